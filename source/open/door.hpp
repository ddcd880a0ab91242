// What all functions of the open interface share: how arguments are checked, and what a failure leaves behind.
//
// A function runs its work in doors::enter. What the work refuses or throws becomes the status, and the calling
// thread's latest failure becomes the sentence that lumra_last_error gives. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/status.h>
#include <lumra/types.h>

#include <complex>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <exception>
#include <span>
#include <string_view>
#include <type_traits>
#include <utility>

#include "open/sentence.hpp"

namespace doors {

/// Ends a call with a code and a sentence.
class refusal : public std::exception {
 public:
  refusal(lumra_status code, const sentence &text) noexcept : code_(code), text_(text) {}
  [[nodiscard]] lumra_status code() const noexcept { return code_; }
  [[nodiscard]] std::string_view text() const noexcept { return text_.text(); }

 private:
  lumra_status code_;
  sentence text_;
};

/// Throws refusal with all parts of the sentence.
template <class... Parts>
[[noreturn]] void refuse(lumra_status code, const Parts &...parts) {
  sentence text;
  (text << ... << parts);
  throw refusal(code, text);
}

template <class... Parts>
void require(bool condition, lumra_status otherwise, const Parts &...parts) {
  if (!condition) refuse(otherwise, parts...);
}

inline void require_present(const void *pointer, std::string_view name) {
  require(pointer != nullptr, LUMRA_NULL_ARGUMENT, name, " is null; give the address of what the header describes");
}

/// Largest number of bytes that an array may have.
inline constexpr std::uint64_t most_bytes = std::uint64_t{1} << 62;

/// Arrays of zero elements may have no address.
template <class T>
std::span<T> array(T *first, std::uint64_t count, std::string_view name) {
  require(count <= most_bytes / sizeof(T), LUMRA_OUT_OF_RANGE, "the count of ", name, " is ", count,
          ", more than memory can hold; give the number of elements");
  if (count == 0) return {};
  require(first != nullptr, LUMRA_NULL_ARGUMENT, name, " is null; give ", count, " elements, or a count of 0");
  return {first, static_cast<std::size_t>(count)};
}

// Complex elements as the library computes with them.
inline std::complex<float> *samples(lumra_cf32 *x) noexcept {
  return reinterpret_cast<std::complex<float> *>(x);
}
inline std::complex<double> *samples(lumra_cf64 *x) noexcept {
  return reinterpret_cast<std::complex<double> *>(x);
}
inline const std::complex<float> *samples(const lumra_cf32 *x) noexcept {
  return reinterpret_cast<const std::complex<float> *>(x);
}
inline const std::complex<double> *samples(const lumra_cf64 *x) noexcept {
  return reinterpret_cast<const std::complex<double> *>(x);
}
inline float *samples(float *x) noexcept {
  return x;
}
inline double *samples(double *x) noexcept {
  return x;
}
inline const float *samples(const float *x) noexcept {
  return x;
}
inline const double *samples(const double *x) noexcept {
  return x;
}

template <class T, class U>
bool overlap(std::span<T> a, std::span<U> b) noexcept {
  const auto first_a = reinterpret_cast<std::uintptr_t>(a.data()), first_b = reinterpret_cast<std::uintptr_t>(b.data());
  return first_a < first_b + b.size_bytes() && first_b < first_a + a.size_bytes();
}

/// Refuses arrays that share memory.
template <class T, class U>
void require_apart(std::span<T> a, std::string_view name, std::span<U> b, std::string_view other) {
  require(!overlap(a, b), LUMRA_OVERLAP, name, " overlaps ", other, "; give memory of its own");
}

/// Refuses arrays that share memory but are not the same.
template <class T, class U>
void require_same_or_apart(std::span<T> a, std::string_view name, std::span<U> b, std::string_view other) {
  const bool same =
      sizeof(T) == sizeof(U) && static_cast<const void *>(a.data()) == static_cast<const void *>(b.data());
  require(same || !overlap(a, b), LUMRA_OVERLAP, name, " overlaps ", other,
          " without beginning where it begins; give the same array or memory of its own");
}

/// The caller's record over the defaults. A caller that was built with an older header gives a shorter record, whose
/// missing end keeps the defaults; one that was built with a newer header may give a longer one, as long as nothing is
/// asked for there.
template <class Options>
Options read_options(const Options *given, const Options &defaults, std::string_view name = "options") {
  static_assert(std::is_trivially_copyable_v<Options>);
  constexpr std::uint32_t smallest = 2 * sizeof(std::uint32_t), largest = 4096;
  if (!given) return defaults;
  const std::uint32_t size = given->size;
  require(size >= smallest && size <= largest, LUMRA_BAD_SIZE_FIELD, name, "->size is ", size, "; this library's is ",
          std::uint64_t{sizeof(Options)}, ", which the header's initialiser gives");
  Options read = defaults;
  std::memcpy(&read, given, size < sizeof read ? size : sizeof read);
  const auto *bytes = reinterpret_cast<const unsigned char *>(given);
  for (std::uint32_t k = sizeof read; k < size; ++k)
    require(bytes[k] == 0, LUMRA_BAD_SIZE_FIELD, name, "->size is ", size, " and asks for what this library (",
            std::uint64_t{sizeof(Options)}, " bytes) does not know; use a newer library");
  return read;
}

/// Keeps the current exception as the thread's latest failure; its code.
lumra_status keep_failure(const char *function) noexcept;

/// Runs an exported function's work; `function` is its __func__.
template <class Work>
lumra_status enter(const char *function, Work &&work) noexcept {
  try {
    std::forward<Work>(work)();
    return LUMRA_SUCCESS;
  } catch (...) {
    return keep_failure(function);
  }
}

}  // namespace doors
