// The text of metadata, which may come from anybody. SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <filesystem>
#include <nlohmann/json_fwd.hpp>
#include <string>

namespace recording {

inline constexpr std::size_t largest_metadata = std::size_t{64} << 20;  // bytes
/// Values are copied, written and freed level by level of nesting, each with a part of the stack.
inline constexpr std::size_t deepest_metadata = 64;

/// Reads JSON; `where` is its name for messages. Throws failure, also beyond the limits, which are checked before
/// anything is built.
nlohmann::json parse_metadata(const std::string &text, const std::string &where);

/// Reads a file of JSON. Throws failure.
nlohmann::json read_metadata(const std::filesystem::path &file);

/// Refuses a text that is too large. Throws failure.
[[noreturn]] void refuse_size(const std::string &where);

}  // namespace recording
