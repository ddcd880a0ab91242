// SPDX-License-Identifier: MIT
#include "toolkit/transform_slot.hpp"

#include <lumra/host_array.h>

#include <algorithm>
#include <exception>
#include <memory>
#include <utility>

#include "qsrfhs/math/fft.hpp"
#include "qsrfhs/math/mkl_memory.hpp"
#include "qsrfhs/math/mkl_section.hpp"

namespace toolkit {
namespace {

bool is_error(MKL_LONG status) noexcept {
  return status != 0 && !DftiErrorClass(status, DFTI_NO_ERROR);
}

void check(MKL_LONG status, toolkit::status otherwise) {
  require(!is_error(status), otherwise);
}

MKL_LONG create(DFTI_DESCRIPTOR_HANDLE *descriptor, const transform_kind &kind) {
  auto lengths = kind.lengths;
  if (lengths[1] == 0) return DftiCreateDescriptor(descriptor, kind.precision, kind.domain, 1, lengths[0]);
  return DftiCreateDescriptor(descriptor, kind.precision, kind.domain, 2, lengths.data());
}

}  // namespace

void check_transform_size(std::int64_t points) {
  require(points <= static_cast<std::int64_t>(qsrfhs::max_fft_length), no_transform);
}

transform::transform(const transform_kind &kind) : kind_(kind) {
  const qsrfhs::mkl_section section;
  const qsrfhs::mkl_memory::descriptor_watch watched;
  const MKL_LONG created = create(&descriptor_, kind);
  try {
    check(watched.status(created), no_transform);
    configure();
    check(watched.status(DftiCommitDescriptor(descriptor_)), no_transform);
  } catch (...) {
    (void)free();
    throw;
  }
}

transform::~transform() {
  (void)free();
}

void transform::configure() const {
  check(DftiSetValue(descriptor_, DFTI_PLACEMENT, DFTI_NOT_INPLACE), no_transform);
  if (kind_.domain == DFTI_REAL) {
    check(DftiSetValue(descriptor_, DFTI_CONJUGATE_EVEN_STORAGE, DFTI_COMPLEX_COMPLEX), no_transform);
  }
  if (kind_.backward_scaled) {
    const auto points = kind_.lengths[0] * std::max<MKL_LONG>(kind_.lengths[1], 1);
    check(DftiSetValue(descriptor_, DFTI_BACKWARD_SCALE, 1.0 / static_cast<double>(points)), no_transform);
  }
}

bool transform::fits(const transform_kind &wanted) const {
  std::array<MKL_LONG, 2> lengths{};
  check(DftiGetValue(descriptor_, DFTI_LENGTHS, lengths.data()), no_transform);
  return kind_ == wanted && lengths == wanted.lengths;
}

bool transform::free() noexcept {
  const qsrfhs::mkl_section section;
  DFTI_DESCRIPTOR_HANDLE held = std::exchange(descriptor_, nullptr);
  return !held || !is_error(DftiFreeDescriptor(&held));
}

void transform::forward(const void *in, void *out) const {
  const qsrfhs::mkl_section section;
  const auto compute = [&] { return DftiComputeForward(descriptor_, const_cast<void *>(in), out); };
  check(qsrfhs::mkl_memory::watched_status(compute), transform_failed);
}

void transform::backward(const void *in, void *out) const {
  const qsrfhs::mkl_section section;
  const auto compute = [&] { return DftiComputeBackward(descriptor_, const_cast<void *>(in), out); };
  check(qsrfhs::mkl_memory::watched_status(compute), transform_failed);
}

transform_slot::transform_slot(void **slot) noexcept
    : slot_(slot ? slot : &own_), unwinding_(std::uncaught_exceptions()) {}

transform_slot::~transform_slot() {
  const bool failed = std::uncaught_exceptions() > unwinding_;
  if (own_ || (taken_ && failed)) (void)release(slot_);
}

const transform &transform_slot::get(const transform_kind &kind) {
  taken_ = true;
  const auto *held = static_cast<const transform *>(*slot_);
  if (held && held->fits(kind)) return *held;
  require(release(slot_), transform_not_freed);
  *slot_ = new transform(kind);
  return *static_cast<const transform *>(*slot_);
}

bool release(void **slot) noexcept {
  if (!slot || !*slot) return true;
  const std::unique_ptr<transform> held(static_cast<transform *>(std::exchange(*slot, nullptr)));
  return held->free();
}

}  // namespace toolkit

int32_t qsHost_ReleaseTransform(void **slot) {
  return toolkit::release(slot) ? toolkit::success : toolkit::transform_not_freed;
}
