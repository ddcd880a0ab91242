// lumra resample, from files to files. SPDX-License-Identifier: MIT
#include <algorithm>
#include <chrono>
#include <cmath>
#include <complex>
#include <cstring>
#include <numbers>
#include <random>
#include <thread>

#include "tools/program.hpp"

namespace {

using tests::outcome;
using sample = std::complex<float>;
using samples = std::vector<sample>;

/// amplitude * exp(j 2 pi frequency n), frequency in cycles per sample.
samples tone(std::size_t count, double amplitude, double frequency) {
  samples x(count);
  for (std::size_t n = 0; n < count; ++n)
    x[n] = std::complex<float>(
        std::polar(amplitude, 2 * std::numbers::pi * std::fmod(frequency * static_cast<double>(n), 1)));
  return x;
}

samples noise(std::size_t count) {
  std::mt19937 random(1);
  std::normal_distribution<float> value(0, 0.1F);
  samples x(count);
  for (sample &s : x) s = {value(random), value(random)};
  return x;
}

std::string bytes_of(const samples &x) {
  return {reinterpret_cast<const char *>(x.data()), x.size() * sizeof(sample)};
}

class Resample : public tests::ProgramTest {
 protected:
  /// Runs `resample` on x as a raw file, which must succeed, and gives the samples written.
  [[nodiscard]] samples resampled(const samples &x, const std::string &from, const std::string &to,
                                  const std::vector<std::string> &more = {}) const {
    write("x.cf32", bytes_of(x));
    std::vector<std::string> arguments{"resample", "x.cf32", "--input-rate", from, "--rate", to, "--output", "y"};
    arguments.insert(arguments.end(), more.begin(), more.end());
    const outcome result = run(arguments);
    EXPECT_EQ(0, result.exit_code) << result.err;
    const std::string bytes = read("y.sigmf-data");
    samples y(bytes.size() / sizeof(sample));
    std::memcpy(y.data(), bytes.data(), y.size() * sizeof(sample));
    return y;
  }
};

constexpr struct {
  double from, to;
} conversions[] = {{1e6, 2e6}, {1e6, 1.25e6}, {44100, 48000}, {1e6, 1e6}, {48000, 44100}, {1e6, 400e3}, {1e6, 10e3}};

/// Half of the taps, in samples of the lower rate, rounded up: nearer to an end the recording's edges are seen.
constexpr double reach = 64;

TEST_F(Resample, TonesInThePassBandKeepFrequencyLevelAndPlace) {
  for (const auto &[from, to] : conversions)
    for (const double part : {0.0, 0.1, -0.449}) {  // of the lower rate
      SCOPED_TRACE(testing::Message() << from << " to " << to << ", " << part);
      const double lower = std::min(from, to), hertz = part * lower;
      const auto count = static_cast<std::size_t>(1000 * from / lower);
      const samples y = resampled(tone(count, 0.5, hertz / from), std::to_string(from), std::to_string(to));
      const double ratio = static_cast<double>(static_cast<float>(from / to));
      ASSERT_EQ(std::ceil(static_cast<double>(count) / ratio), y.size());
      const auto edge = static_cast<std::size_t>(reach * to / lower);
      for (std::size_t k = edge; k + edge < y.size(); ++k) {
        const double turns = std::fmod(static_cast<double>(k) * ratio * hertz / from, 1);
        const auto expected = std::polar(0.5, 2 * std::numbers::pi * turns);
        // Of an error of the gain, 0.01 dB are 0.0012.
        ASSERT_LT(std::abs(std::complex<double>(y[k]) - expected) / 0.5, 2e-4) << "sample " << k;
      }
    }
}

TEST_F(Resample, TonesOutsideTheNewBandAreRejected) {
  for (const auto &[from, to] : conversions) {
    if (to >= from) continue;
    for (const double hertz : {0.501 * to, 0.503 * to, -0.53 * to, 0.49 * from}) {
      SCOPED_TRACE(testing::Message() << from << " to " << to << ", " << hertz);
      const samples y = resampled(tone(static_cast<std::size_t>(1000 * from / to), 1, hertz / from),
                                  std::to_string(from), std::to_string(to));
      const auto edge = static_cast<std::size_t>(reach);
      ASSERT_GT(y.size(), 2 * edge);
      for (std::size_t k = edge; k + edge < y.size(); ++k) ASSERT_LT(20 * std::log10(std::abs(y[k])), -85) << k;
    }
  }
}

TEST_F(Resample, SpectrumOfTheResultShowsTheToneWhereItWas) {
  write("x.sigmf-data", bytes_of(tone(20000, 0.5, 0.1)));
  write("x.sigmf-meta", R"({"global": {"core:datatype": "cf32_le", "core:sample_rate": 1e6},
                            "captures": [{"core:sample_start": 0, "core:frequency": 2.4e9}]})");
  ASSERT_EQ(0, run({"resample", "x", "--rate", "400e3"}).exit_code);
  const auto rows = spectrum({"x-400000Hz", "--fft", "400"});
  const auto peak = std::max_element(rows.begin(), rows.end(), [](auto &a, auto &b) { return a.level < b.level; });
  EXPECT_NEAR(2.4e9 + 1e5, peak->frequency, 1e-3);
  EXPECT_NEAR(-6.0206, peak->level, 0.01);
}

