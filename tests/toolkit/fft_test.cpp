// Transforms of records, and their power. SPDX-License-Identifier: MIT
#include <algorithm>
#include <numeric>

#include "toolkit/toolkit_test.hpp"

namespace {

using namespace tests;
using toolkit::complex_of;

template <class E>
using Fft = toolkit_test<E>;
TYPED_TEST_SUITE(Fft, all_letters);

TYPED_TEST(Fft, AgreesWithTheDefinition) {
  using E = TypeParam;
  for (const std::size_t length : {1U, 2U, 3U, 16U, 37U, 210U, 1024U}) {
    for (const int size : {0, -5, 1, 2, 5, 36, 128, 1009}) {
      for (const int shift : {0, 1, -1}) {
        SCOPED_TRACE(testing::Message() << length << " samples, size " << size << ", shift " << shift);
        const std::size_t n = size < 1 ? length : static_cast<std::size_t>(size);
        const auto record = noise<E>(length);
        array_of<E> in = filled<E>(record), scratch(3);
        array_of<complex_of<E>> out(std::size_t{2});
        ASSERT_EQ(0, family<E>::fft(in, out, size, shift, scratch, &this->slot));
        reference want = wide(record);
        want.resize(n);
        want = dft(want);
        if (shift) std::rotate(want.begin(), want.end() - static_cast<std::ptrdiff_t>(n / 2), want.end());
        EXPECT_LT(error_in_epsilons<E>(values<complex_of<E>>(out), want), transform_bound(n));
        EXPECT_EQ(0, scratch.block()->count);
      }
    }
  }
}

TYPED_TEST(Fft, InverseReturnsTheRecord) {
  using E = TypeParam;
  for (const std::size_t n : {1U, 2U, 3U, 4U, 63U, 64U, 1000U}) {
    for (const int shift : {0, 1}) {
      SCOPED_TRACE(testing::Message() << n << " samples, shift " << shift);
      const auto record = noise<E>(n);
      array_of<E> in = filled<E>(record), out;
      array_of<complex_of<E>> bins, scratch(std::size_t{0});
      ASSERT_EQ(0, family<E>::fft(in, bins, 0, shift, nullptr, &this->slot));
      ASSERT_EQ(0, family<E>::inverse_fft(bins, out, shift, scratch, &this->slot));
      EXPECT_LT(error_in_epsilons<E>(values<E>(out), wide(record)), 2 * transform_bound(n));
      EXPECT_EQ(0, scratch.block()->count);
    }
  }
}

TYPED_TEST(Fft, PowerSpectrumAgreesWithTheDefinition) {
  using E = TypeParam;
  using R = toolkit::magnitude_of<E>;
  for (const std::size_t n : {1U, 2U, 3U, 4U, 15U, 16U, 17U, 100U, 1001U, 1024U}) {
    SCOPED_TRACE(testing::Message() << n << " samples");
    const auto x = noise<E>(n);
    array_of<E> in = filled<E>(x), scratch;
    array_of<R> out;
    ASSERT_EQ(0, family<E>::power_spectrum(in, out, scratch, &this->slot));
    reference want = dft(wide(x));
    for (auto &bin : want) bin = std::norm(bin) / (static_cast<double>(n) * static_cast<double>(n));
    EXPECT_LT(error_in_epsilons<E>(values<R>(out), want), 2 * transform_bound(n));
    EXPECT_TRUE(scratch.elements().empty());
  }
}

TYPED_TEST(Fft, PowerSpectrumSumsToTheMeanPower) {
  using E = TypeParam;
  using R = toolkit::magnitude_of<E>;
  constexpr std::size_t n = 105000;
  const auto x = noise<E>(n);
  array_of<E> in = filled<E>(x), scratch;
  array_of<R> out;
  ASSERT_EQ(0, family<E>::power_spectrum(in, out, scratch, &this->slot));
  const auto p = values<R>(out);
  double power = 0;
  for (const auto &v : x) power += std::norm(std::complex<double>(v)) / n;
  EXPECT_NEAR(power, std::accumulate(p.begin(), p.end(), 0.0), 1e-5 * power);
}

}  // namespace
