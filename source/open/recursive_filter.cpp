// SPDX-License-Identifier: MIT
#include <lumra/filter_recursive.h>

#include <algorithm>
#include <cmath>
#include <complex>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>
#include <utility>
#include <vector>

#include "open/door.hpp"
#include "open/element.hpp"
#include "open/handle.hpp"
#include "open/state.hpp"
#include "signal/recursive_filter.hpp"

namespace doors {
namespace {

struct iir {
  std::int32_t type;
  dsp::recursive_filter filter;
};

using iirs = handles<lumra_iir, iir>;

constexpr state_kind saved_iir{"iir", 2};
constexpr std::uint64_t most_coefficients = 65536, most_sections = 4096;

void require_finite(const std::vector<double> &values, std::string_view name, std::string_view what) {
  for (std::size_t k = 0; k < values.size(); ++k)
    require(std::isfinite(values[k]), LUMRA_OUT_OF_RANGE, name, "[", std::uint64_t{k}, "] is ", values[k], what,
            "; give finite coefficients");
}

dsp::recursion_coefficients checked_stage(std::span<const double> b, std::string_view b_name, std::span<const double> a,
                                          std::string_view a_name) {
  require_finite({b.begin(), b.end()}, b_name, "");
  require_finite({a.begin(), a.end()}, a_name, "");
  require(a[0] != 0, LUMRA_OUT_OF_RANGE, a_name, "[0] is 0; all coefficients are divided by it");
  dsp::recursion_coefficients stage = dsp::normalised(b, a);
  require_finite(stage.b, b_name, " once divided by a[0]");
  require_finite(stage.a, a_name, " once divided by a[0]");
  return stage;
}

lumra_iir_options checked_options(const lumra_iir_options *given) {
  const lumra_iir_options options = read_options(given, lumra_iir_options LUMRA_IIR_OPTIONS);
  require_type(options.type);
  require(options.method >= LUMRA_IIR_AUTO && options.method <= LUMRA_IIR_BLOCKS, LUMRA_UNKNOWN_CHOICE,
          "options->method is ", options.method, "; it is one of enum lumra_iir_method");
  return options;
}

std::unique_ptr<iir> make(std::vector<dsp::recursion_coefficients> stages, std::int32_t type, std::int32_t method) {
  for (const dsp::recursion_coefficients &stage : stages)
    require(method != LUMRA_IIR_BLOCKS || stage.reverse_order() <= dsp::recursive_filter::most_block_order,
            LUMRA_OUT_OF_RANGE, "there are ", std::uint64_t{stage.reverse_order()},
            " coefficients behind a[0]; blocks take ", std::uint64_t{dsp::recursive_filter::most_block_order},
            ", so choose LUMRA_IIR_AUTO");
  const dsp::recursion_method chosen =
      method == LUMRA_IIR_IN_ORDER ? dsp::recursion_method::in_order
      : method == LUMRA_IIR_BLOCKS
          ? dsp::recursion_method::blocks
          : dsp::recursive_filter::choose(
                stages, is_single(type) ? dsp::precision::single_precision : dsp::precision::double_precision);
  return std::unique_ptr<iir>(
      new iir{type, dsp::recursive_filter(std::move(stages), is_complex(type) ? 2 : 1, chosen)});
}

void require_count(const dsp::recursive_filter &filter, std::uint64_t count) {
  const std::uint64_t order = filter.state_count() / filter.parts();
  require(count == order, LUMRA_OUT_OF_RANGE, "count is ", count, "; the state has ", order, " values");
}

void write(state_writer &to, const iir &object) {
  const dsp::recursive_filter &filter = object.filter;
  to.add(object.type);
  to.add(static_cast<std::int32_t>(filter.method() == dsp::recursion_method::blocks ? LUMRA_IIR_BLOCKS
                                                                                    : LUMRA_IIR_IN_ORDER));
  to.add(filter.at().in_block);
  to.add(filter.at().preset);
  to.add(std::uint64_t{filter.stages().size()});
  for (const dsp::recursion_coefficients &stage : filter.stages()) {
    for (const std::vector<double> *values : {&stage.b, &stage.a}) {
      to.add(std::uint64_t{values->size()});
      to.add_all(std::span<const double>(*values));
    }
  }
  to.add_all(filter.memory());
}

std::vector<double> read_coefficients(state_reader &from) {
  const auto count = from.take<std::uint64_t>();
  require(count >= 1 && count <= most_coefficients, LUMRA_BAD_STATE, "the saved bytes name ", count, " coefficients");
  std::vector<double> values(static_cast<std::size_t>(count));
  from.take_all(std::span<double>(values));
  return values;
}

std::unique_ptr<iir> read(state_reader from) {
  const auto type = from.take<std::int32_t>();
  const auto method = from.take<std::int32_t>();
  const auto in_block = from.take<std::uint32_t>();
  const auto preset = from.take<std::uint32_t>();
  const auto count = from.take<std::uint64_t>();
  const bool known = is_type(type) && (method == LUMRA_IIR_BLOCKS || method == LUMRA_IIR_IN_ORDER);
  require(known && count >= 1 && count <= most_sections, LUMRA_BAD_STATE, "the saved bytes describe no filter");
  std::vector<dsp::recursion_coefficients> stages;
  for (std::uint64_t k = 0; k < count; ++k) {
    std::vector<double> b = read_coefficients(from);
    stages.push_back({std::move(b), read_coefficients(from)});
    require(method == LUMRA_IIR_IN_ORDER || stages.back().reverse_order() <= dsp::recursive_filter::most_block_order,
            LUMRA_BAD_STATE, "the saved bytes describe no filter");
  }
  auto object = make(std::move(stages), type, method);
  from.take_all(object->filter.memory());
  from.finish();
  require(object->filter.restore({in_block, preset}), LUMRA_BAD_STATE, "the saved bytes describe no place in a stream");
  return object;
}

}  // namespace
}  // namespace doors

