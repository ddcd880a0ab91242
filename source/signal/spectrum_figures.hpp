// Powers of bands of a power spectrum. SPDX-License-Identifier: MIT
#pragma once

#include <cmath>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>

namespace dsp {

/// The bins of a power spectrum and where they are. Positions are in bins, bin k at k.
struct spectrum_view {
  std::span<const double> power;  // `points` bins of two sides, or points / 2 + 1 of one
  bool one_sided;
  std::uint64_t points;
  double rate, centre, noise_bandwidth;  // hertz, hertz, bins

  [[nodiscard]] double spacing() const noexcept { return rate / static_cast<double>(points); }
  /// The bin of the centre frequency.
  [[nodiscard]] std::uint64_t middle() const noexcept { return one_sided ? 0 : points / 2; }
  [[nodiscard]] double position(double hertz) const noexcept {
    return static_cast<double>(middle()) + (hertz - centre) / spacing();
  }
  [[nodiscard]] double frequency(double position) const noexcept {
    return centre + (position - static_cast<double>(middle())) * spacing();
  }

  /// Where the band of all frequencies begins and ends.
  [[nodiscard]] double begin() const noexcept { return one_sided || points % 2 == 0 ? 0.0 : -0.5; }
  [[nodiscard]] double end() const noexcept { return begin() + static_cast<double>(points) / (one_sided ? 2 : 1); }

  /// The bin that stands for any integer position up to N beyond the ends: spectra repeat, those of real samples are
  /// mirrored, too.
  [[nodiscard]] std::size_t bin(std::int64_t position) const noexcept {
    const auto n = static_cast<std::int64_t>(points), wrapped = position < 0 ? position + n : position % n;
    return static_cast<std::size_t>(one_sided && wrapped > n / 2 ? n - wrapped : wrapped);
  }
  /// Whether a bin is its own mirror, so that half of it is outside of the band and it holds one side's power.
  [[nodiscard]] bool is_mirror(std::size_t bin) const noexcept {
    return one_sided && (bin == 0 || 2 * std::uint64_t{bin} == points);
  }
  /// Power per bin width at an integer position, on the scale of bins that hold the power of both sides.
  [[nodiscard]] double density(std::int64_t position) const noexcept {
    const std::size_t k = bin(position);
    return is_mirror(k) ? 2 * power[k] : power[k];
  }
};

/// The sum in pairs.
[[nodiscard]] double sum(std::span<const double> values) noexcept;

/// Power of a channel in hertz; nothing where it reaches beyond the bins.
[[nodiscard]] std::optional<double> channel_power(const spectrum_view &spectrum, double centre,
                                                  double bandwidth) noexcept;

struct frequency_range {
  double low, high;
};

/// The frequencies that leave (1 - fraction) / 2 of the power below and above; NaN without power.
[[nodiscard]] frequency_range occupied_bandwidth(const spectrum_view &spectrum, double fraction) noexcept;

}  // namespace dsp
