// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>
#include <lumra/session.h>

#include <complex>
#include <limits>
#include <numbers>
#include <thread>
#include <vector>

#include "c_support/base/session.hpp"
#include "support/near.hpp"
#include "support/session.hpp"
#include "support/signals.hpp"
#include "support/test_array.hpp"

namespace {

using tests::cf32_array;
using tests::f32_array;
using tests::open_session;
using complex = std::complex<double>;

constexpr double nan = std::numeric_limits<double>::quiet_NaN();
constexpr double inf = std::numeric_limits<double>::infinity();

/// Window as its formula has it, in double precision; no window for other types.
double window_value(std::int32_t type, std::size_t k, std::size_t n) {
  const double x = 2 * std::numbers::pi * static_cast<double>(k) / static_cast<double>(n);
  const double flat_top = 0.21557895 - 0.41663158 * std::cos(x) + 0.277263158 * std::cos(2 * x) -
                          0.083578947 * std::cos(3 * x) + 0.006947368 * std::cos(4 * x);
  const double sign = k % 2 == 0 ? 1 : -1;
  return type == 1 ? flat_top * sign : type == 0 ? sign : 1.0;
}

/// The averaged power spectrum by its definition.
std::vector<double> spectrum(std::span<const lumra_cf32> x, std::int32_t type, std::size_t n, std::size_t step) {
  std::vector<double> sum(n, 0.0);
  std::vector<complex> segment(n);
  const std::size_t segments = (x.size() - n) / step + 1;
  for (std::size_t start = 0; start < segments * step; start += step) {
    for (std::size_t k = 0; k < n; ++k)
      segment[k] = complex(x[start + k].re, x[start + k].im) * window_value(type, k, n);
    const auto bins = tests::transform_of(segment, -1);
    for (std::size_t k = 0; k < n; ++k) sum[k] += std::norm(bins[k]) / static_cast<double>(segments);
  }
  return sum;
}

struct measured {
  std::int32_t code = 0;
  double f0 = 0, df = 0;
  std::vector<float> power;
};

measured measure(std::uint64_t session, std::int32_t window, std::int32_t n, double overlap,
                 std::span<const lumra_cf32> samples, double dt = 1e-6) {
  cf32_array input(samples);
  lumra_spectrum out{nan, nan, nullptr};
  const lumra_waveform in{0, dt, input.handle()};
  measured result;
  result.code = qsLumraAlgo_PerformWindowingOverlappedSeqFFTAndIQTransform(session, window, n, overlap, &in, &out);
  result.f0 = out.f0;
  result.df = out.df;
  const auto values = host::elements(out.y);
  result.power.assign(values.begin(), values.end());
  qsHost_ArrayFree(&out.y);
  return result;
}

TEST(WindowedFft, MatchesItsDefinition) {
  const struct {
    std::int32_t window, n;  // window 2: never initialised
    double overlap;
    std::size_t count, step;
  } rows[] = {{0, 16, 0, 16, 16},     {0, 16, 50, 40, 8},     {1, 64, 75, 1000, 16}, {1, 16, 99.99, 40, 1},
              {2, 64, 50, 333, 32},   {2, 17, 0, 60, 17},     {1, 19, 20, 200, 16},  {1, 500, 33.35, 3000, 334},
              {0, 128, 0, 1000, 128}, {1, 256, 50, 2000, 128}};
  const auto samples = tests::noise_of<lumra_cf32>(5000);
  const open_session session;
  for (const auto &r : rows) {
    SCOPED_TRACE(testing::Message() << "window " << r.window << " N " << r.n << " overlap " << r.overlap);
    if (r.window < 2) {
      ASSERT_EQ(0, qsLumraAlgo_InitializeWindow(session, static_cast<std::uint32_t>(r.window), r.n));
    }
    const auto input = std::span(samples).first(r.count);
    const measured m = measure(session, r.window, r.n, r.overlap, input);
    ASSERT_EQ(0, m.code);
    const auto n = static_cast<std::size_t>(r.n);
    ASSERT_EQ(n, m.power.size());
    EXPECT_LT(tests::relative_error(m.power, spectrum(input, r.window, n, r.step)), 1e-6);
    EXPECT_EQ(-500000.0, m.f0);
    EXPECT_EQ(1e6 / r.n, m.df);
  }
}

TEST(WindowedFft, APreparedTransformAndAResetChangeNothing) {
  const auto samples = tests::noise_of<lumra_cf32>(3000);
  const open_session session;
  ASSERT_EQ(0, qsLumraAlgo_InitializeWindow(session, 1, 256));
  const auto cold = measure(session, 1, 256, 50, samples).power;
  ASSERT_EQ(0, qsLumraAlgo_InitializeFFT(session, 256));
  EXPECT_EQ(cold, measure(session, 1, 256, 50, samples).power);
  ASSERT_EQ(0, qsLumraAlgo_ResetSession(session));
  EXPECT_NE(cold, measure(session, 1, 256, 50, samples).power);  // the window is gone
  ASSERT_EQ(0, qsLumraAlgo_InitializeWindow(session, 1, 256));
  EXPECT_EQ(cold, measure(session, 1, 256, 50, samples).power);
}

TEST(WindowedFft, RefusesInOrder) {
  const auto samples = tests::noise_of<lumra_cf32>(16);
  const open_session session;
  cf32_array input(samples);
  const lumra_waveform in{0, 1e-6, input.handle()};
  lumra_spectrum out{1, 2, nullptr};
  const auto run = [&](std::uint64_t s, std::int32_t n, double overlap, const lumra_waveform *i, lumra_spectrum *o) {
    return qsLumraAlgo_PerformWindowingOverlappedSeqFFTAndIQTransform(s, 0, n, overlap, i, o);
  };
  EXPECT_EQ(-380123, run(0, 15, -1, nullptr, &out));
  EXPECT_EQ(-380123, run(0, 15, -1, &in, nullptr));
  EXPECT_EQ(-380124, run(0, 15, -1, &in, &out));
  EXPECT_EQ(-380124, run(session, std::numeric_limits<std::int32_t>::min(), 0, &in, &out));
  EXPECT_EQ(-380121, run(0, 16, -1, &in, &out));
  for (const double overlap : {-0.5, -1e-300, 100.0, 1e300, -inf, inf, nan})
    EXPECT_EQ(-380128, run(session, 32, overlap, &in, &out)) << overlap;
  EXPECT_EQ(-380125, run(session, 17, 0, &in, &out));
  EXPECT_EQ(-380125, run(session, std::numeric_limits<std::int32_t>::max(), 0, &in, &out));
  for (const std::int32_t count : {15, 0, -1, std::numeric_limits<std::int32_t>::min()}) {
    input.block()->count = count;
    EXPECT_EQ(-380125, run(session, 16, 0, &in, &out)) << count;
  }
  lumra_cf32_block *no_block = nullptr;
  const lumra_waveform null_handle{0, 1, nullptr}, null_block{0, 1, &no_block};
  EXPECT_EQ(-380125, run(session, 16, 0, &null_handle, &out));
  EXPECT_EQ(-380125, run(session, 16, 0, &null_block, &out));
  EXPECT_EQ(nullptr, out.y);
  EXPECT_EQ(1, out.f0);
  EXPECT_EQ(2, out.df);
}

TEST(WindowedFft, SizesItsOutputOnceAndSurvivesARefusal) {
  const auto samples = tests::noise_of<lumra_cf32>(64);
  const open_session session;
  cf32_array input(samples);
  const lumra_waveform in{0, 1e-6, input.handle()};
  tests::fake_host host(tests::fake_host::unit::bytes);
  f32_array output(20);
  lumra_spectrum out{nan, nan, output.handle()};
  const auto run = [&](std::int32_t n) {
    return qsLumraAlgo_PerformWindowingFFTAndIQTransform(session, 0, n, &in, &out);
  };
  ASSERT_EQ(0, run(16));  // shrinks through the host, too
  ASSERT_EQ(1U, host.calls.size());
  EXPECT_EQ(9, host.calls[0].type);
  EXPECT_EQ(1, host.calls[0].dimensions);
  EXPECT_EQ(64U, host.calls[0].size);
  ASSERT_EQ(0, run(16));
  EXPECT_EQ(1U, host.calls.size());
  const std::vector<float> whole = output.copy();
  host.refuse_from = 1;
  out.f0 = out.df = nan;
  ASSERT_EQ(0, run(32));
  EXPECT_EQ(16, output.block()->count);
  EXPECT_EQ(-500000.0, out.f0);
  out.y = nullptr;
  EXPECT_EQ(0, run(16));
  EXPECT_EQ(nullptr, out.y);
}

TEST(WindowedFft, NonFiniteTimesAndSamplesPropagate) {
  auto samples = tests::noise_of<lumra_cf32>(32);
  const open_session session;
  EXPECT_EQ(-inf, measure(session, 0, 16, 0, samples, 0.0).f0);
  EXPECT_TRUE(std::isnan(measure(session, 0, 16, 0, samples, nan).df));
  samples[20].im = std::numeric_limits<float>::infinity();
  EXPECT_TRUE(std::isnan(measure(session, 0, 16, 0, samples).power[3]));
}

TEST(WindowedFft, SizesBeyondTheLimitAreLoggedAndLeaveTheSessionUsable) {
  const open_session session;
  for (const std::int32_t n : {(1 << 27) + 1, std::numeric_limits<std::int32_t>::max()}) {
    EXPECT_EQ(-380123, qsLumraAlgo_InitializeFFT(session, n));
    EXPECT_EQ(R"(.\source\qsrfhs\math\fft:36 Unknown exception)", session.read_log());
    EXPECT_EQ(-380123, qsLumraAlgo_InitializeWindow(session, 1, n));
    EXPECT_NE(std::string::npos, session.read_log().find(R"(.\source\c_support\measurement\analyze:)"));
    EXPECT_EQ(0, qsLumraAlgo_InitializeWindow(session, 2, n));  // no coefficients, no limit
  }
  const auto &context = c_support::SessionManager::instance().get(session)->context;
  EXPECT_EQ(0, context.transforms.idle_count());
  EXPECT_EQ(0, measure(session, 0, 16, 0, tests::noise_of<lumra_cf32>(16)).code);
}

TEST(Windows, AreCachedWithAlternatingSign) {
  const open_session session;
  EXPECT_EQ(-380124, qsLumraAlgo_InitializeWindow(0, 1, 15));
  EXPECT_EQ(-380121, qsLumraAlgo_InitializeWindow(0, 1, 16));
  EXPECT_EQ(-380124, qsLumraAlgo_InitializeFFT(0, 15));
  EXPECT_EQ(-380121, qsLumraAlgo_InitializeFFT(0, 16));
  for (const std::uint32_t type : {0U, 1U, 2U, 2U}) EXPECT_EQ(0, qsLumraAlgo_InitializeWindow(session, type, 16));
  const auto found = c_support::SessionManager::instance().get(session);
  for (const std::int32_t type : {0, 1})
    for (std::size_t k = 0; k < 16; ++k)
      EXPECT_NEAR(window_value(type, k, 16), (**found->find_window({16, type})).coefficients()[k], 6e-8);
  EXPECT_EQ(nullptr, found->find_window({16, 2}).value());
  const auto first = found->find_window({16, 1});
  EXPECT_EQ(0, qsLumraAlgo_InitializeWindow(session, 1, 16));
  EXPECT_EQ(first, found->find_window({16, 1}));
}

TEST(SessionConcurrency, CallsShareASessionThatIsResetAndClosed) {
  const auto samples = tests::noise_of<lumra_cf32>(2000);
  std::uint64_t session = 0;
  ASSERT_EQ(0, qsLumraAlgo_CreateSession(&session));
  {
    std::vector<std::jthread> threads;
    for (int t = 0; t < 4; ++t)
      threads.emplace_back([&, t] {
        for (int i = 0; i < 50; ++i) {
          const std::int32_t n = 16 << ((i + t) % 3);
          const std::int32_t prepared = t == 0   ? qsLumraAlgo_InitializeFFT(session, n)
                                        : t == 1 ? qsLumraAlgo_InitializeWindow(session, 1, n)
                                        : t == 2 ? qsLumraAlgo_ResetSession(session)
                                                 : 0;
          const std::int32_t code = measure(session, 1, n, 50, samples).code;
          EXPECT_TRUE(prepared == 0 || prepared == -380121) << prepared;
          EXPECT_TRUE(code == 0 || code == -380121) << code;
          if (t == 3 && i == 40) qsLumraAlgo_CloseSession(session);
        }
      });
  }
  EXPECT_EQ(-380121, qsLumraAlgo_ResetSession(session));
}

}  // namespace
