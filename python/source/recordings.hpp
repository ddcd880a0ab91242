// Recordings as Python's callers see them: samples count from the first one that was chosen. SPDX-License-Identifier: MIT
#pragma once

#include <pybind11/pybind11.h>

#include "arrays.hpp"
#include "recording/sample_reader.hpp"
#include "recording/source.hpp"

namespace binding {

/// Never changed once it is open, so that any number of threads may read it.
class recording_file {
 public:
  /// Arguments of lumra.Recording. Throws ValueError, TypeError and failure.
  recording_file(const std::string &path, py::handle datatype, py::handle sample_rate, py::handle frequency,
                 py::handle capture, py::handle channel);

  [[nodiscard]] const recording::source &source() const noexcept { return source_; }
  [[nodiscard]] std::uint64_t samples() const noexcept { return source_.chosen_samples; }
  [[nodiscard]] element type() const noexcept { return source_.format.is_complex ? element::cf32 : element::f32; }
  /// Reads `count` samples from `first` on, both inside of the recording.
  [[nodiscard]] recording::sample_reader reader(std::uint64_t first, std::uint64_t count) const {
    return {source_, source_.chosen_first + first, count};
  }
  /// Throws ValueError where these are not samples of the recording.
  void require_range(py::handle first, py::handle count, std::uint64_t &first_read, std::uint64_t &count_read) const;

 private:
  recording::source source_;
};

/// Samples of one call without the GIL in between, and of one block of a recording.
inline constexpr std::size_t read_at_once = std::size_t{1} << 18;

}  // namespace binding
