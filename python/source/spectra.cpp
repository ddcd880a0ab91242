// Averaged power spectra. SPDX-License-Identifier: MIT
#include <lumra/spectrum.hpp>

#include "accumulators.hpp"
#include "module.hpp"
#include "windows.hpp"

namespace binding {
namespace {

struct spectral {
  using object = lumra_spectrum_average;
  using owned = lumra::detail::owned<lumra_spectrum_average, &lumra_spectrum_free>;
  static constexpr auto add = &lumra_spectrum_add;
  static constexpr auto merge = &lumra_spectrum_merge;
  static constexpr auto state_size = &lumra_spectrum_state_size;
  static constexpr auto save = &lumra_spectrum_save;

  static lumra_spectrum_extent where(const object *of) {
    lumra_spectrum_extent extent{};
    lumra::check_open(lumra_spectrum_where(of, &extent));
    return extent;
  }
  static lumra_spectrum_options options_of(const object *of) {
    lumra_spectrum_options options = LUMRA_SPECTRUM_OPTIONS;
    lumra::check_open(lumra_spectrum_get_options(of, &options));
    return options;
  }
  static element type_of(const object *of) { return static_cast<element>(options_of(of).type); }

  [[nodiscard]] element usual() const noexcept { return binding::of(!real, true); }
  [[nodiscard]] element type_for(element block) const noexcept { return binding::of(!real, is_single(block)); }
  [[nodiscard]] std::size_t piece() const noexcept {
    return static_cast<std::size_t>(std::clamp<std::uint64_t>(32 * options.points, 1U << 20U, 1U << 25U));
  }
  [[nodiscard]] owned make(element type, std::uint64_t first, std::uint64_t from) const {
    lumra_spectrum_options how = options;
    how.type = static_cast<std::int32_t>(type);
    how.start = first;
    how.origin = from;
    return lumra::detail::make<owned>([&](object **out) { return lumra_spectrum_create(&how, out); });
  }
  [[nodiscard]] owned load(std::string_view bytes) const {
    return lumra::detail::make<owned>(
        [&](object **out) { return lumra_spectrum_load(bytes.data(), bytes.size(), options.threads, out); });
  }
  void adopt(const object *loaded) {
    options = options_of(loaded);
    real = !is_complex(static_cast<element>(options.type));
  }

  lumra_spectrum_options options = LUMRA_SPECTRUM_OPTIONS;
  bool real = false;
  std::uint64_t start = 0, origin = 0;
};

using average = accumulator<spectral>;

std::unique_ptr<average> make(py::handle sample_rate, py::handle nfft, py::handle window, py::handle overlap, bool hold,
                              py::handle frequency, py::handle start, py::handle origin, bool real,
                              py::handle threads) {
  spectral kind;
  kind.options.sample_rate_hz = number(sample_rate, "sample_rate");
  kind.options.points = static_cast<std::uint64_t>(whole_number(nfft, "nfft", 0));
  const lumra::window_shape shape = window_of(window);
  kind.options.window = shape.type;
  kind.options.window_parameter = shape.parameter;
  kind.options.overlap = number(overlap, "overlap");
  kind.options.hold = hold ? LUMRA_HOLD_EXTREMES : LUMRA_HOLD_NONE;
  kind.options.centre_hz = number(frequency, "frequency");
  kind.start = static_cast<std::uint64_t>(whole_number(start, "start", 0));
  kind.origin = static_cast<std::uint64_t>(whole_number(origin, "origin", 0));
  kind.options.threads = number_of_threads(threads);
  kind.real = real;
  const py::gil_scoped_release released;
  return std::make_unique<average>(kind);
}

/// power, maximum, minimum (both None where they were not held), sides, segments, noise bandwidth in bins.
py::tuple read(average &of) {
  const auto bins = static_cast<std::size_t>(of.where().bins);
  const bool held =
      of.with_object([](const auto *object) { return spectral::options_of(object).hold; }) == LUMRA_HOLD_EXTREMES;
  py::array power = new_array(element::f64, bins);
  py::object maximum = py::none(), minimum = py::none();
  double *to[3] = {static_cast<double *>(power.mutable_data()), nullptr, nullptr};
  if (held) {
    py::array highest = new_array(element::f64, bins), lowest = new_array(element::f64, bins);
    to[1] = static_cast<double *>(highest.mutable_data());
    to[2] = static_cast<double *>(lowest.mutable_data());
    maximum = std::move(highest);
    minimum = std::move(lowest);
  }
  lumra_spectrum_info info{};
  info.size = sizeof info;
  of.with_object(
      [&](const auto *object) { lumra::check_open(lumra_spectrum_read(object, &info, to[0], to[1], to[2], bins)); });
  return py::make_tuple(power, maximum, minimum, info.sides, info.segments, info.noise_bandwidth_bins);
}

}  // namespace

void add_spectra(py::module_ &module) {
  py::class_<average>(module, "Average")
      .def(py::init(&make))
      .def("add", &average::add)
      .def("add_recording", &average::add_recording)
      .def("merge", &average::merge)
      .def("gap",
           [](average &of) { of.with_object([](auto *object) { lumra::check_open(lumra_spectrum_gap(object)); }); })
      .def("clear",
           [](average &of) { of.with_object([](auto *object) { lumra::check_open(lumra_spectrum_clear(object)); }); })
      .def("read", &read)
      .def("save", &average::save)
      .def("load", &average::load)
      .def("where", [](average &of) {
        const auto extent = of.where();
        return py::make_tuple(extent.start, extent.samples, extent.segments);
      });
}

}  // namespace binding
