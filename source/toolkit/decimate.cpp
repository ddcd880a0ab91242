// Decimation by whole factors. SPDX-License-Identifier: MIT
#include "toolkit/decimate.hpp"

#include <lumra/toolkit.h>

namespace toolkit {
namespace {

template <class E>
void decimate_record(input<E> x, output<E> &out, std::int32_t factor, decimation how) {
  require(x.count() >= 1, empty_input);
  require(factor >= 1 && factor <= x.count(), bad_factor);
  x.copy_if_same(out);
  decimate<value_of<E>>(x.values(), out.resize(x.count() / factor), factor, how);
}

}  // namespace
}  // namespace toolkit

using namespace toolkit;

#define DECIMATE(E)                                                                                           \
  int32_t qsRFPELTA_##E##DecimateH(handle<E> in, handle<E> out, int32_t factor, int32_t average) {            \
    const decimation how = average != 0 ? decimation::average : decimation::pick;                             \
    return toolkit_call([&](output<E> &kept) { decimate_record<E>(in, kept, factor, how); }, output<E>(out)); \
  }
DECIMATE(s)
DECIMATE(d)
DECIMATE(c)
DECIMATE(z)
#undef DECIMATE
