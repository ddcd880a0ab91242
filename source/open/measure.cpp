// SPDX-License-Identifier: MIT
#include <lumra/measure.h>

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <limits>
#include <optional>
#include <span>
#include <vector>

#include "open/door.hpp"
#include "signal/main_lobe.hpp"
#include "signal/spectrum_figures.hpp"
#include "signal/spectrum_peaks.hpp"
#include "signal/tone.hpp"

namespace doors {
namespace {

constexpr double largest_hertz = 1e100;  // so that no position in bins overflows

void require_hertz(double value, std::string_view name) {
  require(std::abs(value) <= largest_hertz, LUMRA_OUT_OF_RANGE, name, " is ", value,
          "; it is a frequency in hertz, to 1e100 of either sign");
}

void require_width(double value, std::string_view name) {
  require(value > 0 && value <= largest_hertz, LUMRA_OUT_OF_RANGE, name, " is ", value,
          "; it is above 0, to 1e100 hertz");
}

void require_not_negative(double value, std::string_view name) {
  require(value >= 0 && std::isfinite(value), LUMRA_OUT_OF_RANGE, name, " is ", value, "; it is 0 or more");
}

struct described_spectrum {
  dsp::spectrum_view view;
  dsp::window_shape window;
};

described_spectrum read_spectrum(const double *power, std::uint64_t bins, const lumra_spectrum_info *info) {
  require_present(info, "info");
  const auto read = read_options(info, lumra_spectrum_info{}, "info");
  require(read.sides == 1 || read.sides == 2, LUMRA_UNKNOWN_CHOICE, "info->sides is ", read.sides,
          "; it is 2 for complex samples, 1 for real ones");
  constexpr std::uint64_t fewest = 16, most = std::uint64_t{1} << 27;
  require(read.points >= fewest && read.points <= most, LUMRA_OUT_OF_RANGE, "info->points is ", read.points,
          "; it is 16 to 2^27");
  require(read.sample_rate_hz >= 1 / largest_hertz && read.sample_rate_hz <= largest_hertz, LUMRA_OUT_OF_RANGE,
          "info->sample_rate_hz is ", read.sample_rate_hz, "; it is 1e-100 to 1e100");
  require_hertz(read.centre_hz, "info->centre_hz");
  require(read.noise_bandwidth_bins > 0 && std::isfinite(read.noise_bandwidth_bins), LUMRA_OUT_OF_RANGE,
          "info->noise_bandwidth_bins is ", read.noise_bandwidth_bins, "; it is above 0, 1 for a rectangular window");
  const std::uint64_t expected = read.sides == 2 ? read.points : read.points / 2 + 1;
  require(bins == expected, LUMRA_OUT_OF_RANGE, "bins is ", bins, "; a spectrum of ", read.points, " points and ",
          read.sides, " sides has ", expected);
  const auto values = array(power, bins, "power");
  return {{values, read.sides == 1, read.points, read.sample_rate_hz, read.centre_hz, read.noise_bandwidth_bins},
          {read.window, read.window_parameter}};
}

dsp::main_lobe read_lobe(const described_spectrum &spectrum) {
  const auto &[type, parameter] = spectrum.window;
  require(dsp::is_window(type), LUMRA_UNKNOWN_CHOICE, "info->window is ", type,
          ", which is no window; enum lumra_window_type names them");
  const bool in_range = parameter >= 0 && parameter <= dsp::largest_kaiser_beta;
  require(type != LUMRA_WINDOW_KAISER || in_range, LUMRA_OUT_OF_RANGE, "info->window_parameter is ", parameter,
          "; a Kaiser window's is 0 to ", dsp::largest_kaiser_beta);
  return {spectrum.window, spectrum.view.points};
}

double main_channel(const dsp::spectrum_view &spectrum, double centre_hz, double bandwidth_hz) {
  require_hertz(centre_hz, "centre_hz");
  require_width(bandwidth_hz, "bandwidth_hz");
  const auto power = dsp::channel_power(spectrum, centre_hz, bandwidth_hz);
  require(power.has_value(), LUMRA_OUT_OF_RANGE, "the channel of ", bandwidth_hz, " Hz around ", centre_hz,
          " Hz reaches beyond the band, ", spectrum.frequency(spectrum.begin()), " Hz to ",
          spectrum.frequency(spectrum.end()), " Hz");
  return *power;
}

double decibels(double ratio) noexcept {
  return 10 * std::log10(ratio);
}

dsp::peak_search read_search(const lumra_find_peaks_options *options, const dsp::spectrum_view &spectrum,
                             std::uint64_t most) {
  const auto read = read_options(options, lumra_find_peaks_options LUMRA_FIND_PEAKS_OPTIONS);
  require(read.reserved == 0, LUMRA_OUT_OF_RANGE, "options->reserved is ", read.reserved, "; it is 0");
  require_not_negative(read.threshold, "options->threshold");
  require_not_negative(read.distance_hz, "options->distance_hz");
  require_not_negative(read.span_hz, "options->span_hz");
  const std::uint64_t bins = spectrum.power.size();
  const double apart = std::ceil(read.distance_hz / spectrum.spacing() * (1 - 1e-12));
  dsp::peak_search search{read.threshold, 1, 0, bins, most};
  if (apart > 1) search.apart = apart < static_cast<double>(bins) ? static_cast<std::uint64_t>(apart) : bins;
  if (read.span_hz == 0) return search;
  require_hertz(read.centre_hz, "options->centre_hz");
  const double half = read.span_hz / spectrum.spacing() / 2 * (1 + 1e-12), middle = spectrum.position(read.centre_hz);
  const auto end = static_cast<double>(bins);
  search.first = static_cast<std::uint64_t>(std::clamp(std::ceil(middle - half), 0.0, end));
  search.end = static_cast<std::uint64_t>(std::clamp(std::floor(middle + half) + 1, 0.0, end));
  return search;
}

}  // namespace
}  // namespace doors

