// Sums of rows that stand at positions, added in one order whatever way they come. SPDX-License-Identifier: MIT
#pragma once

#include <bit>
#include <cstddef>
#include <cstdint>
#include <span>
#include <utility>
#include <vector>

#include "qsrfhs/util/aligned_buffer.hpp"

namespace dsp {

/// Into new memory, or added to what is there.
enum class row_goes { in, on_top };

/// Rows are added one after the other within groups, stretches [m 2^g, (m + 1) 2^g) of positions. Groups are the leaves
/// of the binary tree of all positions: a longer stretch is the sum of its two halves, or the one of them that holds
/// any. Which rows there are alone decides what is added to what. Trees whose stretch may still get rows, in front or
/// behind, are kept side by side: at most two for each level; and so are the rows of a group that began in front.
template <class Real>
class power_forest {
 public:
  struct tree {
    std::uint64_t first, last;  // positions of its rows
    qsrfhs::aligned_buffer<Real> sum;
  };
  /// Where a row goes.
  struct place {
    Real *row;
    row_goes goes;
  };

  static constexpr std::size_t most_trees = 128;
  /// Rows of a group that are at least `step` positions apart.
  static constexpr std::size_t most_in_group = 8;

  /// Rows of `length` values, `step` or more apart, at positions from `begin` on: what stands in front of that is not
  /// this forest's. Throws std::bad_alloc.
  power_forest(std::size_t length, std::uint64_t step, std::uint64_t begin);

  [[nodiscard]] std::span<const tree> trees() const noexcept { return trees_; }
  [[nodiscard]] std::size_t length() const noexcept { return length_; }

  /// Takes the memory that `rows` more need, and then append() of as many trees, so that those cannot fail. Throws
  /// std::bad_alloc.
  void reserve(std::uint64_t rows, std::size_t trees = 0);
  /// A row at a position behind all others; the one after it will stand at `next` or later.
  place plant(std::uint64_t position, std::uint64_t next) noexcept;
  /// To be called when the row is written.
  void settle(std::uint64_t next) noexcept;

  /// Takes over the trees of rows behind these; as many buffers go back.
  void take(power_forest &behind) noexcept;
  /// Copies them; throws std::bad_alloc, and then nothing has changed.
  void append(std::span<const tree> behind);
  /// For trees that were saved, in their order.
  void add_tree(std::uint64_t first, std::uint64_t last, std::span<const Real> sum);

  /// The sum of all; there is at least one row. Throws std::bad_alloc.
  void sum_into(std::span<Real> out) const;

  /// As at the beginning, with memory for the next.
  void clear(std::uint64_t begin) noexcept;

 private:
  static int level(std::uint64_t a, std::uint64_t b) noexcept { return static_cast<int>(std::bit_width(a ^ b)); }
  /// Level of the smallest stretch that holds tree k and the one behind it.
  [[nodiscard]] int level_behind(std::size_t k) const noexcept { return level(trees_[k].last, trees_[k + 1].first); }
  /// Whether a stretch of that level around tree k gets no row in front of tree k any more.
  [[nodiscard]] bool closed_in_front(std::size_t k, int level) const noexcept;
  /// Whether tree k and the one behind it make one sum, where the row behind both will be in a stretch of level
  /// `behind` with the latter.
  [[nodiscard]] bool are_joined(std::size_t k, int behind) const noexcept;
  void join(std::size_t k) noexcept;
  void reduce(std::uint64_t next) noexcept;
  void fold(std::size_t first, std::size_t count, std::span<Real> out) const;
  void fill_spare(std::size_t count);
  qsrfhs::aligned_buffer<Real> buffer() noexcept;

  std::size_t length_;
  int group_;  // the level of a group
  std::uint64_t begin_;
  std::vector<tree> trees_;
  std::vector<qsrfhs::aligned_buffer<Real>> spare_;
};

}  // namespace dsp
