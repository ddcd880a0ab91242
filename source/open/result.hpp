// Records that the library fills in and the caller has sized. SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <cstring>
#include <string_view>

#include "open/door.hpp"

namespace doors {

/// Refuses a record that has not this library's size, or an older one's.
template <class Result>
void require_sized(const Result *result, std::string_view name) {
  require_present(result, name);
  constexpr std::uint32_t smallest = 2 * sizeof(std::uint32_t);
  require(result->size >= smallest && result->size <= sizeof(Result), LUMRA_BAD_SIZE_FIELD, name, "->size is ",
          result->size, "; set it to the record's, ", std::uint64_t{sizeof(Result)});
}

/// Writes what a caller of an older header knows of the record; its size stays.
template <class Result>
void give_result(Result *to, Result result) noexcept {
  result.size = to->size;
  std::memcpy(to, &result, result.size);
}

}  // namespace doors
