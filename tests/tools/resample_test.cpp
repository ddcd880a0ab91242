// lumra resample, from files to files. SPDX-License-Identifier: MIT
#include <lumra/lumra.hpp>

#include "tools/program.hpp"

namespace tests {
namespace {

class Resample : public ProgramTest {};

TEST_F(Resample, SaysWhatIsWritten) {
  write("a.b.sigmf-data", bytes_of(noise(4410)));
  write("a.b.sigmf-meta", metadata());
  succeed("resample a.b.sigmf-meta --rate 44100 --to 48000");
  EXPECT_NE(std::string::npos, read("a.b-48000Hz.sigmf-meta").find("\"core:sample_rate\": 48000.0"));
  const auto said = succeed("resample a.b --rate 44100 --to 88200 --output c.sigmf-data --passband 0.8");
  EXPECT_EQ((std::vector{8820.0, 0.1, 88.2}), said.numbers("Output samples"));
  EXPECT_EQ(17.64, said.numbers("Pass band").at(0));
  EXPECT_EQ((std::vector{22.05, 100.0}), said.numbers("Stop band"));
  EXPECT_EQ(6U, files().size());  // three recordings, and nothing else
}

TEST_F(Resample, CarriesOverTheMetadataThatAreStillTrue) {
  // The metadata count from 100; five samples belong to no capture, the 1000 behind them count.
  write("x.sigmf-data", std::string(5 * sizeof(sample), '\0') + bytes_of(noise(1000)) + "trailing");
  write("x.sigmf-meta",
        metadata(R"(, "core:offset": 100, "core:trailing_bytes": 8, "core:sha512": "0", "core:author": "A",
                    "core:hw": "H", "core:description": "D", "core:data_doi": "1", "core:collection": "C")",
                 R"({"core:sample_start": 105, "core:datetime": "T1", "core:frequency": 5, "core:header_bytes": 0},
                    {"core:sample_start": 605, "core:datetime": "T2", "core:global_index": 9})",
                 R"({"core:sample_start": 100, "core:sample_count": 5, "core:label": "ends before"},
                    {"core:sample_start": 100, "core:sample_count": 10, "core:label": "begins before"},
                    {"core:sample_start": 208, "core:sample_count": 490, "core:freq_lower_edge": -7,
                     "core:freq_upper_edge": 7},
                    {"core:sample_start": 705, "core:sample_count": 1, "core:label": "short"},
                    {"core:sample_start": 1104, "core:sample_count": 1000, "core:label": "ends behind"},
                    {"core:sample_start": 1105, "core:sample_count": 1, "core:label": "behind"})"));
  const std::string global =
      R"("global":{"core:author":"A","core:datatype":"cf32_le","core:description":"D,resampledfrom1kHzto400Hzbylumra)" +
      lumra::library().version_text + R"(","core:hw":"H","core:sample_rate":400.0,"core:version":"1.2.0"}})";
  succeed("resample x --to 400 --output y --capture 1");
  std::string text = read("y.sigmf-meta");
  text.erase(std::remove_if(text.begin(), text.end(), [](char x) { return x == ' ' || x == '\n'; }), text.end());
  EXPECT_EQ(R"({"annotations":[{"core:freq_lower_edge":-7,"core:freq_upper_edge":7,"core:sample_count":37,)"
            R"("core:sample_start":0},{"core:label":"short","core:sample_count":1,"core:sample_start":40},)"
            R"({"core:label":"endsbehind","core:sample_count":1,"core:sample_start":199}],)"
            R"("captures":[{"core:datetime":"T2","core:sample_start":0}],)" +
                global,
            text);
}

TEST_F(Resample, BothFilesAppearOrNeither) {
  write_hole("x.ci8", 20);
  const std::string line = "resample x.ci8 --rate 1000 --to 1 --output y";
  for (const std::string former : {"", "from before"}) {
    if (!former.empty()) write("y.sigmf-data", former);
    const auto before = files();
    const pid_t child = start_outputs(line, 2);
    ASSERT_EQ(0, ::kill(child, SIGSTOP));
    std::filesystem::create_directory(folder_ / "y.sigmf-meta");  // in the way of the second file alone
    ASSERT_EQ(0, ::kill(child, SIGCONT));
    const auto result = finish(child);
    EXPECT_EQ(1, result.exit_code) << result.out;
    EXPECT_EQ("lumra: cannot write y.sigmf-meta: Is a directory\n", result.err);
    std::filesystem::remove(folder_ / "y.sigmf-meta");
    EXPECT_EQ(before, files());
    EXPECT_EQ(former, read("y.sigmf-data"));
  }
  write("x.ci8", "\x01\x01");
  succeed(line);
  EXPECT_EQ(sizeof(sample), read("y.sigmf-data").size());
  EXPECT_EQ((std::vector<std::string>{"x.ci8", "y.sigmf-data", "y.sigmf-meta"}), files());
}

}  // namespace
}  // namespace tests
