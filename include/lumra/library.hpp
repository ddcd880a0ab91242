// Which library this is. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/library_info.h>
#include <lumra/error.hpp>

#include <array>
#include <cstdint>
#include <string>

namespace lumra {

/// Which library this is.
struct library_info {
  std::string name;
  std::uint32_t version = 0;  // major in the top byte, minor in the next
  std::string version_text;   // "20.6.0f0"
  std::string description;
  bool uses_avx = false;  // the kernels in use, by what processor and operating system support
};

[[nodiscard]] inline library_info library() {
  library_info info;
  std::array<char, 64> name{}, version{}, description{};
  std::uint8_t avx = 0;
  check(qsLumraAlgo_getLibraryFilename(name.data(), name.size()));
  check(qsLumraAlgo_getLibraryInfo(&info.version, version.data(), version.size(), description.data(),
                                   description.size()));
  check(qsLumraAlgo_hasAvxHardwareSupport(&avx));
  info.name = name.data();
  info.version_text = version.data();
  info.description = description.data();
  info.uses_avx = avx != 0;
  return info;
}

}  // namespace lumra