using namespace doors;

lumra_status lumra_iir_create(const lumra_iir_options *options, const double *b, uint64_t b_count, const double *a,
                              uint64_t a_count, lumra_iir **out) {
  return enter(__func__, [&] {
    require_present(out, "out");
    const lumra_iir_options checked = checked_options(options);
    for (const auto &[name, count] : {std::pair{"b_count", b_count}, std::pair{"a_count", a_count}})
      require(count >= 1 && count <= most_coefficients, LUMRA_OUT_OF_RANGE, name, " is ", count, "; it is 1 to ",
              most_coefficients);
    const auto forward = array(b, b_count, "b"), reverse = array(a, a_count, "a");
    iirs::give(out, make({checked_stage(forward, "b", reverse, "a")}, checked.type, checked.method));
  });
}

lumra_status lumra_iir_create_sections(const lumra_iir_options *options, const double *sections, uint64_t count,
                                       lumra_iir **out) {
  return enter(__func__, [&] {
    require_present(out, "out");
    const lumra_iir_options checked = checked_options(options);
    require(count >= 1 && count <= most_sections, LUMRA_OUT_OF_RANGE, "count is ", count, "; it is 1 to ",
            most_sections);
    const auto all = array(sections, 6 * count, "sections");
    std::vector<dsp::recursion_coefficients> stages;
    for (std::size_t k = 0; k < all.size(); k += 6)
      stages.push_back(checked_stage(all.subspan(k, 3), "a section's b", all.subspan(k + 3, 3), "a section's a"));
    iirs::give(out, make(std::move(stages), checked.type, checked.method));
  });
}

void lumra_iir_free(lumra_iir *filter) {
  iirs::free(filter);
}

lumra_status lumra_iir_process(lumra_iir *filter, const void *in, void *out, uint64_t n) {
  return enter(__func__, [&] {
    iir &object = iirs::get(filter, "filter");
    with_type(object.type, [&](auto element) {
      using sample = typename decltype(element)::value;
      const auto x = array(static_cast<const sample *>(in), n, "in");
      const auto y = array(static_cast<sample *>(out), n, "out");
      require_same_or_apart(y, "out", x, "in");
      object.filter.run(x.data(), y.data(), n);
    });
  });
}

lumra_status lumra_iir_reset(lumra_iir *filter) {
  return enter(__func__, [&] { iirs::get(filter, "filter").filter.reset(); });
}

lumra_status lumra_iir_get_type(const lumra_iir *filter, int32_t *type) {
  return enter(__func__, [&] {
    const iir &object = iirs::get(filter, "filter");
    require_present(type, "type");
    *type = object.type;
  });
}

lumra_status lumra_iir_get_method(const lumra_iir *filter, int32_t *method) {
  return enter(__func__, [&] {
    const iir &object = iirs::get(filter, "filter");
    require_present(method, "method");
    *method = object.filter.method() == dsp::recursion_method::blocks ? LUMRA_IIR_BLOCKS : LUMRA_IIR_IN_ORDER;
  });
}

lumra_status lumra_iir_get_state(const lumra_iir *filter, void *state, uint64_t count) {
  return enter(__func__, [&] {
    const dsp::recursive_filter &kept = iirs::get(filter, "filter").filter;
    require_count(kept, count);
    const auto values = array(static_cast<double *>(state), kept.state_count(), "state");
    kept.read_state(values);
  });
}

lumra_status lumra_iir_set_state(lumra_iir *filter, const void *state, uint64_t count) {
  return enter(__func__, [&] {
    dsp::recursive_filter &kept = iirs::get(filter, "filter").filter;
    require_count(kept, count);
    const auto values = array(static_cast<const double *>(state), kept.state_count(), "state");
    kept.set_state(values);
  });
}

lumra_status lumra_iir_order(const lumra_iir *filter, uint64_t *order) {
  return enter(__func__, [&] {
    const dsp::recursive_filter &kept = iirs::get(filter, "filter").filter;
    require_present(order, "order");
    *order = kept.state_count() / kept.parts();
  });
}

lumra_status lumra_iir_state_size(const lumra_iir *filter, uint64_t *size) {
  return enter(__func__, [&] {
    const iir &object = iirs::get(filter, "filter");
    require_present(size, "size");
    *size = state_size([&object](state_writer &to) { write(to, object); });
  });
}

lumra_status lumra_iir_save(const lumra_iir *filter, void *bytes, uint64_t room) {
  return enter(__func__, [&] {
    const iir &object = iirs::get(filter, "filter");
    save_state(saved_iir, bytes, room, [&object](state_writer &to) { write(to, object); });
  });
}

lumra_status lumra_iir_load(const void *bytes, uint64_t size, lumra_iir **out) {
  return enter(__func__, [&] {
    require_present(out, "out");
    iirs::give(out, read(open_state(saved_iir, bytes, size)));
  });
}
