// SPDX-License-Identifier: MIT
#include "signal/resampler.hpp"

#include <lumra/resampler.h>

#include <algorithm>
#include <cmath>
#include <complex>
#include <cstdint>
#include <limits>
#include <memory>
#include <span>
#include <string_view>
#include <variant>
#include <vector>

#include "open/door.hpp"
#include "open/element.hpp"
#include "open/handle.hpp"
#include "open/option_checks.hpp"
#include "open/result.hpp"
#include "open/state.hpp"
#include "signal/workers.hpp"

namespace doors {
namespace {

/// The resamplers of all rows, which are always at the same place.
template <class Sample>
struct resampled_rows {
  std::shared_ptr<const dsp::rate_change<Sample>> change;
  std::vector<dsp::resampler<Sample>> rows;

  resampled_rows(const dsp::rate_ratio &ratio, const lumra_resampler_options &options)
      : change(std::make_shared<const dsp::rate_change<Sample>>(ratio, options.passband, options.rejection_db)) {
    rows.reserve(options.channels);
    for (std::uint32_t k = 0; k < options.channels; ++k) rows.emplace_back(change);
  }
};

struct resampler_object {
  lumra_resampler_options options;
  std::variant<resampled_rows<float>, resampled_rows<double>, resampled_rows<std::complex<float>>,
               resampled_rows<std::complex<double>>>
      all;

