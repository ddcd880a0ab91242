// SPDX-License-Identifier: MIT
#include "signal/level.hpp"

#include <lumra/level.h>

#include <cmath>
#include <cstdint>
#include <memory>
#include <span>
#include <utility>
#include <variant>

#include "open/door.hpp"
#include "open/element.hpp"
#include "open/handle.hpp"
#include "open/option_checks.hpp"
#include "open/result.hpp"
#include "open/state.hpp"

namespace doors {
namespace {

template <class Sample>
using meter = dsp::level_meter<Sample>;
using any_meter = std::variant<meter<float>, meter<double>, meter<std::complex<float>>, meter<std::complex<double>>>;
using levels = handles<lumra_level, any_meter>;

constexpr state_kind saved_level{"lvl", 1};
constexpr std::uint64_t most_samples = std::uint64_t{1} << 62;

template <class Meter>
struct sample_of;
template <class Sample>
struct sample_of<meter<Sample>> {
  using type = Sample;
};

std::unique_ptr<any_meter> make(std::int32_t type, std::uint64_t start, std::uint32_t threads) {
  return with_type(type, [=](auto element) {
    return std::make_unique<any_meter>(std::in_place_type<meter<typename decltype(element)::value>>, start, threads);
  });
}

std::int32_t type_of(const any_meter &level) noexcept {
  constexpr std::int32_t types[] = {LUMRA_TYPE_F32, LUMRA_TYPE_F64, LUMRA_TYPE_CF32, LUMRA_TYPE_CF64};
  return types[level.index()];
}

std::uint64_t samples_of(const any_meter &level) noexcept {
  return std::visit([](const auto &m) { return m.samples(); }, level);
}

std::uint64_t start_of(const any_meter &level) noexcept {
  return std::visit([](const auto &m) { return m.start(); }, level);
}

void require_room_for(const any_meter &level, std::uint64_t n) {
  const std::uint64_t end = start_of(level) + samples_of(level);
  require(n <= most_samples - end, LUMRA_OUT_OF_RANGE, "the stream stands at ", end, " and would go on by ", n,
          " samples; it ends at 2^62");
}

void require_samples(const any_meter &level) {
  require(samples_of(level) != 0, LUMRA_TOO_FEW_SAMPLES, "the level has no samples; add some first");
}

double decibels(double amplitude) noexcept {
  return 20 * std::log10(amplitude);
}

template <class Meter>
lumra_level_result figures(const Meter &m) {
  const auto mean = m.mean();
  lumra_level_result result{};
  result.samples = m.samples();
  result.power = mean.power;
  result.rms = std::sqrt(mean.power);
  result.peak = std::sqrt(m.peak().power);
  result.peak_index = m.peak().position;
  result.dc_re = mean.dc.real();
  result.dc_im = mean.dc.imag();
  result.rms_db = decibels(result.rms);
  result.peak_db = decibels(result.peak);
  result.crest_db = decibels(result.peak / result.rms);
  return result;
}

void write(state_writer &to, const any_meter &level) {
  to.add(type_of(level));
  to.add(std::int32_t{0});
  std::visit(
      [&to](const auto &m) {
        to.add(m.start());
        to.add(m.samples());
        const auto image = m.save();
        to.add(image.peak.power);
        to.add(image.peak.position);
        for (const dsp::exact_sum::image &sum : image.sums) to.add(sum);
        to.add_all(m.head());
        to.add_all(m.tail());
        std::uint64_t octaves = 0;
        m.powers().visit_octaves([&octaves](std::size_t, auto) { ++octaves; });
        to.add(octaves);
        m.powers().visit_octaves([&to](std::size_t octave, auto counts) {
          to.add(std::uint64_t{octave});
          to.add_all(std::span<const std::uint64_t>(counts));
        });
      },
      level);
}

/// The bins of octaves in ascending order; all samples are in them.
void read_powers(state_reader &from, dsp::power_histogram &powers, std::uint64_t samples) {
  std::uint64_t next = 0, counted = 0;
  for (auto octaves = from.take<std::uint64_t>(); octaves != 0; --octaves) {
    const auto octave = from.take<std::uint64_t>();
    require(octave >= next && octave < dsp::power_histogram::octaves, LUMRA_BAD_STATE,
            "the saved bytes describe no powers");
    next = octave + 1;
    const auto counts = powers.refill(static_cast<std::size_t>(octave));
    from.take_all(std::span<std::uint64_t>(counts));
    for (const std::uint64_t count : counts) {
      require(count <= samples - counted, LUMRA_BAD_STATE, "the saved bytes count more powers than samples");
      counted += count;
    }
  }
  require(counted == samples, LUMRA_BAD_STATE, "the saved bytes count fewer powers than samples");
  from.finish();
}

std::unique_ptr<any_meter> read(state_reader from) {
  const auto type = from.take<std::int32_t>();
  const auto reserved = from.take<std::int32_t>();
  const auto start = from.take<std::uint64_t>(), samples = from.take<std::uint64_t>();
  require(is_type(type) && reserved == 0 && start <= most_samples && samples <= most_samples - start, LUMRA_BAD_STATE,
          "the saved bytes describe no levels");
  auto level = make(type, start, 1);
  std::visit(
      [&](auto &m) {
        typename std::decay_t<decltype(m)>::image image{};
        image.peak.power = from.take<double>();
        image.peak.position = from.take<std::uint64_t>();
        for (dsp::exact_sum::image &sum : image.sums) sum = from.take<dsp::exact_sum::image>();
        require(m.load(samples, image), LUMRA_BAD_STATE, "the saved bytes describe no levels");
        from.take_all(m.head());
        from.take_all(m.tail());
        read_powers(from, m.powers(), samples);
      },
      *level);
  return level;
}

struct ccdf_arrays {
  std::span<const double> above_db;
  std::span<double> share;
};

ccdf_arrays checked_arrays(const double *above_db, double *share, std::uint64_t count) {
  const ccdf_arrays arrays{array(above_db, count, "above_db"), array(share, count, "share")};
  require_apart(arrays.share, "share", arrays.above_db, "above_db");
  return arrays;
}

template <class T>
lumra_status exact_ccdf(const char *function, const T *x, std::uint64_t n, const double *above_db, double *share,
                        std::uint64_t count) noexcept {
  return enter(function, [&] {
    const auto record = array(samples(x), n, "x");
    require(n != 0, LUMRA_TOO_FEW_SAMPLES, "n is 0; give one sample or more");
    const ccdf_arrays arrays = checked_arrays(above_db, share, count);
    require_apart(arrays.share, "share", record, "x");
    dsp::share_above(record, arrays.above_db, arrays.share.data());
  });
}

}  // namespace
}  // namespace doors

