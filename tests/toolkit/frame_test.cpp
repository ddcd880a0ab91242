// What all families share: refusals, slots, sizing. SPDX-License-Identifier: MIT
#include <functional>

#include "toolkit/operations.hpp"

namespace {

using namespace tests;

template <class E>
class Toolkit : public testing::Test {
 protected:
  fake_host host{fake_host::unit::elements};
};
TYPED_TEST_SUITE(Toolkit, all_letters);

TYPED_TEST(Toolkit, RefusesInTheOrderOfTheChecks) {
  using E = TypeParam;
  using A = arguments<E>;
  using F = family<E>;
  using P = correlation_pair<E, E>;
  struct refusal {
    const char *why;
    std::int32_t code;
    std::function<std::int32_t(A &)> run;
    int emptied = 1;  // arrays of A: the output, if it is one of them, and an input that is scratch, too
  };
  array_of<E> none(std::size_t{0}), null_block;
  array_of<toolkit::complex_of<E>> no_bins(std::size_t{0});
  matrix_of<E> no_columns(3, 0);
  const auto h = [](auto &array) { return array.handle(); };
  const refusal refusals[] = {
      {"fft: no samples", -20003,
       [&](A &a) { return F::fft(h(none), h(a.bins_out), 1 << 28, 0, h(a.scratch), &a.slot); }},
      {"fft: null handle", -20003, [&](A &a) { return F::fft(nullptr, h(a.bins_out), 8, 0, h(a.scratch), &a.slot); }},
      {"fft: null block", -20003,
       [&](A &a) { return F::fft(h(null_block), h(a.bins_out), 8, 0, h(a.scratch), &a.slot); }},
      {"fft: too long", -359502, [&](A &a) { return F::fft(h(a.x), h(a.bins_out), (1 << 27) + 1, 0, h(a.x), &a.slot); },
       2},
      {"fft: shared", -20061, [&](A &a) { return F::fft(h(a.x), h(a.bins_out), 48, 0, h(a.x), &a.slot); }, 2},
      {"fft: null output", -20001, [&](A &a) { return F::fft(h(a.x), nullptr, 48, 0, nullptr, &a.slot); }, 0},
      {"fft: no scratch", -20999, [&](A &a) { return F::fft(h(a.x), h(a.bins_out), 48, 0, nullptr, &a.slot); }},
      {"inverse: no bins", -20003,
       [&](A &a) { return F::inverse_fft(h(no_bins), h(a.out), 0, h(a.bins_scratch), &a.slot); }},
      {"inverse: no scratch", -20999, [&](A &a) { return F::inverse_fft(h(a.bins), h(a.out), 1, nullptr, &a.slot); }},
      {"convolution: no x", -20003,
       [&](A &a) { return F::convolution(h(none), h(a.y), h(a.out), 3, 2, 0, h(a.scratch), h(a.room), &a.slot); }},
      {"convolution: no y", -20003,
       [&](A &a) { return F::convolution(h(a.x), h(none), h(a.out), 3, 2, 0, h(a.scratch), h(a.room), &a.slot); }},
      {"convolution: method 2", -20061,
       [&](A &a) { return F::convolution(h(a.x), h(a.y), h(a.out), 0, 2, 0, h(a.scratch), h(a.room), &a.slot); }},
      {"convolution: method -1", -20061,
       [&](A &a) { return F::convolution(h(a.y), h(a.x), h(a.out), 2, -1, 0, h(a.scratch), h(a.room), &a.slot); }},
      {"convolution: mode 3", -20061,
       [&](A &a) { return F::convolution(h(a.x), h(a.y), h(a.out), 3, 0, 0, h(a.scratch), h(a.room), &a.slot); }},
      {"convolution: mode -1", -20061,
       [&](A &a) { return F::convolution(h(a.x), h(a.y), h(a.out), -1, 0, 0, h(a.scratch), h(a.room), &a.slot); }},
      {"convolution: nothing valid", -20008,
       [&](A &a) { return F::convolution(h(a.y), h(a.x), h(a.out), 2, 0, 0, nullptr, nullptr, &a.slot); }},
      {"convolution: shared", -20061,
       [&](A &a) { return F::convolution(h(a.x), h(a.y), h(a.out), 0, 1, 0, h(a.scratch), h(a.scratch), &a.slot); }},
      {"convolution: no scratch", -20999,
       [&](A &a) { return F::convolution(h(a.x), h(a.y), h(a.out), 1, 1, 0, nullptr, h(a.room), &a.slot); }},
      {"convolution: no room", -20999,
       [&](A &a) { return F::convolution(h(a.x), h(a.y), h(a.out), 0, 1, 0, h(a.scratch), nullptr, &a.slot); }},
      {"correlation: no x", -20003,
       [&](A &a) { return P::correlate(h(none), h(a.y), h(a.out), 2, 3, 0, h(a.scratch), h(a.room), &a.slot); }},
      {"correlation: method", -20061,
       [&](A &a) { return P::correlate(h(a.x), h(a.y), h(a.out), 2, 0, 0, h(a.scratch), h(a.room), &a.slot); }},
      {"correlation: normalisation", -20061,
       [&](A &a) { return P::correlate(h(a.x), h(a.y), h(a.out), 0, 3, 0, nullptr, h(a.room), &a.slot); }},
      {"correlation: no scratch", -20999,
       [&](A &a) { return P::correlate(h(a.x), h(a.y), h(a.out), 0, 0, 0, nullptr, h(a.room), &a.slot); }},
      {"correlation: no room", -20999,
       [&](A &a) { return P::correlate(h(a.x), h(a.y), h(a.out), 1, 0, 0, h(a.scratch), nullptr, &a.slot); }},
      {"matrices: no columns", -20003,
       [&](A &a) {
         return F::matrix_correlation(h(a.mx), h(no_columns), h(a.matrix_out), 2, h(a.scratch), h(a.room), &a.slot);
       }},
      {"matrices: method", -20061,
       [&](A &a) { return F::matrix_correlation(h(a.mx), h(a.my), h(a.matrix_out), 2, nullptr, h(a.room), &a.slot); }},
      {"matrices: no scratch", -20999,
       [&](A &a) { return F::matrix_correlation(h(a.mx), h(a.my), h(a.matrix_out), 0, nullptr, h(a.room), &a.slot); }},
      {"matrices: no room", -20999,
       [&](A &a) {
         return F::matrix_correlation(h(a.mx), h(a.my), h(a.matrix_out), 1, h(a.scratch), nullptr, &a.slot);
       }},
      {"window: no samples", -20003, [&](A &a) { return F::window(h(none), 12, 0, h(a.tables)); }, 0},
      {"window: type 10", -20061, [&](A &a) { return F::window(h(a.x), 10, 0, nullptr); }},
      {"window: type 12", -20061, [&](A &a) { return F::window(h(a.x), 12, 0, h(a.tables)); }},
      {"window: type -1", -20061, [&](A &a) { return F::window(h(a.x), -1, 0, h(a.tables)); }},
      {"window: no scratch", -20999, [&](A &a) { return F::window(h(a.x), 1, 0, nullptr); }},
      {"power: no samples", -20003, [&](A &a) { return F::power_spectrum(h(none), h(a.power_out), nullptr, &a.slot); }},
      {"power: no scratch", -20999, [&](A &a) { return F::power_spectrum(h(a.x), h(a.power_out), nullptr, &a.slot); }},
      {"power: shared", -20061, [&](A &a) { return F::power_spectrum(h(a.x), h(a.power_out), h(a.x), &a.slot); }, 2},
  };
  for (const refusal &r : refusals) {
    SCOPED_TRACE(r.why);
    A a;
    EXPECT_EQ(r.code, r.run(a));
    // All are filled before.
    const int emptied = a.bins_out.elements().empty() + a.out.elements().empty() + a.power_out.elements().empty() +
                        (a.matrix_out.block()->rows == 0 && a.matrix_out.block()->columns == 0) +
                        a.x.elements().empty();
    EXPECT_EQ(r.emptied, emptied);
  }
}

TYPED_TEST(Toolkit, SizedOutputsAreLeftAlone) {
  using E = TypeParam;
  arguments<E> a;
  array_of<toolkit::complex_of<E>> bins(std::size_t{40});
  ASSERT_EQ(0, family<E>::fft(a.x.handle(), bins.handle(), 0, 0, nullptr, &a.slot));
  EXPECT_TRUE(this->host.calls.empty());
}

// Whatever transform lies in the slot, a result is the one of a call with an empty slot.
TYPED_TEST(Toolkit, ASlotOfAnotherFamilyIsNoticed) {
  using E = TypeParam;
  for (const auto &earlier : operations<E>()) {
    for (const auto &later : operations<E>()) {
      SCOPED_TRACE(testing::Message() << later.name << " behind " << earlier.name);
      arguments<E> fresh, before, used;
      ASSERT_EQ(0, later.run(fresh));
      ASSERT_EQ(0, earlier.run(before));
      std::swap(before.slot, used.slot);
      ASSERT_EQ(0, later.run(used));
      EXPECT_EQ(later.result(fresh), later.result(used));
    }
  }
}

TEST(TransformSlot, TellsScalingDomainAndPrecisionAtOneLength) {
  fake_host host(fake_host::unit::elements);
  void *slot = nullptr;
  constexpr std::size_t n = 48;
  const auto run = [&]<class E>(E, bool inverse) {
    array_of<E> x = filled<E>(noise<E>(n)), back;
    array_of<toolkit::complex_of<E>> bins;
    if (!inverse) {
      ASSERT_EQ(0, family<E>::fft(x.handle(), bins.handle(), 0, 0, nullptr, &slot));
      EXPECT_LT(error_in_epsilons<E>(values<toolkit::complex_of<E>>(bins), dft(wide(noise<E>(n)))), transform_bound(n));
      return;
    }
    void *other = nullptr;
    ASSERT_EQ(0, family<E>::fft(x.handle(), bins.handle(), 0, 0, nullptr, &other));
    qsHost_ReleaseTransform(&other);
    ASSERT_EQ(0, family<E>::inverse_fft(bins.handle(), back.handle(), 0, nullptr, &slot));
    EXPECT_LT(error_in_epsilons<E>(values<E>(back), wide(noise<E>(n))), 2 * transform_bound(n));
  };
  for (int round = 0; round < 2; ++round) {
    for (const bool inverse : {false, true, false}) {
      run(toolkit::s{}, inverse);
      run(toolkit::c{}, inverse);
      run(toolkit::z{}, !inverse);
      run(toolkit::d{}, inverse);
    }
  }
  EXPECT_EQ(0, qsHost_ReleaseTransform(&slot));
  EXPECT_EQ(nullptr, slot);
}

}  // namespace
