// SPDX-License-Identifier: MIT
#include "qsrfhs/math/fft.hpp"

#include <algorithm>

#include "qsrfhs/math/mkl_memory.hpp"
#include "qsrfhs/math/mkl_status.hpp"

namespace qsrfhs {
namespace {

constexpr const char *fft_source = R"(.\source\qsrfhs\math\fft)";

// What the log says of a failure here; data of the interface.
constexpr source_position copy_position{fft_source, 31};
constexpr source_position commit_copy_position{fft_source, 32};
constexpr source_position length_position{fft_source, 36};
constexpr source_position create_position{fft_source, 37};
constexpr source_position placement_position{fft_source, 38};
constexpr source_position commit_position{fft_source, 40};
constexpr source_position forward_position{fft_source, 52};

constexpr std::int32_t fft_size_unsupported = -312432;

}  // namespace

fft_transform::fft_transform(std::uint64_t length) : length_(length) {
  if (length > max_fft_length) throw invalid_argument(length_position, fft_size_unsupported);
  const mkl_section section;
  const mkl_memory::descriptor_watch watched;
  DFTI_DESCRIPTOR_HANDLE handle = nullptr;
  const MKL_LONG created = DftiCreateDescriptor(&handle, DFTI_SINGLE, DFTI_COMPLEX, 1, static_cast<MKL_LONG>(length));
  descriptor made(handle);
  throw_if_failed(watched.status(created), create_position);
  throw_if_failed(DftiSetValue(handle, DFTI_PLACEMENT, DFTI_INPLACE), placement_position);
  throw_if_failed(watched.status(DftiCommitDescriptor(handle)), commit_position);
  descriptor_ = std::move(made);
}

fft_transform::fft_transform(const fft_transform &prototype) : length_(prototype.length_) {
  const mkl_section section;
  const mkl_memory::descriptor_watch watched;
  DFTI_DESCRIPTOR_HANDLE handle = nullptr;
  const MKL_LONG copied = DftiCopyDescriptor(prototype.descriptor_.get(), &handle);
  descriptor made(handle);
  throw_if_failed(watched.status(copied), copy_position);
  throw_if_failed(watched.status(DftiCommitDescriptor(handle)), commit_copy_position);
  descriptor_ = std::move(made);
}

void fft_transform::forward(std::complex<float> *data) {
  const auto compute = [&] { return DftiComputeForward(descriptor_.get(), data); };
  throw_if_failed(mkl_memory::watched_status(compute), forward_position);
}

fft_lease::~fft_lease() {
  if (transform_) pool_->release(*this);
}

void fft_pool::prefill(std::uint64_t length) {
  const std::lock_guard lock(mutex_);
  if (const auto found = slots_.find(length); found != slots_.end() && !found->second.empty()) return;
  // The pool only ever keeps clones.
  const fft_transform prototype(length);
  auto transform = std::make_unique<fft_transform>(prototype);
  slots_[length].push_back(std::move(transform));
  ++idle_count_;
}

fft_lease fft_pool::acquire(std::uint64_t length) {
  bool reserved = false;
  {
    const std::lock_guard lock(mutex_);
    if (const auto found = slots_.find(length); found != slots_.end()) {
      slot_list &slots = found->second;
      const auto filled = std::find_if(slots.begin(), slots.end(), [](const auto &slot) { return slot != nullptr; });
      if (filled != slots.end()) {
        --idle_count_;
        return {std::move(*filled), *this};
      }
      reserved = reserve_slots_ != 0;
      if (reserved) slots.emplace_back();
    } else if (reserve_slots_ > 0) {
      slots_[length].resize(static_cast<std::size_t>(reserve_slots_));
      reserved = true;
    }
  }
  try {
    return {std::make_unique<fft_transform>(length), *this};
  } catch (...) {
    if (reserved) forget_empty_slot(length);
    throw;
  }
}

void fft_pool::release(fft_lease &lease) noexcept {
  const std::lock_guard lock(mutex_);
  const auto found = slots_.find(lease->length());
  if (found == slots_.end()) return;
  slot_list &slots = found->second;
  const auto empty = std::find(slots.begin(), slots.end(), nullptr);
  if (empty == slots.end()) return;
  *empty = std::move(lease.transform_);
  ++idle_count_;
}

void fft_pool::clear() {
  std::map<std::uint64_t, slot_list> dropped;  // freed outside the lock
  const std::lock_guard lock(mutex_);
  slots_.swap(dropped);
  idle_count_ = 0;
}

/// Takes back the slot of a transform that could not be made, so that failures leave nothing behind.
void fft_pool::forget_empty_slot(std::uint64_t length) noexcept {
  const std::lock_guard lock(mutex_);
  const auto found = slots_.find(length);
  if (found == slots_.end()) return;
  slot_list &slots = found->second;
  if (const auto empty = std::find(slots.begin(), slots.end(), nullptr); empty != slots.end()) slots.erase(empty);
  if (slots.empty()) slots_.erase(found);
}

std::int64_t fft_pool::idle_count() const {
  const std::lock_guard lock(mutex_);
  return idle_count_;
}

}  // namespace qsrfhs
