// Fourier transforms over spans. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/transform.h>
#include <lumra/object.hpp>

#include <cstddef>
#include <cstdint>
#include <span>
#include <type_traits>
#include <vector>

namespace lumra {

enum class scaling : std::int32_t {
  backward = LUMRA_FFT_SCALE_BACKWARD,
  forward = LUMRA_FFT_SCALE_FORWARD,
  both = LUMRA_FFT_SCALE_BOTH,
  none = LUMRA_FFT_UNSCALED
};

/// Transforms between records of T and their spectra, which are half as long where T is real; see transform.h. One
/// thread at a time.
template <sample T>
class fourier_transform {
 public:
  using bin = complex_type<T>;

  explicit fourier_transform(std::size_t points, scaling factors = scaling::backward)
      : points_(points), transform_(detail::make<owned>([&](lumra_fft **out) {
          lumra_fft_options how = LUMRA_FFT_OPTIONS;
          how.type = detail::type_code<T>;
          how.points = points;
          how.scaling = static_cast<std::int32_t>(factors);
          return lumra_fft_create(&how, out);
        })) {}

  [[nodiscard]] std::size_t points() const noexcept { return points_; }
  [[nodiscard]] std::size_t bins() const noexcept { return std::is_same_v<T, bin> ? points_ : points_ / 2 + 1; }

  /// Whole rows: a multiple of points() samples, and as many times bins() bins. For complex T both may be one span.
  void forward(std::span<const T> records, std::span<bin> spectra) {
    check_open(lumra_fft_forward(transform_.get(), records.data(), spectra.data(), rows(records.size(), spectra.size()),
                                 nullptr));
  }
  void backward(std::span<const bin> spectra, std::span<T> records) {
    check_open(lumra_fft_backward(transform_.get(), spectra.data(), records.data(),
                                  rows(records.size(), spectra.size()), nullptr));
  }
  [[nodiscard]] std::vector<bin> forward(std::span<const T> records) {
    std::vector<bin> spectra(records.size() / points_ * bins());
    forward(records, spectra);
    return spectra;
  }
  [[nodiscard]] std::vector<T> backward(std::span<const bin> spectra) {
    std::vector<T> records(spectra.size() / bins() * points_);
    backward(spectra, records);
    return records;
  }

 private:
  using owned = detail::owned<lumra_fft, &lumra_fft_free>;

  [[nodiscard]] std::size_t rows(std::size_t samples, std::size_t bins_in_all) const {
    const std::size_t count = samples / points_;
    if (samples % points_ != 0 || bins_in_all != count * bins())
      throw error(status(LUMRA_OUT_OF_RANGE), "records and spectra are not as many whole rows");
    return count;
  }

  std::size_t points_;
  owned transform_;
};

}  // namespace lumra
