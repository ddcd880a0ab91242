// A recording that can be read: what it holds, how fast, around which frequency, and where.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <filesystem>
#include <functional>
#include <limits>
#include <memory>
#include <nlohmann/json_fwd.hpp>
#include <optional>
#include <string>
#include <vector>

#include "recording/byte_reader.hpp"
#include "recording/date_time.hpp"
#include "recording/options.hpp"
#include "recording/sample_format.hpp"

namespace recording {

/// The number of samples of an input whose end is not known.
inline constexpr std::uint64_t endless = std::numeric_limits<std::uint64_t>::max();

// Samples count from 0 at the first of the file (metadata may count from elsewhere: source::first_index), those of one
// channel alone.

/// Samples that were recorded with one setting.
struct capture {
  std::uint64_t start = 0;
  std::uint64_t samples = 0;
  std::optional<double> frequency;  // centre in hertz, where known
  std::string time;                 // of the first sample as the metadata say it; empty where they do not
  std::optional<date_time> begin;   // the same, where it can be read
  std::optional<std::uint64_t> global_index;
};

/// A part of the recording that somebody has marked. It may reach beyond the end of the samples.
struct annotation {
  std::uint64_t start = 0;
  std::optional<std::uint64_t> samples;  // none: up to the end, or the next one
  std::optional<double> low, high;       // edges in hertz, absolute
  std::string label, comment;
  std::size_t item = 0;  // its index in the metadata's list
};

/// Samples that an analysis may run over: no two of them have a gap or a new frequency between them.
struct stretch {
  std::uint64_t first = 0;
  std::uint64_t samples = 0;        // or endless; of an endless input that was cut, at most so many
  std::optional<double> frequency;  // centre in hertz, where known
  std::size_t capture = 0;          // index of the first capture it has samples of
};

/// Samples that lie behind each other in the bytes.
struct extent {
  std::uint64_t first;    // index of the first sample
  std::uint64_t samples;  // or endless
  std::uint64_t offset;   // of the first byte
};

struct source {
  std::filesystem::path path;                // as it was given
  std::string name;                          // for titles: the file's name without folder and suffix
  std::filesystem::path data;                // the file with the samples, for messages
  std::vector<std::filesystem::path> files;  // all that is read; outputs must not be among them

  sample_format format;
  std::string datatype;                     // the format's name in SigMF; of a WAV file its subtype
  double rate = 0;                          // samples per second, positive
  std::uint64_t channels = 1, channel = 0;  // how many are interleaved, and which is read
  std::uint64_t samples = 0;                // from the first to the last in the file, or endless
  std::vector<capture> captures;            // in order; one at least
  std::vector<annotation> annotations;
  std::vector<std::string> faults;  // sentences: what is wrong with the metadata and does not hinder reading
  std::shared_ptr<const nlohmann::json> metadata;  // all that SigMF says; none for other files
  std::uint64_t first_index = 0;                   // the metadata's index of the file's first sample

  // What the options choose.
  std::uint64_t chosen_first = 0, chosen_samples = 0;  // the latter may be endless
  std::vector<stretch> stretches;                      // of the samples chosen; in order, none of them empty
  std::optional<double> frequency;                     // where all stretches agree

  // How it is read. Extents follow each other without a gap between their samples.
  std::vector<extent> extents;
  bool ranged = true;  // several readers may read any part; if not, one reader reads once from front to back
  std::function<std::unique_ptr<byte_reader>()> bytes;
};

/// Chooses samples as the options say, and divides them into stretches; captures, extents and rate are there. Two
/// captures are one stretch where they have the same frequency (or neither has one) and datetimes that say that the
/// second continues the first within half a sample, and where their global indices, if both have one, do not deny it.
/// Throws failure.
void choose(source &of, const options &said);

/// The one stretch of a recording that has just one. Throws failure, which tells to choose a capture.
const stretch &only_stretch(const source &of, const option_names &names);

}  // namespace recording
