// Single-precision coefficients in aligned storage. SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <span>

#include "qsrfhs/util/aligned_buffer.hpp"

namespace qsrfhs {

class Filter {
 public:
  /// The periodic five-term flat-top window; its centre is about 1.000000003, its ends are slightly negative.
  static Filter flat_top(std::uint64_t length);
  /// All coefficients equal.
  Filter(std::uint64_t length, float value);

  [[nodiscard]] std::uint64_t length() const noexcept { return coefficients_.size(); }
  [[nodiscard]] std::span<float> coefficients() noexcept { return coefficients_.elements(); }
  [[nodiscard]] std::span<const float> coefficients() const noexcept { return coefficients_.elements(); }

 private:
  aligned_buffer<float> coefficients_;
};

}  // namespace qsrfhs
