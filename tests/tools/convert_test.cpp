// lumra convert, from files to files. SPDX-License-Identifier: MIT
#include "tools/program.hpp"

namespace tests {
namespace {

using Convert = ProgramTest;

TEST_F(Convert, ThereAndBackChangesNoByte) {
  std::string bytes(40000, '\0');
  for (std::size_t i = 0; i < bytes.size(); ++i) bytes[i] = static_cast<char>(i * i >> 4);
  for (const std::string type : {"ci16_le", "ri16_le", "ci32_be", "cu8", "ri8", "cu16_be", "ru32_le"})
    for (const std::string to : {"y.wav", "y.sigmf", "y"}) {
      SCOPED_TRACE(type + " " + to);
      write("x.bin", bytes);
      succeed("convert x.bin --format " + type + " --rate 1000 --frequency 1G --output " + to);
      succeed("convert " + to + " --output z --datatype " + type);
      EXPECT_TRUE(bytes == read("z.sigmf-data"));
      succeed("convert " + to + " --output w --datatype cf64_be");  // which holds them exactly, or as thirds are
      succeed("convert w --output v --datatype c" + type.substr(1));
      succeed("convert " + to + " --output u --datatype c" + type.substr(1));
      EXPECT_TRUE(read("u.sigmf-data") == read("v.sigmf-data"));
    }
}

TEST_F(Convert, CutsShiftsAndCounts) {
  write("x.sigmf-data", bytes_of({{0.5F, 0}, {1.5F, 0}, {0, -1}, {0, 1}, {2, 2}, {0.25F, 0}}));
  write("x.sigmf-meta", metadata("", R"({"core:frequency": 1}, {"core:sample_start": 3, "core:frequency": 2})",
                                 R"({"core:sample_start": 4, "core:sample_count": 9, "core:label": "a"})"));
  const auto json = succeed("convert x --start 1ms --duration 4ms --datatype ci8 --output y --json -").out;
  EXPECT_EQ("{\"samples\":4,\"datatype\":\"ci8\",\"clipped\":3}\n", json);
  EXPECT_EQ(std::string("\x7F\0\0\x80\0\x7F\x7F\x7F", 8), read("y.sigmf-data"));
  const std::string told = succeed("info y --json -").out;
  for (const std::string part :
       {R"("captures":[{"start":0,"samples":2,"frequency_hz":1.0,"time":null},)",
        R"({"start":2,"samples":2,"frequency_hz":2.0,"time":null}])", R"("annotations":[{"start":3,"samples":1,)"})
    EXPECT_NE(std::string::npos, told.find(part)) << told;
  EXPECT_EQ(std::vector{1.0}, succeed("convert x --capture 1 --output z --datatype cu8").numbers("Clipped"));
}

TEST_F(Convert, RefusesInOneLine) {
  write("x.ci16", std::string(400, '\0'));
  write("x.sigmf", "from before");
  write("nan.cf32", std::string(80, '\xFF'));
  std::filesystem::permissions(folder_ / "x.sigmf", std::filesystem::perms::owner_read);
  std::filesystem::create_symlink("/dev/full", folder_ / "full.wav");
  std::filesystem::create_symlink("/dev/full", folder_ / "full.sigmf");
  const struct {
    int code;
    const char *says, *line, *front;
  } refusals[] = {
      {1, "begins with c", "convert x.ci16 --rate 1 --output y --datatype ri16", "exec"},
      {1, "unknown sample type", "convert x.ci16 --rate 1 --output y --datatype ci12", "exec"},
      {1, "protected from writing", "convert x.ci16 --rate 1 --output x.sigmf", "exec"},
      {1, "is a folder", "convert x.ci16 --rate 1 --output ./", "exec"},
      {1, "whole number", "convert x.ci16 --rate 1.5 --output y.wav", "exec"},
      {1, "No space left", "convert x.ci16 --rate 1 --output full.wav", "exec"},
      {1, "No space left", "convert x.ci16 --rate 1 --output full.sigmf", "exec"},
      {1, "not a finite", "convert nan.cf32 --rate 1 --output y", "exec"},
      {1, "leave out --format", "convert y.wav --format ci8 --output z", "exec"},
      {1, "no capture -1; there is 1", "convert y.sigmf --capture -1 --output z", "exec"},
      {1, "--rate HZ", "convert - --format ci16 --output y", "cat x.ci16 | exec"},
      {1, "not known; say --duration", "convert - --format ci16 --rate 1 --output z.sigmf", "cat x.ci16 | exec"},
      {1, "ended after 100 samples", "convert - --format ci16 --rate 1 --duration 101 --output z.sigmf",
       "cat x.ci16 | exec"},
      {1, "ends inside of sample 99, 3 of whose 4 bytes", "convert - --format ci16 --rate 1 --output z",
       "head -c 399 x.ci16 | exec"},
      {2, "--output", "convert x.ci16", "exec"},
  };
  succeed("convert x.ci16 --rate 1 --output y.sigmf");
  succeed("convert x.ci16 --rate 1 --output y.wav");
  for (const auto &[code, says, line, front] : refusals) refuse(code, says, line, front);
  EXPECT_EQ("from before", read("x.sigmf"));
}

}  // namespace
}  // namespace tests