  template <class Sample>
  resampler_object(element<Sample>, const dsp::rate_ratio &ratio, const lumra_resampler_options &made_from)
      : options(made_from), all(std::in_place_type<resampled_rows<Sample>>, ratio, made_from) {
    options.size = sizeof options;
  }
};
using resamplers = handles<lumra_resampler, resampler_object>;

constexpr state_kind saved_resampler{{'r', 'a', 't'}, 1};
constexpr std::uint32_t most_channels = 1024;

dsp::rate_ratio checked_ratio(const lumra_resampler_options &options) {
  constexpr std::string_view near = "; rates are less than a factor of 10^9 apart";
  require_rate(options.input_rate_hz, "options->input_rate_hz");
  if (options.up == 0 && options.down == 0) {
    require_rate(options.output_rate_hz, "options->output_rate_hz");
    require(dsp::rate_ratio::are_near(options.output_rate_hz, options.input_rate_hz), LUMRA_OUT_OF_RANGE,
            "options->output_rate_hz is ", options.output_rate_hz, " for options->input_rate_hz ",
            options.input_rate_hz, near);
    return {options.output_rate_hz, options.input_rate_hz};
  }
  require(options.up != 0 && options.down != 0, LUMRA_OUT_OF_RANGE, "options->up is ", options.up,
          " and options->down ", options.down, "; both are 0, or none");
  const auto up = static_cast<double>(options.up), down = static_cast<double>(options.down);
  require(dsp::rate_ratio::are_near(up, down), LUMRA_OUT_OF_RANGE, "options->up is ", options.up, " and options->down ",
          options.down, near);
  return {options.up, options.down};
}

std::unique_ptr<resampler_object> make(const lumra_resampler_options &options) {
  require_type(options.type);
  const dsp::rate_ratio ratio = checked_ratio(options);
  require_passband(options.passband, "options->passband");
  require_rejection(options.rejection_db, options.type);
  require(options.channels >= 1 && options.channels <= most_channels, LUMRA_OUT_OF_RANGE, "options->channels is ",
          options.channels, "; it is 1 to ", most_channels);
  require_threads(options.threads, "options->threads");
  return with_type(options.type, [&](auto type) { return std::make_unique<resampler_object>(type, ratio, options); });
}

/// Any one of the rows.
template <class Sample>
const dsp::resampler<Sample> &a_row(const resampled_rows<Sample> &all) noexcept {
  return all.rows.front();
}

template <class Sample>
void require_near_enough(const resampled_rows<Sample> &all, std::uint64_t n) {
  const std::uint64_t before = a_row(all).inputs();
  const bool fits =
      n <= dsp::longest_resampled - before && all.change->ratio.outputs(before + n) <= dsp::longest_resampled;
  require(fits, LUMRA_OUT_OF_RANGE, "n is ", n, " behind ", before,
          " samples; streams have at most 2^60 samples at both rates, then flush");
}

/// Samples from the first to the last of rows that lie `stride` apart.
template <class T>
std::span<T> rows_of(T *first, std::uint64_t stride, std::uint64_t count, std::uint32_t channels,
                     std::string_view name) {
  if (channels == 1 || count == 0) return array(first, count, name);
  constexpr std::uint64_t most = most_bytes / sizeof(T);
  require(count <= most && stride <= (most - count) / (channels - 1), LUMRA_OUT_OF_RANGE, "the stride of ", name,
          " is ", stride, " for ", count, " samples in each of ", channels, " rows, more than memory can hold");
  return array(first, (channels - 1) * stride + count, name);
}

/// One of those rows.
template <class T>
std::span<T> row_of(std::span<T> rows, std::size_t row, std::uint64_t stride, std::uint64_t count) noexcept {
  return rows.empty() ? rows : rows.subspan(row * static_cast<std::size_t>(stride), static_cast<std::size_t>(count));
}

/// Where rows of outputs go; checks the room for them.
template <class Sample>
std::span<Sample> checked_outputs(void *out, std::uint64_t stride, std::uint64_t room, std::uint64_t count,
                                  std::uint32_t channels) {
  require(room >= count, LUMRA_TOO_LITTLE_ROOM, "room is ", room, " samples a row; ", count, " come");
  require(channels == 1 || count == 0 || stride >= room, LUMRA_OUT_OF_RANGE, "out_stride is ", stride, "; rows of ",
          room, " samples are at least as far apart");
  return rows_of(static_cast<Sample *>(out), stride, count, channels, "out");
}

/// Calls work(row) for every row, on as many threads as the options say; a short piece of the stream is one's.
template <class Work>
void for_rows(const lumra_resampler_options &options, std::uint64_t samples, Work work) {
  constexpr std::uint64_t worth_threads = 8192;  // samples
  const std::size_t channels = options.channels;
  const std::size_t parts = samples < worth_threads ? 1 : std::min(dsp::thread_count(options.threads), channels);
  const auto part = [&](std::size_t k) {
    for (std::size_t row = channels * k / parts; row < channels * (k + 1) / parts; ++row) work(row);
  };
  if (parts == 1) return part(0);
  dsp::run_parts(parts, part);
}

lumra_resampler_figures figures_of(const resampler_object &object) {
  return std::visit(
      [&](const auto &all) {
        const dsp::resampling_plan &plan = all.change->plan;
        const dsp::rate_ratio &ratio = all.change->ratio;
        const lumra_resampler_options &options = object.options;
        const double input = options.input_rate_hz;
        const double output = options.up == 0 ? options.output_rate_hz : input * ratio.value();
        const double half = std::min(input, output) / 2;
        double deviation = plan.rest ? std::pow(10, -plan.rejection / 20) : 0;
        std::size_t longest = 0;
        for (const dsp::block_design &block : plan.blocks) {
          deviation += std::pow(10, -block.band.attenuation / 20);
          longest = std::max({longest, block.inputs(), block.outputs()});
        }
        const bool short_terms = std::max(ratio.up(), ratio.down()) <= std::numeric_limits<std::uint64_t>::max();
        const std::uint64_t latency = a_row(all).latency();
        return lumra_resampler_figures{.size = sizeof(lumra_resampler_figures),
                                       .kind = plan.blocks.empty() ? LUMRA_RESAMPLER_COPY
                                               : plan.rest         ? LUMRA_RESAMPLER_INTERPOLATOR
                                                                   : LUMRA_RESAMPLER_BLOCKS,
                                       .input_rate_hz = input,
                                       .output_rate_hz = output,
                                       .up = short_terms ? static_cast<std::uint64_t>(ratio.up()) : 0,
                                       .down = short_terms ? static_cast<std::uint64_t>(ratio.down()) : 0,
                                       .pass_edge_hz = half * (plan.blocks.empty() ? 1 : options.passband),
                                       .stop_edge_hz = half,
                                       .ripple_db = 20 * std::log10(1 + deviation),
                                       .rejection_db = options.rejection_db,
                                       .latency_samples = latency,
                                       .latency_s = static_cast<double>(latency) / input,
                                       .blocks = static_cast<std::uint32_t>(plan.blocks.size()),
                                       .longest_block = static_cast<std::uint32_t>(longest)};
      },
      object.all);
}

auto payload_of(const resampler_object &object) {
  return [&object](state_writer &to) {
    to.add(object.options);
    std::visit(
        [&to](const auto &all) {
          for (const auto &row : all.rows) row.save(to);
        },
        object.all);
  };
}

/// False where rows would be at different places.
template <class Sample>
bool load(resampled_rows<Sample> &all, state_reader &from) {
  return std::all_of(all.rows.begin(), all.rows.end(),
                     [&](auto &row) { return row.load(from) && row.inputs() == a_row(all).inputs(); });
}

}  // namespace
}  // namespace doors

using namespace doors;

lumra_status lumra_resampler_create(const lumra_resampler_options *options, lumra_resampler **resampler) {
  return enter(__func__, [&] {
    const lumra_resampler_options wanted = read_options<lumra_resampler_options>(options, LUMRA_RESAMPLER_OPTIONS);
    auto object = make(wanted);
    require_present(resampler, "resampler");
    resamplers::give(resampler, std::move(object));
  });
}

