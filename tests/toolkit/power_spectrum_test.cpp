// SPDX-License-Identifier: MIT
#include <numeric>

#include "toolkit/families.hpp"
#include "toolkit/toolkit_test.hpp"

namespace {

using namespace tests;

template <class E>
class PowerSpectrum : public testing::Test {
 protected:
  void *slot = nullptr;
  fake_host host{fake_host::unit::elements};
  ~PowerSpectrum() override { qsHost_ReleaseTransform(&slot); }
};
TYPED_TEST_SUITE(PowerSpectrum, all_letters);

TYPED_TEST(PowerSpectrum, AgreesWithTheDefinition) {
  using E = TypeParam;
  using R = toolkit::magnitude_of<E>;
  for (const std::size_t n : {1U, 2U, 3U, 4U, 15U, 16U, 17U, 100U, 1001U, 1024U}) {
    SCOPED_TRACE(testing::Message() << n << " samples");
    const auto x = noise<E>(n);
    array_of<E> in = filled<E>(x), scratch;
    array_of<R> out;
    ASSERT_EQ(0, family<E>::power_spectrum(in.handle(), out.handle(), scratch.handle(), &this->slot));
    reference want = dft(wide(x));
    for (auto &bin : want) bin = std::norm(bin) / (static_cast<double>(n) * static_cast<double>(n));
    EXPECT_LT(error_in_epsilons<E>(values<R>(out), want), 2 * transform_bound(n));
    EXPECT_TRUE(scratch.elements().empty());
  }
}

TYPED_TEST(PowerSpectrum, SumIsTheMeanPower) {
  using E = TypeParam;
  using R = toolkit::magnitude_of<E>;
  constexpr std::size_t n = 105000;
  const auto x = noise<E>(n);
  array_of<E> in = filled<E>(x), scratch;
  array_of<R> out;
  ASSERT_EQ(0, family<E>::power_spectrum(in.handle(), out.handle(), scratch.handle(), &this->slot));
  const auto p = values<R>(out);
  double power = 0;
  for (const auto &v : x) power += std::norm(std::complex<double>(v)) / n;
  EXPECT_NEAR(power, std::accumulate(p.begin(), p.end(), 0.0), 1e-5 * power);
}

}  // namespace
