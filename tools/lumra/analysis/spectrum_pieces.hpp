// Averages a long recording by several threads, which each read, decode and add pieces of it.
// SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <condition_variable>
#include <cstdint>
#include <exception>
#include <lumra/spectrum.hpp>
#include <mutex>
#include <optional>
#include <stop_token>
#include <thread>
#include <vector>

#include "analysis/selection.hpp"
#include "analysis/spectrum_accumulator.hpp"
#include "recording/source.hpp"

namespace tool {

/// Samples go from the file into one core's caches and no further, which beats one reader that hands blocks on.
class spectrum_pieces {
 public:
  /// Whether there are several threads, and usual pieces for all of them of a source that several readers may read.
  static bool pay(const recording::source &source, const selection &chosen, const lumra::spectrum_settings &settings);

  /// Pieces of a size that pays. Each has an accumulator of its own, which takes as long as some segments to make.
  static std::uint64_t usual_size(const lumra::spectrum_settings &settings) noexcept {
    return std::max(std::uint64_t{1} << 21, 128 * settings.points);
  }

  /// The source must outlive this.
  spectrum_pieces(const recording::source &source, const selection &chosen, const lumra::spectrum_settings &settings,
                  std::uint64_t size);
  spectrum_pieces(const spectrum_pieces &) = delete;
  spectrum_pieces &operator=(const spectrum_pieces &) = delete;

  struct averaged_piece {
    spectrum_accumulator average;
    std::uint64_t samples;
  };
  /// The next piece in order, which continues the one before; nothing at the end. Throws what reading it threw.
  std::optional<averaged_piece> next();

 private:
  struct piece {
    std::size_t stretch;          // that it begins in; it may have samples of several
    std::uint64_t start, origin;  // of it and of that stretch, in the stream of all samples that were chosen
    std::uint64_t samples;
  };
  struct result {
    std::optional<spectrum_accumulator> average;
    std::exception_ptr failure;
    [[nodiscard]] bool is_there() const noexcept { return average || failure; }
  };

  template <class Reader>
  spectrum_accumulator average_of(const piece &of, Reader &reader) const;
  void work(const std::stop_token &stopped);

  const recording::source &source_;
  std::vector<recording::stretch> stretches_;
  lumra::spectrum_settings settings_;
  std::vector<piece> pieces_;
  std::vector<result> results_;  // that of piece k at k modulo their number
  std::size_t taken_ = 0, given_ = 0;
  std::mutex mutex_;
  std::condition_variable_any changed_;
  std::vector<std::jthread> threads_;  // last, so that they end first
};

}  // namespace tool
