// SPDX-License-Identifier: MIT
#include "signal/dfti_descriptor.hpp"

#include <utility>

#include "qsrfhs/math/mkl_status.hpp"

namespace dsp {
namespace {

const char *text_of(MKL_LONG status) noexcept {
  const char *const text = DftiErrorMessage(status);
  return text ? text : "MKL gives no reason";
}

}  // namespace

dfti_failure::dfti_failure(dfti_step step, MKL_LONG status) noexcept
    : transform_failure(text_of(status), DftiErrorClass(status, DFTI_MEMORY_ERROR) != 0),
      step_(step),
      status_(status) {}

std::optional<failed_step> make_descriptor(DFTI_DESCRIPTOR_HANDLE &made, const dfti_settings &settings,
                                           const qsrfhs::mkl_memory::watch &watched) noexcept {
  std::optional<failed_step> failure;
  const auto passes = [&failure](dfti_step step, MKL_LONG status) {
    if (qsrfhs::failed(status)) failure = {step, status};
    return !failure;
  };
  const auto create = [&] {
    auto lengths = settings.lengths;
    if (lengths[1] == 0) return DftiCreateDescriptor(&made, settings.precision, settings.domain, 1, lengths[0]);
    return DftiCreateDescriptor(&made, settings.precision, settings.domain, 2, lengths);
  };
  const auto scaled = [&](DFTI_CONFIG_PARAM direction, double scale) {
    return scale == 1 || passes(dfti_step::scale, DftiSetValue(made, direction, scale));
  };
  (void)(passes(dfti_step::create, watched.status(create())) &&
         passes(dfti_step::placement,
                DftiSetValue(made, DFTI_PLACEMENT, settings.in_place ? DFTI_INPLACE : DFTI_NOT_INPLACE)) &&
         (settings.domain != DFTI_REAL ||
          passes(dfti_step::storage, DftiSetValue(made, DFTI_CONJUGATE_EVEN_STORAGE, DFTI_COMPLEX_COMPLEX))) &&
         scaled(DFTI_FORWARD_SCALE, settings.forward_scale) && scaled(DFTI_BACKWARD_SCALE, settings.backward_scale) &&
         passes(dfti_step::commit, watched.status(DftiCommitDescriptor(made))));
  return failure;
}

void dfti_descriptor::fail_unless_no_error(MKL_LONG status, dfti_step step) {
  if (qsrfhs::failed(status)) throw dfti_failure(step, status);
}

dfti_descriptor::dfti_descriptor(const dfti_settings &settings) {
  const qsrfhs::mkl_section section;
  const qsrfhs::mkl_memory::descriptor_watch watched;
  DFTI_DESCRIPTOR_HANDLE handle = nullptr;
  const auto failure = make_descriptor(handle, settings, watched);
  owned made(handle);
  if (failure) throw dfti_failure(failure->step, failure->status);
  handle_ = std::move(made);
}

dfti_descriptor::dfti_descriptor(const dfti_descriptor &other) {
  if (!other) return;
  const qsrfhs::mkl_section section;
  const qsrfhs::mkl_memory::descriptor_watch watched;
  DFTI_DESCRIPTOR_HANDLE handle = nullptr;
  const MKL_LONG copied = DftiCopyDescriptor(other.handle_.get(), &handle);
  owned made(handle);
  check(watched.status(copied), dfti_step::copy);
  check(watched.status(DftiCommitDescriptor(handle)), dfti_step::commit);
  handle_ = std::move(made);
}

std::array<MKL_LONG, 2> dfti_descriptor::lengths() const {
  std::array<MKL_LONG, 2> lengths{};
  check(DftiGetValue(handle_.get(), DFTI_LENGTHS, lengths.data()), dfti_step::lengths);
  return lengths;
}

bool dfti_descriptor::free() noexcept {
  const qsrfhs::mkl_section section;
  DFTI_DESCRIPTOR_HANDLE held = handle_.release();
  if (!held) return true;
  return DftiErrorClass(DftiFreeDescriptor(&held), DFTI_NO_ERROR) != 0;
}

}  // namespace dsp
