// Figures of power spectra. SPDX-License-Identifier: MIT
#include <cstring>
#include <lumra/measure.hpp>

#include "arrays.hpp"
#include "module.hpp"
#include "windows.hpp"

namespace binding {
namespace {

/// Powers in double precision and what they stand for.
class measured {
 public:
  measured(py::handle power_given, std::int32_t sides, std::uint64_t points, double sample_rate, double frequency,
           double enbw, py::handle window) {
    samples given(numbers(power_given, "power"), element::f64);
    power.resize(given.size());
    gather(given.first<double>(), given.step(), power.data(), power.size());
    const lumra::window_shape shape = window_of(window);
    info.size = sizeof info;
    info.sides = sides;
    info.points = points;
    info.sample_rate_hz = sample_rate;
    info.centre_hz = frequency;
    info.noise_bandwidth_bins = enbw;
    info.window = shape.type;
    info.window_parameter = shape.parameter;
  }

  std::vector<double> power;
  lumra_spectrum_info info{};
};

/// What find() gives for a channel; a refusal that tells of the channel as a whole gets its arguments' names.
template <class Find>
auto of_channel(py::handle center, py::handle bandwidth, Find find) {
  const double middle = number(center, "center"), width = number(bandwidth, "bandwidth");
  try {
    return find(middle, width);
  } catch (const lumra::error &refused) {
    const std::string_view sentence = refused.what();
    const auto channel = sentence.find(": the ");
    if (channel == std::string_view::npos) throw;
    throw py::value_error("center is " + std::string(py::repr(py::float_(middle))) + ", bandwidth is " +
                          std::string(py::repr(py::float_(width))) + std::string(sentence.substr(channel)));
  }
}

double channel_power(const measured &of, py::handle center, py::handle bandwidth) {
  return of_channel(center, bandwidth, [&](double middle, double width) {
    return lumra::channel_power(of.power, of.info, middle, width);
  });
}

py::tuple occupied_bandwidth(const measured &of, py::handle fraction) {
  const lumra::frequency_band band = lumra::occupied_bandwidth(of.power, of.info, number(fraction, "fraction"));
  return py::make_tuple(band.low_hz, band.high_hz);
}

/// Pairs of levels below and above.
py::list adjacent_power(const measured &of, py::handle center, py::handle bandwidth, py::handle offsets_given,
                        py::handle adjacent_bandwidth) {
  const samples offsets(numbers(offsets_given, "offsets"), element::f64);
  std::vector<double> distances(offsets.size());
  gather(offsets.first<double>(), offsets.step(), distances.data(), distances.size());
  double width = 0;
  if (!adjacent_bandwidth.is_none()) {
    width = number(adjacent_bandwidth, "adjacent_bandwidth");
    if (!(width > 0)) refuse_value("adjacent_bandwidth", text_of(adjacent_bandwidth), "give hertz above 0, or None");
  }
  py::list found;
  const auto levels = of_channel(center, bandwidth, [&](double middle, double main_width) {
    return lumra::adjacent_power(of.power, of.info, middle, main_width, distances, width);
  });
  for (std::size_t i = 0; i < levels.size(); ++i)
    found.append(py::make_tuple(distances[i], levels[i].lower_dbc, levels[i].upper_dbc));
  return found;
}

/// Pairs of frequency and power.
py::list peaks(const measured &of, py::handle count, py::handle threshold, py::handle distance) {
  lumra_find_peaks_options options = LUMRA_FIND_PEAKS_OPTIONS;
  if (!threshold.is_none()) options.threshold = number(threshold, "threshold");
  if (!distance.is_none()) options.distance_hz = number(distance, "distance");
  py::list found;
  for (const lumra::peak &each :
       lumra::find_peaks(of.power, of.info, static_cast<std::size_t>(whole_number(count, "count", 0)), options))
    found.append(py::make_tuple(each.frequency_hz, each.power));
  return found;
}

/// The figures, then pairs of frequency and level for each harmonic.
py::tuple tone(const measured &of, py::handle frequency, py::handle harmonics) {
  std::optional<double> near;
  if (!frequency.is_none()) near = number(frequency, "frequency");
  constexpr std::int64_t highest = 1000;
  const std::int64_t order = whole_number(harmonics, "harmonics", 1);
  if (order > highest) refuse_value("harmonics", text_of(harmonics), "give the highest order, 1 to 1000");
  const lumra::tone_figures found = lumra::measure_tone(of.power, of.info, near, static_cast<std::uint32_t>(order));
  py::list levels;
  for (const lumra::harmonic &each : found.harmonics) levels.append(py::make_tuple(each.frequency_hz, each.level_dbc));
  return py::make_tuple(found.frequency_hz, found.power, found.snr_db, found.sinad_db, found.thd_db, found.sfdr_db,
                        found.image_db, found.dc_db, found.enob, levels);
}

}  // namespace

void add_figures(py::module_ &module) {
  py::class_<measured>(module, "Figures")
      .def(py::init<py::handle, std::int32_t, std::uint64_t, double, double, double, py::handle>())
      .def("channel_power", &channel_power)
      .def("occupied_bandwidth", &occupied_bandwidth)
      .def("adjacent_power", &adjacent_power)
      .def("peaks", &peaks)
      .def("tone", &tone);
}

}  // namespace binding
