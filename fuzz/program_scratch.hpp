// A folder in memory for what the program reads and writes. SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <string_view>

namespace fuzz {

inline void require(bool holds, const char *what, std::string_view seen = "") {
  if (holds) return;
  std::fprintf(stderr, "not true: %s\n%.*s\n", what, static_cast<int>(seen.size()), seen.data());
  std::abort();
}

/// What a user is told: a text without a line's end.
inline void require_one_line(std::string_view text) {
  require(!text.empty() && std::all_of(text.begin(), text.end(), [](char c) { return c != '\n' && c != '\0'; }),
          "the failure is told in one line", text);
}

class scratch_folder {
 public:
  scratch_folder() {
    std::string name = "/dev/shm/lumra-fuzz-XXXXXX";
    require(::mkdtemp(name.data()) != nullptr, "a folder in memory");
    path_ = name;
  }
  scratch_folder(const scratch_folder &) = delete;
  scratch_folder &operator=(const scratch_folder &) = delete;
  ~scratch_folder() { std::filesystem::remove_all(path_); }

  [[nodiscard]] const std::filesystem::path &path() const noexcept { return path_; }
  void write(const std::string &name, std::string_view content) const {
    std::ofstream(path_ / name, std::ios::binary).write(content.data(), static_cast<std::streamsize>(content.size()));
  }
  [[nodiscard]] std::string read(const std::string &name) const {
    std::ifstream file(path_ / name, std::ios::binary);
    return {std::istreambuf_iterator<char>(file), {}};
  }

 private:
  std::filesystem::path path_;
};

}  // namespace fuzz