using namespace doors;

lumra_status lumra_level_create(const lumra_level_options *options, lumra_level **level) {
  return enter(__func__, [&] {
    require_present(level, "level");
    const auto checked = read_options(options, lumra_level_options LUMRA_LEVEL_OPTIONS);
    require_type(checked.type);
    require(checked.start <= most_samples, LUMRA_OUT_OF_RANGE, "options->start is ", checked.start,
            "; a position is at most 2^62");
    require_threads(checked.threads, "options->threads");
    require(checked.reserved == 0, LUMRA_OUT_OF_RANGE, "options->reserved is ", checked.reserved, "; it is 0");
    levels::give(level, make(checked.type, checked.start, checked.threads));
  });
}

lumra_status lumra_level_add(lumra_level *level, const void *x, uint64_t n) {
  return enter(__func__, [&] {
    any_meter &object = levels::get(level, "level");
    std::visit(
        [&]<class Sample>(meter<Sample> &m) {
          const auto record = array(static_cast<const Sample *>(x), n, "x");
          require_room_for(object, n);
          m.add(record);
        },
        object);
  });
}

lumra_status lumra_level_merge(lumra_level *level, const lumra_level *next) {
  return enter(__func__, [&] {
    any_meter &object = levels::get(level, "level");
    const any_meter &other = levels::get(next, "next");
    require(&object != &other, LUMRA_OVERLAP, "next is level itself; give its neighbour");
    require(object.index() == other.index(), LUMRA_WRONG_TYPE, "next is of type ", type_of(other), " and level of ",
            type_of(object), "; merge levels of one type");
    const std::uint64_t end = start_of(object) + samples_of(object);
    require(start_of(other) == end, LUMRA_OUT_OF_RANGE, "next starts at ", start_of(other), "; level ends at ", end);
    std::visit([&]<class Meter>(Meter &m) { m.merge(std::get<Meter>(other)); }, object);
  });
}

lumra_status lumra_level_where(const lumra_level *level, lumra_level_extent *extent) {
  return enter(__func__, [&] {
    const any_meter &object = levels::get(level, "level");
    require_present(extent, "extent");
    *extent = {start_of(object), samples_of(object), type_of(object), 0};
  });
}

lumra_status lumra_level_read(const lumra_level *level, lumra_level_result *result) {
  return enter(__func__, [&] {
    const any_meter &object = levels::get(level, "level");
    require_sized(result, "result");
    require_samples(object);
    give_result(result, std::visit([](const auto &m) { return figures(m); }, object));
  });
}

lumra_status lumra_level_ccdf(const lumra_level *level, const double *above_db, double *share, uint64_t count) {
  return enter(__func__, [&] {
    const any_meter &object = levels::get(level, "level");
    const ccdf_arrays arrays = checked_arrays(above_db, share, count);
    require_samples(object);
    std::visit([&](const auto &m) { m.read_shares(arrays.above_db, arrays.share.data()); }, object);
  });
}

lumra_status lumra_level_state_size(const lumra_level *level, uint64_t *size) {
  return enter(__func__, [&] {
    const any_meter &object = levels::get(level, "level");
    require_present(size, "size");
    *size = state_size([&object](state_writer &to) { write(to, object); });
  });
}

lumra_status lumra_level_save(const lumra_level *level, void *bytes, uint64_t room) {
  return enter(__func__, [&] {
    const any_meter &object = levels::get(level, "level");
    save_state(saved_level, bytes, room, [&object](state_writer &to) { write(to, object); });
  });
}

lumra_status lumra_level_load(const void *bytes, uint64_t size, lumra_level **level) {
  return enter(__func__, [&] {
    require_present(level, "level");
    levels::give(level, read(open_state(saved_level, bytes, size)));
  });
}

void lumra_level_free(lumra_level *level) {
  levels::free(level);
}

#define CCDF(SUFFIX, T)                                                                                             \
  lumra_status lumra_ccdf_##SUFFIX(const T *x, uint64_t n, const double *above_db, double *share, uint64_t count) { \
    return exact_ccdf(__func__, x, n, above_db, share, count);                                                      \
  }
CCDF(f32, float)
CCDF(f64, double)
CCDF(cf32, lumra_cf32)
CCDF(cf64, lumra_cf64)
#undef CCDF
