// SPDX-License-Identifier: MIT
#include "recording/sample_reader.hpp"

#include <algorithm>
#include <bit>
#include <cmath>
#include <cstring>
#include <type_traits>

#include "recording/failure.hpp"
#include "recording/sample_codec.hpp"

namespace recording {
namespace {

/// Bytes and what becomes of them stay in a core's cache.
constexpr std::size_t piece_bytes = std::size_t{1} << 17;

template <class Real>
bool is_finite(Real value) noexcept {
  using bits = std::conditional_t<sizeof(Real) == 4, std::uint32_t, std::uint64_t>;
  constexpr auto exponent = std::bit_cast<bits>(std::numeric_limits<Real>::infinity());
  return (std::bit_cast<bits>(value) & exponent) != exponent;
}

/// The loop has no early end, so that it is vectorised.
template <class Real>
bool all_finite(std::span<const Real> values) noexcept {
  bool finite = true;
  for (const Real value : values) finite &= is_finite(value);
  return finite;
}

/// Moves one channel's samples to the front.
void gather(std::span<std::byte> bytes, std::size_t frame, std::size_t first, std::size_t width) noexcept {
  for (std::size_t i = 0; i < bytes.size() / frame; ++i)
    std::memmove(bytes.data() + i * width, bytes.data() + i * frame + first, width);
}

}  // namespace

sample_reader::sample_reader(const source &from, std::uint64_t first, std::uint64_t samples)
    : source_(from),
      first_(first),
      samples_(samples),
      frame_(from.channels * from.format.bytes()),
      reader_(from.bytes()),
      bytes_(std::max(piece_bytes, frame_)) {}

template <class Real>
void sample_reader::require_finite(std::span<const Real> components) const {
  if (!source_.format.is_floating() || all_finite(components)) return;
  const auto bad = std::find_if_not(components.begin(), components.end(), is_finite<Real>);
  const auto sample = static_cast<std::size_t>(bad - components.begin()) / source_.format.components();
  throw failure("{}: sample {} is not a finite {} number; is the type ({}) and byte order right?",
                source_.data.string(), first_ + position_ + sample,
                sizeof(Real) == 4 ? "single-precision" : "double-precision", source_.datatype);
}

template <class Real>
std::size_t sample_reader::read_piece(std::span<Real> out) {
  if (position_ >= samples_) return 0;
  const std::size_t parts = source_.format.components();
  const std::uint64_t index = first_ + position_;
  const auto behind = std::upper_bound(source_.extents.begin(), source_.extents.end(), index,
                                       [](std::uint64_t at, const extent &e) { return at < e.first; });
  const extent &in = *(behind - 1);
  const auto left = std::min<std::uint64_t>(in.samples - (index - in.first), samples_ - position_);
  const auto wanted = std::min<std::uint64_t>({out.size() / parts, left, bytes_.size() / frame_});
  if (wanted == 0) return 0;

  // What lies in the file as it is needed goes there at once.
  const bool as_it_is = std::is_same_v<Real, float> && source_.format.type == component::f32 &&
                        !source_.format.big_endian && source_.channels == 1;
  const std::span<std::byte> to =
      as_it_is ? std::as_writable_bytes(out.first(wanted * parts)) : std::span(bytes_).first(wanted * frame_);
  const std::size_t got = reader_->read(in.offset + (index - in.first) * frame_, to);
  if (got < to.size() && source_.samples != endless)
    throw failure("{}: became shorter while it was read; try again", source_.data.string());
  if (got % frame_ != 0)
    throw failure("{}: ends inside of sample {}, {} of whose {} bytes are there; is it complete, the type ({}) right?",
                  source_.data.string(), index + got / frame_, got % frame_, frame_, source_.datatype);
  const std::size_t count = got / frame_;
  const std::size_t width = source_.format.bytes();
  if (source_.channels > 1) gather(to.first(got), frame_, source_.channel * width, width);
  const std::span<const std::byte> read = to.first(count * width);
  out = out.first(count * parts);
  if (!as_it_is) decode(source_.format, read, out);
  if (counting_) clipped_ += recording::count_clipped(source_.format, read);
  require_finite(std::span<const Real>(out));
  position_ += count;
  return count;
}

template <class Real>
std::size_t sample_reader::read_components(std::span<Real> out) {
  const std::size_t parts = source_.format.components();
  std::size_t got = 0;
  while (got * parts < out.size()) {
    const std::size_t count = read_piece(out.subspan(got * parts));
    if (count == 0) break;
    got += count;
  }
  return got;
}

template <class Real>
std::size_t sample_reader::read_complex(std::span<std::complex<Real>> out) {
  auto *const parts = reinterpret_cast<Real *>(out.data());
  if (source_.format.is_complex) return read_components(std::span(parts, 2 * out.size()));
  // The real samples are read into the front half and spread from the last one on.
  const std::size_t count = read_components(std::span(parts, out.size()));
  for (std::size_t i = count; i-- > 0;) {
    parts[2 * i] = parts[i];
    parts[2 * i + 1] = 0;
  }
  return count;
}

std::size_t sample_reader::read(std::span<std::complex<float>> out) {
  return read_complex(out);
}
std::size_t sample_reader::read(std::span<std::complex<double>> out) {
  return read_complex(out);
}
std::size_t sample_reader::read(std::span<float> out) {
  return read_components(out);
}
std::size_t sample_reader::read(std::span<double> out) {
  return read_components(out);
}

}  // namespace recording
