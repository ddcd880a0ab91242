// SPDX-License-Identifier: MIT
#include "signal/fir.hpp"

#include <lumra/filter.h>

#include <complex>
#include <cstdint>
#include <memory>
#include <span>
#include <variant>

#include "open/door.hpp"
#include "open/handle.hpp"
#include "open/method.hpp"
#include "open/state.hpp"

namespace doors {
namespace {

using cf32 = std::complex<float>;
using cf64 = std::complex<double>;

struct fir_object {
  std::variant<dsp::fir_filter<float, float>, dsp::fir_filter<double, double>, dsp::fir_filter<cf32, float>,
               dsp::fir_filter<cf32, cf32>, dsp::fir_filter<cf64, double>, dsp::fir_filter<cf64, cf64>>
      filter;
  std::int32_t type;

  template <class Sample, class Tap>
  fir_object(std::in_place_type_t<dsp::fir_filter<Sample, Tap>> kind, std::span<const Tap> taps,
             dsp::convolution_method method, std::int32_t sample_type)
      : filter(kind, taps, method), type(sample_type) {}
};
using firs = handles<lumra_fir, fir_object>;

constexpr state_kind fir_state{{'f', 'i', 'r', '\0'}, 1};

template <class Sample, class Tap>
Sample sample_of(const dsp::fir_filter<Sample, Tap> &);
/// The type of a filter's samples.
template <class Filter>
using sample_type = decltype(sample_of(std::declval<const Filter &>()));

template <class Sample, class Tap>
void make(const lumra_fir_options &options, dsp::convolution_method method, const void *taps, std::uint64_t count,
          lumra_fir **out) {
  const auto values = array(static_cast<const Tap *>(taps), count, "taps");
  require_present(out, "fir");
  firs::give(out, std::make_unique<fir_object>(std::in_place_type<dsp::fir_filter<Sample, Tap>>, values, method,
                                               options.type));
}

/// The payload: type of samples, count of samples, the samples.
auto payload_of(const fir_object &fir) {
  return [&fir](state_writer &writer) {
    writer.add(std::int64_t{fir.type});
    std::visit(
        [&](const auto &filter) {
          writer.add(std::uint64_t{filter.past().size()});
          writer.add_all(filter.past());
        },
        fir.filter);
  };
}

}  // namespace
}  // namespace doors

using namespace doors;

lumra_status lumra_fir_create(const lumra_fir_options *options, const void *taps, uint64_t count, lumra_fir **fir) {
  return enter(__func__, [&] {
    const lumra_fir_options wanted = read_options<lumra_fir_options>(options, LUMRA_FIR_OPTIONS);
    const bool is_complex = wanted.type == LUMRA_TYPE_CF32 || wanted.type == LUMRA_TYPE_CF64;
    const bool is_single = wanted.type == LUMRA_TYPE_F32 || wanted.type == LUMRA_TYPE_CF32;
    require(is_complex || is_single || wanted.type == LUMRA_TYPE_F64, LUMRA_UNKNOWN_CHOICE, "options->type is ",
            wanted.type, ", which is no sample type; enum lumra_type_code names them");
    const std::int32_t real_type = is_single ? LUMRA_TYPE_F32 : LUMRA_TYPE_F64;
    const std::int32_t taps_type = wanted.taps_type == 0 ? real_type : wanted.taps_type;
    require(taps_type == real_type || taps_type == wanted.type, LUMRA_UNKNOWN_CHOICE, "options->taps_type is ",
            wanted.taps_type, "; for samples of type ", wanted.type, " it is 0, ", real_type, " or ", wanted.type);
    const dsp::convolution_method method = checked_method(wanted.method, "options->method");
    require(count >= 1 && count <= dsp::most_fir_taps, LUMRA_OUT_OF_RANGE, "count is ", count,
            "; a filter has 1 to 2^24 taps");
    const bool has_complex_taps = taps_type != real_type;
    if (wanted.type == LUMRA_TYPE_F32)
      make<float, float>(wanted, method, taps, count, fir);
    else if (wanted.type == LUMRA_TYPE_F64)
      make<double, double>(wanted, method, taps, count, fir);
    else if (wanted.type == LUMRA_TYPE_CF32)
      (has_complex_taps ? make<cf32, cf32> : make<cf32, float>)(wanted, method, taps, count, fir);
    else
      (has_complex_taps ? make<cf64, cf64> : make<cf64, double>)(wanted, method, taps, count, fir);
  });
}

lumra_status lumra_fir_process(lumra_fir *fir, const void *in, void *out, uint64_t n) {
  return enter(__func__, [&] {
    std::visit(
        [&]<class Filter>(Filter &filter) {
          using sample = sample_type<Filter>;
          const auto samples = array(static_cast<const sample *>(in), n, "in");
          const auto outputs = array(static_cast<sample *>(out), n, "out");
          require_same_or_apart(outputs, "out", samples, "in");
          filter.process(samples, outputs.data());
        },
        firs::get(fir, "fir").filter);
  });
}

lumra_status lumra_fir_reset(lumra_fir *fir) {
  return enter(__func__, [&] { std::visit([](auto &filter) { filter.reset(); }, firs::get(fir, "fir").filter); });
}

lumra_status lumra_fir_state_size(const lumra_fir *fir, uint64_t *size) {
  return enter(__func__, [&] {
    const fir_object &object = firs::get(fir, "fir");
    require_present(size, "size");
    *size = state_size(payload_of(object));
  });
}

lumra_status lumra_fir_save(const lumra_fir *fir, void *bytes, uint64_t room) {
  return enter(__func__, [&] { save_state(fir_state, bytes, room, payload_of(firs::get(fir, "fir"))); });
}

lumra_status lumra_fir_load(lumra_fir *fir, const void *bytes, uint64_t size) {
  return enter(__func__, [&] {
    fir_object &object = firs::get(fir, "fir");
    state_reader reader = open_state(fir_state, bytes, size);
    const auto type = reader.take<std::int64_t>();
    require(type == object.type, LUMRA_BAD_STATE, "the saved filter has samples of type ", type, ", this one of type ",
            object.type, "; load it into one of its own type");
    std::visit(
        [&]<class Filter>(Filter &filter) {
          const auto count = reader.take<std::uint64_t>();
          require(count == filter.past().size(), LUMRA_BAD_STATE, "the saved filter remembers ", count,
                  " samples, this one ", std::uint64_t{filter.past().size()}, "; load it into one of as many taps");
          const qsrfhs::aligned_buffer<sample_type<Filter>> past(filter.past().size());
          reader.take_all(past.elements());
          reader.finish();
          filter.set_past(past.elements());
        },
        object.filter);
  });
}

void lumra_fir_free(lumra_fir *fir) {
  firs::free(fir);
}
