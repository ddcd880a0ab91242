// WAV files, also those beyond 4 GB (RF64, W64). SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <filesystem>
#include <memory>
#include <optional>
#include <string>

#include "recording/byte_sink.hpp"
#include "recording/options.hpp"
#include "recording/source.hpp"

namespace recording {

/// Opens a file whose suffix says WAV; gives nothing for others. One channel is real, two are I and Q; of more, an even
/// number are pairs of I and Q and an odd number real ones, of which one is read. Throws failure.
std::optional<source> open_wav(const std::filesystem::path &path, const options &said);

bool has_wav_suffix(const std::filesystem::path &path);

/// The type in which WAV files hold samples of a type: eight bits unsigned, more of them signed, little-endian.
sample_format wav_format(const sample_format &of);
/// What WAV files call it.
std::string wav_datatype(const sample_format &format);

/// Writes a WAV file to an open file that can be both written and positioned. Its header is that of RF64 where it needs
/// to be.
class wav_writer final : public byte_sink {
 public:
  /// The format is one of wav_format, the descriptor outlives the writer. Throws failure, also where the rate is no
  /// whole number. `name` is the file's, for messages.
  wav_writer(int descriptor, std::string name, const sample_format &format, double rate);
  wav_writer(const wav_writer &) = delete;
  wav_writer &operator=(const wav_writer &) = delete;
  ~wav_writer();

  /// Appends whole samples. Throws failure.
  void write(std::span<const std::byte> bytes) override;
  /// Completes the header. Throws failure.
  void finish();

 private:
  struct file;

  std::string name_;
  std::unique_ptr<file> file_;
};

}  // namespace recording