using namespace doors;

lumra_status lumra_channel_power(const double *power, uint64_t bins, const lumra_spectrum_info *info, double centre_hz,
                                 double bandwidth_hz, double *channel_power) {
  return enter(__func__, [&] {
    const auto spectrum = read_spectrum(power, bins, info);
    const double found = main_channel(spectrum.view, centre_hz, bandwidth_hz);
    require_present(channel_power, "channel_power");
    *channel_power = found;
  });
}

lumra_status lumra_occupied_bandwidth(const double *power, uint64_t bins, const lumra_spectrum_info *info,
                                      double fraction, double *low_hz, double *high_hz) {
  return enter(__func__, [&] {
    const auto spectrum = read_spectrum(power, bins, info);
    require(fraction > 0 && fraction <= 1, LUMRA_OUT_OF_RANGE, "fraction is ", fraction, "; it is above 0, to 1");
    require_present(low_hz, "low_hz");
    require_present(high_hz, "high_hz");
    const auto band = dsp::occupied_bandwidth(spectrum.view, fraction);
    *low_hz = band.low;
    *high_hz = band.high;
  });
}

lumra_status lumra_adjacent_power(const double *power, uint64_t bins, const lumra_spectrum_info *info, double centre_hz,
                                  double bandwidth_hz, double adjacent_bandwidth_hz, const double *offsets_hz,
                                  uint64_t count, lumra_adjacent *adjacent) {
  return enter(__func__, [&] {
    const auto spectrum = read_spectrum(power, bins, info);
    const double main = main_channel(spectrum.view, centre_hz, bandwidth_hz);
    const double width = adjacent_bandwidth_hz == 0 ? bandwidth_hz : adjacent_bandwidth_hz;
    require_width(width, "adjacent_bandwidth_hz");
    const auto offsets = array(offsets_hz, count, "offsets_hz");
    const auto out = array(adjacent, count, "adjacent");
    require_apart(out, "adjacent", offsets, "offsets_hz");
    require_apart(out, "adjacent", spectrum.view.power, "power");
    for (const double offset : offsets) require_width(offset, "an offset of offsets_hz");
    const auto relative = [&](double centre) {
      const auto found = dsp::channel_power(spectrum.view, centre, width);
      return found ? decibels(*found / main) : std::numeric_limits<double>::quiet_NaN();
    };
    for (std::size_t k = 0; k < out.size(); ++k)
      out[k] = {relative(centre_hz - offsets[k]), relative(centre_hz + offsets[k])};
  });
}

