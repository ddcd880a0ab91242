// SPDX-License-Identifier: MIT
#include "signal/fir.hpp"

#include <lumra/filter.h>

#include <complex>
#include <cstdint>
#include <memory>
#include <span>
#include <utility>
#include <variant>

#include "open/door.hpp"
#include "open/element.hpp"
#include "open/handle.hpp"
#include "open/method.hpp"
#include "open/state.hpp"

namespace doors {
namespace {

using cf32 = std::complex<float>;
using cf64 = std::complex<double>;

/// What options say: types of samples and taps, and the method that was asked for.
struct fir_kind {
  std::int32_t type, taps_type;
  dsp::convolution_method method;
};

struct fir_object {
  fir_kind kind;
  std::variant<dsp::fir_filter<float, float>, dsp::fir_filter<double, double>, dsp::fir_filter<cf32, float>,
               dsp::fir_filter<cf32, cf32>, dsp::fir_filter<cf64, double>, dsp::fir_filter<cf64, cf64>>
      filter;

  template <class Sample, class Tap>
  fir_object(const fir_kind &what, element<Sample>, std::span<const Tap> taps)
      : kind(what), filter(std::in_place_type<dsp::fir_filter<Sample, Tap>>, taps, what.method) {}
};
using firs = handles<lumra_fir, fir_object>;

constexpr state_kind saved_fir{"fir", 1};

constexpr std::int32_t real_type(std::int32_t type) noexcept {
  return is_single(type) ? LUMRA_TYPE_F32 : LUMRA_TYPE_F64;
}

template <class Sample, class Tap>
Sample sample_of(const dsp::fir_filter<Sample, Tap> &);
/// The type of a filter's samples.
template <class Filter>
using sample_type = decltype(sample_of(std::declval<const Filter &>()));

/// Calls work(element<Sample>{}, element<Tap>{}).
template <class Work>
void with_types(const fir_kind &kind, Work &&work) {
  with_type(kind.type, [&](auto sample) {
    using real = dsp::real_of<typename decltype(sample)::value>;
    if (kind.taps_type == kind.type)
      work(sample, sample);
    else
      work(sample, element<real>{});
  });
}

void write(state_writer &to, const fir_object &fir) {
  to.add(fir.kind.type);
  to.add(fir.kind.taps_type);
  to.add(fir.kind.method);
  to.add(std::uint32_t{0});
  std::visit(
      [&to](const auto &filter) {
        to.add(std::uint64_t{filter.taps().size()});
        to.add_all(filter.taps());
        to.add_all(filter.past());
      },
      fir.filter);
}

template <class T>
qsrfhs::aligned_buffer<T> read_all(state_reader &from, std::uint64_t count) {
  qsrfhs::aligned_buffer<T> values(static_cast<std::size_t>(count));
  from.take_all(values.elements());
  return values;
}

void read(state_reader from, lumra_fir **out) {
  const auto type = from.take<std::int32_t>();
  const auto taps_type = from.take<std::int32_t>();
  const auto method = from.take<std::int32_t>();
  const auto reserved = from.take<std::uint32_t>();
  const auto count = from.take<std::uint64_t>();
  const bool known = is_type(type) && (taps_type == type || taps_type == real_type(type)) && is_method(method);
  require(known && reserved == 0 && count >= 1 && count <= dsp::most_fir_taps, LUMRA_BAD_STATE,
          "the saved bytes describe no filter");
  const fir_kind kind{type, taps_type, static_cast<dsp::convolution_method>(method)};
  with_types(kind, [&]<class Sample, class Tap>(element<Sample> sample, element<Tap>) {
    const auto taps = read_all<Tap>(from, count);
    const auto past = read_all<Sample>(from, count - 1);
    from.finish();
    auto object = std::make_unique<fir_object>(kind, sample, std::span<const Tap>(taps.elements()));
    std::get<dsp::fir_filter<Sample, Tap>>(object->filter).set_past(past.elements());
    firs::give(out, std::move(object));
  });
}

}  // namespace
}  // namespace doors

using namespace doors;

lumra_status lumra_fir_create(const lumra_fir_options *options, const void *taps, uint64_t count, lumra_fir **fir) {
  return enter(__func__, [&] {
    const lumra_fir_options wanted = read_options<lumra_fir_options>(options, LUMRA_FIR_OPTIONS);
    require_type(wanted.type);
    const std::int32_t real = real_type(wanted.type), taps_type = wanted.taps_type == 0 ? real : wanted.taps_type;
    require(taps_type == real || taps_type == wanted.type, LUMRA_UNKNOWN_CHOICE, "options->taps_type is ",
            wanted.taps_type, "; for samples of type ", wanted.type, " it is 0, ", real, " or ", wanted.type);
    const fir_kind kind{wanted.type, taps_type, checked_method(wanted.method, "options->method")};
    require(count >= 1 && count <= dsp::most_fir_taps, LUMRA_OUT_OF_RANGE, "count is ", count,
            "; a filter has 1 to 2^24 taps");
    with_types(kind, [&]<class Sample, class Tap>(element<Sample> sample, element<Tap>) {
      const auto values = array(static_cast<const Tap *>(taps), count, "taps");
      require_present(fir, "fir");
      firs::give(fir, std::make_unique<fir_object>(kind, sample, values));
    });
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

lumra_status lumra_fir_get_type(const lumra_fir *fir, int32_t *type) {
  return enter(__func__, [&] {
    const fir_object &object = firs::get(fir, "fir");
    require_present(type, "type");
    *type = object.kind.type;
  });
}

lumra_status lumra_fir_state_size(const lumra_fir *fir, uint64_t *size) {
  return enter(__func__, [&] {
    const fir_object &object = firs::get(fir, "fir");
    require_present(size, "size");
    *size = state_size([&object](state_writer &to) { write(to, object); });
  });
}

lumra_status lumra_fir_save(const lumra_fir *fir, void *bytes, uint64_t room) {
  return enter(__func__, [&] {
    const fir_object &object = firs::get(fir, "fir");
    save_state(saved_fir, bytes, room, [&object](state_writer &to) { write(to, object); });
  });
}

lumra_status lumra_fir_load(const void *bytes, uint64_t size, lumra_fir **fir) {
  return enter(__func__, [&] {
    require_present(fir, "fir");
    read(open_state(saved_fir, bytes, size), fir);
  });
}

void lumra_fir_free(lumra_fir *fir) {
  firs::free(fir);
}
