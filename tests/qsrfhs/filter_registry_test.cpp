// The registry of filters and its designs. SPDX-License-Identifier: MIT
#include "qsrfhs/math/filter_registry.hpp"

#include <gtest/gtest.h>

#include <cmath>
#include <complex>
#include <limits>
#include <numbers>
#include <random>
#include <vector>

#include "support/recorded.hpp"
#include "support/test_array.hpp"

namespace {

using std::numbers::pi;

lumra_filter_key key_of(std::int32_t kind, double a, double b = 0, double c = 0, double d = 0) {
  return {kind, {}, {a, b, c, d}};
}

std::uint64_t total() {
  return qsrfhs::filter_registry::instance().total_cost();
}

// A reference that gives itself back; the filter is erased with it.
struct registered {
  lumra_filter_key key;
  lumra_filter_record record{};
  std::int32_t status;

  explicit registered(const lumra_filter_key &of, const void *input = nullptr, std::uint64_t count = 0)
      : key(of), status(qsUtilHS_RegisterFilterSpec(&record, input, &key, count)) {}
  registered(const registered &) = delete;
  registered &operator=(const registered &) = delete;
  ~registered() {
    lumra_filter_record unused;
    if (status != 0) return;
    qsUtilHS_MatchFilterSpecErase(&unused, &key, 1);
    qsUtilHS_UnegisterFilterSpec(&record);
  }
  std::vector<double> coefficients() const {
    return {record.entry->coefficients, record.entry->coefficients + record.entry->n};
  }
};

double response(const std::vector<double> &h, double frequency) {
  std::complex<double> sum = 0;
  const double middle = static_cast<double>(h.size() - 1) / 2;
  for (std::size_t k = 0; k < h.size(); ++k)
    sum += h[k] * std::polar(1.0, -2 * pi * frequency * (static_cast<double>(k) - middle));
  EXPECT_NEAR(0, sum.imag(), 1e-6);  // linear phase
  return sum.real();
}

TEST(FilterDesign, KaiserLowPassKeepsItsBands) {
  struct row {
    double rate, pass, stop, attenuation;
  };
  for (const row &r : {row{1, .1, .15, 10}, row{1e6, 5e4, 6e4, 21}, row{48000, 8000, 10000, 40}, row{2, .4, .5, 55},
                       row{1, .05, .06, 60}, row{1e9, 1e8, 1.5e8, 80}, row{1, .2, .25, 100}, row{1, .3, .45, 70}}) {
    SCOPED_TRACE(testing::Message() << r.pass << " " << r.stop << " " << r.attenuation);
    const registered filter(key_of(1, r.rate, r.pass, r.stop, r.attenuation));
    ASSERT_EQ(0, filter.status);
    const auto h = filter.coefficients();
    const double deviation = std::pow(10, -r.attenuation / 20);
    double ripple = 0, leak = 0;
    constexpr int points = 2000;
    for (int k = 0; k <= points; ++k) {
      const double part = static_cast<double>(k) / points;
      ripple = std::max(ripple, std::abs(response(h, part * r.pass / r.rate) - 1));
      leak = std::max(leak, std::abs(response(h, (r.stop + part * (r.rate / 2 - r.stop)) / r.rate)));
    }
    EXPECT_LT(ripple, deviation);
    EXPECT_LT(leak, deviation);
    // No longer than the formula, so that the bands are not met by brute force.
    EXPECT_LE(static_cast<double>(h.size()),
              std::max(0.93, (r.attenuation - 1.9) / 14.3) * r.rate / (r.stop - r.pass) + 2);
  }
}

TEST(FilterDesign, RootRaisedCosineSquaredHasNyquistZeros) {
  struct row {
    double samples, roll_off, span;
  };
  for (const row &r : {row{4, .25, 40}, row{4, .22, 60}, row{8, .5, 40}, row{2, 1, 40}, row{3, 1.0 / 3, 50},
                       row{5, .1, 200}, row{4, 0, 400}}) {
    SCOPED_TRACE(testing::Message() << r.samples << " " << r.roll_off);
    const registered filter(key_of(2, r.samples * 1e6, 1e6, r.roll_off, r.span));
    ASSERT_EQ(0, filter.status);
    const auto h = filter.coefficients();
    ASSERT_EQ(static_cast<std::size_t>(r.samples * r.span) + 1, h.size());
    const auto step = static_cast<std::size_t>(r.samples);
    // What a finite span leaves: the impulse response at its ends; without roll-off that sums up.
    const double end = r.span / 2;
    const double tolerance = r.roll_off > 0 ? 1 / (4 * pi * r.roll_off * end * end) : 1 / end;
    for (std::size_t lag = 0; lag < h.size() / 2; lag += step) {
      double sum = 0;
      for (std::size_t k = 0; k + lag < h.size(); ++k) sum += h[k] * h[k + lag];
      EXPECT_NEAR(lag == 0 ? 1 : 0, sum, lag == 0 ? 1e-6 : tolerance) << lag;
    }
    // Half the power at half the symbol rate.
    if (r.roll_off > 0) {
      EXPECT_NEAR(std::sqrt(0.5), response(h, 0.5 / r.samples) / response(h, 0), 1e-2);
    }
  }
  // Samples on the zeros of the divisor, and next to them.
  const auto at = [](double roll_off) { return registered(key_of(2, 4, 1, roll_off, 8)).coefficients(); };
  const auto on = at(0.5), beside = at(0.5 + 1e-9), near = at(0.5 + 1e-7);
  for (std::size_t k = 0; k < on.size(); ++k) {
    EXPECT_NEAR(on[k], beside[k], 1e-6);
    EXPECT_NEAR(on[k], near[k], 1e-6);
  }
}

TEST(FilterDesign, TakesGivenCoefficientsAndWantedCounts) {
  tests::f32_array given{1.F, -2.F, 3.F};
  const registered filter(key_of(0, 77), given, 3);
  EXPECT_EQ((std::vector<double>{1, -2, 3}), filter.coefficients());
  EXPECT_EQ(0U, reinterpret_cast<std::uintptr_t>(filter.record.entry->coefficients) % 32);
  EXPECT_EQ(0.F, filter.record.entry->state[5]);
  EXPECT_EQ(17U, registered(key_of(1, 1, .1, .2, 60), nullptr, 17).coefficients().size());
  EXPECT_EQ(1U, registered(key_of(2, 4, 1, .2, 10), nullptr, 1).coefficients().size());
}

TEST(FilterDesign, RefusesWhatMakesNoFilter) {
  constexpr double nan = std::numeric_limits<double>::quiet_NaN(), inf = std::numeric_limits<double>::infinity();
  tests::f32_array given{1.F, 2.F}, empty(1), negative(1), none;
  empty.block()->count = 0;
  negative.block()->count = -1;
  struct row {
    std::int32_t kind;
    double values[4];
    std::uint64_t count;
  };
  // Low-passes, then root raised cosines, each with one value after the other beyond its range; kinds that do not exist.
  constexpr row rows[] = {
      {1, {1, .1, .6, 60}, 0},         {1, {1, .2, .2, 60}, 0},     {1, {1, .3, .2, 60}, 0},
      {1, {1, -.1, .2, 60}, 0},        {1, {1, .1, .2, 0}, 0},      {1, {1, .1, .2, -60}, 0},
      {1, {1, .1, .2, 1e300}, 0},      {1, {0, .1, .2, 60}, 0},     {1, {-1, -.2, -.1, 60}, 0},
      {1, {nan, .1, .2, 60}, 0},       {1, {inf, .1, .2, 60}, 0},   {1, {1, .1, .2, inf}, 0},
      {1, {1, .1, .1 + 1e-12, 60}, 0}, {1, {1, .1, .2, 60}, ~0ULL}, {1, {1, .1, .2, 60}, (1 << 24) + 1},
      {2, {1, 2, .2, 10}, 0},          {2, {4, 0, .2, 10}, 0},      {2, {4, -1, .2, 10}, 0},
      {2, {-4, -1, .2, 10}, 0},        {2, {4, 1, -.1, 10}, 0},     {2, {4, 1, 1.1, 10}, 0},
      {2, {4, 1, .2, 0}, 0},           {2, {4, 1, .2, 1e300}, 0},   {2, {1e300, 1e-300, .2, 10}, 0},
      {2, {4, 1, nan, 10}, 0},         {3, {1, 1, 1, 1}, 0},        {-1, {1, 1, 1, 1}, 0}};
  const std::uint64_t before = total();
  const tests::recorded list;
  lumra_filter_record record{};
  for (const row &r : rows) {
    const lumra_filter_key key = key_of(r.kind, r.values[0], r.values[1], r.values[2], r.values[3]);
    EXPECT_EQ(-50462898, qsUtilHS_RegisterFilterSpec(&record, given, &key, r.count)) << &r - rows;
  }
  const lumra_filter_key key = key_of(0, 1);
  for (const lumra_f32_array input : {lumra_f32_array{}, empty.handle(), negative.handle(), none.handle()})
    EXPECT_EQ(-50462898, qsUtilHS_RegisterFilterSpec(&record, input, &key, 0));
  EXPECT_EQ(-50462898, qsUtilHS_RegisterFilterSpec(&record, given, &key, 3));
  EXPECT_EQ(nullptr, record.entry);
  EXPECT_EQ(std::size(rows) + 5, list.codes().size());
  EXPECT_EQ(before, total());
}

TEST(FilterRegistry, SharesByKeyAndGivesTheRecordBack) {
  const lumra_filter_key key = key_of(1, 1, 0, .2, 60);
  const std::uint64_t before = total();
  lumra_filter_record first{}, second{}, matched{};
  first.user[0] = 1;
  second.user[0] = 2;
  EXPECT_EQ(-50462810, qsUtilHS_MatchFilterSpecErase(&matched, &key, 0));
  ASSERT_EQ(0, qsUtilHS_RegisterFilterSpec(&first, nullptr, &key, 0));
  const lumra_filter_key same = key_of(1, 1, -0.0, .2, 60);
  ASSERT_EQ(0, qsUtilHS_RegisterFilterSpec(&second, nullptr, &same, 5));
  EXPECT_EQ(first.entry, second.entry);
  EXPECT_EQ(first.identifier, second.identifier);
  EXPECT_EQ(before + (first.entry->n + 384) * 32, total());
  ASSERT_EQ(0, qsUtilHS_MatchFilterSpecErase(&matched, &key, 0));
  EXPECT_EQ(0, std::memcmp(&matched, &second, sizeof matched));
  for (std::size_t v = 0; v < 4; ++v) {
    lumra_filter_key other = key;
    other.values[v] += 1e-12;
    EXPECT_EQ(-50462810, qsUtilHS_MatchFilterSpecErase(&matched, &other, 0));
  }
  EXPECT_EQ(-50462794, qsUtilHS_MatchFilterSpecErase(&matched, &key, 1));
  EXPECT_EQ(-50462810, qsUtilHS_MatchFilterSpecErase(&matched, &key, 0));
  lumra_filter_record fresh{};
  ASSERT_EQ(0, qsUtilHS_RegisterFilterSpec(&fresh, nullptr, &key, 0));
  EXPECT_NE(first.identifier, fresh.identifier);
  for (int references = 0; references < 3; ++references) {
    EXPECT_EQ(before + 2 * (fresh.entry->n + 384) * 32, total());
    EXPECT_EQ(0, qsUtilHS_UnegisterFilterSpec(&first));
  }
  EXPECT_EQ(before + (fresh.entry->n + 384) * 32, total());  // the last reference freed the erased one
  EXPECT_EQ(-50462843, qsUtilHS_UnegisterFilterSpec(&first));
  EXPECT_EQ(0, qsUtilHS_UnegisterFilterSpec(&fresh));
  EXPECT_EQ(-50462843, qsUtilHS_UnegisterFilterSpec(&fresh));  // cached, without references
  EXPECT_EQ(-50462794, qsUtilHS_MatchFilterSpecErase(&matched, &key, -1));
  EXPECT_EQ(before, total());
}

TEST(FilterRegistry, EvictsTheLeastRecentlyUsedWithoutReferences) {
  constexpr std::uint64_t n = 100000, cost = (n + 384) * 32;  // 41 of them fit
  tests::f32_array given(n);
  const auto key = [](int i) { return key_of(0, 1000 + i); };
  const auto cached = [&](int i) {
    lumra_filter_record record{};
    const lumra_filter_key k = key(i);
    if (qsUtilHS_MatchFilterSpecErase(&record, &k, 0) != 0) return false;
    EXPECT_EQ(0, qsUtilHS_UnegisterFilterSpec(&record));
    return true;
  };
  const auto add = [&](int i) {
    lumra_filter_record record{};
    const lumra_filter_key k = key(i);
    EXPECT_EQ(0, qsUtilHS_RegisterFilterSpec(&record, given, &k, 0));
    return record;
  };
  const std::uint64_t before = total();
  const int fitting = static_cast<int>((qsrfhs::filter_registry::budget - before) / cost);
  std::vector<lumra_filter_record> records;
  for (int i = 0; i < fitting; ++i) records.push_back(add(i));
  for (int i = 1; i < fitting; ++i) EXPECT_EQ(0, qsUtilHS_UnegisterFilterSpec(&records[static_cast<std::size_t>(i)]));
  EXPECT_TRUE(cached(1));  // now the most recently used
  auto added = add(fitting);
  EXPECT_TRUE(cached(0));  // referenced
  EXPECT_FALSE(cached(2));
  EXPECT_TRUE(cached(3));
  EXPECT_TRUE(cached(1));
  EXPECT_LE(total(), qsrfhs::filter_registry::budget);
  // References to all: the budget is overrun without complaint, and made good later.
  std::vector<lumra_filter_record> more;
  for (int i = 100; i < 100 + fitting; ++i) more.push_back(add(i));
  EXPECT_GT(total(), qsrfhs::filter_registry::budget);
  more.push_back(records[0]);
  more.push_back(added);
  for (lumra_filter_record &record : more) EXPECT_EQ(0, qsUtilHS_UnegisterFilterSpec(&record));
  added = add(500);
  EXPECT_LE(total(), qsrfhs::filter_registry::budget);
  EXPECT_EQ(0, qsUtilHS_UnegisterFilterSpec(&added));
  lumra_filter_record unused{};
  for (int i = 0; i <= 500; ++i) {
    const lumra_filter_key k = key(i);
    (void)qsUtilHS_MatchFilterSpecErase(&unused, &k, 1);
  }
  EXPECT_EQ(before, total());
}

TEST(FilterRegistry, AKeyWithANanNeverMatches) {
  tests::f32_array given{1.F};
  const lumra_filter_key key = key_of(0, std::numeric_limits<double>::quiet_NaN());
  lumra_filter_record a{}, b{};
  EXPECT_EQ(0, qsUtilHS_RegisterFilterSpec(&a, given, &key, 0));
  EXPECT_EQ(0, qsUtilHS_RegisterFilterSpec(&b, given, &key, 0));
  EXPECT_NE(a.entry, b.entry);
  lumra_filter_record unused{};
  EXPECT_EQ(-50462810, qsUtilHS_MatchFilterSpecErase(&unused, &key, 1));
  EXPECT_EQ(0, qsUtilHS_UnegisterFilterSpec(&a));
  EXPECT_EQ(0, qsUtilHS_UnegisterFilterSpec(&b));
}

TEST(FilterRegistry, RefusesNullsForgedAndStaleRecords) {
  const registered filter(key_of(2, 4, 1, .3, 6));
  const tests::recorded list;
  lumra_filter_record record{};
  EXPECT_EQ(-50462874, qsUtilHS_RegisterFilterSpec(nullptr, nullptr, nullptr, 0));
  EXPECT_EQ(-50462898, qsUtilHS_RegisterFilterSpec(&record, nullptr, nullptr, 0));
  EXPECT_EQ(-50462763, qsUtilHS_MatchFilterSpecErase(nullptr, nullptr, 1));
  EXPECT_EQ(-50462766, qsUtilHS_MatchFilterSpecErase(&record, nullptr, 1));
  EXPECT_EQ(-50462818, qsUtilHS_UnegisterFilterSpec(nullptr));
  EXPECT_EQ(-50462821, qsUtilHS_UnegisterFilterSpec(&record));
  record = filter.record;
  record.identifier = 0;
  EXPECT_EQ(-50462821, qsUtilHS_UnegisterFilterSpec(&record));
  std::mt19937_64 random(3);
  for (int i = 0; i < 3000; ++i) {
    record.entry = i % 2 ? filter.record.entry : reinterpret_cast<const lumra_filter_entry *>(random() | 1);
    record.identifier = i % 2 ? random() | 1ULL << 40 : filter.record.identifier;
    ASSERT_EQ(-50462843, qsUtilHS_UnegisterFilterSpec(&record));
  }
  EXPECT_EQ(3007U, list.codes().size());
}

}  // namespace
