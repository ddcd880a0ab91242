// Recursive filters over streams, in direct form or as second-order sections. SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <array>
#include <complex>
#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

#include "qsrfhs/util/aligned_buffer.hpp"
#include "signal/sample_type.hpp"

namespace dsp {

/// y[n] = sum over j of b[j] x[n - j] - sum over j >= 1 of a[j] y[n - j], a[0] = 1.
struct recursion_coefficients {
  std::vector<double> b, a;
  [[nodiscard]] std::size_t forward_order() const noexcept { return b.size() - 1; }
  [[nodiscard]] std::size_t reverse_order() const noexcept { return a.size() - 1; }
  [[nodiscard]] std::size_t order() const noexcept { return std::max(forward_order(), reverse_order()); }
};

/// Divides by a[0] and drops zeros at the end of a: outputs that count for nothing must not be used, as they may be
/// NaN. b and a hold at least one value, a[0] is not 0.
recursion_coefficients normalised(std::span<const double> b, std::span<const double> a);

enum class recursion_method {
  in_order,  // sample by sample
  blocks,    // eight samples at a time, from the outputs in front of them
};

/// Stages behind each other in double precision, over a stream of real samples, or two: real and imaginary parts.
///
/// Blocks start at every eighth sample from the start of the stream, from the last reset or from where a state was set,
/// and every output is the same sum of the same products wherever the stream is cut. Outputs below 1e-290 are taken as
/// 0 by what comes after them.
class recursive_filter {
 public:
  static constexpr std::size_t block = 8, most_block_order = 16;

  /// `streams` is 1 or 2. Blocks need stages of at most most_block_order.
  recursive_filter(std::vector<recursion_coefficients> stages, std::size_t streams, recursion_method method);

  /// The method that pays: blocks, where a trial shows them to be about as exact as the recursion in order.
  ///
  /// The trial is noise of 2048 samples. Blocks are taken where their error against extended precision is, as a root
  /// mean square, below four times that of the recursion in order, or below 2^-30 (single precision) or 2^-52 (double)
  /// of the output. A narrow filter of high order in direct form loses more digits in blocks, and stays in order.
  static recursion_method choose(const std::vector<recursion_coefficients> &stages, precision of_samples);

  /// Filters n samples of type float, double or complex of them; out may be in.
  template <class Sample>
  void run(const Sample *in, Sample *out, std::uint64_t n) noexcept;

  void reset() noexcept;

  /// What the samples so far add to the next `order` outputs, before those recur: the state of the transposed direct
  /// form II. Stage after stage, of each stream in turn.
  [[nodiscard]] std::size_t state_count() const noexcept { return streams_ * total_order_; }
  void read_state(std::span<double> out) const;
  void set_state(std::span<const double> state) noexcept;

  /// All that a stream continues from with the same bits.
  [[nodiscard]] std::span<double> memory() noexcept { return memory_.elements(); }
  [[nodiscard]] std::span<const double> memory() const noexcept { return memory_.elements(); }
  struct place {
    std::uint32_t in_block = 0;  // samples of a block that has begun
    std::uint32_t preset = 0;    // outputs from which on a state that was set adds nothing more
  };
  [[nodiscard]] const place &at() const noexcept { return at_; }
  /// False for a place that no stream of this filter can be at.
  [[nodiscard]] bool restore(const place &at) noexcept;

  [[nodiscard]] recursion_method method() const noexcept { return method_; }
  [[nodiscard]] std::size_t streams() const noexcept { return streams_; }
  [[nodiscard]] const std::vector<recursion_coefficients> &stages() const noexcept { return stages_; }

 private:
  struct stage_view;
  using planes = std::array<double *, 2>;

  template <class Visit>
  void for_each_stage(Visit visit) const;
  void run_chunk(planes &in, planes &out, std::size_t n) noexcept;
  [[nodiscard]] std::size_t plane_size() const noexcept;
  void run_stage(const stage_view &stage, const planes &in, const planes &out, std::size_t n) noexcept;
  void add_preset(const stage_view &stage, const planes &data, std::size_t n) const noexcept;

  std::vector<recursion_coefficients> stages_;
  std::size_t streams_, total_order_ = 0, most_order_ = 0;
  recursion_method method_;
  place at_;
  qsrfhs::aligned_buffer<double> plans_;   // coefficients of the block recursions, stage after stage
  qsrfhs::aligned_buffer<double> memory_;  // of each stage and stream in turn: see stage_view
  qsrfhs::aligned_buffer<double> room_;    // a chunk of samples and one of outputs, histories in front of them
};

}  // namespace dsp
