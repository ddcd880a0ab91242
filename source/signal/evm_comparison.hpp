// Measured samples beside a reference that a model carries. SPDX-License-Identifier: MIT
#pragma once

#include <complex>
#include <cstddef>
#include <cstdint>
#include <span>

#include "signal/delayed_reference.hpp"
#include "signal/evm_alignment.hpp"
#include "signal/level.hpp"
#include "signal/stream_moments.hpp"

namespace dsp {

/// Values a sample; null where not wanted.
template <class Real>
struct error_traces {
  std::complex<Real> *error = nullptr;
  Real *magnitude = nullptr, *phase = nullptr;

  [[nodiscard]] error_traces from(std::size_t first) const noexcept {
    return {error ? error + first : error, magnitude ? magnitude + first : magnitude, phase ? phase + first : phase};
  }
};

/// Sums of squares, and the largest square of an error with its position.
struct error_sums {
  double error = 0, magnitude = 0, phase = 0;
  power_peak peak;

  /// Adds neighbouring samples from a position on, whose reference is on the model's delay and carrier, and writes
  /// their traces. Errors are multiplied by `scale`. Not more than longest_run.
  template <class Real>
  void add(std::span<const std::complex<double>> carried, const std::complex<Real> *measured, const stream_model &model,
           std::uint64_t position, double scale, const error_traces<Real> &traces) noexcept;

  /// Adds those of samples behind these.
  void add(const error_sums &next) noexcept;

  static constexpr std::size_t longest_run = 512;
};

/// What is known of the samples of one block.
struct block_sums {
  stream_moments moments;  // times are positions
  error_sums errors;       // in units of the reference
};

/// Compares blocks under one model.
template <class Real>
class block_comparison {
 public:
  using sample = std::complex<Real>;

  /// Slopes are summed where a delay is wanted.
  block_comparison(const stream_model &model, bool delay_wanted) noexcept
      : model_(model), slopes_(delay_wanted ? slopes::computed : slopes::left_out), delayed_({}) {}

  [[nodiscard]] const stream_model &model() const noexcept { return model_; }
  /// Whether the reference is interpolated, which takes neighbours.
  [[nodiscard]] bool is_delayed() const noexcept { return model_.delay != 0 || slopes_ == slopes::computed; }
  /// Makes the room for blocks of that many samples with their neighbours. Throws std::bad_alloc, dfti_failure.
  void prepare(std::size_t samples) {
    if (is_delayed()) delayed_.prepare(samples);
  }

  /// Of samples from a position on, compares those of a part as far as their reference is known, and writes their
  /// traces. Throws std::bad_alloc, dfti_failure where there is no room yet.
  block_sums compare(std::span<const sample> reference, std::span<const sample> measured, std::uint64_t position,
                     const stretch &part, const error_traces<Real> &traces);

 private:
  stream_model model_;
  slopes slopes_;
  delayed_reference<sample> delayed_;
};

}  // namespace dsp
