// The threads that read, without the program. SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <cstring>
#include <numeric>

#include "analysis/sample_blocks.hpp"
#include "analysis/spectrum_pieces.hpp"
#include "recording/failure.hpp"

namespace tests {
namespace {

/// Samples 0, 1, 2 ..., and a failure from one of them on.
class counting_bytes final : public recording::byte_reader {
 public:
  explicit counting_bytes(std::uint64_t fails_at) : fails_at_(fails_at) {}

  std::size_t read(std::uint64_t offset, std::span<std::byte> out) override {
    const std::uint64_t first = offset / sizeof(float), count = out.size() / sizeof(float);
    if (first + count > fails_at_) throw recording::failure("sample {} is missing", fails_at_);
    std::vector<float> samples(count);
    std::iota(samples.begin(), samples.end(), static_cast<float>(first));
    std::memcpy(out.data(), samples.data(), out.size());
    return out.size();
  }

 private:
  std::uint64_t fails_at_;
};

recording::source counting_source(std::uint64_t samples, std::uint64_t fails_at) {
  recording::source made;
  made.format = {recording::component::f32, false, false};
  made.samples = samples;
  made.extents = {{0, samples, 0}};
  made.bytes = [fails_at] { return std::make_unique<counting_bytes>(fails_at); };
  return made;
}

tool::selection chosen(std::vector<recording::stretch> stretches) {
  tool::selection made;
  for (const recording::stretch &each : stretches) made.samples += each.samples;
  made.stretches = std::move(stretches);
  return made;
}

/// Checks a block's samples; how many they are.
std::size_t expect_counting(const tool::sample_block &block) {
  const auto *samples = static_cast<const float *>(block.samples);
  for (std::size_t k = 0; k < block.count; ++k)
    EXPECT_EQ(static_cast<float>(block.first + k), samples[k]) << block.first;
  return block.count;
}

TEST(ReaderConcurrency, BlocksHoldWhatWasRead) {
  const recording::source source = counting_source(100'000, recording::endless);
  for (const std::size_t size : {std::size_t{1000}, std::size_t{1} << 18}) {
    tool::sample_blocks blocks(source, chosen({{5, 40'000, {}, 0}, {50'001, 30'000, {}, 0}}), size);
    std::uint64_t samples = 0;
    std::vector<std::uint64_t> begins;
    while (const auto block = blocks.next()) {
      if (block->begins_stretch) begins.push_back(block->first);
      samples += expect_counting(*block);
    }
    EXPECT_EQ(70'000U, samples);
    EXPECT_EQ((std::vector<std::uint64_t>{5, 50'001}), begins);
  }
}

TEST(ReaderConcurrency, EndsWheneverNobodyWantsMore) {
  const recording::source source = counting_source(10'000, recording::endless);
  for (int wanted = 0; wanted < 12; ++wanted)
    for (int again = 0; again < 20; ++again) {
      tool::sample_blocks blocks(source, chosen({{0, 10'000, {}, 0}}), 1000);
      for (int k = 0; k < wanted; ++k) {
        const auto block = blocks.next();
        ASSERT_EQ(k < 10, block.has_value());
        if (block) expect_counting(*block);
      }
    }
}

TEST(ReaderConcurrency, FailureComesBehindWhatWasReadBefore) {
  for (const std::uint64_t fails_at : {0U, 1U, 3500U, 9999U}) {
    const recording::source source = counting_source(10'000, fails_at);
    tool::sample_blocks blocks(source, chosen({{0, 10'000, {}, 0}}), 1000);
    for (std::uint64_t k = 0; k < fails_at / 1000; ++k) {
      const auto block = blocks.next();
      ASSERT_TRUE(block.has_value());
      EXPECT_EQ(1000 * k, block->first);
      expect_counting(*block);
    }
    EXPECT_THROW((void)blocks.next(), recording::failure) << fails_at;
  }
}

const tool::selection two_stretches = chosen({{5, 40'000, {}, 0}, {50'001, 30'003, {}, 0}});

lumra::spectrum_settings short_segments(std::uint32_t threads) {
  lumra::spectrum_settings settings;
  settings.points = 64;
  settings.overlap = 0.3;
  settings.hold = true;
  settings.threads = threads;
  return settings;
}

TEST(ReaderConcurrency, PiecesAddUpToTheSpectrumOfOneThread) {
  const recording::source source = counting_source(100'000, recording::endless);
  tool::spectrum_accumulator whole(short_segments(1), true);
  tool::sample_blocks blocks(source, two_stretches);
  while (const auto block = blocks.next()) {
    if (block->begins_stretch) whole.gap();
    whole.add(*block);
  }
  const lumra::averaged_spectrum expected = whole.read();
  for (const std::uint32_t threads : {1U, 2U, 5U})
    for (const std::uint64_t size : {63U, 1000U, 40'000U, 100'000U}) {
      tool::spectrum_accumulator sum(short_segments(1), true);
      tool::spectrum_pieces pieces(source, two_stretches, short_segments(threads), size);
      std::uint64_t samples = 0;
      while (const auto piece = pieces.next()) {
        sum.merge(piece->average);
        samples += piece->samples;
      }
      const lumra::averaged_spectrum found = sum.read();
      EXPECT_EQ(70'003U, samples);
      EXPECT_EQ(expected.info.segments, found.info.segments);
      EXPECT_EQ(expected.power, found.power) << threads << " threads, pieces of " << size;
      EXPECT_EQ(expected.maximum, found.maximum) << threads << " threads, pieces of " << size;
    }
}

TEST(ReaderConcurrency, PiecesInFrontOfAFailureAreGivenAndNobodyWaitsForTheRest) {
  const tool::selection all = chosen({{5, 40'000, {}, 0}});
  for (const std::uint64_t fails_at : {0U, 4500U, 39'999U, 100'000U}) {
    const recording::source source = counting_source(100'000, fails_at);
    const std::uint64_t good = fails_at < 5 ? 0 : std::min<std::uint64_t>((fails_at - 5) / 1000, 40);
    for (const std::uint64_t wanted : {std::uint64_t{0}, std::uint64_t{1}, good, good + 1}) {
      tool::spectrum_pieces pieces(source, all, short_segments(3), 1000);
      for (std::uint64_t k = 0; k < std::min(wanted, good); ++k) ASSERT_TRUE(pieces.next().has_value());
      if (wanted <= good) continue;
      if (good < 40)
        EXPECT_THROW((void)pieces.next(), recording::failure) << fails_at;
      else
        EXPECT_FALSE(pieces.next().has_value());
    }
  }
}

}  // namespace
}  // namespace tests
