// Recursive filters over streams, in direct form or as second-order sections. SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <complex>
#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

#include "qsrfhs/util/aligned_buffer.hpp"
#include "qsrfhs/vector/kernels/kernels.hpp"
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
  blocks,    // eight samples at a time, from a state in front of them
};

/// Stages behind each other in double precision, over a stream of real or complex samples.
///
/// Blocks start at every eighth sample from the start of the stream, from the last reset or from where a state was set,
/// and every output is the same sum of the same products wherever the stream is cut. Outputs below 1e-290, and in
/// blocks states that leave no larger ones, are taken as 0 by what comes after them.
class recursive_filter {
 public:
  static constexpr std::size_t block = 8, most_block_order = qsrfhs::kernels::block_recursion::most_order;

  /// A sample has `parts`: one value, or a real and an imaginary part. Blocks need recursions of at most
  /// most_block_order. One that grows too fast for them, to more than a double holds within 64 samples, stays in order.
  recursive_filter(std::vector<recursion_coefficients> stages, std::size_t parts, recursion_method method);

  /// The method that pays: blocks, where a trial shows them to be about as exact as the recursion in order.
  ///
  /// The trial is noise of 2048 samples. Blocks are taken where their error against extended precision is, as a root
  /// mean square, below four times that of the recursion in order, or below 2^-30 (single precision) or 2^-52 (double)
  /// of the output; not where the outputs leave all numbers meanwhile.
  static recursion_method choose(const std::vector<recursion_coefficients> &stages, precision of_samples);

  /// Filters n samples of as many parts, float or double; out may be in.
  template <class Sample>
  void run(const Sample *in, Sample *out, std::uint64_t n) noexcept;

  void reset() noexcept;

  /// What the samples so far add to the next `order` outputs, before those recur: the state of the transposed direct
  /// form II, stage after stage.
  [[nodiscard]] std::size_t state_count() const noexcept { return parts_ * total_order_; }
  void read_state(std::span<double> out) const;
  void set_state(std::span<const double> state) noexcept;

  /// All that a stream continues from with the same bits.
  [[nodiscard]] std::span<double> memory() noexcept { return memory_.elements(); }
  [[nodiscard]] std::span<const double> memory() const noexcept { return memory_.elements(); }
  struct place {
    std::uint32_t in_block = 0;  // samples of a block that has begun
    std::uint32_t preset = 0;    // outputs since a state was set, up to where it adds nothing more
  };
  [[nodiscard]] const place &at() const noexcept { return at_; }
  /// False for a place that no stream of this filter can be at.
  [[nodiscard]] bool restore(const place &at) noexcept;

  [[nodiscard]] recursion_method method() const noexcept { return method_; }
  [[nodiscard]] std::size_t parts() const noexcept { return parts_; }
  [[nodiscard]] const std::vector<recursion_coefficients> &stages() const noexcept { return stages_; }

 private:
  struct stage_view;

  template <class Visit>
  void for_each_stage(Visit visit) const;
  void sum_samples(const stage_view &stage, double *in, double *out, std::size_t n) noexcept;
  void recur_in_order(const stage_view &stage, double *data, std::size_t n) noexcept;
  void recur_by_blocks(const stage_view &stage, double *data, std::size_t n) noexcept;
  double *run_chunk(double *data, double *other, std::size_t n) noexcept;
  [[nodiscard]] std::size_t room_in_front() const noexcept;

  std::vector<recursion_coefficients> stages_;
  std::size_t parts_, total_order_ = 0, most_order_ = 0;
  recursion_method method_;
  place at_;
  qsrfhs::aligned_buffer<double> plans_;   // tables of the block recursions, stage after stage
  qsrfhs::aligned_buffer<double> memory_;  // stage after stage: see stage_view
  qsrfhs::aligned_buffer<double> room_;    // a chunk of samples and one of sums, histories in front of them
};

}  // namespace dsp
