// Sample-rate changes in the frequency domain: transform descriptors, their cache, and one block of overlap-save.
// SPDX-License-Identifier: MIT
#pragma once

#include <lumra/fft_resampler.h>

#include <complex>
#include <cstdint>
#include <mutex>
#include <span>

namespace qsrfhs {

using resampler_descriptor = lumra_resampler_descriptor;

/// Forward is out of place and unscaled, inverse in place and scaled by 1 / length.
enum class direction { forward, inverse };

/// Makes sure that the descriptor holds a committed transform of the length. One that has it is kept as it is, whatever
/// its direction. Failures are recorded, and leave no transform.
std::int32_t prepare(resampler_descriptor &descriptor, std::uint32_t length, direction towards) noexcept;

/// Frees transform and buffer and marks the descriptor as released, which is recorded as a code of its own.
void release(resampler_descriptor &descriptor) noexcept;

/// Descriptors that were handed out. They are never freed, only handed out again: of those that are free and fit, the
/// one that was handed out last.
class descriptor_cache {
 public:
  static descriptor_cache &instance() noexcept;

  /// Failures are recorded; *out is null then.
  std::int32_t create(resampler_descriptor **out, std::uint32_t length, std::uint32_t buffer_flag,
                      std::uint32_t inverse_flag, std::uint64_t owner) noexcept;

  void before_fork() noexcept { mutex_.lock(); }
  void after_fork_in_parent() noexcept { mutex_.unlock(); }
  void after_fork_in_child() noexcept { mutex_.unlock(); }

 private:
  /// What a descriptor was made for, whatever its owners write into it.
  struct purpose {
    std::uint32_t length, buffer_flag, inverse_flag;
    friend bool operator==(const purpose &, const purpose &) = default;
  };
  struct entry : resampler_descriptor {
    purpose made_for{};
    std::uint64_t turn = 0;  // counts what the cache hands out
    bool available = false;
    entry *next = nullptr;
  };

  entry *take(const purpose &wanted, std::uint64_t &turn_before) noexcept;
  void add(entry &made) noexcept;
  void remove(entry &made) noexcept;
  void put_back(entry &taken, std::uint64_t turn_before) noexcept;
  static void give_back(void *descriptor) noexcept;

  std::mutex mutex_;
  entry *first_ = nullptr;   // under mutex_
  std::uint64_t turns_ = 0;  // under mutex_
};

/// Sizes of a resampler: n points forward, m backward, 1 <= m <= n; `overlap` samples at the output rate are dropped at
/// either end of a block, 2 * overlap < m. n is even, so that a middle bin exists.
struct resampler_plan {
  std::uint32_t n, m, overlap;
  /// Input samples from one block to the next.
  [[nodiscard]] std::uint32_t hop() const noexcept { return n - 2 * (n / m) * overlap; }
};

struct resampler_channel {
  std::int64_t centre = 0;                // bin, centred numbering: n / 2 is 0 Hz
  std::uint32_t divisor = 1;              // every m / divisor-th sample is kept; 1 to m
  const float *weights = nullptr;         // 2 * m: for each bin one for the real and one for the imaginary part
  std::span<std::complex<float>> output;  // nothing is written beyond it
  std::uint64_t output_offset = 0;
  double phase_start = 0;      // in radians
  double phase_step = 0;       // in radians for an input sample
  std::uint64_t produced = 0;  // samples so far, before every m / divisor-th is taken
};

/// One block: n input samples through one forward transform, then each channel's band through a backward one.
///
/// forward, inverse  descriptors for the plan's lengths, prepared here; inverse with a work buffer
/// spectrum          n samples of work memory
/// block             number of the block, from 0. Block b starts b * hop() samples into the input
///
/// A transform that fails is recorded, and the block goes on with what the buffers hold.
void process_block(const resampler_plan &plan, resampler_descriptor &forward, resampler_descriptor &inverse,
                   const std::complex<float> *input, std::complex<float> *spectrum, std::uint64_t block, bool first,
                   std::span<resampler_channel> channels) noexcept;

}  // namespace qsrfhs
