// FFT resampler: descriptors and the block step. SPDX-License-Identifier: MIT
#include "qsrfhs/vector/fft_resampler.hpp"

#include <lumra/array_store.h>

#include <gtest/gtest.h>

#include <cmath>
#include <cstring>
#include <vector>

#include "support/recorded.hpp"
#include "support/signals.hpp"

namespace {

using qsrfhs::direction;
using sample = std::complex<float>;
using exact = std::complex<double>;
constexpr std::uint64_t owner = 4711;

// A descriptor that goes back to the cache.
struct lent {
  lumra_resampler_descriptor *descriptor = nullptr;
  std::uint64_t key;

  lent(std::uint32_t length, std::uint32_t buffer, std::uint32_t inverse, std::uint64_t of = owner) : key(of) {
    EXPECT_EQ(0, qsUtilHS_FFTResampler_CSG_CreateDescriptor(&descriptor, length, buffer, inverse, key));
  }
  lent(const lent &) = delete;
  lent &operator=(const lent &) = delete;
  ~lent() { qsUtilHS_FreeArrayIDH_CSG(key); }
};

// Bin j of a channel, bin by bin, as it is defined.
exact channel_bin(const std::vector<exact> &spectrum, std::int64_t m, std::int64_t centre, std::int64_t j) {
  const auto n = static_cast<std::int64_t>(spectrum.size());
  const std::int64_t start = centre - m / 2, end = centre + m / 2, c = start + j;
  std::int64_t natural = c >= n / 2 ? c - n / 2 : c + n / 2;
  if (start < 0) natural = end + n / 2 + c;
  const bool missing = start < 0 ? c < 0 || natural >= n : c >= n;
  return missing ? exact(0) : spectrum[static_cast<std::size_t>(natural)];
}

TEST(FftResampler, ABlockIsTheDirectComputation) {
  struct row {
    std::uint32_t n, m, overlap, hop;
  };
  for (const row &r :
       {row{64, 16, 3, 40}, row{64, 64, 5, 54}, row{60, 12, 2, 40}, row{64, 48, 0, 64}, row{50, 13, 4, 26}}) {
    const qsrfhs::resampler_plan plan{r.n, r.m, r.overlap};
    const lent forward(r.n, 0, 0), inverse(r.m, 1, 1);
    const auto x = tests::noise_of<sample>(r.n, r.n + r.m), w = tests::noise_of<sample>(r.m, 9);
    std::vector<sample> work(r.n);
    const auto spectrum = tests::transform_of({x.begin(), x.end()}, -1);
    const auto *const weights = reinterpret_cast<const float *>(w.data());
    const auto n = static_cast<std::int64_t>(r.n), m = static_cast<std::int64_t>(r.m);
    std::vector<std::int64_t> centres;
    for (std::int64_t centre = -m; centre <= n + m; ++centre) centres.push_back(centre);
    centres.insert(centres.end(), {std::int64_t{-1} << 40, std::int64_t{1} << 40});
    for (const bool first : {true, false}) {
      constexpr std::uint64_t offset = 3, before = 11;  // of the output, and samples of the blocks before
      std::vector<std::vector<sample>> out(centres.size(), std::vector<sample>(2 * r.m + 20, sample(77)));
      std::vector<qsrfhs::resampler_channel> channels;
      for (std::size_t i = 0; i < centres.size(); ++i)
        channels.push_back({centres[i], i % 3 ? r.m : 1 + static_cast<std::uint32_t>(i) % r.m, weights, out[i], offset,
                            i % 2 ? 0.3 : 0.0, i % 2 ? 0.01 : 0.0, before});
      qsrfhs::process_block(plan, *forward.descriptor, *inverse.descriptor, x.data(), work.data(), 5, first, channels);
      for (std::size_t i = 0; i < centres.size(); ++i) {
        SCOPED_TRACE(testing::Message() << r.n << " " << r.m << " centre " << centres[i] << " first " << first);
        const double phase = 5.0 * r.hop * channels[i].phase_step + channels[i].phase_start;
        std::vector<exact> bins(r.m);
        for (std::int64_t j = 0; j < m; ++j) {
          const exact bin = channel_bin(spectrum, m, centres[i], j);
          const sample weight = w[static_cast<std::size_t>(j)];
          const std::int64_t half = m / 2, swapped = j < half ? j + half : j < 2 * half ? j - half : j;
          bins[static_cast<std::size_t>(swapped)] =
              exact(bin.real() * weight.real(), bin.imag() * weight.imag()) * std::polar(1.0, phase);
        }
        const auto block = tests::transform_of(bins, 1);
        const std::size_t from = first ? 0 : r.overlap, kept = r.m - r.overlap - from;
        EXPECT_EQ(before + kept, channels[i].produced);
        std::vector<sample> expected(out[i].size(), sample(77));
        const std::size_t stride = r.m / channels[i].divisor;
        for (std::size_t k = 0; k < kept; k += stride)
          expected[offset + before / stride + k / stride] = sample(block[from + k] / static_cast<double>(m));
        for (std::size_t k = 0; k < expected.size(); ++k) EXPECT_NEAR(0, std::abs(expected[k] - out[i][k]), 2e-5);
      }
    }
  }
}

TEST(FftResampler, NothingIsWrittenBeyondTheOutput) {
  const qsrfhs::resampler_plan plan{32, 16, 4};
  const lent forward(32, 0, 0), inverse(16, 1, 1);
  const auto x = tests::noise_of<sample>(32, 1), w = tests::noise_of<sample>(16, 2);
  std::vector<sample> work(32), out(16, sample(5));
  const auto *const weights = reinterpret_cast<const float *>(w.data());
  for (const std::uint64_t offset : {std::uint64_t{0}, std::uint64_t{2}, std::uint64_t{3}, ~std::uint64_t{0} / 2}) {
    qsrfhs::resampler_channel channel{16, 16, weights, std::span(out).first(3), offset, 0, 0, 0};
    qsrfhs::process_block(plan, *forward.descriptor, *inverse.descriptor, x.data(), work.data(), 0, true,
                          {&channel, 1});
  }
  for (std::size_t k = 3; k < 16; ++k) EXPECT_EQ(sample(5), out[k]);
}

TEST(ResamplerDescriptors, AreLentAgainOnceTheirOwnerIsReleased) {
  const lumra_resampler_descriptor *first = nullptr;
  {
    const lent a(240, 1, 1), b(240, 1, 1, owner + 1);
    first = a.descriptor;
    EXPECT_NE(a.descriptor, b.descriptor);
    EXPECT_EQ(0U, reinterpret_cast<std::uintptr_t>(a.descriptor->aligned_buffer) % 4096);
    std::memset(a.descriptor->aligned_buffer, 1, 240 * 8 + 4096);
    EXPECT_EQ(0, a.descriptor->status);
    qsUtilHS_FreeArrayIDH_CSG(owner);
    for (int i = 0; i < 3; ++i) {
      const lent again(240, 1, 1, owner + 2);
      EXPECT_EQ(first, again.descriptor);
      EXPECT_NE(first, lent(240, 2, 1, owner + 3).descriptor);  // flags count by value
      EXPECT_NE(first, lent(240, 1, 0, owner + 3).descriptor);
      EXPECT_NE(first, lent(241, 1, 1, owner + 3).descriptor);
    }
    const lent again(240, 1, 1, owner + 2);
    EXPECT_NE(again.descriptor, lent(240, 1, 1, owner + 3).descriptor);  // taken
  }
  for (const std::uint32_t inverse : {0U, 1U}) {
    const lent bare(240, 1 - inverse, inverse);
    EXPECT_EQ(nullptr, bare.descriptor->aligned_buffer);
    EXPECT_EQ(nullptr, bare.descriptor->buffer_block);
  }
}

TEST(ResamplerDescriptors, TheOneLentLastIsLentFirst) {
  const auto lend = [](std::uint64_t to) {
    lumra_resampler_descriptor *out = nullptr;
    EXPECT_EQ(0, qsUtilHS_FFTResampler_CSG_CreateDescriptor(&out, 242, 0, 0, to));
    return out;
  };
  const auto *const a = lend(owner), *const b = lend(owner + 1);
  for (const std::uint64_t first : {owner, owner + 1}) {  // the order of their return does not count
    qsUtilHS_FreeArrayIDH_CSG(first);
    qsUtilHS_FreeArrayIDH_CSG(2 * owner + 1 - first);
    EXPECT_EQ(b, lend(owner + 1));
    EXPECT_EQ(a, lend(owner));
    qsUtilHS_FreeArrayIDH_CSG(owner + 1);
    EXPECT_EQ(b, lend(owner + 1));
  }
  qsUtilHS_FreeArrayIDH_CSG(owner);
  EXPECT_EQ(a, lend(owner));  // from now on the last one
  qsUtilHS_FreeArrayIDH_CSG(owner);
  qsUtilHS_FreeArrayIDH_CSG(owner + 1);
  EXPECT_EQ(a, lend(owner));
  qsUtilHS_FreeArrayIDH_CSG(owner);
}

TEST(ResamplerDescriptors, PrepareKeepsATransformOfTheLength) {
  lumra_resampler_descriptor descriptor{};
  ASSERT_EQ(0, qsrfhs::prepare(descriptor, 64, direction::inverse));
  const void *const inverse = descriptor.transform;
  ASSERT_EQ(0, qsrfhs::prepare(descriptor, 64, direction::forward));
  EXPECT_EQ(inverse, descriptor.transform);
  const tests::recorded list;
  EXPECT_EQ(-50397485, qsrfhs::prepare(descriptor, 0, direction::forward));
  EXPECT_EQ(nullptr, descriptor.transform);
  qsrfhs::release(descriptor);
  EXPECT_EQ(-50397566, descriptor.status);
  EXPECT_EQ((std::vector<std::int32_t>{-50397485, -50397566}), list.codes());
}

TEST(ResamplerDescriptors, RefusesAndRecords) {
  lumra_resampler_descriptor stale{};
  for (const std::uint32_t length : {0U, (1U << 27) + 1, 0x7FFFFFFFU, 0xFFFFFFFFU}) {
    lumra_resampler_descriptor *out = &stale;
    const tests::recorded list;
    EXPECT_EQ(-50397485, qsUtilHS_FFTResampler_CSG_CreateDescriptor(&out, length, 1, 1, owner));
    EXPECT_EQ(nullptr, out);
    EXPECT_EQ((std::vector<std::int32_t>{-50397485, -50397566}), list.codes());
  }
  const tests::recorded list;
  EXPECT_EQ(-50397684, qsUtilHS_FFTResampler_CSG_CreateDescriptor(nullptr, 16, 1, 1, owner));
  EXPECT_EQ((std::vector<std::int32_t>{-50397684}), list.codes());
  // A descriptor is no array.
  const lent d(16, 1, 1);
  lumra_array_ref forged{1, reinterpret_cast<lumra_array_block *>(d.descriptor)};
  lumra_array_ref *pointer = &forged;
  std::uint32_t length = 0;
  EXPECT_EQ(-33620126, qsUtilHS_ArrayLength_CSG(&pointer, &length));
  EXPECT_EQ(0, qsUtilHS_FreeArray_CSG(&pointer));
  EXPECT_NE(d.descriptor, lent(16, 1, 1, owner + 1).descriptor);  // still lent
}

}  // namespace
