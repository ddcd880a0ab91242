// How windowed segments are transformed. SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <span>

#include "qsrfhs/util/aligned_buffer.hpp"
#include "signal/sample_type.hpp"

namespace dsp {

/// The window and the shape of the transforms of segments, for all threads: nothing changes it. Long segments of complex
/// samples go through a first pass of radix 16, which takes the window along; what is left are 16 rows that fit the
/// caches. Row r has bins r, r + 16, r + 32 and so on.
template <class Sample>
class segment_plan {
 public:
  using real = real_of<Sample>;

  /// A window of as many values as a segment. Throws std::bad_alloc.
  explicit segment_plan(qsrfhs::aligned_buffer<real> window);

  [[nodiscard]] static std::size_t bins(std::size_t points) noexcept {
    return is_complex<Sample> ? points : points / 2 + 1;
  }

  [[nodiscard]] std::size_t points() const noexcept { return window_.size(); }
  [[nodiscard]] std::size_t rows() const noexcept { return rows_; }             // 1 or 16
  [[nodiscard]] std::size_t row() const noexcept { return row_; }               // points of a row
  [[nodiscard]] std::size_t stride() const noexcept { return stride_; }         // from a row to the next in memory
  [[nodiscard]] const real *window() const noexcept { return window_.data(); }  // where there is one row, in its order

  /// rows() rows, stride() apart, that are still to be transformed.
  void split(const Sample *x, Sample *rows) const noexcept;

  /// Powers that the kernels left in the rows, one row after the other, into the order of the bins, and back. The spans
  /// lie apart.
  void to_bins(std::span<const real> power, std::span<real> bins) const noexcept;
  void from_bins(std::span<const real> bins, std::span<real> power) const noexcept;

 private:
  std::size_t rows_, row_, stride_;
  qsrfhs::aligned_buffer<real> window_;
  qsrfhs::aligned_buffer<real> columns_, blocks_;  // twiddle factors as the kernels take them, where there are 16 rows
};

}  // namespace dsp
