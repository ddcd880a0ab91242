// Fourier transforms of rows that lie anywhere. SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <cstdint>

#include "qsrfhs/util/aligned_buffer.hpp"
#include "signal/dfti_descriptor.hpp"
#include "signal/strided_copy.hpp"

namespace dsp {

struct fft_settings {
  bool real = false, double_precision = false;
  std::uint64_t points = 1;  // to most_fft_points
  double forward_scale = 1, backward_scale = 1;
};

/// Transforms between records and spectra, which for real records are the half of the bins from 0 to N / 2. Memory for
/// all calls is taken at construction. One thread at a time. All throw dfti_failure; construction std::bad_alloc, too.
class fft {
 public:
  explicit fft(const fft_settings &settings);

  [[nodiscard]] const row_shape &record() const noexcept { return record_; }
  [[nodiscard]] const row_shape &spectrum() const noexcept { return spectrum_; }

  /// What is read and what is written are apart, or in place: the same address with the same layout for complex
  /// records, with steps of 1 and distances of the same bytes for real ones.
  void forward(const void *record, row_layout from, void *spectrum, row_layout to, std::uint64_t rows);
  void backward(const void *spectrum, row_layout from, void *record, row_layout to, std::uint64_t rows);

 private:
  enum class direction { forward, backward };

  template <direction D>
  void run(const void *in, row_layout from, void *out, row_layout to, std::uint64_t rows);
  template <direction D>
  void run_blocks(const std::byte *in, row_layout from, std::byte *out, row_layout to, std::uint64_t rows);

  row_shape record_, spectrum_;
  dfti_descriptor apart_;
  dfti_descriptor in_place_;  // none for sizes that are faster through the workspace
  std::size_t block_;         // rows that are gathered or scattered together
  std::size_t pitch_;         // bytes from one of them to the next
  // Rows gathered from where they lie apart or will be overwritten, and rows to be scattered.
  qsrfhs::aligned_buffer<std::byte> gathered_, scattered_;
};

}  // namespace dsp
