// SPDX-License-Identifier: MIT
#include "recording/sample_reader.hpp"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <bit>
#include <cerrno>
#include <cmath>

#include "recording/failure.hpp"

namespace recording {
namespace {

constexpr std::size_t piece_bytes = std::size_t{1} << 20;

bool is_finite(float value) noexcept {
  return (std::bit_cast<std::uint32_t>(value) & 0x7F800000U) != 0x7F800000U;
}

/// The loop has no early end, so that it is vectorised.
bool all_finite(std::span<const std::complex<float>> samples) noexcept {
  const auto *values = reinterpret_cast<const float *>(samples.data());
  bool finite = true;
  for (std::size_t i = 0; i < 2 * samples.size(); ++i) finite &= is_finite(values[i]);
  return finite;
}

}  // namespace

sample_reader::sample_reader(const source &from)
    : source_(from), file_(::open(from.data.c_str(), O_RDONLY | O_CLOEXEC)), bytes_(piece_bytes) {
  if (!file_.is_open()) throw failure("{}: {}", from.data.string(), system_reason(errno));
  (void)::posix_fadvise(file_.get(), 0, 0, POSIX_FADV_SEQUENTIAL);
}

void sample_reader::read(std::span<std::complex<float>> out) {
  const std::size_t width = source_.format.bytes();
  while (!out.empty()) {
    if (extent_ == source_.extents.size()) throw failure("{}: no more samples", source_.data.string());
    const extent &current = source_.extents[extent_];
    if (in_extent_ == current.samples) {
      ++extent_;
      in_extent_ = 0;
      continue;
    }
    const std::uint64_t count =
        std::min({std::uint64_t{out.size()}, current.samples - in_extent_, std::uint64_t{piece_bytes / width}});
    read_piece(out.first(count), current.offset + in_extent_ * width);
    in_extent_ += count;
    position_ += count;
    out = out.subspan(count);
  }
}

void sample_reader::read_piece(std::span<std::complex<float>> out, std::uint64_t offset) {
  const std::size_t wanted = out.size() * source_.format.bytes();
  for (std::size_t got = 0; got < wanted;) {
    const ssize_t count = ::pread(file_.get(), bytes_.data() + got, wanted - got, static_cast<off_t>(offset + got));
    if (count < 0 && errno == EINTR) continue;
    if (count < 0) throw failure("{}: {}", source_.data.string(), system_reason(errno));
    if (count == 0) throw failure("{}: became shorter while it was read; try again", source_.data.string());
    got += static_cast<std::size_t>(count);
  }
  decode(source_.format, std::span(bytes_).first(wanted), out);
  if (!source_.format.is_floating() || all_finite(out)) return;
  const auto bad = std::find_if(out.begin(), out.end(), [](const std::complex<float> &x) {
    return !is_finite(x.real()) || !is_finite(x.imag());
  });
  throw failure("{}: sample {} is not a finite single-precision number; is the type ({}) and byte order right?",
                source_.data.string(), position_ + static_cast<std::uint64_t>(bad - out.begin()),
                source_.format.name());
}

}  // namespace recording
