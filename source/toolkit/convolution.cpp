// Linear convolution of two records. SPDX-License-Identifier: MIT
#include "toolkit/convolution.hpp"

#include <lumra/toolkit.h>

#include <algorithm>
#include <limits>
#include <optional>

namespace toolkit {
namespace {

/// Which part of the full result is kept.
enum class mode : std::int32_t { full = 0, same = 1, valid = 2 };

struct section {
  std::int64_t first, count;
};

section kept(mode mode, std::int64_t nx, std::int64_t ny) noexcept {
  if (mode == mode::same) return {ny / 2, nx};
  if (mode == mode::valid) return {ny - 1, nx - ny + 1};
  return {0, nx + ny - 1};
}

template <class E>
void convolve(input<E> x, input<E> y, output<E> &out, std::int32_t mode_number, std::int32_t method_number,
              std::int32_t block, scratch<E> full, scratch<E> room, transform_slot &slot) {
  require(x.count() >= 1 && y.count() >= 1, empty_input);
  const method how = checked_method(method_number);
  require(mode_number >= 0 && mode_number <= 2, bad_option);
  const auto mode = static_cast<toolkit::mode>(mode_number);
  const section part = kept(mode, x.count(), y.count());
  require(part.count >= 1, empty_result);
  const std::int64_t length = std::int64_t{x.count()} + y.count() - 1;
  require(length <= std::numeric_limits<std::int32_t>::max(), no_memory);
  std::optional<fourier_convolution<E>> plan;
  if (how == method::fourier) plan.emplace(length);
  refuse_sharing(full, x, y, out, room);
  refuse_sharing(room, x, y, out);
  const bool with_itself = same_array(x, y);
  x.copy_if_same(out);
  y.copy_if_same(out);

  const auto wanted = out.resize(part.count);
  const auto result = mode == mode::full ? wanted : full.resize(length);
  if (plan) {
    const padded_vector<value_of<E>> first{x.values()}, second{y.values()};
    const value_of<E> *found = with_itself ? plan->run(room, slot, first) : plan->run(room, slot, first, second);
    std::copy_n(found, result.size(), result.begin());
  } else {
    std::fill(result.begin(), result.end(), value_of<E>{});
    add_convolution(x.values(), y.values(), block, result.data());
  }
  if (mode != mode::full) std::copy_n(result.begin() + part.first, part.count, wanted.begin());
}

}  // namespace
}  // namespace toolkit

using namespace toolkit;

#define CONVOLUTION(E)                                                                                         \
  int32_t qsRFPELTA_##E##1DConvolutionH(handle<E> x, handle<E> y, handle<E> out, int32_t mode, int32_t method, \
                                        int32_t blockSize, handle<E> scratch, handle<E> transformScratch,      \
                                        void **slot) {                                                         \
    return toolkit_call(                                                                                       \
        [&](output<E> &result, transform_slot &kept) {                                                         \
          convolve<E>(x, y, result, mode, method, blockSize, scratch, transformScratch, kept);                 \
        },                                                                                                     \
        output<E>(out), transform_slot(slot));                                                                 \
  }
CONVOLUTION(s)
CONVOLUTION(d)
CONVOLUTION(c)
CONVOLUTION(z)
#undef CONVOLUTION
