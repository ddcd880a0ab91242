// SPDX-License-Identifier: MIT
#include "signal/transform.hpp"

#include <algorithm>

#include "qsrfhs/math/mkl_runtime.hpp"

namespace dsp {
namespace {

/// Up to this size a transform in place is the faster way; beyond it, a copy and a transform of that are.
constexpr std::uint64_t most_in_place_points = std::uint64_t{1} << 16;

constexpr std::size_t line = 64;                              // bytes that a cache loads at once
constexpr std::size_t most_gathered = std::size_t{16} << 20;  // bytes of rows that are gathered together
constexpr std::size_t neighbours = 4 * line;                  // bytes of interleaved rows worth gathering together

dfti_settings settings_of(const fft_settings &wanted, bool in_place) noexcept {
  return {.precision = wanted.double_precision ? DFTI_DOUBLE : DFTI_SINGLE,
          .domain = wanted.real ? DFTI_REAL : DFTI_COMPLEX,
          .lengths = {static_cast<MKL_LONG>(wanted.points), 0},
          .in_place = in_place,
          .forward_scale = wanted.forward_scale,
          .backward_scale = wanted.backward_scale};
}

}  // namespace

fft::fft(const fft_settings &settings) {
  const std::size_t real = settings.double_precision ? sizeof(double) : sizeof(float);
  const auto points = static_cast<std::size_t>(settings.points);
  record_ = {points, settings.real ? real : 2 * real};
  spectrum_ = {settings.real ? points / 2 + 1 : points, 2 * real};

  const qsrfhs::mkl_runtime::use in_use;
  apart_ = dfti_descriptor(settings_of(settings, false));
  if (settings.points <= most_in_place_points) in_place_ = dfti_descriptor(settings_of(settings, true));

  // Rows in the workspace begin on lines of different cache sets.
  const std::size_t bytes = std::max(record_.bytes(), spectrum_.bytes());
  pitch_ = (bytes + line - 1) / line * line + line;
  block_ = std::clamp<std::size_t>(most_gathered / pitch_, 1, neighbours / record_.size);
  gathered_ = qsrfhs::aligned_buffer<std::byte>(block_ * pitch_);
  scattered_ = qsrfhs::aligned_buffer<std::byte>(block_ * pitch_);
}

template <fft::direction D>
void fft::run(const void *in, row_layout from, void *out, row_layout to, std::uint64_t rows) {
  const row_shape &read = D == direction::forward ? record_ : spectrum_;
  const row_shape &written = D == direction::forward ? spectrum_ : record_;
  const bool in_place = in == out, contiguous = from.step == 1 && to.step == 1;
  const auto *row_in = static_cast<const std::byte *>(in);
  auto *row_out = static_cast<std::byte *>(out);
  const std::int64_t next_in = from.distance * static_cast<std::int64_t>(read.size);
  const std::int64_t next_out = to.distance * static_cast<std::int64_t>(written.size);

  const qsrfhs::mkl_runtime::use in_use;
  if (!contiguous || (in_place && !in_place_)) return run_blocks<D>(row_in, from, row_out, to, rows);
  for (std::uint64_t r = 0; r < rows; ++r, row_in += next_in, row_out += next_out) {
    if constexpr (D == direction::forward)
      in_place ? in_place_.forward(row_out) : apart_.forward(row_in, row_out);
    else
      in_place ? in_place_.backward(row_out) : apart_.backward(row_in, row_out);
  }
}

template <fft::direction D>
void fft::run_blocks(const std::byte *in, row_layout from, std::byte *out, row_layout to, std::uint64_t rows) {
  const row_shape &read = D == direction::forward ? record_ : spectrum_;
  const row_shape &written = D == direction::forward ? spectrum_ : record_;
  const bool gathers = from.step != 1 || in == out, scatters = to.step != 1;
  const row_layout gathered{1, static_cast<std::int64_t>(pitch_ / read.size)};
  const row_layout scattered{1, static_cast<std::int64_t>(pitch_ / written.size)};
  const row_layout &source = gathers ? gathered : from, &target = scatters ? scattered : to;
  const std::size_t block = from.interleaved() || to.interleaved() ? block_ : 1;

  for (std::uint64_t done = 0; done < rows; done += block) {
    const auto first = static_cast<std::int64_t>(done);
    const std::size_t count = std::min<std::uint64_t>(block, rows - done);
    const std::byte *const block_in = in + first * from.distance * static_cast<std::int64_t>(read.size);
    std::byte *const block_out = out + first * to.distance * static_cast<std::int64_t>(written.size);
    if (gathers) copy_rows(block_in, from, gathered_.data(), gathered, read, count);
    const std::byte *row_in = gathers ? gathered_.data() : block_in;
    std::byte *row_out = scatters ? scattered_.data() : block_out;
    for (std::size_t r = 0; r < count; ++r) {
      D == direction::forward ? apart_.forward(row_in, row_out) : apart_.backward(row_in, row_out);
      row_in += source.distance * static_cast<std::int64_t>(read.size);
      row_out += target.distance * static_cast<std::int64_t>(written.size);
    }
    if (scatters) copy_rows(scattered_.data(), scattered, block_out, to, written, count);
  }
}

void fft::forward(const void *record, row_layout from, void *spectrum, row_layout to, std::uint64_t rows) {
  run<direction::forward>(record, from, spectrum, to, rows);
}

void fft::backward(const void *spectrum, row_layout from, void *record, row_layout to, std::uint64_t rows) {
  run<direction::backward>(spectrum, from, record, to, rows);
}

}  // namespace dsp
