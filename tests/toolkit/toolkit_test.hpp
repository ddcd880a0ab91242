// What the tests of the typed families share: one test body for all type letters. SPDX-License-Identifier: MIT
#pragma once

#include <gtest/gtest.h>

#include <algorithm>
#include <cstring>
#include <limits>
#include <span>
#include <vector>

#include "support/letters.hpp"
#include "support/reference.hpp"
#include "support/test_array.hpp"

namespace tests {

template <class E>
using array_of = test_array<typename E::block>;
template <class E>
using matrix_of = test_array<typename E::matrix_block>;

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

template <class E>
std::vector<toolkit::value_of<E>> noise(std::size_t n, std::uint32_t seed = 1) {
  return noise_of<toolkit::value_of<E>>(n, seed);
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

/// Relative error in units of the type's epsilon.
template <class E, class Values>
double error_in_epsilons(const Values &got, const reference &want) {
  EXPECT_EQ(want.size(), got.size());
  if (want.size() != got.size() || want.empty() || wide(got) == want) return 0;
  return relative_error(wide(got), want) / static_cast<double>(std::numeric_limits<toolkit::real_of<E>>::epsilon());
}

/// Bit for bit.
template <class Values, class Others>
bool same_bytes(const Values &got, const Others &want) {
  return got.size() == want.size() && (got.empty() || std::memcmp(got.data(), want.data(), got.size_bytes()) == 0);
}

}  // namespace tests
