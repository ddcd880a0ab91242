// SPDX-License-Identifier: MIT
#include <algorithm>

#include "toolkit/families.hpp"
#include "toolkit/toolkit_test.hpp"

namespace {

using namespace tests;
using toolkit::complex_of;

template <class E>
class Fft : public testing::Test {
 protected:
  void *slot = nullptr;
  fake_host host{fake_host::unit::elements};
  ~Fft() override { qsHost_ReleaseTransform(&slot); }
};
TYPED_TEST_SUITE(Fft, all_letters);

template <class E>
reference padded(const std::vector<toolkit::value_of<E>> &x, std::size_t n) {
  reference out = wide(x);
  out.resize(n);
  return out;
}

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
        ASSERT_EQ(0, family<E>::fft(in.handle(), out.handle(), size, shift, scratch.handle(), &this->slot));
        reference want = dft(padded<E>(record, n));
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
      ASSERT_EQ(0, family<E>::fft(in.handle(), bins.handle(), 0, shift, nullptr, &this->slot));
      ASSERT_EQ(0, family<E>::inverse_fft(bins.handle(), out.handle(), shift, scratch.handle(), &this->slot));
      EXPECT_LT(error_in_epsilons<E>(values<E>(out), wide(record)), 2 * transform_bound(n));
      EXPECT_EQ(0, scratch.block()->count);
    }
  }
}

}  // namespace
