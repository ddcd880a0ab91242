// Calls that signals interrupt a thousand times a second. SPDX-License-Identifier: MIT
#include <gtest/gtest.h>
#include <sys/time.h>

#include <atomic>
#include <csignal>
#include <thread>

#include "lifetime/caller.hpp"

namespace {

std::atomic<int> signals{0};  // the system chooses the thread, also one of the library's
static_assert(decltype(signals)::is_always_lock_free);

TEST(SignalsConcurrency, DisturbNoCallAndNoWait) {
  struct sigaction action {
  }, before{};
  action.sa_handler = [](int) { ++signals; };
  ASSERT_EQ(0, sigaction(SIGALRM, &action, &before));
  constexpr itimerval every_millisecond{{0, 1000}, {0, 1000}}, never{};
  ASSERT_EQ(0, setitimer(ITIMER_REAL, &every_millisecond, nullptr));
  lifetime::shared_objects shared;
  lifetime::caller calling(shared, 1);
  // A busy machine takes longer to deliver that many.
  const auto end = std::chrono::steady_clock::now() + std::chrono::seconds(30);
  while (signals < 300 && std::chrono::steady_clock::now() < end) ASSERT_TRUE(calling.call_all());
  ASSERT_GE(signals, 300);

  // A wait for bytes takes its tenth of a second, one for an entry of the log ends with the session.
  const int before_waits = signals;
  char data[8];
  const auto wait_begin = std::chrono::steady_clock::now();
  EXPECT_EQ(-1, qsLTEHS_DataFIFO(shared.fifo, LUMRA_FIFO_WRITE, data, nullptr, 0, 2000));
  EXPECT_GE(std::chrono::steady_clock::now() - wait_begin, std::chrono::milliseconds(100));
  std::jthread closing([&] {
    std::this_thread::sleep_for(std::chrono::milliseconds(50));
    (void)qsLumraAlgo_CloseSession(shared.session);
  });
  EXPECT_EQ(LUMRA_INTERNAL_ERROR, qsLumraAlgo_ReadLog(shared.session, 0, data, sizeof data));
  (void)setitimer(ITIMER_REAL, &never, nullptr);
  (void)sigaction(SIGALRM, &before, nullptr);
  EXPECT_GT(signals, before_waits);
}

}  // namespace
