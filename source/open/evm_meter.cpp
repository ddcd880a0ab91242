// SPDX-License-Identifier: MIT
#include "signal/evm_meter.hpp"

#include <lumra/evm.h>

#include <cmath>
#include <cstdint>
#include <memory>
#include <tuple>
#include <utility>
#include <variant>

#include "open/door.hpp"
#include "open/evm_checks.hpp"
#include "open/handle.hpp"
#include "open/option_checks.hpp"
#include "open/result.hpp"
#include "open/state.hpp"
#include "signal/error_vectors.hpp"

namespace doors {
namespace {

static_assert(LUMRA_EVM_BLOCK == dsp::error_block::length && LUMRA_EVM_WINDOW == dsp::error_block::window);

constexpr state_kind saved_meter{"evm", 1};
constexpr std::uint64_t most_samples = std::uint64_t{1} << 62;

struct any_meter {
  lumra_evm_meter_options options;
  std::variant<dsp::evm_meter<float>, dsp::evm_meter<double>> meter;
};
using meters = handles<lumra_evm_meter, any_meter>;

lumra_evm_meter_options checked(const lumra_evm_meter_options *given) {
  const auto options = read_options(given, lumra_evm_meter_options LUMRA_EVM_METER_OPTIONS);
  require(options.type == LUMRA_TYPE_CF32 || options.type == LUMRA_TYPE_CF64, LUMRA_UNKNOWN_CHOICE, "options->type is ",
          options.type, "; it is LUMRA_TYPE_CF32 or LUMRA_TYPE_CF64");
  (void)checked_alignment(options.align);
  require(options.reserved == 0, LUMRA_OUT_OF_RANGE, "options->reserved is ", options.reserved, "; it is 0");
  require(options.start <= most_samples, LUMRA_OUT_OF_RANGE, "options->start is ", options.start,
          "; a position is at most 2^62");
  require_rate(options.sample_rate_hz, "options->sample_rate_hz");
  const double gain = std::abs(std::complex<double>(options.gain_re, options.gain_im));
  require(std::isfinite(gain) && gain > 0, LUMRA_OUT_OF_RANGE, "options->gain_re and gain_im make ", gain,
          "; the gain's length is above 0 and finite");
  require(std::abs(options.delay_samples) <= dsp::longest_model_delay, LUMRA_OUT_OF_RANGE, "options->delay_samples is ",
          options.delay_samples, "; it is from -501 to 501");
  require(std::isfinite(options.frequency_hz / options.sample_rate_hz), LUMRA_OUT_OF_RANGE, "options->frequency_hz is ",
          options.frequency_hz, "; it is finite");
  require(std::isfinite(options.dc_re) && std::isfinite(options.dc_im), LUMRA_OUT_OF_RANGE, "options->dc_re is ",
          options.dc_re, " and dc_im ", options.dc_im, "; they are finite");
  return options;
}

dsp::stream_model model_of(const lumra_evm_meter_options &options) noexcept {
  return {{options.gain_re, options.gain_im},
          options.delay_samples,
          options.frequency_hz / options.sample_rate_hz,
          {options.dc_re, options.dc_im}};
}

std::unique_ptr<any_meter> make(const lumra_evm_meter_options &options) {
  const dsp::alignment wanted = checked_alignment(options.align);
  const dsp::stream_model model = model_of(options);
  if (options.type == LUMRA_TYPE_CF32)
    return std::make_unique<any_meter>(any_meter{options, dsp::evm_meter<float>(options.start, wanted, model)});
  return std::make_unique<any_meter>(any_meter{options, dsp::evm_meter<double>(options.start, wanted, model)});
}

template <class Work>
auto visit(any_meter &object, Work &&work) {
  return std::visit(std::forward<Work>(work), object.meter);
}

dsp::positions record_of(any_meter &object) noexcept {
  return visit(object, [](const auto &m) { return m.record(); });
}

void require_compared(any_meter &object) {
  require(visit(object, [](const auto &m) { return m.compared().count(); }) != 0, LUMRA_TOO_FEW_SAMPLES,
          "none of the samples is compared; add more");
}

/// All but the start.
bool same_kind(const lumra_evm_meter_options &a, const lumra_evm_meter_options &b) noexcept {
  const auto kind = [](const lumra_evm_meter_options &of) {
    return std::tie(of.size, of.type, of.align, of.reserved, of.sample_rate_hz, of.gain_re, of.gain_im,
                    of.delay_samples, of.frequency_hz, of.dc_re, of.dc_im);
  };
  return kind(a) == kind(b);
}

void write(state_writer &to, any_meter &object) {
  to.add(object.options);
  visit(object, [&to](const auto &m) {
    to.add(m.record().count());
    const auto image = m.save();
    to.add(image.peak.power);
    to.add(image.peak.position);
    for (const dsp::exact_sum::image &sum : image.sums) to.add(sum);
    for (const auto *kept : {&m.head(), &m.tail()}) {
      to.add_all(std::span(kept->reference));
      to.add_all(std::span(kept->measured));
    }
  });
}

std::unique_ptr<any_meter> read(state_reader from) {
  const auto options = from.take<lumra_evm_meter_options>();
  require(options.size == sizeof options, LUMRA_BAD_STATE, "the saved bytes describe no meter");
  std::unique_ptr<any_meter> object;
  try {
    object = make(checked(&options));
  } catch (const refusal &) {
    refuse(LUMRA_BAD_STATE, "the saved bytes describe no meter");
  }
  visit(*object, [&](auto &m) {
    const auto samples = from.take<std::uint64_t>();
    dsp::error_totals::image image{};
    image.peak.power = from.take<double>();
    image.peak.position = from.take<std::uint64_t>();
    for (dsp::exact_sum::image &sum : image.sums) sum = from.take<dsp::exact_sum::image>();
    require(samples <= most_samples - options.start && m.load(samples, image), LUMRA_BAD_STATE,
            "the saved bytes describe no meter");
    for (auto *kept : {&m.head(), &m.tail()}) {
      from.take_all(std::span(kept->reference));
      from.take_all(std::span(kept->measured));
    }
  });
  from.finish();
  return object;
}

}  // namespace
}  // namespace doors

