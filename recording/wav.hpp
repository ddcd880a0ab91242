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

/// The smallest type of WAV files, little-endian, from which the samples of a type come back as they were. Integers of
/// eight bits are unsigned there, wider ones signed.
sample_format wav_format(const sample_format &of);
/// What WAV files call it.
std::string wav_datatype(const sample_format &format);

/// Writes a WAV file to an open file that can be both written and positioned.
class wav_writer final : public byte_sink {
 public:
  /// The format is one of wav_format, the descriptor outlives the writer; `name` is the file's, for messages. What may
  /// become larger than a plain file can, or is endless, gets the header of RF64. Throws failure, also where the rate
  /// is no whole number.
  wav_writer(int descriptor, std::string name, const sample_format &format, double rate, std::uint64_t samples);
  wav_writer(const wav_writer &) = delete;
  wav_writer &operator=(const wav_writer &) = delete;
  ~wav_writer();

  /// Appends whole samples. Throws failure.
  void write(std::span<const std::byte> bytes) override;
  /// Completes the header. Throws failure.
  void finish();

 private:
  struct file;

  /// Throws failure with what the system said last, or else this.
  [[noreturn]] void refuse(const char *reason) const;

  std::string name_;
  std::unique_ptr<file> file_;
};

}  // namespace recording
