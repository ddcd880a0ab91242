// SPDX-License-Identifier: MIT
#include "recording/open.hpp"

#include "recording/raw.hpp"
#include "recording/sigmf.hpp"

namespace recording {

/// Each kind of input looks whether the path is one of its own; a raw file may have any name and is the last.
source open(const std::filesystem::path &path, const options &said) {
  if (auto opened = open_sigmf(path, said)) return *std::move(opened);
  return open_raw(path, said);
}

}  // namespace recording
