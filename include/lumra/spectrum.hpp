// Averaged power spectra over spans. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/spectrum.h>
#include <lumra/object.hpp>

#include <cstddef>
#include <cstdint>
#include <span>
#include <utility>
#include <vector>

namespace lumra {

/// How spectra are averaged; see spectrum.h.
struct spectrum_settings {
  double sample_rate_hz = 1, centre_hz = 0;
  std::uint64_t points = 4096;
  std::int32_t window = LUMRA_WINDOW_SESSION_FLAT_TOP;
  double window_parameter = 0;
  double overlap = 0.5;
  bool hold = false;
  std::uint32_t threads = 0;
  std::uint64_t start = 0, origin = 0;
};

/// Powers in ascending frequency, and what the bins stand for.
struct averaged_spectrum {
  lumra_spectrum_info info{};
  std::vector<double> power;
  std::vector<double> maximum, minimum;  // empty where they were not held

  [[nodiscard]] double frequency(std::size_t bin) const noexcept {
    return info.first_hz + info.spacing_hz * static_cast<double>(bin);
  }
};

/// The averaged spectrum of one stretch of a stream of T. One thread at a time.
template <sample T>
class spectrum_average {
 public:
  explicit spectrum_average(const spectrum_settings &settings = {})
      : average_(detail::make<owned>([&](lumra_spectrum_average **out) {
          lumra_spectrum_options options = LUMRA_SPECTRUM_OPTIONS;
          options.type = detail::type_code<T>;
          options.sample_rate_hz = settings.sample_rate_hz;
          options.centre_hz = settings.centre_hz;
          options.points = settings.points;
          options.window = settings.window;
          options.hold = settings.hold ? LUMRA_HOLD_EXTREMES : LUMRA_HOLD_NONE;
          options.window_parameter = settings.window_parameter;
          options.overlap = settings.overlap;
          options.threads = settings.threads;
          options.start = settings.start;
          options.origin = settings.origin;
          return lumra_spectrum_create(&options, out);
        })) {}

  spectrum_average &add(std::span<const T> x) {
    check_open(lumra_spectrum_add(average_.get(), x.data(), x.size()));
    return *this;
  }
  spectrum_average &gap() {
    check_open(lumra_spectrum_gap(average_.get()));
    return *this;
  }
  spectrum_average &merge(const spectrum_average &next) {
    check_open(lumra_spectrum_merge(average_.get(), next.average_.get()));
    return *this;
  }
  void clear() { check_open(lumra_spectrum_clear(average_.get())); }

  [[nodiscard]] lumra_spectrum_extent where() const {
    lumra_spectrum_extent extent{};
    check_open(lumra_spectrum_where(average_.get(), &extent));
    return extent;
  }
  [[nodiscard]] averaged_spectrum read() const {
    averaged_spectrum result;
    const std::size_t bins = static_cast<std::size_t>(where().bins);
    result.power.resize(bins);
    const bool held = options().hold == LUMRA_HOLD_EXTREMES;
    if (held) result.maximum.resize(bins), result.minimum.resize(bins);
    result.info.size = sizeof result.info;
    check_open(lumra_spectrum_read(average_.get(), &result.info, result.power.data(),
                                   held ? result.maximum.data() : nullptr, held ? result.minimum.data() : nullptr,
                                   bins));
    return result;
  }

  [[nodiscard]] std::vector<std::byte> save() const {
    return detail::save(average_.get(), lumra_spectrum_state_size, lumra_spectrum_save);
  }
  /// What save() gave for the same type of samples.
  [[nodiscard]] static spectrum_average load(std::span<const std::byte> state, std::uint32_t threads = 0) {
    spectrum_average loaded(detail::make<owned>(
        [&](lumra_spectrum_average **out) { return lumra_spectrum_load(state.data(), state.size(), threads, out); }));
    if (loaded.options().type != detail::type_code<T>)
      throw error(status(LUMRA_WRONG_TYPE), "the spectrum was saved for another type of samples");
    return loaded;
  }

  [[nodiscard]] lumra_spectrum_options options() const {
    lumra_spectrum_options options = LUMRA_SPECTRUM_OPTIONS;
    check_open(lumra_spectrum_get_options(average_.get(), &options));
    return options;
  }

 private:
  using owned = detail::owned<lumra_spectrum_average, &lumra_spectrum_free>;
  explicit spectrum_average(owned average) : average_(std::move(average)) {}

  owned average_;
};

}  // namespace lumra
