// What the tests of the typed families share: one test body for all type letters. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/toolkit.h>

#include <gtest/gtest.h>

#include <cmath>
#include <complex>
#include <limits>
#include <numbers>
#include <span>
#include <type_traits>
#include <vector>

#include "support/test_array.hpp"
#include "toolkit/element.hpp"

namespace tests {

template <class E>
using array_of = test_array<typename E::block>;
template <class E>
using matrix_of = test_array<typename E::matrix_block>;
using reference = std::vector<std::complex<double>>;

using all_letters = testing::Types<toolkit::s, toolkit::d, toolkit::c, toolkit::z>;

/// A host, and a slot for transforms.
template <class E>
class toolkit_test : public testing::Test {
 protected:
  fake_host host{fake_host::unit::elements};
  void *slot = nullptr;
  ~toolkit_test() override { qsHost_ReleaseTransform(&slot); }
};

/// The elements as the letter's values.
template <class E, class Array>
std::span<toolkit::value_of<E>> values(Array &array) {
  const auto elements = array.elements();
  return {reinterpret_cast<toolkit::value_of<E> *>(elements.data()), elements.size()};
}

/// Reproducible values between -1 and 1, exact in single precision.
template <class E>
std::vector<toolkit::value_of<E>> noise(std::size_t n, std::uint32_t seed = 1) {
  const auto next = [&seed] {
    seed = seed * 1664525U + 1013904223U;
    return static_cast<toolkit::real_of<E>>(static_cast<float>(seed >> 8) / 8388608.F - 1.F);
  };
  std::vector<toolkit::value_of<E>> out(n);
  for (auto &v : out) {
    if constexpr (toolkit::is_complex<E>) {
      const auto re = next();
      v = {re, next()};
    } else {
      v = next();
    }
  }
  return out;
}

template <class E>
std::span<const typename array_of<E>::element> elements_of(const std::vector<toolkit::value_of<E>> &from) {
  return {reinterpret_cast<const typename array_of<E>::element *>(from.data()), from.size()};
}
template <class E>
array_of<E> filled(const std::vector<toolkit::value_of<E>> &from) {
  return array_of<E>(elements_of<E>(from));
}
/// Row by row.
template <class E>
matrix_of<E> filled(std::int32_t rows, std::int32_t columns, const std::vector<toolkit::value_of<E>> &from) {
  return matrix_of<E>(rows, columns, elements_of<E>(from));
}

template <class Values>
reference wide(const Values &from) {
  return reference(from.begin(), from.end());
}

/// Relative error in the least-squares sense, in units of the type's epsilon.
template <class E, class Values>
double error_in_epsilons(const Values &got, const reference &want) {
  EXPECT_EQ(want.size(), got.size());
  double difference = 0, norm = 0;
  for (std::size_t i = 0; i < want.size() && i < got.size(); ++i) {
    difference += std::norm(std::complex<double>(got[i]) - want[i]);
    norm += std::norm(want[i]);
  }
  if (!(difference > 0)) return difference;  // exact, or not a number
  return std::sqrt(difference / norm) / static_cast<double>(std::numeric_limits<toolkit::real_of<E>>::epsilon());
}

/// Growth of rounding errors: of transforms of n points, and of sums of n terms; a small constant for all types.
inline double transform_bound(std::size_t n) {
  return 2.0 * (1.0 + std::log2(static_cast<double>(n)));
}
inline double sum_bound(std::size_t n) {
  return 1.0 + static_cast<double>(n);
}

/// The discrete Fourier transform by its definition.
inline reference dft(const reference &x, int sign = -1) {
  const std::size_t n = x.size();
  reference roots(n), out(n);
  for (std::size_t k = 0; k < n; ++k)
    roots[k] = std::polar(1.0, sign * 2.0 * std::numbers::pi * static_cast<double>(k) / static_cast<double>(n));
  for (std::size_t k = 0; k < n; ++k)
    for (std::size_t i = 0; i < n; ++i) out[k] += x[i] * roots[k * i % n];
  return out;
}

}  // namespace tests
