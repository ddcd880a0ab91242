// SPDX-License-Identifier: MIT
#include "signal/dfti_descriptor.hpp"

#include <utility>

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

void dfti_descriptor::fail_unless_no_error(MKL_LONG status, dfti_step step) {
  if (!DftiErrorClass(status, DFTI_NO_ERROR)) throw dfti_failure(step, status);
}

dfti_descriptor::dfti_descriptor(const dfti_settings &settings) {
  const qsrfhs::mkl_section section;
  const qsrfhs::mkl_memory::descriptor_watch watched;
  DFTI_DESCRIPTOR_HANDLE handle = nullptr;
  auto lengths = settings.lengths;
  const MKL_LONG created =
      settings.lengths[1] == 0
          ? DftiCreateDescriptor(&handle, settings.precision, settings.domain, 1, settings.lengths[0])
          : DftiCreateDescriptor(&handle, settings.precision, settings.domain, 2, lengths);
  owned made(handle);
  check(watched.status(created), dfti_step::create);
  check(DftiSetValue(handle, DFTI_PLACEMENT, settings.in_place ? DFTI_INPLACE : DFTI_NOT_INPLACE),
        dfti_step::placement);
  if (settings.domain == DFTI_REAL)
    check(DftiSetValue(handle, DFTI_CONJUGATE_EVEN_STORAGE, DFTI_COMPLEX_COMPLEX), dfti_step::storage);
  if (settings.forward_scale != 1)
    check(DftiSetValue(handle, DFTI_FORWARD_SCALE, settings.forward_scale), dfti_step::scale);
  if (settings.backward_scale != 1)
    check(DftiSetValue(handle, DFTI_BACKWARD_SCALE, settings.backward_scale), dfti_step::scale);
  check(watched.status(DftiCommitDescriptor(handle)), dfti_step::commit);
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
