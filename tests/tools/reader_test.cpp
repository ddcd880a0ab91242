// The thread that reads ahead, without the program. SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <cstring>
#include <numeric>

#include "analysis/sample_blocks.hpp"
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

}  // namespace
}  // namespace tests