using namespace doors;

lumra_status lumra_evm_meter_create(const lumra_evm_meter_options *options, lumra_evm_meter **meter) {
  return enter(__func__, [&] {
    require_present(meter, "meter");
    auto used = checked(options);
    used.size = sizeof used;
    meters::give(meter, make(used));
  });
}

lumra_status lumra_evm_meter_add(lumra_evm_meter *meter, const void *reference, const void *measured, uint64_t n) {
  return enter(__func__, [&] {
    any_meter &object = meters::get(meter, "meter");
    visit(object, [&]<class Real>(dsp::evm_meter<Real> &m) {
      using sample = std::complex<Real>;
      const auto from = array(static_cast<const sample *>(reference), n, "reference");
      const auto to = array(static_cast<const sample *>(measured), n, "measured");
      const std::uint64_t end = m.record().last;
      require(n <= most_samples - end, LUMRA_OUT_OF_RANGE, "the streams stand at ", end, " and would go on by ", n,
              " samples; they end at 2^62");
      m.add(from, to);
    });
  });
}

lumra_status lumra_evm_meter_merge(lumra_evm_meter *meter, const lumra_evm_meter *next) {
  return enter(__func__, [&] {
    any_meter &object = meters::get(meter, "meter");
    any_meter &other = meters::get(next, "next");
    require(&object != &other, LUMRA_OVERLAP, "next is meter itself; give its neighbour");
    require(same_kind(object.options, other.options), LUMRA_WRONG_TYPE,
            "next was made with other options; give one that differs in start alone");
    const std::uint64_t end = record_of(object).last, start = record_of(other).first;
    require(start == end, LUMRA_OUT_OF_RANGE, "next starts at ", start, "; meter ends at ", end);
    visit(object, [&]<class Meter>(Meter &m) { m.merge(std::get<Meter>(other.meter)); });
  });
}

