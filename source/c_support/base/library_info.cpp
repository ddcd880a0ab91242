// SPDX-License-Identifier: MIT
#include <lumra/library_info.h>
#include <lumra/status.h>

#include <cstring>
#include <string_view>

#include "platform/processor.hpp"

namespace {

constexpr std::string_view library_name = "qsLumraAlgo";
constexpr std::uint32_t version_number = 0x140600C0;  // 20.6
constexpr std::string_view version_label = "20.6.0f0";
constexpr std::string_view library_description = "QS Lumra Algo C interface 64bit release";

/// Writes a text with its NUL where both fit into `room` bytes, else an empty string.
void write_text(std::string_view text, char *buffer, int room) noexcept {
  if (room < 1) return;
  const bool fits = text.size() < static_cast<std::size_t>(room);
  const std::size_t n = fits ? text.size() : 0;
  std::memcpy(buffer, text.data(), n);
  buffer[n] = '\0';
}

}  // namespace

int32_t qsLumraAlgo_getLibraryFilename(char *buffer, uint16_t size) {
  if (!buffer) return LUMRA_INFO_FILENAME_NULL;
  write_text(library_name, buffer, size - 1);
  return 0;
}

int32_t qsLumraAlgo_getLibraryInfo(uint32_t *version, char *versionText, uint16_t versionTextSize, char *description,
                                   uint16_t descriptionSize) {
  constexpr int shortest_version_text = 13;
  if (!version) return LUMRA_INFO_VERSION_NULL;
  if (!versionText) return LUMRA_INFO_VERSION_TEXT_NULL;
  if (!description) return LUMRA_INFO_DESCRIPTION_NULL;
  *version = version_number;
  // Deliberately different: the version text is given one byte less than its buffer, the description all of it.
  if (versionTextSize < shortest_version_text) return 0;
  write_text(version_label, versionText, versionTextSize - 1);
  if (descriptionSize < library_description.size() + 1) return 0;
  write_text(library_description, description, descriptionSize);
  return 0;
}

int32_t qsLumraAlgo_hasAvxHardwareSupport(uint8_t *result) {
  if (!result) return LUMRA_INFO_AVX_NULL;
  *result = platform::has_avx() ? 1 : 0;
  return 0;
}
