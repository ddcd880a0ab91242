// SPDX-License-Identifier: MIT
#include <lumra/spectrum.h>

#include <cmath>
#include <complex>
#include <cstdint>
#include <memory>
#include <span>
#include <type_traits>
#include <variant>

#include "open/door.hpp"
#include "open/element.hpp"
#include "open/handle.hpp"
#include "open/option_checks.hpp"
#include "open/result.hpp"
#include "open/state.hpp"
#include "signal/spectrum_average.hpp"

namespace doors {
namespace {

struct spectrum_object {
  std::variant<dsp::spectrum_average<float>, dsp::spectrum_average<double>, dsp::spectrum_average<std::complex<float>>,
               dsp::spectrum_average<std::complex<double>>>
      average;
  lumra_spectrum_options options;

  template <class Sample>
  spectrum_object(element<Sample>, const dsp::spectrum_settings &settings, const lumra_spectrum_options &made_from)
      : average(std::in_place_type<dsp::spectrum_average<Sample>>, settings), options(made_from) {}
};
using spectra = handles<lumra_spectrum_average, spectrum_object>;

constexpr state_kind saved_spectrum{{'a', 'v', 'g'}, 3};
constexpr std::uint64_t fewest_points = 16;

dsp::spectrum_settings checked_settings(const lumra_spectrum_options &options) {
  require_type(options.type);
  require_rate(options.sample_rate_hz, "options->sample_rate_hz");
  require(std::isfinite(options.centre_hz), LUMRA_OUT_OF_RANGE, "options->centre_hz is ", options.centre_hz,
          "; it is a number");
  require(options.points >= fewest_points && options.points <= dsp::most_fft_points, LUMRA_OUT_OF_RANGE,
          "options->points is ", options.points, "; it is ", fewest_points, " to ", dsp::most_fft_points);
  require(dsp::is_window(options.window), LUMRA_UNKNOWN_CHOICE, "options->window is ", options.window,
          "; it is one of enum lumra_window_type");
  require(options.hold == LUMRA_HOLD_NONE || options.hold == LUMRA_HOLD_EXTREMES, LUMRA_UNKNOWN_CHOICE,
          "options->hold is ", options.hold, "; it is one of enum lumra_hold");
  const double parameter = options.window_parameter;
  require(options.window != LUMRA_WINDOW_KAISER || (parameter >= 0 && parameter <= dsp::largest_kaiser_beta),
          LUMRA_OUT_OF_RANGE, "options->window_parameter is ", parameter, "; a Kaiser window's is 0 to ",
          dsp::largest_kaiser_beta);
  require(options.overlap >= 0 && options.overlap < 1, LUMRA_OUT_OF_RANGE, "options->overlap is ", options.overlap,
          "; it is 0 or more, below 1");
  require_threads(options.threads, "options->threads");
  require(options.reserved == 0, LUMRA_OUT_OF_RANGE, "options->reserved is ", options.reserved, "; it is 0");
  require(options.start <= dsp::most_position, LUMRA_OUT_OF_RANGE, "options->start is ", options.start,
          "; it is at most ", dsp::most_position);
  require(options.origin <= options.start, LUMRA_OUT_OF_RANGE, "options->origin is ", options.origin,
          "; it is at most options->start, which is ", options.start);
  const auto points = static_cast<std::size_t>(options.points);
  const auto overlap = static_cast<std::size_t>(options.overlap * static_cast<double>(points));
  return {.points = points,
          .step = points - std::min(overlap, points - 1),
          .window = {options.window, parameter},
          .hold = options.hold == LUMRA_HOLD_NONE ? dsp::extremes::forgotten : dsp::extremes::held,
          .threads = options.threads,
          .start = options.start,
          .origin = options.origin};
}

std::unique_ptr<spectrum_object> make(const lumra_spectrum_options &options) {
  const dsp::spectrum_settings settings = checked_settings(options);
  return with_type(options.type, [&](auto type) { return std::make_unique<spectrum_object>(type, settings, options); });
}

/// The object of a handle; one that a transform left halfway is refused.
spectrum_object &get(const lumra_spectrum_average *handle, std::string_view name) {
  spectrum_object &object = spectra::get(handle, name);
  const bool broken = std::visit([](const auto &average) { return average.broken(); }, object.average);
  require(!broken, LUMRA_TRANSFORM_FAILED, name, " lost a segment when a transform failed; free it");
  return object;
}

template <class Average>
struct sample_of;
template <class Sample>
struct sample_of<dsp::spectrum_average<Sample>> {
  using type = Sample;
};

/// Whether two average the same of the same.
bool alike(const lumra_spectrum_options &a, const lumra_spectrum_options &b) noexcept {
  return a.type == b.type && a.sample_rate_hz == b.sample_rate_hz && a.centre_hz == b.centre_hz &&
         a.points == b.points && a.window == b.window && a.hold == b.hold && a.overlap == b.overlap &&
         (a.window != LUMRA_WINDOW_KAISER || a.window_parameter == b.window_parameter);
}

lumra_spectrum_info info_of(const spectrum_object &object) noexcept {
  const lumra_spectrum_options &options = object.options;
  const auto points = static_cast<double>(options.points);
  const bool two_sided = is_complex(options.type);
  const double spacing = options.sample_rate_hz / points;
  const std::uint64_t below = two_sided ? options.points / 2 : 0;  // bins below the centre
  const double first = options.centre_hz - spacing * static_cast<double>(below);
  return std::visit(
      [&](const auto &average) {
        return lumra_spectrum_info{.size = sizeof(lumra_spectrum_info),
                                   .sides = two_sided ? 2 : 1,
                                   .points = options.points,
                                   .segments = average.segments(),
                                   .sample_rate_hz = options.sample_rate_hz,
                                   .centre_hz = options.centre_hz,
                                   .first_hz = first,
                                   .spacing_hz = spacing,
                                   .noise_bandwidth_bins = average.noise_bandwidth(),
                                   .resolution_bandwidth_hz = average.noise_bandwidth() * spacing,
                                   .window = options.window,
                                   .reserved = 0,
                                   .window_parameter = options.window_parameter};
      },
      object.average);
}

lumra_spectrum_options options_of(const spectrum_object &object) noexcept {
  lumra_spectrum_options options = object.options;
  options.size = sizeof options;
  std::visit([&](const auto &average) { options.start = average.start(), options.origin = average.first_origin(); },
             object.average);
  return options;
}

auto payload_of(const spectrum_object &object) {
  return [&object](state_writer &to) {
    lumra_spectrum_options options = options_of(object);
    options.threads = 0;
    to.add(options);
    std::visit([&](const auto &average) { average.save(to); }, object.average);
  };
}

}  // namespace
}  // namespace doors