lumra_status lumra_evm_meter_where(const lumra_evm_meter *meter, lumra_evm_meter_extent *extent) {
  return enter(__func__, [&] {
    any_meter &object = meters::get(meter, "meter");
    require_present(extent, "extent");
    const dsp::positions record = record_of(object);
    *extent = {record.first, record.count(), object.options.type, 0};
  });
}

lumra_status lumra_evm_meter_read(const lumra_evm_meter *meter, lumra_evm_result *result) {
  return enter(__func__, [&] {
    any_meter &object = meters::get(meter, "meter");
    require_sized(result, "result");
    require_compared(object);
    dsp::error_figures figures;
    require_measured(visit(object, [&](const auto &m) { return m.read(figures); }));
    give_result(result, result_of(figures, object.options.sample_rate_hz));
  });
}

lumra_status lumra_evm_meter_refine(const lumra_evm_meter *meter, lumra_evm_refinement *refinement) {
  return enter(__func__, [&] {
    any_meter &object = meters::get(meter, "meter");
    require_sized(refinement, "refinement");
    require_compared(object);
    dsp::model_refinement refined;
    require_measured(visit(object, [&](const auto &m) { return m.refine(refined); }));
    give_result(refinement,
                lumra_evm_refinement{0, refined.settled, static_cast<std::uint64_t>(refined.reach),
                                     refined.model.gain.real(), refined.model.gain.imag(), refined.model.delay,
                                     refined.model.frequency * object.options.sample_rate_hz, refined.model.dc.real(),
                                     refined.model.dc.imag(), refined.reference_rms});
  });
}

lumra_status lumra_evm_meter_state_size(const lumra_evm_meter *meter, uint64_t *size) {
  return enter(__func__, [&] {
    any_meter &object = meters::get(meter, "meter");
    require_present(size, "size");
    *size = state_size([&object](state_writer &to) { write(to, object); });
  });
}

lumra_status lumra_evm_meter_save(const lumra_evm_meter *meter, void *bytes, uint64_t room) {
  return enter(__func__, [&] {
    any_meter &object = meters::get(meter, "meter");
    save_state(saved_meter, bytes, room, [&object](state_writer &to) { write(to, object); });
  });
}

lumra_status lumra_evm_meter_load(const void *bytes, uint64_t size, lumra_evm_meter **meter) {
  return enter(__func__, [&] {
    require_present(meter, "meter");
    meters::give(meter, read(open_state(saved_meter, bytes, size)));
  });
}

void lumra_evm_meter_free(lumra_evm_meter *meter) {
  meters::free(meter);
}

lumra_status lumra_evm_errors(const lumra_evm_meter_options *options, const void *reference, const void *measured,
                              uint64_t n, void *error, void *magnitude, void *phase) {
  return enter(__func__, [&] {
    const auto used = checked(options);
    const auto trace = [&]<class Real>(Real) {
      using sample = std::complex<Real>;
      const auto from = array(static_cast<const sample *>(reference), n, "reference");
      const auto to = array(static_cast<const sample *>(measured), n, "measured");
      const dsp::error_traces<Real> traces{static_cast<sample *>(error), static_cast<Real *>(magnitude),
                                           static_cast<Real *>(phase)};
      require(used.delay_samples == 0 || n <= LUMRA_EVM_WINDOW, LUMRA_OUT_OF_RANGE, "n is ", n,
              "; with a delay it is at most ", std::uint64_t{LUMRA_EVM_WINDOW});
      require_traces_apart(from, to, {}, traces.error, traces.magnitude, traces.phase);
      require(n >= 1, LUMRA_TOO_FEW_SAMPLES, "n is 0; give samples");
      dsp::trace_errors<Real>(from, to, used.start, model_of(used), traces);
    };
    used.type == LUMRA_TYPE_CF32 ? trace(float()) : trace(double());
  });
}
