// SPDX-License-Identifier: MIT
#include "toolkit/decimate.hpp"

#include "toolkit/toolkit_test.hpp"

namespace {

using namespace tests;

template <class E>
using Decimate = toolkit_test<E>;
TYPED_TEST_SUITE(Decimate, all_letters);

TYPED_TEST(Decimate, KeepsOrAveragesGroups) {
  using E = TypeParam;
  for (const std::size_t n : {1U, 2U, 10U, 97U, 1000U}) {
    for (const std::size_t factor : {1U, 2U, 3U, 7U, 31U, 32U, 33U, 97U, 500U, 1000U}) {
      if (factor > n) continue;
      for (const int average : {0, 1, -1}) {
        SCOPED_TRACE(testing::Message() << n << " by " << factor << ", average " << average);
        const auto record = noise<E>(n);
        reference want(n / factor);
        for (std::size_t k = 0; k < want.size(); ++k) {
          for (std::size_t j = 0; j < (average ? factor : 1); ++j)
            want[k] += std::complex<double>(record[k * factor + j]);
          if (average) want[k] /= static_cast<double>(factor);
        }
        array_of<E> in = filled<E>(record), out(std::size_t{1});
        ASSERT_EQ(0, family<E>::decimate(in.handle(), out.handle(), static_cast<int>(factor), average));
        EXPECT_LE(error_in_epsilons<E>(values<E>(out), want), average ? sum_bound(factor) : 0.0);
        ASSERT_EQ(0, family<E>::decimate(in.handle(), in.handle(), static_cast<int>(factor), average));
        EXPECT_TRUE(same_bytes(in.elements(), out.elements()));
      }
    }
  }
}

TEST(DecimateKernel, WorksInPlaceAndRefusesASmallDestination) {
  std::vector<float> x{1, 2, 3, 4, 5, 6, 7};
  EXPECT_THROW(toolkit::decimate<float>(x, std::span(x).first(2), 2, toolkit::decimation::pick), toolkit::failure);
  toolkit::decimate<float>(x, x, 2, toolkit::decimation::average);
  EXPECT_EQ((std::vector<float>{1.5F, 3.5F, 5.5F}), std::vector<float>(x.begin(), x.begin() + 3));
}

}  // namespace
