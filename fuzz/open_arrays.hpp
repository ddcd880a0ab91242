// Arguments of the open interface's functions. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/lumra.h>

#include <cstring>
#include <span>
#include <vector>

#include "input.hpp"
#include "open/state.hpp"

namespace fuzz {

constexpr std::uint64_t huge = std::uint64_t{1} << 61;  // more elements of any type than memory can hold

/// Gives a changed state the checksum that fits.
inline void seal(std::vector<unsigned char> &state) noexcept {
  const std::span<unsigned char> all(state);
  const std::uint64_t sum = doors::checksum(std::as_bytes(all.first(all.size() - sizeof sum)));
  std::memcpy(all.last(sizeof sum).data(), &sum, sizeof sum);
}

/// The arrays of one call, exactly as long as they are said to be. Some are null, or begin in another.
class arrays {
 public:
  explicit arrays(input &from) noexcept : in_(from) {}

  /// An address with so many bytes behind it, and some before it.
  void *give(std::uint64_t bytes, std::size_t alignment, bool writes, std::uint64_t before = 0) {
    const unsigned b = in_.byte();
    const std::size_t all = bytes + before, shift = b & 1 ? alignment : 0;
    if (b >= 250) return nullptr;
    for (block &known : blocks_) {
      if (b < 232 || known.now.size() < all + shift) continue;
      known.writes = known.writes || writes;
      return known.now.data() + before + shift;
    }
    block &made = blocks_.emplace_back();
    made.now = std::vector<unsigned char>(all + shift);
    auto *const first = reinterpret_cast<char *>(made.now.data()) + shift;
    if (alignment == sizeof(double))
      fill<double>(in_, first, all / sizeof(double));
    else
      fill<float>(in_, first, all / sizeof(float));
    made.before = made.now;
    made.writes = writes;
    return made.now.data() + before + shift;
  }

  /// A call's code is a listed one, and a failure has a sentence; only outputs changed, and only without a failure.
  void check(lumra_status code, int line = __builtin_LINE()) const {
    const bool listed = code == LUMRA_NO_CONVERGENCE || code == LUMRA_TOO_FEW_SAMPLES ||
                        (code >= LUMRA_BAD_STATE && code <= LUMRA_NULL_ARGUMENT);
    hold(code == LUMRA_SUCCESS || listed, "code is not a documented one", line);
    hold(code == LUMRA_SUCCESS || std::strncmp(lumra_last_error(), "lumra_", 6) == 0, "a sentence", line);
    for (const block &one : blocks_)
      hold((code == LUMRA_SUCCESS && one.writes) || one.now == one.before, "an array that must not change", line);
  }

 private:
  struct block {
    std::vector<unsigned char> now, before;
    bool writes = false;
  };
  input &in_;
  std::vector<block> blocks_;
};

inline std::uint64_t any_count(input &in) {
  return in.one_in(32) ? huge << in.choice(3) : static_cast<std::uint64_t>(in.count() % 400);
}
/// As many elements as an array has: what is refused needs none.
inline std::uint64_t held(std::uint64_t count) {
  return count < huge ? count : 2;
}

constexpr std::size_t real_size(std::int32_t type) noexcept {
  return type == LUMRA_TYPE_F32 || type == LUMRA_TYPE_CF32 ? sizeof(float) : sizeof(double);
}
constexpr bool is_real(std::int32_t type) noexcept {
  return type == LUMRA_TYPE_F32 || type == LUMRA_TYPE_F64;
}
constexpr std::size_t size_of(std::int32_t type) noexcept {
  return real_size(type) * (is_real(type) ? 1 : 2);
}

inline std::int32_t any_type(input &in) {
  constexpr std::int32_t types[] = {LUMRA_TYPE_F32, LUMRA_TYPE_F64, LUMRA_TYPE_CF32, LUMRA_TYPE_CF64};
  return in.one_in(32) ? in.option(16) : types[in.choice(4)];
}

/// Options as callers of any age give them, and what the library makes of them.
template <class Options>
struct record {
  Options given, meant;
  unsigned char more[4096] = {};
  const Options *address = &given;

  record(input &in, const Options &options, const Options &defaults) : given(options), meant(options) {
    constexpr std::uint32_t own = sizeof(Options);
    constexpr std::uint32_t sizes[] = {0, 7, 8, own - 4, own + 1, 4096, 4097, 0xFFFFFFFF};
    if (in.one_in(32)) address = nullptr;
    if (in.one_in(16)) given.size = sizes[in.choice(8)];
    more[in.byte()] = in.one_in(8);
    meant = defaults;
    if (address) std::memcpy(&meant, &given, std::min(given.size, own));
  }
};

}  // namespace fuzz