using namespace doors;

lumra_status lumra_spectrum_create(const lumra_spectrum_options *options, lumra_spectrum_average **spectrum) {
  return enter(__func__, [&] {
    require_present(spectrum, "spectrum");
    spectra::give(spectrum, make(read_options(options, LUMRA_SPECTRUM_OPTIONS)));
  });
}

lumra_status lumra_spectrum_add(lumra_spectrum_average *spectrum, const void *x, uint64_t n) {
  return enter(__func__, [&] {
    std::visit(
        [&]<class Average>(Average &average) {
          using sample = typename sample_of<Average>::type;
          require(n <= dsp::most_position - average.position(), LUMRA_OUT_OF_RANGE, "n is ", n,
                  ", and the stream is at position ", average.position(), "; a stream ends at ", dsp::most_position);
          average.add(array(static_cast<const sample *>(x), n, "x"));
        },
        get(spectrum, "spectrum").average);
  });
}

lumra_status lumra_spectrum_gap(lumra_spectrum_average *spectrum) {
  return enter(__func__, [&] { std::visit([](auto &average) { average.gap(); }, get(spectrum, "spectrum").average); });
}

lumra_status lumra_spectrum_merge(lumra_spectrum_average *spectrum, const lumra_spectrum_average *next) {
  return enter(__func__, [&] {
    require_present(spectrum, "spectrum");
    require_present(next, "next");
    spectrum_object &object = get(spectrum, "spectrum");
    const spectrum_object &other = get(next, "next");
    require(&object != &other, LUMRA_OVERLAP, "next is spectrum; give its neighbour");
    require(alike(object.options, other.options), LUMRA_WRONG_TYPE,
            "next was made with other options; give one that differs in threads, start and origin alone");
    std::visit(
        [&]<class Average>(Average &average) {
          const auto &behind = std::get<Average>(other.average);
          require(behind.start() == average.position(), LUMRA_OUT_OF_RANGE, "next begins at ", behind.start(),
                  "; spectrum ends at ", average.position(), ", where its neighbour begins");
          require(behind.first_origin() == average.origin() || behind.first_origin() == behind.start(),
                  LUMRA_OUT_OF_RANGE, "segments of next count from ", behind.first_origin(),
                  "; those of spectrum from ", average.origin(), ", or from the border where a gap is there");
          average.merge(behind);
        },
        object.average);
  });
}

