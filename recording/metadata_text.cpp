// SPDX-License-Identifier: MIT
#include "recording/metadata_text.hpp"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <nlohmann/json.hpp>
#include <string>

#include "recording/failure.hpp"
#include "recording/file.hpp"

namespace recording {
namespace {

namespace fs = std::filesystem;

/// Reads all of the file, however large it says it is.
std::string text_of(const fs::path &file) {
  // A pipe is opened without waiting for its other end.
  const descriptor opened(::open(file.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK));
  struct stat status = {};
  if (!opened.is_open() || ::fstat(opened.get(), &status) != 0)
    throw failure("{}: {}", file.string(), system_reason(errno));
  if (!S_ISREG(status.st_mode)) throw failure("{}: not a regular file; is this the metadata file?", file.string());
  const auto expected = static_cast<std::size_t>(status.st_size);
  std::string text;
  std::size_t size = 0;
  while (size <= largest_metadata && expected <= largest_metadata) {
    if (size == text.size()) text.resize(std::min(std::max(2 * size, expected + 1), largest_metadata + 1));
    const ssize_t count = ::read(opened.get(), text.data() + size, text.size() - size);
    if (count < 0 && errno == EINTR) continue;
    if (count < 0) throw failure("{}: {}", file.string(), system_reason(errno));
    size += static_cast<std::size_t>(count);
    if (count > 0) continue;
    text.resize(size);
    return text;
  }
  refuse_size(file.string());
}

/// Counts arrays and objects; gives at least what a parser would see up to the first error.
std::size_t depth_of(const std::string &text) noexcept {
  std::size_t depth = 0, deepest = 0;
  bool in_string = false;
  for (std::size_t i = 0; i < text.size(); ++i) {
    const char c = text[i];
    if (in_string && c == '\\') {
      ++i;
    } else if (c == '"') {
      in_string = !in_string;
    } else if (!in_string && (c == '[' || c == '{')) {
      deepest = std::max(deepest, ++depth);
    } else if (!in_string && (c == ']' || c == '}')) {
      depth -= depth > 0 ? 1 : 0;
    }
  }
  return deepest;
}

}  // namespace

void refuse_size(const std::string &where) {
  throw failure("{}: metadata of more than 64 MiB are not read; take out what is not needed", where);
}

nlohmann::json parse_metadata(const std::string &text, const std::string &where) {
  if (text.size() > largest_metadata) refuse_size(where);
  if (depth_of(text) > deepest_metadata)
    throw failure("{}: metadata nested deeper than {} are not read; take out what is nested so deep", where,
                  deepest_metadata);
  try {
    return nlohmann::json::parse(text);
  } catch (const nlohmann::json::parse_error &error) {
    throw failure("{}: not valid JSON near byte {}; is this the metadata file?", where, error.byte);
  } catch (const nlohmann::json::exception &) {
    throw failure("{}: a number is out of range; correct the metadata", where);
  }
}

nlohmann::json read_metadata(const fs::path &file) {
  return parse_metadata(text_of(file), file.string());
}

}  // namespace recording
