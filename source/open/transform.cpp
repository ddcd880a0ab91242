// SPDX-License-Identifier: MIT
#include <lumra/transform.h>

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <cstdlib>
#include <memory>
#include <span>
#include <string_view>

#include "open/door.hpp"
#include "open/handle.hpp"
#include "signal/transform.hpp"

namespace doors {
namespace {

using ffts = handles<lumra_fft, dsp::fft>;

dsp::fft_settings checked_settings(const lumra_fft_options &options) {
  dsp::fft_settings settings;
  switch (options.type) {
    case LUMRA_TYPE_F32:
    case LUMRA_TYPE_CF32:
      break;
    case LUMRA_TYPE_F64:
    case LUMRA_TYPE_CF64:
      settings.double_precision = true;
      break;
    default:
      refuse(LUMRA_UNKNOWN_CHOICE, "options->type is ", options.type, "; it is one of enum lumra_type_code");
  }
  settings.real = options.type == LUMRA_TYPE_F32 || options.type == LUMRA_TYPE_F64;
  settings.points = options.points;
  require(options.points >= 1 && options.points <= dsp::most_fft_points, LUMRA_OUT_OF_RANGE, "options->points is ",
          options.points, "; it is 1 to ", dsp::most_fft_points);
  const double inverse = 1.0 / static_cast<double>(options.points);
  switch (options.scaling) {
    case LUMRA_FFT_SCALE_BACKWARD:
      settings.backward_scale = inverse;
      break;
    case LUMRA_FFT_SCALE_FORWARD:
      settings.forward_scale = inverse;
      break;
    case LUMRA_FFT_SCALE_BOTH:
      settings.forward_scale = settings.backward_scale = std::sqrt(inverse);
      break;
    case LUMRA_FFT_UNSCALED:
      break;
    default:
      refuse(LUMRA_UNKNOWN_CHOICE, "options->scaling is ", options.scaling, "; it is one of enum lumra_fft_scaling");
  }
  require(options.reserved == 0, LUMRA_OUT_OF_RANGE, "options->reserved is ", options.reserved, "; it is 0");
  return settings;
}

/// One side of a transform: where its rows lie, and the bytes that they touch, from the first to behind the last,
/// counted from the address of the call.
struct side {
  dsp::row_layout layout;
  std::int64_t first, behind;
};

/// Bytes that `count` distances of elements reach.
std::int64_t reach(std::int64_t distance, std::uint64_t count, std::size_t size, std::string_view name) {
  constexpr std::int64_t furthest = most_bytes / 4;
  std::int64_t bytes = 0;
  const bool fits = !__builtin_mul_overflow(distance, count, &bytes) &&
                    !__builtin_mul_overflow(bytes, static_cast<std::int64_t>(size), &bytes) && bytes <= furthest &&
                    bytes >= -furthest;
  require(fits, LUMRA_OUT_OF_RANGE, name, " is ", distance, ", and ", count,
          " of that reach further than memory does; give distances in elements");
  return bytes;
}

side checked_side(dsp::row_layout layout, const dsp::row_shape &shape, std::uint64_t rows, std::string_view step,
                  std::string_view distance) {
  // What leads nowhere may be anything.
  if (shape.count == 1) layout.step = 1;
  if (rows == 1) layout.distance = 0;
  const std::int64_t along = reach(layout.step, shape.count - 1, shape.size, step);
  const std::int64_t across = reach(layout.distance, rows - 1, shape.size, distance);
  const auto size = static_cast<std::int64_t>(shape.size);
  return {layout, std::min<std::int64_t>(along, 0) + std::min<std::int64_t>(across, 0),
          std::max<std::int64_t>(along, 0) + std::max<std::int64_t>(across, 0) + size};
}

/// Whether no element stands for two.
bool rows_are_apart(const dsp::row_layout &layout, std::size_t count, std::uint64_t rows) noexcept {
  const std::int64_t step = std::abs(layout.step), distance = std::abs(layout.distance);
  if (count > 1 && step == 0) return false;
  return rows == 1 || distance > step * static_cast<std::int64_t>(count - 1) ||
         (distance > 0 && step > distance * static_cast<std::int64_t>(rows - 1));
}

constexpr std::string_view real_in_place =
    "; in place, real records lie in rows of their own, twice as many elements apart as their spectra";

/// Checks rows that lie one after the other: the rule of the calls that take the least time.
inline void require_packed_room(const void *in, const dsp::row_shape &from, std::string_view in_name, const void *out,
                                const dsp::row_shape &to, std::string_view out_name, std::uint64_t rows) {
  std::size_t read = 0, written = 0;
  const bool fits = !__builtin_mul_overflow(rows, from.bytes(), &read) && read <= most_bytes &&
                    !__builtin_mul_overflow(rows, to.bytes(), &written) && written <= most_bytes;
  require(fits, LUMRA_OUT_OF_RANGE, "rows is ", rows, ", more than memory can hold; give the number of records");
  require_present(in, in_name);
  require_present(out, out_name);
  const std::span a(static_cast<const std::byte *>(in), read), b(static_cast<const std::byte *>(out), written);
  require_same_or_apart(b, out_name, a, in_name);
  require(in != out || rows == 1 || from.size == to.size, LUMRA_OVERLAP, out_name, " is ", in_name, real_in_place);
}

/// Checks rows with a layout.
void require_room(const void *in, const side &read, const dsp::row_shape &from, std::string_view in_name,
                  const void *out, const side &written, const dsp::row_shape &to, std::string_view out_name,
                  std::uint64_t rows) {
  require_present(in, in_name);
  require_present(out, out_name);
  require(rows_are_apart(written.layout, to.count, rows), LUMRA_OVERLAP, "rows of ", out_name,
          " overlap each other; give steps and distances that leave them apart");
  if (in == out) {
    const bool same_steps = read.layout.step == written.layout.step && (from.size == to.size || read.layout.step == 1);
    const bool same_rows = read.layout.distance * static_cast<std::int64_t>(from.size) ==
                           written.layout.distance * static_cast<std::int64_t>(to.size);
    require(same_steps && same_rows && rows_are_apart(read.layout, from.count, rows), LUMRA_OVERLAP, out_name, " is ",
            in_name, " with another layout", real_in_place);
    return;
  }
  const auto a = reinterpret_cast<std::uintptr_t>(in), b = reinterpret_cast<std::uintptr_t>(out);
  const bool apart = a + static_cast<std::uintptr_t>(read.behind) <= b + static_cast<std::uintptr_t>(written.first) ||
                     b + static_cast<std::uintptr_t>(written.behind) <= a + static_cast<std::uintptr_t>(read.first);
  require(apart, LUMRA_OVERLAP, out_name, " overlaps ", in_name, "; give the same address, or memory of its own");
}

side record_side(const lumra_fft_layout &layout, const dsp::row_shape &shape, std::uint64_t rows) {
  return checked_side({layout.record_step, layout.record_distance}, shape, rows, "layout->record_step",
                      "layout->record_distance");
}

side spectrum_side(const lumra_fft_layout &layout, const dsp::row_shape &shape, std::uint64_t rows) {
  return checked_side({layout.spectrum_step, layout.spectrum_distance}, shape, rows, "layout->spectrum_step",
                      "layout->spectrum_distance");
}

dsp::row_layout packed(const dsp::row_shape &shape) noexcept {
  return {1, static_cast<std::int64_t>(shape.count)};
}

}  // namespace
}  // namespace doors

