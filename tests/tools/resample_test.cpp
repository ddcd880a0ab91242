// lumra resample, from files to files. SPDX-License-Identifier: MIT
#include <cstring>
#include <lumra/lumra.hpp>

#include "tools/program.hpp"

namespace tests {
namespace {

class Resample : public ProgramTest {
 protected:
  /// Runs `resample` on x as a raw file and gives the samples written.
  [[nodiscard]] samples resampled(const samples &x, const std::string &from, const std::string &to,
                                  const std::string &more = "") const {
    write("x.cf32", bytes_of(x));
    succeed("resample x.cf32 --output y --rate " + from + " --to " + to + more);
    const std::string bytes = read("y.sigmf-data");
    samples y(bytes.size() / sizeof(sample));
    std::memcpy(y.data(), bytes.data(), y.size() * sizeof(sample));
    return y;
  }
};

TEST_F(Resample, TonesKeepFrequencyLevelAndPlaceOrAreRejected) {
  const std::pair<double, double> conversions[] = {{1e6, 2e6},     {1e6, 1.25e6}, {44100, 48000}, {1e6, 1e6},
                                                   {48000, 44100}, {1e6, 400e3},  {1e6, 10e3}};
  for (const auto &[from, to] : conversions) {
    const double lower = std::min(from, to), ratio = static_cast<double>(static_cast<float>(from / to));
    for (const double part : {0.0, 0.1, -0.449, 0.501, 0.503, -0.53, 0.49 * from / lower}) {  // of the lower rate
      const bool passes = std::abs(part) < 0.45;
      if (!passes && (to >= from || std::abs(part) * lower > from / 2)) continue;
      SCOPED_TRACE(testing::Message() << from << " to " << to << ", " << part);
      const double hertz = part * lower;
      const auto count = static_cast<std::size_t>(1000 * from / lower);
      const samples y = resampled(tone(count, 1, hertz / from), std::to_string(from), std::to_string(to));
      ASSERT_EQ(std::ceil(static_cast<double>(count) / ratio), y.size());
      // Half of the taps are 64 samples of the lower rate: nearer to an end the recording's edges are seen.
      const auto edge = static_cast<std::size_t>(64 * to / lower);
      for (std::size_t k = edge; k + edge < y.size(); ++k) {
        const double turns = std::fmod(static_cast<double>(k) * ratio * hertz / from, 1);
        const auto expected = passes ? std::polar(1.0, 2 * std::numbers::pi * turns) : 0;
        // Of an error of the gain, 0.01 dB are 0.0012; rejected are 85 dB.
        ASSERT_LT(std::abs(std::complex<double>(y[k]) - expected), passes ? 2e-4 : std::pow(10, -85 / 20.0)) << k;
      }
    }
  }
}

TEST_F(Resample, BlocksChangeNoByte) {
  const samples x = noise(3001);
  for (const char *to : {"1234567.8", "1000000", "31234.5"}) {
    const samples whole = resampled(x, "1e6", to);
    for (const char *block : {" --block 1", " --block 7", " --block 1000", " --block 3001"})
      EXPECT_EQ(whole, resampled(x, "1e6", to, block));
  }
  // Whatever the recording's length, the output reaches as far.
  for (const std::size_t count : {1U, 2U, 99U, 100U, 101U}) {
    EXPECT_EQ((count + 9) / 10, resampled(noise(count), "1e6", "1e5").size());
    EXPECT_EQ(4 * count, resampled(noise(count), "1e6", "4e6").size());
  }
}

TEST_F(Resample, SaysWhatIsWritten) {
  write("a.b.sigmf-data", bytes_of(noise(4410)));
  write("a.b.sigmf-meta", metadata());
  const auto rounded = succeed("resample a.b.sigmf-meta --rate 44100 --to 48000");
  const double rate = 44100 / static_cast<double>(44100.0F / 48000.0F);
  EXPECT_EQ(rate, rounded.numbers("Note").at(0)) << rounded.out;
  const std::string written = read("a.b-48000Hz.sigmf-meta"), key = "\"core:sample_rate\": ";
  EXPECT_EQ(rate, std::stod(written.substr(written.find(key) + key.size())));

  const auto exact = succeed("resample a.b --rate 44100 --to 88200 --output c.sigmf-data");
  EXPECT_TRUE(exact.numbers("Note").empty()) << exact.out;
  EXPECT_EQ((std::vector{8820.0, 0.1, 88.2}), exact.numbers("Output samples"));
  EXPECT_EQ(19.845, exact.numbers("Pass band").at(0));
  EXPECT_GE(exact.numbers("Stop band").at(1), 90);
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