TEST_F(Resample, BlocksChangeNoByte) {
  const samples x = noise(3001);
  for (const char *to : {"1234567.8", "1000000", "31234.5"}) {
    const samples whole = resampled(x, "1e6", to);
    for (const char *block : {"1", "7", "1000", "3001"}) EXPECT_EQ(whole, resampled(x, "1e6", to, {"--block", block}));
  }
  // Whatever the recording's length, the output reaches as far.
  for (const std::size_t count : {1U, 2U, 99U, 100U, 101U}) {
    const auto expected = static_cast<std::size_t>(std::ceil(static_cast<double>(count) / 10));
    EXPECT_EQ(expected, resampled(noise(count), "1e6", "1e5").size());
    EXPECT_EQ(4 * count, resampled(noise(count), "1e6", "4e6").size());
  }
}

TEST_F(Resample, SaysTheRateThatIsWritten) {
  write("a.b.sigmf-data", bytes_of(noise(4410)));
  const std::string meta = R"({"global": {"core:datatype": "cf32_le", "core:sample_rate": 44100},
                               "captures": [{"core:sample_start": 0, "core:frequency": 433920000.5}]})";
  write("a.b.sigmf-meta", meta);
  const outcome rounded = run({"resample", "a.b.sigmf-meta", "--rate", "48000"});
  EXPECT_EQ(0, rounded.exit_code) << rounded.err;
  EXPECT_NE(std::string::npos, rounded.out.find("rounded to single precision")) << rounded.out;
  const std::string written = read("a.b-48000Hz.sigmf-meta");
  const auto value = [&](const std::string &key) {
    const std::size_t at = written.find('"' + key + "\": ");
    return at == std::string::npos ? -1 : std::stod(written.substr(at + key.size() + 4));
  };
  EXPECT_EQ(44100 / static_cast<double>(44100.0F / 48000.0F), value("core:sample_rate"));
  EXPECT_EQ(433920000.5, value("core:frequency"));
  EXPECT_NE(std::string::npos, written.find("cf32_le"));
  EXPECT_EQ(meta, read("a.b.sigmf-meta"));

  const outcome exact = run({"resample", "a.b", "--rate", "88200", "--output", "c.sigmf-data"});
  EXPECT_EQ(std::string::npos, exact.out.find("rounded")) << exact.out;
  EXPECT_NE(std::string::npos, exact.out.find("8820 (0.1 s) at 88.2 kHz")) << exact.out;
  EXPECT_NE(std::string::npos, exact.out.find("up to 19.845 kHz")) << exact.out;
  const std::size_t rejection = exact.out.find("rejection ");
  ASSERT_NE(std::string::npos, rejection);
  EXPECT_GE(std::stod(exact.out.substr(rejection + 10)), 90);
  const std::vector<std::string> names{"a.b-48000Hz.sigmf-data", "a.b-48000Hz.sigmf-meta", "a.b.sigmf-data",
                                       "a.b.sigmf-meta",         "c.sigmf-data",           "c.sigmf-meta"};
  EXPECT_EQ(names, files());
}

