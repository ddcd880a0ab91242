// Reads ahead: a thread of its own decodes the next block while this one is analysed. SPDX-License-Identifier: MIT
#pragma once

#include <complex>
#include <condition_variable>
#include <cstdint>
#include <exception>
#include <mutex>
#include <optional>
#include <thread>
#include <vector>

#include "analysis/selection.hpp"
#include "recording/sample_reader.hpp"
#include "recording/source.hpp"

namespace tool {

/// Samples that follow each other.
struct sample_block {
  const void *samples = nullptr;  // float or std::complex<float>
  std::size_t count = 0;
  std::size_t width = 0;        // bytes of one
  std::uint64_t first = 0;      // index in the recording
  bool begins_stretch = false;  // does not follow the block before

  [[nodiscard]] sample_block part(std::size_t from, std::size_t length) const noexcept {
    return {static_cast<const char *>(samples) + from * width, length, width, first + from,
            begins_stretch && from == 0};
  }
};

class sample_blocks {
 public:
  static constexpr std::size_t usual_size = std::size_t{1} << 18;

  /// The source must outlive this. Throws failure.
  sample_blocks(const recording::source &source, const selection &chosen, std::size_t size = usual_size,
                bool count_clipped = false);
  sample_blocks(const sample_blocks &) = delete;
  sample_blocks &operator=(const sample_blocks &) = delete;
  ~sample_blocks();

  /// The next block, valid until the call after; nothing at the end. Throws what reading throws.
  std::optional<sample_block> next();
  /// Of the blocks so far.
  [[nodiscard]] std::uint64_t clipped() const noexcept { return clipped_; }
  [[nodiscard]] bool is_real() const noexcept { return real_; }

 private:
  struct buffer {
    std::vector<std::complex<float>> complex;
    std::vector<float> real;
    sample_block block;
    std::uint64_t clipped = 0;
    bool full = false, last = false;
  };

  void read_all(const selection &chosen);
  /// False when nobody wants more.
  bool hand_over(buffer &filled);

  std::uint64_t first_;  // of the samples that the reader has
  recording::sample_reader reader_;
  bool real_;
  std::size_t size_;
  buffer buffers_[2];
  std::size_t turn_ = 0;     // the buffer that next() gives
  buffer *given_ = nullptr;  // the one it gave
  std::uint64_t clipped_ = 0;
  std::mutex mutex_;
  std::condition_variable changed_;
  std::exception_ptr reason_;
  bool stopped_ = false;
  std::thread thread_;
};

}  // namespace tool
