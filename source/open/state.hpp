// Saved states: what streams or accumulates, as bytes that can be loaded in another process or on another machine.
//
// 8 bytes "lumra" and the kind of object, 4 bytes version, 4 bytes version of the frame, 8 bytes count of the payload,
// the payload, 8 bytes checksum of all before. Numbers are little-endian, as every processor that the library runs on
// has them.
// SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <array>
#include <bit>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <span>
#include <string_view>
#include <type_traits>

#include "open/door.hpp"

namespace doors {

static_assert(std::endian::native == std::endian::little);

/// Which object, three letters, and which layout of its payload.
struct state_kind {
  char letters[4];
  std::uint32_t version;
};

inline constexpr std::size_t state_frame = 32;  // bytes around the payload
inline constexpr std::uint32_t frame_version = 1;

/// FNV-1a of 64 bits over words instead of bytes: four sums over every fourth word, the last words filled up with
/// zeros, then a sum over those. Any change of a single word changes it. Four multiplications wait side by side: one
/// chain over bytes took most of a saving's time.
inline std::uint64_t checksum(std::span<const std::byte> bytes) noexcept {
  constexpr std::uint64_t basis = 0xcbf29ce484222325U, prime = 0x100000001b3U;
  std::array<std::uint64_t, 4> sums{basis, basis, basis, basis}, words;
  const auto add_words = [&] {
    for (std::size_t k = 0; k < sums.size(); ++k) sums[k] = (sums[k] ^ words[k]) * prime;
  };
  for (; bytes.size() >= sizeof words; bytes = bytes.subspan(sizeof words)) {
    std::memcpy(words.data(), bytes.data(), sizeof words);
    add_words();
  }
  if (!bytes.empty()) {
    words = {};
    std::memcpy(words.data(), bytes.data(), bytes.size());
    add_words();
  }
  std::uint64_t sum = basis;
  for (const std::uint64_t each : sums) sum = (sum ^ each) * prime;
  return sum;
}

/// Writes a state. The same sequence of calls on a counter without bytes tells its size.
class state_writer {
 public:
  /// Counts only.
  state_writer() = default;
  explicit state_writer(std::span<std::byte> room) noexcept : room_(room) {}

  template <class T>
  void add(const T &value) noexcept {
    add_all(std::span<const T>(&value, 1));
  }
  template <class T>
  void add_all(std::span<const T> values) noexcept {
    static_assert(std::is_trivially_copyable_v<T>);
    if (!room_.empty() && !values.empty()) std::memcpy(room_.data() + size_, values.data(), values.size_bytes());
    size_ += values.size_bytes();
  }
  [[nodiscard]] std::size_t size() const noexcept { return size_; }
  /// Nothing is written: values need not be known.
  [[nodiscard]] bool only_counts() const noexcept { return room_.empty(); }

 private:
  std::span<std::byte> room_;
  std::size_t size_ = 0;
};

/// Reads a payload; throws refusal where it ends too early.
class state_reader {
 public:
  explicit state_reader(std::span<const std::byte> payload) noexcept : rest_(payload) {}

  template <class T>
  T take() {
    T value;
    take_all(std::span<T>(&value, 1));
    return value;
  }
  template <class T>
  void take_all(std::span<T> values) {
    static_assert(std::is_trivially_copyable_v<T>);
    require(values.size_bytes() <= rest_.size(), LUMRA_BAD_STATE, "the saved bytes end too early; save again");
    if (!values.empty()) std::memcpy(values.data(), rest_.data(), values.size_bytes());
    rest_ = rest_.subspan(values.size_bytes());
  }
  void finish() const { require(rest_.empty(), LUMRA_BAD_STATE, "the saved bytes hold too much; save again"); }

 private:
  std::span<const std::byte> rest_;
};

/// Size of an object's saved state; write(state_writer &) writes its payload.
template <class Write>
std::uint64_t state_size(Write &&write) {
  state_writer counter;
  write(counter);
  return counter.size() + state_frame;
}

/// Writes an object's state into the caller's bytes.
template <class Write>
void save_state(const state_kind &kind, void *bytes, std::uint64_t room, Write &&write) {
  const std::uint64_t size = state_size(write);
  require(room >= size, LUMRA_TOO_LITTLE_ROOM, "the room of ", room, " bytes is too small; the state needs ", size);
  require_present(bytes, "bytes");
  const std::span<std::byte> out(static_cast<std::byte *>(bytes), static_cast<std::size_t>(size));
  state_writer writer(out);
  writer.add_all(std::span<const char>("lumra", 5));
  writer.add_all(std::span<const char>(kind.letters, 3));
  writer.add(kind.version);
  writer.add(frame_version);
  writer.add(size - state_frame);
  write(writer);
  const std::uint64_t sum = checksum(out.first(writer.size()));
  writer.add(sum);
}

/// The payload of saved bytes of that kind; throws refusal for all others.
inline state_reader open_state(const state_kind &kind, const void *bytes, std::uint64_t size) {
  require_present(bytes, "bytes");
  require(size >= state_frame && size < most_bytes, LUMRA_BAD_STATE, "the saved state has ", size,
          " bytes, which is no state's size; give all that was saved");
  const std::span<const std::byte> all(static_cast<const std::byte *>(bytes), static_cast<std::size_t>(size));
  state_reader head(all);
  char letters[8];
  head.take_all(std::span<char>(letters));
  require(std::memcmp(letters, "lumra", 5) == 0 && std::memcmp(letters + 5, kind.letters, 3) == 0, LUMRA_BAD_STATE,
          "the saved bytes are not of this kind of object; load them as what they were saved from");
  const auto version = head.take<std::uint32_t>();
  require(version == kind.version, LUMRA_BAD_STATE, "the saved state has version ", version, "; this library reads ",
          kind.version);
  const auto frame = head.take<std::uint32_t>();
  require(frame == frame_version, LUMRA_BAD_STATE, "the saved state has a frame of version ", frame,
          "; this library reads ", frame_version);
  const auto payload = head.take<std::uint64_t>();
  std::uint64_t sum = 0;
  std::memcpy(&sum, all.last(sizeof sum).data(), sizeof sum);
  require(payload == size - state_frame && sum == checksum(all.first(all.size() - sizeof sum)), LUMRA_BAD_STATE,
          "the saved bytes are damaged; save again");
  return state_reader(all.subspan(24, static_cast<std::size_t>(payload)));
}

}  // namespace doors
