// Named FIFOs. SPDX-License-Identifier: MIT
#include <lumra/data_fifo.h>

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <cstdint>
#include <latch>
#include <numeric>
#include <random>
#include <string>
#include <thread>
#include <vector>

namespace {

using bytes = std::vector<std::uint8_t>;

struct fifo {
  std::uint64_t *cell = nullptr;
  std::uint64_t handle;

  explicit fifo(std::uint32_t capacity, const char *name = "test", std::uint32_t flags = 0)
      : handle(qsLTEHS_DataFIFOCreate(name, capacity, flags, &cell)) {}
  fifo(const fifo &) = delete;
  fifo &operator=(const fifo &) = delete;
  ~fifo() { qsLTEHS_DataFIFOUnreserve(&cell); }

  std::int32_t write(const bytes &data) const {
    return qsLTEHS_DataFIFO(handle, 0, data.data(), nullptr, 0, static_cast<std::uint32_t>(data.size()));
  }
  std::int32_t read(bytes &data) const {
    return qsLTEHS_DataFIFO(handle, 1, nullptr, data.data(), 0, static_cast<std::uint32_t>(data.size()));
  }
  std::uint32_t fill() const {
    std::uint32_t held = 0;
    EXPECT_EQ(0, qsLTEHS_DataFIFO_GetStatus(handle, nullptr, &held));
    return held;
  }
};

bytes counting(std::size_t n, std::uint8_t first = 0) {
  bytes data(n);
  std::iota(data.begin(), data.end(), first);
  return data;
}

TEST(DataFifo, WrapsFillsExactlyAndTakesOffsets) {
  const fifo f(16);
  bytes twelve(12), ten(10);
  EXPECT_EQ(16, f.write(counting(16)));  // does not wait
  EXPECT_EQ(12, f.read(twelve));
  EXPECT_EQ(counting(12), twelve);
  EXPECT_EQ(10, f.write(counting(10, 16)));  // the write position was 16, the end
  EXPECT_EQ(14U, f.fill());
  EXPECT_EQ(10, f.read(ten));  // 4 at the end, 6 at the start
  EXPECT_EQ(counting(10, 12), ten);
  EXPECT_EQ(0, f.write({}));
  const bytes source = counting(8);
  EXPECT_EQ(3, qsLTEHS_DataFIFO(f.handle, 0, source.data(), nullptr, 5, 3));
  EXPECT_EQ(7, qsLTEHS_DataFIFO(f.handle, -1, nullptr, twelve.data(), 2, 7));  // any direction but 0 reads
  EXPECT_EQ((bytes{0, 1, 22, 23, 24, 25, 5, 6, 7, 9, 10, 11}), twelve);
}

TEST(DataFifo, WaitsATenthOfASecondAndLeavesNothingBehind) {
  const fifo f(8);
  bytes four(4);
  const auto start = std::chrono::steady_clock::now();
  EXPECT_EQ(-1, f.read(four));
  const auto waited = std::chrono::steady_clock::now() - start;
  EXPECT_GE(waited, std::chrono::milliseconds(99));
  EXPECT_LT(waited, std::chrono::seconds(5));
  EXPECT_EQ(8, f.write(counting(8)));
  EXPECT_EQ(-1, f.write(counting(1)));
  EXPECT_EQ(-1, f.write(counting(9)));  // can never fit
  EXPECT_EQ(8U, f.fill());
  EXPECT_EQ(4, f.read(four));
  EXPECT_EQ(counting(4), four);
}

TEST(DataFifo, ANameFindsTheFifoByWhatItHolds) {
  const fifo first(16, "name");
  EXPECT_EQ(0U, first.handle % 16);
  // Empty, and more is asked for: replaced even where it may be used again.
  const fifo second(16, "name", 1);
  EXPECT_EQ(16U, second.handle - first.handle);
  EXPECT_EQ(-2, first.write(counting(1)));
  EXPECT_EQ(-2, qsLTEHS_DataFIFO_Flush(first.handle));
  EXPECT_EQ(10, second.write(counting(10)));
  EXPECT_EQ(10U, second.fill());
  // It holds as much as is asked for: flushed and used again.
  const fifo third(10, "name", 3);
  EXPECT_EQ(second.handle, third.handle);
  EXPECT_NE(second.cell, third.cell);
  EXPECT_EQ(0U, second.fill());
  // Or forgotten.
  EXPECT_EQ(16, second.write(counting(16)));
  const fifo fourth(5, "name");
  EXPECT_NE(second.handle, fourth.handle);
  EXPECT_EQ(-2, second.write(counting(1)));
  EXPECT_EQ(-2, qsLTEHS_DataFIFO_GetStatus(second.handle, nullptr, nullptr));
  EXPECT_EQ(5, fourth.write(counting(5)));
  // Case matters; so do the first 255 bytes, and no others.
  const fifo other(5, "NAME");
  EXPECT_NE(fourth.handle % 16, other.handle % 16);
  std::string endless(255, 'x');
  const fifo cut(4, (endless + "a").c_str());
  EXPECT_EQ(4, cut.write(counting(4)));
  const fifo same(4, (endless + "b").c_str(), 1);
  EXPECT_EQ(cut.handle, same.handle);
  const fifo unnamed(4, nullptr);
  EXPECT_EQ(4, unnamed.write(counting(4)));
  EXPECT_EQ(unnamed.handle, fifo(4, "", 1).handle);
}

TEST(DataFifo, SixteenAtATime) {
  std::vector<std::unique_ptr<fifo>> fifos;
  for (int i = 0; i < 16; ++i) fifos.push_back(std::make_unique<fifo>(4, std::to_string(i).c_str()));
  for (const auto &f : fifos) EXPECT_NE(0U, f->handle);
  fifo none(4, "one more");
  EXPECT_EQ(0U, none.handle);
  ASSERT_NE(nullptr, none.cell);
  EXPECT_EQ(0U, *none.cell);
  EXPECT_EQ(0, qsLTEHS_DataFIFOUnreserve(&none.cell));
  EXPECT_EQ(nullptr, none.cell);
  const fifo third(4, "3");
  EXPECT_EQ(3U, third.handle % 16);  // a replacement needs no other slot
  fifos[5].reset();
  const fifo room(4, "one more");
  EXPECT_EQ(5U, room.handle % 16);
}

TEST(DataFifo, CapacitiesAtTheLimits) {
  const fifo none(0, "none"), all(0xFFFFFFFFU, "all");
  bytes one(1);
  EXPECT_EQ(0, none.read(one = {}));
  EXPECT_EQ(-1, none.write(counting(1)));
  ASSERT_NE(0U, all.handle);
  bytes back(100000);
  EXPECT_EQ(100000, all.write(counting(100000)));
  EXPECT_EQ(100000, all.read(back));
  EXPECT_EQ(counting(100000), back);
  std::uint32_t capacity = 0;
  EXPECT_EQ(0, qsLTEHS_DataFIFO_GetStatus(all.handle, &capacity, nullptr));
  EXPECT_EQ(0xFFFFFFFFU, capacity);
}

TEST(DataFifo, RefusesForgedAndStaleHandlesCellsAndBuffers) {
  fifo f(16);
  bytes data(4);
  std::mt19937_64 random(2);
  for (int i = 0; i < 1000000; ++i) {
    const std::uint64_t forged = i < 1000 ? static_cast<std::uint64_t>(i) % 16 : random() >> (i % 64);
    if (forged == f.handle) continue;
    std::uint32_t capacity = 7, fill = 7;
    ASSERT_EQ(-2, qsLTEHS_DataFIFO(forged, i % 2, data.data(), data.data(), 0, 4));
    ASSERT_EQ(-2, qsLTEHS_DataFIFO_GetStatus(forged, &capacity, &fill));
    ASSERT_EQ(0U, capacity + fill);
    ASSERT_EQ(-2, qsLTEHS_DataFIFO_Flush(forged));
    ASSERT_EQ(0, qsLTEHS_DataFIFODelete(forged));
    auto *cell = reinterpret_cast<std::uint64_t *>(forged);
    ASSERT_EQ(-2, qsLTEHS_DataFIFOUnreserve(&cell));
  }
  EXPECT_EQ(-2, qsLTEHS_DataFIFO(f.handle, 0, nullptr, data.data(), 0, 1));
  EXPECT_EQ(-2, qsLTEHS_DataFIFO(f.handle, 1, data.data(), nullptr, 0, 1));
  for (const int direction : {0, 1}) EXPECT_EQ(0, qsLTEHS_DataFIFO(f.handle, direction, nullptr, nullptr, 3, 0));
  EXPECT_EQ(-2, qsLTEHS_DataFIFO(f.handle, 0, data.data(), nullptr, 0, 0x80000000U));
  EXPECT_EQ(0U, f.fill());
  EXPECT_EQ(-2, qsLTEHS_DataFIFOUnreserve(nullptr));
  EXPECT_EQ(0U, qsLTEHS_DataFIFOCreate("x", 1, 0, nullptr));
  std::uint64_t *copy = f.cell;
  EXPECT_EQ(0, qsLTEHS_DataFIFOUnreserve(&f.cell));
  EXPECT_EQ(-2, f.write(counting(1)));
  EXPECT_EQ(-2, qsLTEHS_DataFIFOUnreserve(&copy));
  EXPECT_EQ(-312402, qsLTEHS());
}

// Every piece size from 1 to the capacity on one side, and other sizes on the other.
TEST(DataFifoConcurrency, MovesEveryByteInOrderAtEverySize) {
  constexpr std::uint32_t capacity = 61;
  constexpr std::size_t total = 20000;
  const fifo f(capacity);
  for (std::uint32_t size = 1; size <= capacity; ++size) {
    const auto stream = [](std::size_t piece, auto &&move) {
      for (std::size_t done = 0; done < total;) {
        const std::size_t n = std::min(piece, total - done);
        const std::int32_t moved = move(done, n);
        if (moved == -1) continue;
        ASSERT_EQ(static_cast<std::int32_t>(n), moved);
        done += n;
      }
    };
    std::jthread writer([&] {
      stream(size, [&](std::size_t at, std::size_t n) {
        bytes data(n);
        for (std::size_t k = 0; k < n; ++k) data[k] = static_cast<std::uint8_t>((at + k) * 7919 >> 3);
        return f.write(data);
      });
    });
    // Two sizes whose sum is beyond capacity + 1 may wait for one another: neither has enough.
    stream(std::min(capacity + 1 - size, 1 + size * 31 % capacity), [&](std::size_t at, std::size_t n) {
      bytes data(n);
      const std::int32_t moved = f.read(data);
      for (std::size_t k = 0; moved > 0 && k < n; ++k)
        EXPECT_EQ(static_cast<std::uint8_t>((at + k) * 7919 >> 3), data[k]) << "size " << size;
      return moved;
    });
  }
  EXPECT_EQ(0U, f.fill());
}

TEST(DataFifoConcurrency, DeletedWhileBothEndsTransfer) {
  for (int round = 0; round < 30; ++round) {
    fifo f(64, "deleted");
    std::latch running(3);
    const auto until_closed = [&](auto &&move) {
      bytes data(1 + static_cast<std::size_t>(round));
      running.arrive_and_wait();
      std::int32_t moved = 0;
      do moved = move(data);
      while (moved != -2);
    };
    std::jthread writer([&] { until_closed([&](bytes &data) { return f.write(data); }); });
    std::jthread reader([&] { until_closed([&](bytes &data) { return f.read(data); }); });
    running.arrive_and_wait();
    std::this_thread::yield();
    switch (round % 3) {
      case 0:
        EXPECT_EQ(0, qsLTEHS_DataFIFODelete(f.handle));
        break;
      case 1:
        EXPECT_EQ(0, qsLTEHS_DataFIFOUnreserve(&f.cell));
        break;
      default:
        fifo(65, "deleted");  // replaces it
    }
  }
}

TEST(DataFifoConcurrency, AForgottenFifoIsLeftWithoutAWakeUp) {
  const fifo f(64, "forgotten");
  EXPECT_EQ(4, f.write(counting(4)));
  std::int32_t moved = 0;
  std::latch running(2);
  std::jthread reader([&] {
    bytes data(5);
    running.arrive_and_wait();
    moved = f.read(data);
  });
  running.arrive_and_wait();
  const fifo other(4, "forgotten");
  EXPECT_NE(f.handle, other.handle);
  reader.join();
  EXPECT_TRUE(moved == -1 || moved == -2);  // it waited, or it came too late
}

TEST(DataFifoConcurrency, CreatedAndDeletedByManyThreads) {
  std::vector<std::jthread> threads;
  for (int t = 0; t < 4; ++t)
    threads.emplace_back([t] {
      bytes data(8);
      for (int i = 0; i < 300; ++i) {
        const fifo f(16, std::to_string((t + i) % 3).c_str(), static_cast<std::uint32_t>(i % 2));
        const std::int32_t written = f.write(data);
        EXPECT_TRUE(written == 8 || written == -2);
        if (f.handle != 0) (void)qsLTEHS_DataFIFO_GetStatus(f.handle, nullptr, nullptr);
      }
    });
}

}  // namespace
