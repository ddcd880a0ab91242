// Filters between the coefficients of a prototype: all builds give the same bits, and the sums of the definition.
// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <vector>

#include "qsrfhs/vector/kernels/kernels.hpp"
#include "support/guarded.hpp"
#include "support/signals.hpp"

namespace {

using namespace qsrfhs::kernels;
using tests::edge, tests::guarded;

/// Real outputs, then complex ones, of one kernel of either kind in all builds.
template <class Taps, class Kernel>
std::vector<float> expect_sums(const Taps &real_taps, const Taps &complex_taps, Kernel kernel_table::*real,
                               Kernel kernel_table::*complex, const std::vector<tap_place<float>> &places,
                               std::size_t samples, const std::vector<std::vector<double>> &taps) {
  const auto x = tests::noise_of<float>(2 * samples, 7);
  // Nothing before the samples is read, and behind the last group of any place neither.
  std::vector<std::vector<float>> got;
  for (const edge at : {edge::front, edge::back}) {
    const guarded reals(std::vector<float>(x.begin(), x.begin() + static_cast<std::ptrdiff_t>(samples)), at),
        both(x, at);
    const guarded given(places, at), out(3 * places.size() * sizeof(float), at);
    for (const build &b : builds()) {
      const auto *const first = given.as<tap_place<float>>();
      (b.exact->*real)(first, places.size(), real_taps, reals.as<float>(), out.as<float>());
      (b.exact->*complex)(first, places.size(), complex_taps, both.as<float>(), out.as<float>() + places.size());
      got.emplace_back(out.as<float>(), out.as<float>() + 3 * places.size());
      EXPECT_EQ(got[0], got.back());
    }
  }
  for (std::size_t k = 0; k < places.size(); ++k) {
    double sums[3] = {};
    for (std::size_t j = 0; j < static_cast<std::size_t>(places[k].count); ++j) {
      const std::size_t i = static_cast<std::size_t>(places[k].first) + j;
      sums[0] += taps[k][j] * static_cast<double>(x[i]);
      sums[1] += taps[k][j] * static_cast<double>(x[2 * i]);
      sums[2] += taps[k][j] * static_cast<double>(x[2 * i + 1]);
    }
    EXPECT_NEAR(sums[0], static_cast<double>(got[0][k]), 4e-6) << places[k].count;
    EXPECT_NEAR(sums[1], static_cast<double>(got[0][places.size() + 2 * k]), 4e-6) << places[k].count;
    EXPECT_NEAR(sums[2], static_cast<double>(got[0][places.size() + 2 * k + 1]), 4e-6) << places[k].count;
  }
  return got[0];
}

std::size_t slot(std::size_t k, bool complex) {
  return k / 8 * 16 + (complex ? static_cast<std::size_t>(complex_tap_order[k % 8]) : k % 8);
}

TEST(PolyphaseKernels, TapsInRows) {
  constexpr std::size_t rows = 3, length = 40;
  const auto in_order = tests::noise_of<float>(2 * rows * length, 1);
  auto for_complex = in_order;
  for (std::size_t i = 0; i < in_order.size(); i += 8)
    for (std::size_t k = 0; k < 8; ++k) for_complex[i + slot(k, true)] = in_order[i + k];
  std::vector<tap_place<float>> places;
  std::vector<std::vector<double>> taps;
  for (std::int32_t n = 0; n <= static_cast<std::int32_t>(length); ++n) {
    const auto row = n % 3;
    places.push_back({n % 5, n, row, 0.3F});
    auto &of_place = taps.emplace_back();
    for (std::size_t k = 0; k < length; ++k) {
      const std::size_t i = 2 * length * static_cast<std::size_t>(row) + slot(k, false);
      of_place.push_back(static_cast<double>(in_order[i]) + 0.3 * static_cast<double>(in_order[i + 8]));
    }
  }
  for (const edge at : {edge::front, edge::back}) {
    const guarded real(in_order, at), complex(for_complex, at);
    expect_sums(tap_rows<float>{real.as<float>(), length}, tap_rows<float>{complex.as<float>(), length},
                &kernel_table::polyphase, &kernel_table::complex_polyphase, places, 44, taps);
  }
}

// The last taps lie behind the prototype's end: they go on along its last pair. Rows hold what is read from it otherwise.
TEST(PolyphaseKernels, TapsAtOffsets) {
  constexpr std::size_t length = 40, last_pair = 190, rows = 5;
  constexpr double step = 4.9;
  const auto h = tests::noise_of<float>(last_pair + 2, 1);
  std::vector<float> offsets[2], pairs[2];
  for (const bool complex : {false, true}) {
    offsets[complex].resize(2 * length);
    pairs[complex].resize(2 * length * rows);
    for (std::size_t k = 0; k < length; ++k) {
      const double offset = step * static_cast<double>(k), whole = std::floor(offset);
      offsets[complex][slot(k, complex)] = static_cast<float>(whole);
      offsets[complex][slot(k, complex) + 8] = static_cast<float>(offset - whole);
      for (std::size_t row = 0; row < rows; ++row) {
        const std::size_t i = std::min(static_cast<std::size_t>(whole) + row, last_pair);
        pairs[complex][2 * length * row + slot(k, complex)] = h[i];
        pairs[complex][2 * length * row + slot(k, complex) + 8] = h[i + 1] - h[i];
      }
    }
  }
  std::vector<tap_place<float>> places;
  std::vector<std::vector<double>> taps;
  for (std::int32_t n = 0; n <= static_cast<std::int32_t>(length); ++n) {
    places.push_back({n % 5, n, 3, 0.875F});
    auto &of_place = taps.emplace_back();
    for (std::size_t k = 0; k < length; ++k) {
      const double t = 3.875 + step * static_cast<double>(k);
      const std::size_t i = std::min(static_cast<std::size_t>(t), last_pair);
      of_place.push_back(static_cast<double>(h[i]) +
                         (t - static_cast<double>(i)) * (static_cast<double>(h[i + 1]) - static_cast<double>(h[i])));
    }
  }
  for (const edge at : {edge::front, edge::back}) {
    const guarded prototype(h, at), real(offsets[0], at), complex(offsets[1], at), real_rows(pairs[0], at),
        complex_rows(pairs[1], at);
    const auto sums = [&](const float *at_real, const float *at_complex) {
      return expect_sums(tap_offsets{prototype.as<float>(), last_pair, real.as<float>(), {at_real, length}},
                         tap_offsets{prototype.as<float>(), last_pair, complex.as<float>(), {at_complex, length}},
                         &kernel_table::stretched, &kernel_table::complex_stretched, places, 44, taps);
    };
    EXPECT_EQ(sums(nullptr, nullptr), sums(real_rows.as<float>(), complex_rows.as<float>()));
  }
}

/// Outputs of all builds, exact and fused, for real samples (width 1) and complex ones.
template <class Real>
void expect_cubic_sums(void (*kernel_table::*kernel)(const sample_place<Real> *, std::size_t, const cubic_taps<Real> &,
                                                     std::size_t, const Real *, Real *),
                       double tolerance) {
  constexpr std::size_t group = 32 / sizeof(Real), rows = 3;
  for (const std::size_t length : {group, 2 * group, 6 * group})
    for (const std::size_t width : {1U, 2U}) {
      const guarded c(tests::noise_of<Real>(rows * 4 * length, 1), edge::back);
      const guarded x(tests::noise_of<Real>(length + 4 * width, 2), edge::back);
      std::vector<sample_place<Real>> places;
      for (std::uint32_t k = 0; k < 5; ++k) places.push_back({k, k % 3, static_cast<Real>(0.2 * k - 0.4)});
      const auto outputs = [&](const kernel_table &table) {
        std::vector<Real> out(width * places.size());
        (table.*kernel)(places.data(), places.size(), {c.as<Real>(), length}, width, x.as<Real>(), out.data());
        return out;
      };
      const std::vector<Real> results[] = {outputs(baseline_kernels), outputs(*builds().back().fused)};
      for (const build &b : builds()) {
        EXPECT_EQ(results[0], outputs(*b.exact)) << b.name;
        EXPECT_EQ(results[b.fused != b.exact], outputs(*b.fused)) << b.name;
      }
      for (std::size_t k = 0; k < places.size(); ++k) {
        double sums[2] = {};
        for (std::size_t j = 0; j < length; ++j) {
          double tap = 0;
          for (std::size_t power = 0; power < 4; ++power)
            tap = tap * static_cast<double>(places[k].offset) +
                  static_cast<double>(
                      c.as<Real>()[(places[k].row * length + j / group * group) * 4 + power * group + j % group]);
          sums[j % width] += tap * static_cast<double>(x.as<Real>()[width * places[k].first + j]);
        }
        for (std::size_t part = 0; part < width; ++part)
          for (const auto &out : results)
            EXPECT_NEAR(sums[part], static_cast<double>(out[width * k + part]), tolerance) << length;
      }
    }
}

TEST(PolyphaseKernels, TapsThatArePolynomials) {
  expect_cubic_sums(&kernel_table::interpolate, 2e-5);
  expect_cubic_sums(&kernel_table::interpolate_double, 1e-13);
}

}  // namespace