TEST_F(Resample, RefusesBadInputInOneLine) {
  write("x.cf32", bytes_of(noise(100)));
  write("empty.cf32", "");
  write("nan.cf32", std::string(800, '\xFF'));
  write("large.cf32", bytes_of(samples(4000, 3.4e38F)));
  write("x.sigmf-data", bytes_of(noise(100)));
  write("x.sigmf-meta", R"({"global": {"core:datatype": "cf32_le"}})");
  std::filesystem::create_symlink("/dev/full", folder_ / "full.sigmf-data");
  std::filesystem::create_symlink("/dev/full", folder_ / "fullmeta.sigmf-meta");
  const auto before = files();
  const struct {
    int code;
    const char *says;
    std::vector<std::string> arguments;
  } refusals[] = {
      {1, "No such file", {"none.cf32", "--rate", "1"}},
      {1, "--input-rate HZ", {"x.cf32", "--rate", "1"}},
      {1, "--input-rate HZ", {"x", "--rate", "1"}},
      {1, "no samples", {"empty.cf32", "--rate", "1", "--input-rate", "1"}},
      {1, "sample 0 is not", {"nan.cf32", "--rate", "1", "--input-rate", "1"}},
      {1, "too large", {"large.cf32", "--rate", "1.5", "--input-rate", "1"}},
      {1, "beyond a factor", {"x.cf32", "--rate", "1", "--input-rate", "65537"}},
      {1, "beyond a factor", {"x.cf32", "--rate", "1e300", "--input-rate", "1e-300"}},
      {1, "part of the recording", {"x", "--rate", "1", "--input-rate", "2", "--output", "x"}},
      {1, "part of the recording", {"x.sigmf-data", "--rate", "1", "--input-rate", "2", "--output", "./x.sigmf-meta"}},
      {1, "is a folder", {"x.cf32", "--rate", "1", "--input-rate", "2", "--output", "./"}},
      {1, "No such file", {"x.cf32", "--rate", "1", "--input-rate", "2", "--output", "none/y"}},
      {1, "No space left", {"x.cf32", "--rate", "1", "--input-rate", "2", "--output", "full"}},
      {1, "No space left", {"x.cf32", "--rate", "1", "--input-rate", "2", "--output", "fullmeta"}},
      {2, "--rate", {"x.cf32", "--input-rate", "1"}},
      {2, "--rate", {"x.cf32", "--rate", "0"}},
      {2, "--input-rate", {"x.cf32", "--rate", "1", "--input-rate", "nan"}},
      {2, "RECORDING", {"--rate", "1"}},
  };
  for (const auto &refusal : refusals) {
    std::vector<std::string> arguments{"resample"};
    arguments.insert(arguments.end(), refusal.arguments.begin(), refusal.arguments.end());
    const outcome result = run(arguments);
    SCOPED_TRACE(result.err);
    EXPECT_EQ(refusal.code, result.exit_code);
    EXPECT_NE(std::string::npos, result.err.find(refusal.says)) << refusal.says;
    EXPECT_EQ(1, std::count(result.err.begin(), result.err.end(), '\n'));
    EXPECT_TRUE(result.err.starts_with("lumra: "));
    EXPECT_EQ("", result.out);
    EXPECT_EQ(before, files());
  }
}

TEST_F(Resample, InterruptionLeavesNothing) {
  write("long.ci8", "");
  std::filesystem::resize_file(folder_ / "long.ci8", std::uintmax_t{1} << 36);  // a hole: takes no room
  const pid_t child = start({"resample", "long.ci8", "--input-rate", "1e6", "--rate", "1e3"});
  const auto begin = std::chrono::steady_clock::now();
  const auto parts = [&] {
    const auto names = files();
    return std::count_if(names.begin(), names.end(), [](const auto &name) { return name.ends_with(".part"); });
  };
  while (parts() < 2 && std::chrono::steady_clock::now() - begin < std::chrono::seconds(20))
    std::this_thread::sleep_for(std::chrono::milliseconds(5));
  EXPECT_EQ(2, parts());
  ASSERT_EQ(0, ::kill(child, SIGINT));
  const outcome result = finish(child);
  EXPECT_EQ(SIGINT, result.signal);
  EXPECT_EQ("", result.out + result.err);
  EXPECT_EQ(std::vector<std::string>{"long.ci8"}, files());
}

}  // namespace
