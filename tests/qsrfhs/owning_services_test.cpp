// The owning types over the core services. SPDX-License-Identifier: MIT
#include <lumra/lumra.hpp>

#include <gtest/gtest.h>

#include <thread>
#include <type_traits>

namespace {

TEST(OwningServices, StoredArraysReleaseThemselves) {
  const void *block = nullptr;
  {
    lumra::stored_array a(100), moved;
    EXPECT_EQ(100U, a.size());
    for (auto &x : a.elements()) x = {1, 2};
    block = a.elements().data();
    moved = std::move(a);
    EXPECT_EQ(block, moved.elements().data());
    lumra::host_array<std::complex<float>> out;
    moved.read(out, 99, 2);
    EXPECT_EQ((std::complex<float>{1, 2}), out.elements()[0]);
    EXPECT_EQ(std::complex<float>{}, out.elements()[1]);
  }
  EXPECT_EQ(block, lumra::stored_array(90).elements().data());
  EXPECT_THROW(lumra::stored_array(std::size_t{1} << 29), lumra::error);
  EXPECT_THROW(lumra::stored_array(std::size_t{1} << 40), std::length_error);
  EXPECT_EQ(0U, lumra::stored_array().size());
}

TEST(OwningServices, FiltersAreSharedAndOutliveTheirErasure) {
  const lumra_filter_key key{LUMRA_FILTER_ROOT_RAISED_COSINE, {}, {4, 1, .3, 6}};
  const auto filter = lumra::registered_filter::root_raised_cosine(4, 1, .3, 6);
  EXPECT_EQ(25U, filter.coefficients().size());
  {
    const auto same = lumra::registered_filter::find(key);
    ASSERT_TRUE(same);
    EXPECT_EQ(filter.identifier(), same->identifier());
  }
  EXPECT_TRUE(lumra::registered_filter::erase(key));
  EXPECT_FALSE(lumra::registered_filter::erase(key));
  EXPECT_FALSE(lumra::registered_filter::find(key));
  EXPECT_GT(filter.coefficients()[12], 0.F);
  lumra::host_array<float> given(3);
  const lumra::registered_filter own(given, {1, 2, 3, 4});
  EXPECT_EQ(3U, own.coefficients().size());
  EXPECT_THROW(lumra::registered_filter::kaiser_low_pass(1, .3, .2, 60), lumra::error);
  lumra::registered_filter::erase({LUMRA_FILTER_GIVEN, {}, {1, 2, 3, 4}});
}

static_assert(!std::is_copy_constructible_v<lumra::fifo_writer> && !std::is_copy_constructible_v<lumra::fifo_reader>);

TEST(OwningServicesConcurrency, FifoEndsLiveOnTheirThreads) {
  lumra::fifo_ends ends("ends", 100);
  constexpr int last = 200;
  std::jthread thread([writer = std::move(ends.writer)]() mutable {
    for (int i = 0; i <= last; ++i)
      while (writer.write(std::as_bytes(std::span(&i, 1))) == lumra::transfer::timed_out) {
      }
  });
  int got = -1;
  for (int expected = 0; expected <= last; ++expected) {
    while (ends.reader.read(std::as_writable_bytes(std::span(&got, 1))) == lumra::transfer::timed_out) {
    }
    EXPECT_EQ(expected, got);
  }
  thread.join();
  EXPECT_EQ(100U, ends.reader.capacity());
  std::array<std::byte, 101> much{};
  EXPECT_THROW((void)ends.reader.read(much), std::length_error);
  ends.reader.close();
  EXPECT_EQ(lumra::transfer::closed, ends.reader.read(std::span(much).first(1)));
}

TEST(OwningServices, DescriptorsGoBack) {
  using lumra::resampler_descriptor;
  const void *first = nullptr;
  {
    resampler_descriptor a(320, resampler_descriptor::direction::inverse);
    first = a.get();
    resampler_descriptor b = std::move(a);
    EXPECT_EQ(first, b.get());
    EXPECT_NE(nullptr, b.get()->aligned_buffer);
    EXPECT_NE(first, resampler_descriptor(320, resampler_descriptor::direction::inverse).get());
    b = resampler_descriptor(320, resampler_descriptor::direction::forward);
  }
  EXPECT_THROW(resampler_descriptor(0, resampler_descriptor::direction::forward), lumra::error);
}

}  // namespace
