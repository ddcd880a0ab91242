// Single-precision coefficients in aligned storage. SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <span>

#include "qsrfhs/util/aligned_buffer.hpp"

namespace qsrfhs {

class Filter {
 public:
  /// The periodic five-term flat-top window; its centre is about 1.000000003, its ends are slightly negative.
  explicit Filter(std::uint64_t length);
  /// All coefficients equal.
  Filter(std::uint64_t length, float value);
  virtual ~Filter() = default;
  Filter(const Filter &) = delete;
  Filter &operator=(const Filter &) = delete;

  [[nodiscard]] std::uint64_t length() const noexcept { return coefficients_.size(); }
  /// The length rounded up to a multiple of 8.
  [[nodiscard]] std::uint64_t capacity() const noexcept { return coefficients_.capacity(); }
  [[nodiscard]] std::span<float> coefficients() const noexcept { return coefficients_.elements(); }

 private:
  aligned_buffer<float> coefficients_;
};

}  // namespace qsrfhs
