// SPDX-License-Identifier: MIT
#include "c_support/base/status.hpp"

#include <gtest/gtest.h>

#include <algorithm>
#include <exception>
#include <new>
#include <stdexcept>

#include "c_support/base/boundary.hpp"

namespace {

TEST(ErrorString, KnownCodesReturnZeroUnknownOnesAreFolded) {
  constexpr const char *unknown = "Unknown error code";
  constexpr const char *unmapped = "Error code not mapped. Please contact support.";
  const struct {
    std::int32_t code, result;
    const char *text;
  } rows[] = {
      {0, -312404, unknown},       {-312404, 0, unknown},
      {-312419, -312404, unknown}, {INT32_MIN, -312404, unknown},
      {-312409, 0, unmapped},      {-312416, 0, unmapped},
      {-312433, 0, unmapped},      {-380121, 0, "Invalid  LumraAlgo session."},
  };
  for (const auto &r : rows) {
    char text[300] = "untouched";
    EXPECT_EQ(r.result, qsLumraAlgo_GetErrorString(7, r.code, sizeof text, text)) << r.code;
    EXPECT_STREQ(r.text, text) << r.code;
  }
  EXPECT_STREQ("Success", c_support::GetStatusMessage(0));
}

TEST(ErrorString, ExactlyTheCodesOfTheInterfaceAreKnown) {
  constexpr std::pair<std::int32_t, std::int32_t> known[] = {
      {312400, 312402},   {-312410, -312400}, {-312418, -312415}, {-312422, -312420}, {-312427, -312425},
      {-312433, -312430}, {-312499, -312497}, {-380126, -380121}, {-380253, -380253}};
  for (const auto &[first, last] :
       {std::pair{-380300, -380000}, {-312600, -312300}, {-10, 10}, {312300, 312500}, {INT32_MIN, INT32_MIN + 1}})
    for (std::int32_t code = first; code <= last; ++code) {
      const bool is_known = std::any_of(std::begin(known), std::end(known),
                                        [=](const auto &k) { return code >= k.first && code <= k.second; });
      ASSERT_EQ(is_known ? code : -312404, c_support::NormalizeStatusCode(code));
    }
}

TEST(ErrorString, WritesOnlyWhatFitsOneByteBelowTheBuffer) {
  const struct {
    std::int32_t size, result;
    const char *text;  // of 27 characters; '#' marks a buffer that stays as it was
  } rows[] = {{-5, 27, "#"},
              {0, 27, "#"},
              {1, 27, "#"},
              {2, 27, ""},
              {27, 27, ""},
              {28, 0, ""},
              {29, 0, "Invalid  LumraAlgo session."}};
  for (const auto &r : rows) {
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

template <class Exception>
std::exception_ptr thrown(Exception exception) {
  return std::make_exception_ptr(exception);
}

TEST(Boundary, TranslatesEveryKindOfException) {
  using qsrfhs::log::Logger;
  const c_support::catch_positions at{{"catch", 1}, {"catch", 2}};
  const struct {
    std::exception_ptr exception;
    std::int32_t code;
    const char *file;
    std::int32_t line;
    const char *message;
  } rows[] = {
      {thrown(qsrfhs::invalid_argument({"core", 9})), -380123, "core", 9, "Unknown exception"},
      {thrown(qsrfhs::error({"core", 8})), -380122, "core", 8, "Unknown exception"},
      {thrown(qsrfhs::mkl_error({"core", 7}, "text of MKL")), -380122, "core", 7, "text of MKL"},
      {thrown(std::bad_alloc()), -380122, "catch", 1, "bad allocation"},
      {thrown(std::runtime_error("why")), -380122, "catch", 1, "why"},
      {thrown(42), -380122, "catch", 2, "Unknown failure!"},
  };
  for (const auto &r : rows) {
    SCOPED_TRACE(testing::Message() << r.file << ' ' << r.line);
    Logger log;
    try {
      std::rethrow_exception(r.exception);
    } catch (...) {
      EXPECT_EQ(r.code, c_support::translate_current_exception(&log, &at));
    }
    const auto entry = log.pop();
    ASSERT_TRUE(entry);
    EXPECT_STREQ(r.file, entry->file);
    EXPECT_EQ(r.line, entry->line);
    EXPECT_EQ(r.message, entry->message);
    EXPECT_EQ(r.code, c_support::at_boundary([&]() -> std::int32_t { std::rethrow_exception(r.exception); }));
  }
}

}  // namespace
