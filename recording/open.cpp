// SPDX-License-Identifier: MIT
#include "recording/open.hpp"

#include "recording/raw.hpp"
#include "recording/sigmf_archive.hpp"
#include "recording/sigmf_pair.hpp"
#include "recording/wav.hpp"

namespace recording {
namespace {

/// Each kind of input looks whether the path is one of its own; a raw file may have any name and is the last.
source open_any(const std::filesystem::path &path, const options &said) {
  if (path == "-") return open_standard_input(said);
  if (auto opened = open_sigmf_pair(path, said)) return *std::move(opened);
  if (auto opened = open_sigmf_archive(path, said)) return *std::move(opened);
  if (auto opened = open_wav(path, said)) return *std::move(opened);
  return open_raw(path, said);
}

}  // namespace

source open(const std::filesystem::path &path, const options &said) {
  source opened = open_any(path, said);
  opened.path = path;
  choose(opened, said);
  return opened;
}

}  // namespace recording
