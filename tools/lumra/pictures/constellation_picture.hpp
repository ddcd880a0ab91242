// The picture of two recordings as points of the complex plane. SPDX-License-Identifier: MIT
#pragma once

#include <complex>
#include <cstdint>
#include <string>
#include <vector>

#include "pictures/gnuplot.hpp"

namespace tool {

/// A limited number of sample pairs, spread evenly over recordings of any length.
class constellation {
 public:
  explicit constellation(std::uint64_t samples) noexcept;

  /// Index of the next sample to add; samples behind it must be added in this order. Beyond all samples at the end.
  [[nodiscard]] std::uint64_t next() const noexcept;
  void add(std::complex<double> reference, std::complex<double> measured);

  [[nodiscard]] const std::vector<std::complex<double>> &reference() const noexcept { return reference_; }
  [[nodiscard]] const std::vector<std::complex<double>> &measured() const noexcept { return measured_; }
  [[nodiscard]] std::uint64_t samples() const noexcept { return samples_; }
  [[nodiscard]] bool is_partial() const noexcept { return wanted_ < samples_; }

 private:
  std::uint64_t samples_, wanted_;
  std::vector<std::complex<double>> reference_, measured_;
};

/// The gnuplot script; points are relative to the RMS of the reference, figures is the line below the title.
std::string constellation_script(const constellation &points, const std::string &title, const std::string &figures,
                                 picture_type type);

}  // namespace tool
