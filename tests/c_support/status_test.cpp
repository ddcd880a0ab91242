// SPDX-License-Identifier: MIT
#include "c_support/base/status.hpp"

#include <gtest/gtest.h>

#include <new>
#include <string>

#include "c_support/base/boundary.hpp"

namespace {

std::int32_t message_of(std::int32_t code, std::string &text) {
  char buffer[300] = "untouched";
  const std::int32_t result = qsLumraAlgo_GetErrorString(7, code, sizeof buffer, buffer);
  text = buffer;
  return result;
}

TEST(ErrorString, KnownCodesReturnZeroUnknownOnesAreFolded) {
  struct row {
    std::int32_t code, result;
    const char *text;
  };
  constexpr const char *unknown = "Unknown error code";
  constexpr const char *unmapped = "Error code not mapped. Please contact support.";
  const row rows[] = {
      {0, -312404, unknown},
      {1, -312404, unknown},
      {-312404, 0, unknown},
      {-312419, -312404, unknown},
      {-312423, -312404, unknown},
      {-312411, -312404, unknown},
      {-312434, -312404, unknown},
      {-312496, -312404, unknown},
      {-312500, -312404, unknown},
      {-380127, -312404, unknown},
      {-380128, -312404, unknown},
      {-380252, -312404, unknown},
      {312403, -312404, unknown},
      {312399, -312404, unknown},
      {INT32_MIN, -312404, unknown},
      {-312409, 0, unmapped},
      {-312416, 0, unmapped},
      {-312433, 0, unmapped},
      {-312400, 0, "Invalid session."},
      {-380121, 0, "Invalid  LumraAlgo session."},
      {-312418, 0, "(FFT Size - FFT overlap) must be a even number."},
      {312401, 0, c_support::GetStatusMessage(-312405)},
      {312402, 0, c_support::GetStatusMessage(-312406)},
  };
  for (const row &r : rows) {
    SCOPED_TRACE(r.code);
    std::string text;
    EXPECT_EQ(r.result, message_of(r.code, text));
    EXPECT_EQ(r.text, text);
  }
  EXPECT_STREQ("Success", c_support::GetStatusMessage(0));
}

TEST(ErrorString, ExactlyTheCodesOfTheInterfaceAreKnown) {
  const auto within = [](std::int32_t code, std::int32_t low, std::int32_t high) {
    return code >= low && code <= high;
  };
  for (std::int32_t code = -380300; code <= 312500; ++code) {
    if (code == -380000) code = -312600;
    if (code == -312300) code = 312300;
    const bool known = within(code, 312400, 312402) || within(code, -312410, -312400) ||
                       (within(code, -312422, -312415) && code != -312419) || within(code, -312427, -312425) ||
                       within(code, -312433, -312430) || within(code, -312499, -312497) ||
                       within(code, -380126, -380121) || code == -380253;
    ASSERT_EQ(known ? code : -312404, c_support::NormalizeStatusCode(code));
  }
}

TEST(ErrorString, WritesOnlyWhatFitsOneByteBelowTheBuffer) {
  struct row {
    std::int32_t size, result;
    const char *text;
  };
  // 27 characters; '#' marks a buffer that stays as it was.
  const row rows[] = {{-5, 27, "#"},
                      {0, 27, "#"},
                      {1, 27, "#"},
                      {2, 27, ""},
                      {27, 27, ""},
                      {28, 0, ""},
                      {29, 0, "Invalid  LumraAlgo session."}};
  for (const row &r : rows) {
    SCOPED_TRACE(r.size);
    char buffer[64] = "#";
    buffer[28] = buffer[29] = '~';
    EXPECT_EQ(r.result, qsLumraAlgo_GetErrorString(0, -380121, r.size, buffer));
    EXPECT_STREQ(r.text, buffer);
    EXPECT_EQ('~', buffer[28]);
  }
  EXPECT_EQ(27, qsLumraAlgo_GetErrorString(0, -380121, 0, nullptr));
  EXPECT_EQ(0, qsLumraAlgo_GetErrorString(0, -380121, 28, nullptr));
  EXPECT_EQ(-312404, qsLumraAlgo_GetErrorString(0, 5, 100, nullptr));
}

TEST(Boundary, TranslatesEveryKindOfException) {
  using qsrfhs::log::Logger;
  const c_support::catch_positions at{{"catch", 1}, {"catch", 2}};
  struct row {
    const char *why;
    void (*thrower)();
    std::int32_t code;
    const char *file;
    std::int32_t line, level;
    const char *message;
  };
  const row rows[] = {
      {"argument",
       [] {
         throw qsrfhs::invalid_argument({"core", 9}, -312432);
       },
       -380123, "core", 9, 5, "Unknown exception"},
      {"error",
       [] {
         throw qsrfhs::error({"core", 8}, -312499);
       },
       -380122, "core", 8, 5, "Unknown exception"},
      {"MKL",
       [] {
         throw qsrfhs::mkl_error({"core", 7}, -312499, 3, "text of MKL");
       },
       -380122, "core", 7, 5, "text of MKL"},
      {"memory", [] { throw std::bad_alloc(); }, -380122, "catch", 1, 5, "bad allocation"},
      {"standard", [] { throw std::runtime_error("why"); }, -380122, "catch", 1, 5, "why"},
      {"other", [] { throw 42; }, -380122, "catch", 2, 4, "Unknown failure!"},
  };
  for (const row &r : rows) {
    SCOPED_TRACE(r.why);
    Logger log;
    std::int32_t code = 0;
    try {
      r.thrower();
    } catch (...) {
      code = c_support::translate_current_exception(&log, &at);
    }
    EXPECT_EQ(r.code, code);
    const auto entry = log.pop();
    ASSERT_TRUE(entry);
    EXPECT_STREQ(r.file, entry->file);
    EXPECT_EQ(r.line, entry->line);
    EXPECT_EQ(r.level, entry->level);
    EXPECT_EQ(r.message, entry->message);
    EXPECT_EQ(r.code, c_support::at_boundary([&]() -> std::int32_t { return r.thrower(), 0; }));
  }
}

}  // namespace
