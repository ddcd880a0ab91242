// SPDX-License-Identifier: MIT
#include "c_support/base/session.hpp"

#include <gtest/gtest.h>
#include <lumra/core_services.h>
#include <lumra/library_info.h>
#include <lumra/session.h>

#include <cstring>
#include <latch>
#include <string>
#include <thread>
#include <vector>

#include "qsrfhs/util/management.hpp"
#include "support/recorded.hpp"
#include "support/session.hpp"

namespace {

using c_support::SessionManager;
using tests::open_session;

TEST(Sessions, HandlesAreNeverReused) {
  std::uint64_t first = 0, second = 0;
  ASSERT_EQ(0, qsLumraAlgo_CreateSession(&first));
  EXPECT_GE(first, 1U);
  EXPECT_EQ(-380123, qsLumraAlgo_CreateSession(nullptr));  // takes no handle
  for (const std::uint64_t handle : {first, first, std::uint64_t{0}}) EXPECT_EQ(0, qsLumraAlgo_CloseSession(handle));
  ASSERT_EQ(0, qsLumraAlgo_CreateSession(&second));
  EXPECT_EQ(first + 1, second);
  EXPECT_EQ(0, qsLumraAlgo_ResetSession(second));
  EXPECT_EQ(0, qsLumraAlgo_CloseSession(second));
  EXPECT_EQ(-380121, qsLumraAlgo_ResetSession(second));
}

TEST(Log, KeepsTheNewest10001Entries) {
  const open_session session;
  auto &log = SessionManager::instance().get(session)->log;
  for (int i = 1; i <= 10005; ++i) log.add({i, "file", "text"});
  EXPECT_EQ("file:5 text", session.read_log());
}

TEST(Log, ReadsIntoAnyBuffer) {
  const open_session session;
  auto &log = SessionManager::instance().get(session)->log;
  const std::string whole = "file:-12 a message";
  for (std::uint64_t size = 0; size <= whole.size() + 2; ++size) {
    log.add({-12, "file", "a message"});
    char buffer[64];
    std::fill(std::begin(buffer), std::end(buffer), '~');
    ASSERT_EQ(0, qsLumraAlgo_ReadLog(session, -0.0, buffer, size));
    EXPECT_EQ(size > 0 ? whole.substr(0, size - 1) : "", std::string(buffer, size > 0 ? std::strlen(buffer) : 0));
    EXPECT_EQ('~', buffer[size]);
  }
}

TEST(Log, RefusesInOrderAndLeavesTheQueue) {
  const open_session session;
  char buffer[64];
  SessionManager::instance().get(session)->log.add({1, "f", "m"});
  EXPECT_EQ(-380123, qsLumraAlgo_ReadLog(0, 0.5, nullptr, 1));
  EXPECT_EQ(-380121, qsLumraAlgo_ReadLog(0, 0.5, buffer, 1));
  for (const double timeout : {0.5, -1.0, std::numeric_limits<double>::quiet_NaN()})
    EXPECT_EQ(-380122, qsLumraAlgo_ReadLog(session, timeout, buffer, 1));
  EXPECT_EQ("f:1 m", session.read_log());
}

TEST(LogConcurrency, ClosingTheSessionWakesItsReaders) {
  std::uint64_t session = 0;
  ASSERT_EQ(0, qsLumraAlgo_CreateSession(&session));
  std::latch started(3);
  std::vector<std::jthread> readers;
  for (int i = 0; i < 2; ++i)
    readers.emplace_back([&] {
      char buffer[8];
      started.count_down();
      const std::int32_t code = qsLumraAlgo_ReadLog(session, 0.0, buffer, sizeof buffer);
      EXPECT_TRUE(code == -380122 || code == -380121) << code;
    });
  started.arrive_and_wait();
  EXPECT_EQ(0, qsLumraAlgo_CloseSession(session));
}

TEST(ErrorList, CountsCopiesAndGrowsByItsOwnFailures) {
  const tests::recorded since;
  std::uint64_t count = 0;
  EXPECT_EQ(-67371090, qsrfhs_getErrorCnt(nullptr));
  EXPECT_EQ(-67371105, qsrfhs_getErrors(nullptr, 100));
  testing::internal::CaptureStdout();
  EXPECT_EQ(-33620066, qsrfhs::Management::addError(-33620066));
  EXPECT_EQ("\t>>> Management::addError(fdfeff9e)##################################################\n",
            testing::internal::GetCapturedStdout());
  ASSERT_EQ(0, qsrfhs_getErrorCnt(&count));
  std::vector<std::int32_t> codes(count, 0);
  EXPECT_EQ(-67371113, qsrfhs_getErrors(codes.data(), count - 1));
  EXPECT_EQ(0, codes[0]);
  EXPECT_EQ(-67371113, qsrfhs_getErrors(codes.data(), count));  // the failure before made the list longer
  EXPECT_EQ((std::vector<std::int32_t>{-67371090, -67371105, -33620066, -67371113, -67371113}), since.codes());
  EXPECT_GE(qsUtilHS_NumCPUs(), 1);
  EXPECT_LE(qsUtilHS_NumCPUs(), 32);
}

TEST(ErrorListConcurrency, LosesNoCode) {
  const tests::recorded since;
  testing::internal::CaptureStdout();
  {
    std::vector<std::jthread> writers;
    for (int t = 0; t < 4; ++t)
      writers.emplace_back([] {
        for (int i = 0; i < 100; ++i) qsrfhs::Management::addError(-1);
      });
  }
  testing::internal::GetCapturedStdout();
  EXPECT_EQ(std::vector<std::int32_t>(400, -1), since.codes());
}

TEST(LibraryInfo, WritesWhatFits) {
  constexpr const char *text = "QS Lumra Algo C interface 64bit release";
  const struct {
    std::uint16_t version_size, description_size;
    const char *version_text, *description;
  } rows[] = {{12, 100, "#", "#"}, {13, 39, "20.6.0f0", "#"}, {13, 40, "20.6.0f0", text}, {60, 60, "20.6.0f0", text}};
  for (const auto &r : rows) {
    SCOPED_TRACE(testing::Message() << r.version_size << ' ' << r.description_size);
    std::uint32_t version = 0;
    char version_text[64] = "#", description[128] = "#";
    EXPECT_EQ(0, qsLumraAlgo_getLibraryInfo(&version, version_text, r.version_size, description, r.description_size));
    EXPECT_EQ(0x140600C0U, version);
    EXPECT_STREQ(r.version_text, version_text);
    EXPECT_STREQ(r.description, description);
  }
  std::uint32_t version = 0;
  char text_buffer[64] = "#";
  EXPECT_EQ(-268501053, qsLumraAlgo_getLibraryInfo(nullptr, nullptr, 0, nullptr, 0));
  EXPECT_EQ(-268501057, qsLumraAlgo_getLibraryInfo(&version, nullptr, 0, nullptr, 0));
  EXPECT_EQ(-268501061, qsLumraAlgo_getLibraryInfo(&version, text_buffer, 0, nullptr, 0));
  EXPECT_EQ(-268501027, qsLumraAlgo_getLibraryFilename(nullptr, 13));
  const std::pair<std::uint16_t, const char *> names[] = {{0, "#"}, {1, "#"}, {2, ""}, {12, ""}, {13, "qsLumraAlgo"}};
  for (const auto &[size, name] : names) {
    char buffer[64] = "#";
    EXPECT_EQ(0, qsLumraAlgo_getLibraryFilename(buffer, size));
    EXPECT_STREQ(name, buffer) << size;
  }
  std::uint8_t avx = 2;
  EXPECT_EQ(-268501078, qsLumraAlgo_hasAvxHardwareSupport(nullptr));
  EXPECT_EQ(0, qsLumraAlgo_hasAvxHardwareSupport(&avx));
  EXPECT_LE(avx, 1);
}

}  // namespace
