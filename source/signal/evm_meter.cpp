// SPDX-License-Identifier: MIT
#include "signal/evm_meter.hpp"

#include <algorithm>

namespace dsp {
namespace {

template <class Kept, class Samples>
void append(Kept &to, Samples reference, Samples measured) {
  to.reference.insert(to.reference.end(), reference.begin(), reference.end());
  to.measured.insert(to.measured.end(), measured.begin(), measured.end());
}

}  // namespace

template <class Real>
evm_meter<Real>::evm_meter(std::uint64_t start, const alignment &wanted, const stream_model &model)
    : start_(start),
      end_(start),
      wanted_(wanted),
      first_block_(start == 0 ? 0 : (start + error_block::margin + error_block::length - 1) / error_block::length),
      next_block_(first_block_),
      comparison_(model, wanted.delay) {}

template <class Real>
positions evm_meter<Real>::head_place() const noexcept {
  const std::uint64_t end =
      first_block_ == 0 ? start_ : error_block::window_begin(first_block_ - 1) + error_block::window;
  return {start_, std::min(end, end_)};
}

template <class Real>
positions evm_meter<Real>::tail_place() const noexcept {
  return {std::min(error_block::window_begin(next_block_), end_), end_};
}

template <class Real>
positions evm_meter<Real>::compared() const noexcept {
  return comparison_.is_delayed() ? known_positions(record(), model().delay) : record();
}

template <class Real>
void evm_meter<Real>::add(std::span<const sample> reference, std::span<const sample> measured) {
  while (!reference.empty()) {
    const std::uint64_t complete = error_block::window_begin(next_block_) + error_block::window;
    const auto count = static_cast<std::size_t>(std::min<std::uint64_t>(reference.size(), complete - end_));
    const auto from = reference.first(count), to = measured.first(count);
    const std::uint64_t before = end_;
    const std::size_t in_head = head_.reference.size(), in_tail = tail_.reference.size();
    try {
      end_ += count;
      const auto more = static_cast<std::size_t>(head_place().count() - in_head);
      append(head_, from.first(more), to.first(more));
      const auto skipped = count - static_cast<std::size_t>(tail_place().count() - in_tail);
      append(tail_, from.subspan(skipped), to.subspan(skipped));
      if (end_ == complete) {
        comparison_.prepare(error_block::window);
        const error_block block(next_block_, {tail_place().first, end_});
        totals_.add(comparison_.compare(tail_.reference, tail_.measured, block.around.first, block.part(), {}));
      }
    } catch (...) {
      end_ = before;
      for (auto *samples : {&head_.reference, &head_.measured}) samples->resize(std::min(samples->size(), in_head));
      for (auto *samples : {&tail_.reference, &tail_.measured}) samples->resize(std::min(samples->size(), in_tail));
      throw;
    }
    if (end_ == complete) {
      ++next_block_;
      const auto done = static_cast<std::ptrdiff_t>(tail_.reference.size() - tail_place().count());
      for (auto *samples : {&tail_.reference, &tail_.measured})
        samples->erase(samples->begin(), samples->begin() + done);
    }
    reference = reference.subspan(count);
    measured = measured.subspan(count);
  }
}

template <class Real>
void evm_meter<Real>::merge(const evm_meter &next) {
  // The blocks across the border come from what both kept; all others of `next` are in its totals.
  kept tail = next.tail_;
  add(next.head_.reference, next.head_.measured);
  if (next.end_ == next.head_place().last) return;
  totals_.add(next.totals_);
  end_ = next.end_;
  next_block_ = next.next_block_;
  tail_ = std::move(tail);
}

template <class Real>
error_totals evm_meter<Real>::all() const {
  error_totals totals = totals_;
  block_comparison<Real> comparison(model(), wanted_.delay);
  const auto add_blocks = [&](std::uint64_t first, std::uint64_t last, const kept &samples, const positions &place) {
    for (std::uint64_t k = first; k < last; ++k) {
      const error_block block(k, place);
      if (block.inner.first >= block.inner.last) continue;
      const auto skipped = static_cast<std::size_t>(block.around.first - place.first);
      const auto count = static_cast<std::size_t>(block.around.count());
      totals.add(comparison.compare(std::span(samples.reference).subspan(skipped, count),
                                    std::span(samples.measured).subspan(skipped, count), block.around.first,
                                    block.part(), {}));
    }
  };
  const std::uint64_t behind = (end_ + error_block::length - 1) / error_block::length;
  add_blocks(start_ / error_block::length, std::min(first_block_, behind), head_, head_place());
  add_blocks(next_block_, behind, tail_, tail_place());
  return totals;
}

template <class Real>
error_outcome evm_meter<Real>::read(error_figures &figures) const {
  return all().read(compared(), model(), figures);
}

template <class Real>
error_outcome evm_meter<Real>::refine(model_refinement &refined) const {
  return all().refine(record(), compared(), wanted_, model(), refined);
}

template <class Real>
bool evm_meter<Real>::load(std::uint64_t samples, const error_totals::image &saved) {
  end_ = start_ + samples;
  while (error_block::window_begin(next_block_) + error_block::window <= end_) ++next_block_;
  for (auto *kept_samples : {&head_.reference, &head_.measured})
    kept_samples->resize(static_cast<std::size_t>(head_place().count()));
  for (auto *kept_samples : {&tail_.reference, &tail_.measured})
    kept_samples->resize(static_cast<std::size_t>(tail_place().count()));
  return totals_.load(saved);
}

template class evm_meter<float>;
template class evm_meter<double>;

}  // namespace dsp