using namespace doors;

lumra_status lumra_fft_create(const lumra_fft_options *options, lumra_fft **fft) {
  return enter(__func__, [&] {
    require_present(fft, "fft");
    const dsp::fft_settings settings = checked_settings(read_options(options, LUMRA_FFT_OPTIONS));
    ffts::give(fft, std::make_unique<dsp::fft>(settings));
  });
}

lumra_status lumra_fft_forward(lumra_fft *fft, const void *record, void *spectrum, uint64_t rows,
                               const lumra_fft_layout *layout) {
  return enter(__func__, [&] {
    dsp::fft &transform = ffts::get(fft, "fft");
    if (rows == 0) return;
    const dsp::row_shape &from = transform.record(), &to = transform.spectrum();
    if (!layout) {
      require_packed_room(record, from, "record", spectrum, to, "spectrum", rows);
      return transform.forward(record, packed(from), spectrum, packed(to), rows);
    }
    const side read = record_side(*layout, from, rows), written = spectrum_side(*layout, to, rows);
    require_room(record, read, from, "record", spectrum, written, to, "spectrum", rows);
    transform.forward(record, read.layout, spectrum, written.layout, rows);
  });
}

lumra_status lumra_fft_backward(lumra_fft *fft, const void *spectrum, void *record, uint64_t rows,
                                const lumra_fft_layout *layout) {
  return enter(__func__, [&] {
    dsp::fft &transform = ffts::get(fft, "fft");
    if (rows == 0) return;
    const dsp::row_shape &from = transform.spectrum(), &to = transform.record();
    if (!layout) {
      require_packed_room(spectrum, from, "spectrum", record, to, "record", rows);
      return transform.backward(spectrum, packed(from), record, packed(to), rows);
    }
    const side written = record_side(*layout, to, rows), read = spectrum_side(*layout, from, rows);
    require_room(spectrum, read, from, "spectrum", record, written, to, "record", rows);
    transform.backward(spectrum, read.layout, record, written.layout, rows);
  });
}

void lumra_fft_free(lumra_fft *fft) {
  ffts::free(fft);
}
