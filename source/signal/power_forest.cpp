// SPDX-License-Identifier: MIT
#include "signal/power_forest.hpp"

#include <algorithm>

#include "qsrfhs/vector/kernels/kernels.hpp"

namespace dsp {
namespace {

void add(const float *x, float *sum, std::size_t n) noexcept {
  qsrfhs::kernels::exact().add(x, sum, n);
}

void add(const double *x, double *sum, std::size_t n) noexcept {
  for (std::size_t k = 0; k < n; ++k) sum[k] += x[k];
}

}  // namespace

template <class Real>
power_forest<Real>::power_forest(std::size_t length, std::uint64_t step, std::uint64_t begin)
    : length_(length),
      group_(static_cast<int>(std::bit_width(step - 1) + std::bit_width(most_in_group)) - 2),
      begin_(begin) {
  trees_.reserve(2 * most_trees);  // its own, and those of another one that it takes over
  spare_.reserve(4 * most_trees);
}

template <class Real>
void power_forest<Real>::reserve(std::uint64_t rows, std::size_t trees) {
  // The levels of trees that cannot be joined yet rise and then fall, and double the rows with each step.
  const std::size_t more = std::min<std::uint64_t>(rows, 2U * std::bit_width(rows) + most_in_group);
  fill_spare(more + trees);
}

template <class Real>
void power_forest<Real>::fill_spare(std::size_t count) {
  spare_.reserve(trees_.size() + spare_.size() + count + 2 * most_trees);
  while (spare_.size() < count) spare_.emplace_back(length_);
}

template <class Real>
qsrfhs::aligned_buffer<Real> power_forest<Real>::buffer() noexcept {
  qsrfhs::aligned_buffer<Real> taken = std::move(spare_.back());
  spare_.pop_back();
  return taken;
}

template <class Real>
bool power_forest<Real>::closed_in_front(std::size_t k, int level) const noexcept {
  if (k > 0) return level_behind(k - 1) > level;
  if (level > 63) return begin_ == 0;
  return (trees_[0].first >> level << level) >= begin_;
}

template <class Real>
bool power_forest<Real>::are_joined(std::size_t k, int behind) const noexcept {
  const int joint = level_behind(k);
  return joint <= group_ ? closed_in_front(k, group_) : joint < behind && closed_in_front(k, joint);
}

template <class Real>
void power_forest<Real>::join(std::size_t k) noexcept {
  add(trees_[k + 1].sum.data(), trees_[k].sum.data(), length_);
  trees_[k].last = trees_[k + 1].last;
  spare_.push_back(std::move(trees_[k + 1].sum));
  trees_.erase(trees_.begin() + static_cast<std::ptrdiff_t>(k) + 1);
}

template <class Real>
void power_forest<Real>::settle(std::uint64_t next) noexcept {
  while (trees_.size() >= 2 && are_joined(trees_.size() - 2, level(trees_.back().last, next))) join(trees_.size() - 2);
}

template <class Real>
auto power_forest<Real>::plant(std::uint64_t position, std::uint64_t next) noexcept -> place {
  settle(position);
  if (!trees_.empty()) {
    tree &before = trees_.back();
    const int joint = level(before.last, position);
    const bool in_group = joint <= group_;
    if ((in_group || joint < level(position, next)) && closed_in_front(trees_.size() - 1, in_group ? group_ : joint)) {
      before.last = position;
      return {before.sum.data(), row_goes::on_top};
    }
  }
  trees_.push_back({position, position, buffer()});
  return {trees_.back().sum.data(), row_goes::in};
}

template <class Real>
void power_forest<Real>::reduce(std::uint64_t next) noexcept {
  for (std::size_t k = 0; k + 1 < trees_.size();) {
    const int behind = k + 2 < trees_.size() ? level_behind(k + 1) : level(trees_[k + 1].last, next);
    if (are_joined(k, behind)) {
      join(k);
      k -= std::min<std::size_t>(k, 1);
    } else {
      ++k;
    }
  }
}

template <class Real>
void power_forest<Real>::take(power_forest &behind) noexcept {
  const std::size_t count = behind.trees_.size();
  const std::uint64_t next = count == 0 ? 0 : behind.trees_.back().last + 1;
  for (tree &each : behind.trees_) trees_.push_back(std::move(each));
  behind.trees_.clear();
  if (count != 0) reduce(next);
  // As many buffers go back as came, so that neither side's number grows.
  for (std::size_t k = 0; k < count && !spare_.empty(); ++k) behind.spare_.push_back(buffer());
}

template <class Real>
void power_forest<Real>::append(std::span<const tree> behind) {
  fill_spare(behind.size());
  for (const tree &each : behind) {
    trees_.push_back({each.first, each.last, buffer()});
    std::copy_n(each.sum.data(), length_, trees_.back().sum.data());
  }
  if (!behind.empty()) reduce(behind.back().last + 1);
}

template <class Real>
void power_forest<Real>::add_tree(std::uint64_t first, std::uint64_t last, std::span<const Real> sum) {
  tree added{first, last, qsrfhs::aligned_buffer<Real>(length_)};
  std::copy(sum.begin(), sum.end(), added.sum.data());
  trees_.push_back(std::move(added));
}

template <class Real>
void power_forest<Real>::fold(std::size_t first, std::size_t count, std::span<Real> out) const {
  if (count == 1) {
    std::copy_n(trees_[first].sum.data(), length_, out.data());
    return;
  }
  // Trees of the first half of the smallest stretch that holds all; of one group, all but the last.
  const auto level_at = [&](std::size_t k) { return std::max(level_behind(first + k - 1), group_); };
  std::size_t left = 1;
  for (std::size_t k = 2; k < count; ++k)
    if (level_at(k) >= level_at(left)) left = k;
  const std::size_t right = count - left;
  if (left == 1) {
    fold(first + left, right, out);
    add(trees_[first].sum.data(), out.data(), length_);
  } else if (right == 1) {
    fold(first, left, out);
    add(trees_[first + left].sum.data(), out.data(), length_);
  } else {
    const qsrfhs::aligned_buffer<Real> half(length_);
    fold(first, left, out);
    fold(first + left, right, half.elements());
    add(half.data(), out.data(), length_);
  }
}

template <class Real>
void power_forest<Real>::sum_into(std::span<Real> out) const {
  fold(0, trees_.size(), out);
}

template <class Real>
void power_forest<Real>::clear(std::uint64_t begin) noexcept {
  for (tree &each : trees_) spare_.push_back(std::move(each.sum));
  trees_.clear();
  begin_ = begin;
}

template class power_forest<float>;
template class power_forest<double>;

}  // namespace dsp
