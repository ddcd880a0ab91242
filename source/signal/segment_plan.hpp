// How windowed segments are transformed. SPDX-License-Identifier: MIT
#pragma once

#include <complex>
#include <cstddef>
#include <span>

#include "qsrfhs/util/aligned_buffer.hpp"
#include "signal/radix_pass.hpp"
#include "signal/sample_type.hpp"

namespace dsp {

/// The window and the shape of the transforms of segments, for all threads: nothing changes it. Long segments are
/// split: a first pass of radix 16, which takes the window along, leaves rows that fit the caches, whose transforms are
/// the rest. Row r has bins r, r + 16, r + 32 and so on. Of real samples there are rows 0 to 8, where the negative
/// frequencies are the conjugates of what rows 15 to 9 would have.
template <class Sample>
class segment_plan {
 public:
  using real = real_of<Sample>;
  using bin = std::complex<real>;

  /// Which powers are a row's.
  struct range {
    std::size_t first, count;
  };

  /// A window of as many values as a segment. Throws std::bad_alloc.
  explicit segment_plan(qsrfhs::aligned_buffer<real> window);

  [[nodiscard]] static std::size_t bins(std::size_t points) noexcept {
    return is_complex<Sample> ? points : points / 2 + 1;
  }

  [[nodiscard]] std::size_t points() const noexcept { return window_.size(); }
  [[nodiscard]] bool is_split() const noexcept { return rows_ != 1; }
  [[nodiscard]] std::size_t rows() const noexcept { return rows_; }
  [[nodiscard]] std::size_t row() const noexcept { return row_; }  // points
  /// From a row to the next in memory.
  [[nodiscard]] std::size_t stride() const noexcept { return stride_; }

  /// The window of segments that are not split.
  [[nodiscard]] const real *window() const noexcept { return window_.data(); }
  /// The rows of one that is, still to be transformed.
  void split(const Sample *x, bin *rows) const noexcept;

  /// Where the powers of a row's bins go, from the first bin on, as the kernels leave them.
  [[nodiscard]] range powers_of(std::size_t row) const noexcept;
  /// Powers into the order of the bins. The spans lie apart.
  void to_bins(std::span<const real> power, std::span<real> bins) const noexcept;
  /// For states: each row into the order of its bins, which is the same with all kernels, and out of it. To put the rows
  /// into each other would take as long as all the rest of saving. The spans lie apart.
  void to_state(std::span<const real> power, std::span<real> state) const noexcept;
  void from_state(std::span<const real> state, std::span<real> power) const noexcept;

 private:
  /// Of the powers of some neighbours in a row, which may stand in reverse order.
  struct group_place {
    std::size_t first;
    bool reversed;
  };

  [[nodiscard]] std::size_t columns() const noexcept;
  [[nodiscard]] group_place group_of(std::size_t r, std::size_t n) const noexcept;

  std::size_t rows_;
  radix_pass<real> pass_;  // where segments are split
  std::size_t row_, stride_;
  qsrfhs::aligned_buffer<real> window_;
};

}  // namespace dsp
