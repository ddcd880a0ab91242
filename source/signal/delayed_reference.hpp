// A record between its samples. SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <cmath>
#include <complex>
#include <cstddef>
#include <limits>
#include <memory>
#include <span>

#include "qsrfhs/util/aligned_buffer.hpp"
#include "signal/block_transform.hpp"

namespace dsp {

/// Samples of a record from `first` to `last`, not included.
struct stretch {
  std::size_t first, last;
  [[nodiscard]] std::size_t count() const noexcept { return last - first; }
};

/// Derivatives of a delayed record by the delay.
enum class slopes { left_out, computed };

/// A record delayed by fractions of a sample, in double precision and blocks of moderate length: each block's Fourier
/// transform with its phases turned. Blocks are computed with neighbouring samples on both sides, as far as there are.
template <class Sample>
class delayed_reference {
 public:
  static constexpr std::size_t longest_block = std::size_t{1} << 20;

  explicit delayed_reference(std::span<const Sample> reference) noexcept : reference_(reference) {}

  /// Samples that interpolation does not know well at the ends of a record.
  static std::size_t guard(std::size_t n) noexcept { return std::min<std::size_t>(32, n / 8); }
  /// Where the delayed record is known.
  [[nodiscard]] stretch known(double delay) const noexcept;

  /// Calls visit(first, values, slopes) with values[k] = x(first + k - delay) and, if asked for, their derivatives by
  /// the delay, block by block over a stretch. Without a delay and slopes these are the samples. Throws
  /// std::bad_alloc, dfti_failure.
  template <class Visit>
  void walk(const stretch &part, double delay, slopes wanted, Visit visit) {
    using values = std::span<const std::complex<double>>;
    const bool as_is = delay == 0 && wanted == slopes::left_out;
    const std::size_t block = as_is ? 4096 : longest_block - 2 * margin;
    for (std::size_t first = part.first, count = 0; first < part.last; first += count) {
      count = std::min(part.last - first, reference_.size() <= longest_block && !as_is ? part.count() : block);
      if (as_is) {
        prepare(delayed_, count);
        std::copy_n(reference_.data() + first, count, delayed_.data());
        shifted_ = std::numeric_limits<double>::quiet_NaN();
        visit(first, values(delayed_.data(), count), values());
        continue;
      }
      load(first, count);
      if (wanted == slopes::computed || delay != shifted_) shift(delay, wanted);
      const std::size_t inside = first - window_.first;
      visit(first, values(delayed_.data() + inside, count),
            wanted == slopes::computed ? values(slopes_.data() + inside, count) : values());
    }
  }

 private:
  using buffer = qsrfhs::aligned_buffer<std::complex<double>>;

  static constexpr std::size_t margin = 8192;  // samples around a block: the longest delay, and where ends still show

  static void prepare(buffer &room, std::size_t count) {
    if (room.size() < count) room = buffer(count);
  }
  /// The spectrum of a block with its margins, unless it is there.
  void load(std::size_t first, std::size_t count);
  /// Computes delayed_, and slopes_ if asked for, of the window.
  void shift(double delay, slopes wanted);

  std::span<const Sample> reference_;
  stretch window_{0, 0};
  double shifted_ = std::numeric_limits<double>::quiet_NaN();  // the delay by which delayed_ is
  std::unique_ptr<block_transform<std::complex<double>>> transform_;
  buffer spectrum_, turned_, delayed_, slopes_;
};

}  // namespace dsp