lumra_status lumra_find_peaks(const double *power, uint64_t bins, const lumra_spectrum_info *info,
                              const lumra_find_peaks_options *options, lumra_peak *peaks, uint64_t room,
                              uint64_t *count) {
  return enter(__func__, [&] {
    const auto spectrum = read_spectrum(power, bins, info);
    const auto lobe = read_lobe(spectrum);
    const auto search = read_search(options, spectrum.view, room);
    const auto out = array(peaks, room, "peaks");
    require_apart(out, "peaks", spectrum.view.power, "power");
    require_present(count, "count");
    const auto found = dsp::find_peaks(spectrum.view, lobe, search);
    std::transform(found.begin(), found.end(), out.begin(), [&](const dsp::peak &p) {
      return lumra_peak{spectrum.view.frequency(p.position), p.power};
    });
    *count = found.size();
  });
}

lumra_status lumra_tone(const double *power, uint64_t bins, const lumra_spectrum_info *info,
                        const lumra_tone_options *options, lumra_tone_figures *figures, lumra_harmonic *harmonics,
                        uint64_t room) {
  return enter(__func__, [&] {
    const auto spectrum = read_spectrum(power, bins, info);
    const auto lobe = read_lobe(spectrum);
    const auto read = read_options(options, lumra_tone_options LUMRA_TONE_OPTIONS);
    constexpr std::uint32_t most = 1000;
    require(read.harmonics >= 1 && read.harmonics <= most, LUMRA_OUT_OF_RANGE, "options->harmonics is ", read.harmonics,
            "; the highest order is 1 to ", most);
    require(read.choice == LUMRA_TONE_STRONGEST || read.choice == LUMRA_TONE_NEAREST, LUMRA_UNKNOWN_CHOICE,
            "options->choice is ", read.choice, "; it is LUMRA_TONE_STRONGEST or LUMRA_TONE_NEAREST");
    require(read.reserved == 0, LUMRA_OUT_OF_RANGE, "options->reserved is ", read.reserved, "; it is 0");
    std::optional<double> near;
    if (read.choice == LUMRA_TONE_NEAREST) {
      require_hertz(read.near_hz, "options->near_hz");
      const double position = spectrum.view.position(read.near_hz);
      require(position >= -0.5 && position <= spectrum.view.end(), LUMRA_OUT_OF_RANGE, "options->near_hz is ",
              read.near_hz, " Hz, beyond the band, ", spectrum.view.frequency(spectrum.view.begin()), " Hz to ",
              spectrum.view.frequency(spectrum.view.end()), " Hz");
      near = read.near_hz;
    }
    require_present(figures, "figures");
    const std::uint64_t orders = harmonics ? read.harmonics - 1 : 0;
    require(room >= orders, LUMRA_TOO_LITTLE_ROOM, "room is ", room, "; the harmonics to order ", read.harmonics,
            " take ", orders);
    const auto out = array(harmonics, orders, "harmonics");
    require_apart(out, "harmonics", spectrum.view.power, "power");

    std::vector<dsp::harmonic> measured(read.harmonics - 1);
    const auto tone = dsp::measure_tone(spectrum.view, lobe, near, measured);
    const double sinad = decibels(tone.carrier / tone.noise_and_distortion);
    *figures = {tone.frequency,
                tone.carrier,
                decibels(tone.carrier / tone.noise),
                sinad,
                decibels(tone.harmonics / tone.carrier),
                decibels(tone.carrier / tone.spur),
                tone.spur_frequency,
                decibels(tone.image / tone.carrier),
                decibels(tone.dc / tone.carrier),
                (sinad - 1.76) / 6.02};
    std::transform(measured.begin(), measured.begin() + static_cast<std::ptrdiff_t>(orders), out.begin(),
                   [&](const dsp::harmonic &h) {
                     return lumra_harmonic{h.frequency, decibels(h.power / tone.carrier)};
                   });
  });
}
