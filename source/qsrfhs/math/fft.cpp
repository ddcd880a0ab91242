// SPDX-License-Identifier: MIT
#include "qsrfhs/math/fft.hpp"

#include <algorithm>

#include "qsrfhs/math/exceptions.hpp"

namespace qsrfhs {
namespace {

constexpr const char *fft_source = R"(.\source\qsrfhs\math\fft)";

// Lines that the log names for a failure here; data of the interface.
constexpr std::int32_t length_line = 36, forward_line = 52;

std::int32_t making_line(dsp::dfti_step failed) noexcept {
  return failed == dsp::dfti_step::create ? 37 : failed == dsp::dfti_step::placement ? 38 : 40;
}
std::int32_t copying_line(dsp::dfti_step failed) noexcept {
  return failed == dsp::dfti_step::copy ? 31 : 32;
}

/// Calls MKL; what fails becomes an mkl_error with the line that belongs to the step.
template <class Line, class Call>
auto at_line(Line line_of, Call call) try {
  return call();
} catch (const dsp::dfti_failure &failure) {
  const char *const text = DftiErrorMessage(failure.status());
  throw mkl_error({fft_source, line_of(failure.step())}, text ? text : "");
}

dsp::dfti_descriptor make(std::uint64_t length) {
  if (length > max_fft_length) throw invalid_argument({fft_source, length_line});
  return at_line(&making_line, [length] {
    return dsp::dfti_descriptor({.lengths = {static_cast<MKL_LONG>(length), 0}, .in_place = true});
  });
}

}  // namespace

fft_transform::fft_transform(std::uint64_t length) : descriptor_(make(length)), length_(length) {}

fft_transform::fft_transform(const fft_transform &prototype)
    : descriptor_(at_line(&copying_line, [&] { return dsp::dfti_descriptor(prototype.descriptor_); })),
      length_(prototype.length_) {}

void fft_transform::forward(std::complex<float> *data, const mkl_section &around) {
  at_line([](dsp::dfti_step) { return forward_line; }, [&] { descriptor_.forward(data, around); });
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
