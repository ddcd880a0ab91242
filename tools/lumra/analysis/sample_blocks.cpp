// SPDX-License-Identifier: MIT
#include "analysis/sample_blocks.hpp"

#include <algorithm>
#include <utility>

#include "terminal/interruption.hpp"

namespace tool {
namespace {

std::uint64_t reach_of(const selection &chosen) {
  const recording::stretch &last = chosen.stretches.back();
  return last.samples == recording::endless ? recording::endless
                                            : last.first + last.samples - chosen.stretches.front().first;
}

}  // namespace

sample_blocks::sample_blocks(const recording::source &source, const selection &chosen, std::size_t size,
                             bool count_clipped)
    : first_(chosen.stretches.front().first),
      reader_(source, first_, reach_of(chosen)),
      real_(!source.format.is_complex),
      size_(static_cast<std::size_t>(std::min<std::uint64_t>(size, std::max<std::uint64_t>(chosen.samples, 1)))) {
  if (count_clipped) reader_.count_clipped();
  for (buffer &each : buffers_)
    if (real_)
      each.real.resize(size_);
    else
      each.complex.resize(size_);
  const held_signals for_the_other_thread;  // which inherits them: handlers run in this one
  thread_ = std::thread([this, chosen] {
    try {
      read_all(chosen);
    } catch (...) {
      const std::lock_guard lock(mutex_);
      reason_ = std::current_exception();
      changed_.notify_all();
    }
  });
}

sample_blocks::~sample_blocks() {
  {
    const std::lock_guard lock(mutex_);
    stopped_ = true;
    changed_.notify_all();
  }
  thread_.join();
}

void sample_blocks::read_all(const selection &chosen) {
  std::size_t turn = 0;
  for (const recording::stretch &over : chosen.stretches) {
    reader_.seek(over.first - first_);
    bool begins = true;
    for (std::uint64_t left = over.samples; left > 0;) {
      buffer &filled = buffers_[turn];
      {
        std::unique_lock lock(mutex_);
        changed_.wait(lock, [&] { return !filled.full || stopped_; });
        if (stopped_) return;
      }
      const auto wanted = static_cast<std::size_t>(std::min<std::uint64_t>(size_, left));
      const std::uint64_t at = first_ + reader_.position();
      const std::size_t count = real_ ? reader_.read(std::span(filled.real).first(wanted))
                                      : reader_.read(std::span(filled.complex).first(wanted));
      if (count == 0) break;
      const void *samples = real_ ? static_cast<const void *>(filled.real.data()) : filled.complex.data();
      filled.block = {samples, count, real_ ? sizeof(float) : sizeof(std::complex<float>), at,
                      std::exchange(begins, false)};
      filled.clipped = reader_.clipped();
      if (!hand_over(filled)) return;
      turn ^= 1U;
      if (left != recording::endless) left -= count;
    }
  }
  buffer &end = buffers_[turn];
  std::unique_lock lock(mutex_);
  changed_.wait(lock, [&] { return !end.full || stopped_; });
  end.last = end.full = true;
  changed_.notify_all();
}

bool sample_blocks::hand_over(buffer &filled) {
  const std::lock_guard lock(mutex_);
  filled.full = true;
  changed_.notify_all();
  return !stopped_;
}

std::optional<sample_block> sample_blocks::next() {
  std::unique_lock lock(mutex_);
  if (given_) {
    given_->full = false;
    changed_.notify_all();
  }
  buffer &expected = buffers_[turn_];
  changed_.wait(lock, [&] { return expected.full || reason_; });
  // What was read before the failure is analysed first, so that a fault behind the end of an analysis is none.
  if (!expected.full) std::rethrow_exception(reason_);
  if (expected.last) return std::nullopt;
  given_ = &expected;
  turn_ ^= 1U;
  clipped_ = expected.clipped;
  return expected.block;
}

}  // namespace tool