lumra_status lumra_spectrum_where(const lumra_spectrum_average *spectrum, lumra_spectrum_extent *extent) {
  return enter(__func__, [&] {
    const spectrum_object &object = spectra::get(spectrum, "spectrum");
    require_present(extent, "extent");
    std::visit(
        [&](const auto &average) {
          *extent = {average.start(), average.position() - average.start(), average.segments(), average.origin(),
                     average.bins()};
        },
        object.average);
  });
}

lumra_status lumra_spectrum_get_options(const lumra_spectrum_average *spectrum, lumra_spectrum_options *options) {
  return enter(__func__, [&] {
    const spectrum_object &object = spectra::get(spectrum, "spectrum");
    require_sized(options, "options");
    give_result(options, options_of(object));
  });
}

lumra_status lumra_spectrum_read(const lumra_spectrum_average *spectrum, lumra_spectrum_info *info, double *power,
                                 double *maximum, double *minimum, uint64_t room) {
  return enter(__func__, [&] {
    const spectrum_object &object = spectra::get(spectrum, "spectrum");
    require_sized(info, "info");
    std::visit(
        [&](const auto &average) {
          require(room >= average.bins(), LUMRA_TOO_LITTLE_ROOM, "room is ", room, " bins; the spectrum has ",
                  std::uint64_t{average.bins()});
          const auto mean = array(power, average.bins(), "power");
          const auto row = [&](double *first) { return std::span(first, first ? average.bins() : 0); };
          const auto highest = row(maximum), lowest = row(minimum);
          require(object.options.hold != LUMRA_HOLD_NONE || (!maximum && !minimum), LUMRA_WRONG_TYPE,
                  "spectrum holds no ", "extremes; give null for maximum and minimum, or set options->hold");
          require_apart(mean, "power", highest, "maximum");
          require_apart(mean, "power", lowest, "minimum");
          require_apart(highest, "maximum", lowest, "minimum");
          require(average.segments() != 0, LUMRA_TOO_FEW_SAMPLES, "spectrum has no whole segment yet; add ",
                  object.options.points, " samples in one run");
          (void)get(spectrum, "spectrum");
          average.read(mean, highest, lowest);
          give_result(info, info_of(object));
        },
        object.average);
  });
}

lumra_status lumra_spectrum_clear(lumra_spectrum_average *spectrum) {
  return enter(__func__,
               [&] { std::visit([](auto &average) { average.clear(); }, get(spectrum, "spectrum").average); });
}

lumra_status lumra_spectrum_state_size(const lumra_spectrum_average *spectrum, uint64_t *size) {
  return enter(__func__, [&] {
    const spectrum_object &object = spectra::get(spectrum, "spectrum");
    require_present(size, "size");
    (void)get(spectrum, "spectrum");
    *size = state_size(payload_of(object));
  });
}

lumra_status lumra_spectrum_save(const lumra_spectrum_average *spectrum, void *bytes, uint64_t room) {
  return enter(__func__, [&] { save_state(saved_spectrum, bytes, room, payload_of(get(spectrum, "spectrum"))); });
}

lumra_status lumra_spectrum_load(const void *bytes, uint64_t size, uint32_t threads,
                                 lumra_spectrum_average **spectrum) {
  return enter(__func__, [&] {
    require_present(spectrum, "spectrum");
    require_threads(threads, "threads");
    state_reader from = open_state(saved_spectrum, bytes, size);
    auto options = from.take<lumra_spectrum_options>();
    options.threads = threads;
    std::unique_ptr<spectrum_object> object;
    try {
      object = make(options);
    } catch (const refusal &reason) {
      refuse(LUMRA_BAD_STATE, "the saved bytes describe no spectrum: ", reason.text());
    }
    const bool whole = std::visit([&](auto &average) { return average.load(from); }, object->average);
    require(whole, LUMRA_BAD_STATE, "the saved bytes describe no place in a stream");
    from.finish();
    spectra::give(spectrum, std::move(object));
  });
}

void lumra_spectrum_free(lumra_spectrum_average *spectrum) {
  spectra::free(spectrum);
}
