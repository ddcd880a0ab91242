// A record between its samples. SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <array>
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

/// A record delayed by fractions of a sample, in double precision: its Fourier transform with the phases turned. Parts
/// of it are computed with neighbouring samples on both sides, as far as there are.
template <class Sample>
class delayed_reference {
 public:
  /// The longest record that is delayed; as it is, it may be of any length.
  static constexpr std::size_t longest = std::size_t{1} << 18;

  explicit delayed_reference(std::span<const Sample> reference) noexcept : reference_(reference) {}

  /// Takes another record in the place of this one.
  void renew(std::span<const Sample> reference) noexcept {
    reference_ = reference;
    window_ = {0, 0};
    shifted_ = std::numeric_limits<double>::quiet_NaN();
  }
  /// Makes the room for delayed records of that length. Throws std::bad_alloc, dfti_failure.
  void prepare(std::size_t points);

  /// Samples that interpolation does not know well at the ends of a record.
  static std::size_t guard(std::size_t n) noexcept { return std::min<std::size_t>(32, n / 8); }
  /// Where the delayed record is known.
  [[nodiscard]] stretch known(double delay) const noexcept;

  /// Calls visit(first, values, slopes) with values[k] = x(first + k - delay) and, if asked for, their derivatives by
  /// the delay, piece by piece over a stretch. Without a delay and slopes these are the samples. Throws
  /// std::bad_alloc, dfti_failure where there is no room yet.
  template <class Visit>
  void walk(const stretch &part, double delay, slopes wanted, Visit visit) {
    using values = std::span<const std::complex<double>>;
    if (part.first >= part.last) return;
    if (delay == 0 && wanted == slopes::left_out) {
      constexpr std::size_t piece = 4096;
      std::array<std::complex<double>, piece> room;
      for (std::size_t first = part.first; first < part.last; first += piece) {
        const std::size_t count = std::min(part.last - first, piece);
        std::copy_n(reference_.data() + first, count, room.data());
        visit(first, values(room.data(), count), values());
      }
      return;
    }
    load(part);
    if (wanted == slopes::computed || delay != shifted_) shift(delay, wanted);
    const std::size_t inside = part.first - window_.first;
    visit(part.first, values(delayed_.data() + inside, part.count()),
          wanted == slopes::computed ? values(slopes_.data() + inside, part.count()) : values());
  }

 private:
  using buffer = qsrfhs::aligned_buffer<std::complex<double>>;

  static constexpr std::size_t margin = 8192;  // samples around a part: the longest delay, and where ends still show

  /// The spectrum of a part with its margins, unless it is there.
  void load(const stretch &part);
  /// Computes delayed_, and slopes_ if asked for, of the window.
  void shift(double delay, slopes wanted);

  std::span<const Sample> reference_;
  stretch window_{0, 0};
  double shifted_ = std::numeric_limits<double>::quiet_NaN();  // the delay by which delayed_ is
  std::unique_ptr<block_transform<std::complex<double>>> transform_;
  buffer spectrum_, turned_, delayed_, slopes_;
};

}  // namespace dsp
