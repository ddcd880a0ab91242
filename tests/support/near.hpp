// How far a result may lie from its definition. SPDX-License-Identifier: MIT
#pragma once

#include <cmath>
#include <cstddef>

namespace tests {

/// |result - expected| / |expected| in the Euclidean norm; values may be real or complex.
template <class Result, class Expected>
double relative_error(const Result &result, const Expected &expected) {
  double difference = 0, size = 0;
  for (std::size_t k = 0; k < expected.size(); ++k) {
    const auto wanted = expected[k];
    difference += std::norm(static_cast<decltype(wanted)>(result[k]) - wanted);
    size += std::norm(wanted);
  }
  return std::sqrt(difference / size);
}

}  // namespace tests