lumra_status lumra_resampler_output_count(const lumra_resampler *resampler, uint64_t n, uint64_t *count) {
  return enter(__func__, [&] {
    std::visit(
        [&](const auto &all) {
          require_near_enough(all, n);
          require_present(count, "count");
          *count = a_row(all).next_outputs(n);
        },
        resamplers::get(resampler, "resampler").all);
  });
}

lumra_status lumra_resampler_process(lumra_resampler *resampler, const void *in, uint64_t in_stride, uint64_t n,
                                     void *out, uint64_t out_stride, uint64_t room, uint64_t *written) {
  return enter(__func__, [&] {
    resampler_object &object = resamplers::get(resampler, "resampler");
    std::visit(
        [&]<class Sample>(resampled_rows<Sample> &all) {
          const std::uint32_t channels = object.options.channels;
          require_near_enough(all, n);
          const auto samples = rows_of(static_cast<const Sample *>(in), in_stride, n, channels, "in");
          const std::uint64_t count = a_row(all).next_outputs(n);
          const auto outputs = checked_outputs<Sample>(out, out_stride, room, count, channels);
          require_apart(outputs, "out", samples, "in");
          for_rows(object.options, n, [&](std::size_t row) {
            all.rows[row].process(row_of(samples, row, in_stride, n), row_of(outputs, row, out_stride, count));
          });
          if (written) *written = count;
        },
        object.all);
  });
}

lumra_status lumra_resampler_flush_count(const lumra_resampler *resampler, uint64_t *count) {
  return enter(__func__, [&] {
    const resampler_object &object = resamplers::get(resampler, "resampler");
    require_present(count, "count");
    std::visit([&](const auto &all) { *count = a_row(all).flushed_outputs(); }, object.all);
  });
}

lumra_status lumra_resampler_flush(lumra_resampler *resampler, void *out, uint64_t out_stride, uint64_t room,
                                   uint64_t *written) {
  return enter(__func__, [&] {
    resampler_object &object = resamplers::get(resampler, "resampler");
    std::visit(
        [&]<class Sample>(resampled_rows<Sample> &all) {
          const std::uint64_t count = a_row(all).flushed_outputs();
          const auto outputs = checked_outputs<Sample>(out, out_stride, room, count, object.options.channels);
          for_rows(object.options, a_row(all).latency(),
                   [&](std::size_t row) { all.rows[row].flush(row_of(outputs, row, out_stride, count)); });
          if (written) *written = count;
        },
        object.all);
  });
}

lumra_status lumra_resampler_reset(lumra_resampler *resampler) {
  return enter(__func__, [&] {
    std::visit(
        [](auto &all) {
          for (auto &row : all.rows) row.reset();
        },
        resamplers::get(resampler, "resampler").all);
  });
}

lumra_status lumra_resampler_get_figures(const lumra_resampler *resampler, lumra_resampler_figures *figures) {
  return enter(__func__, [&] {
    const resampler_object &object = resamplers::get(resampler, "resampler");
    require_sized(figures, "figures");
    give_result(figures, figures_of(object));
  });
}

lumra_status lumra_resampler_get_options(const lumra_resampler *resampler, lumra_resampler_options *options) {
  return enter(__func__, [&] {
    const resampler_object &object = resamplers::get(resampler, "resampler");
    require_sized(options, "options");
    give_result(options, object.options);
  });
}

lumra_status lumra_resampler_get_type(const lumra_resampler *resampler, int32_t *type) {
  return enter(__func__, [&] {
    const resampler_object &object = resamplers::get(resampler, "resampler");
    require_present(type, "type");
    *type = object.options.type;
  });
}

lumra_status lumra_resampler_state_size(const lumra_resampler *resampler, uint64_t *size) {
  return enter(__func__, [&] {
    const resampler_object &object = resamplers::get(resampler, "resampler");
    require_present(size, "size");
    *size = state_size(payload_of(object));
  });
}

lumra_status lumra_resampler_save(const lumra_resampler *resampler, void *bytes, uint64_t room) {
  return enter(__func__,
               [&] { save_state(saved_resampler, bytes, room, payload_of(resamplers::get(resampler, "resampler"))); });
}

lumra_status lumra_resampler_load(const void *bytes, uint64_t size, lumra_resampler **resampler) {
  return enter(__func__, [&] {
    require_present(resampler, "resampler");
    state_reader from = open_state(saved_resampler, bytes, size);
    std::unique_ptr<resampler_object> object;
    try {
      object = make(from.take<lumra_resampler_options>());
    } catch (const refusal &reason) {
      refuse(LUMRA_BAD_STATE, "the saved bytes describe no resampler: ", reason.text());
    }
    const bool whole = std::visit([&](auto &all) { return load(all, from); }, object->all);
    require(whole, LUMRA_BAD_STATE, "the saved bytes describe no place in a stream");
    from.finish();
    resamplers::give(resampler, std::move(object));
  });
}

void lumra_resampler_free(lumra_resampler *resampler) {
  resamplers::free(resampler);
}
