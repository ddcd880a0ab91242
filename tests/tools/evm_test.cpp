// lumra evm, from files to files. SPDX-License-Identifier: MIT
#include <chrono>
#include <cmath>
#include <complex>
#include <numbers>
#include <random>
#include <thread>

#include "tools/program.hpp"

namespace {

using tests::outcome;
using sample = std::complex<float>;
using samples = std::vector<sample>;
using exact = std::complex<double>;

constexpr double degrees = 180 / std::numbers::pi;

std::string bytes_of(const samples &x) {
  return {reinterpret_cast<const char *>(x.data()), x.size() * sizeof(sample)};
}

samples noise(std::size_t count, unsigned seed, float deviation) {
  std::mt19937 random(seed);
  std::normal_distribution<float> value(0, deviation);
  samples x(count);
  for (sample &s : x) s = {value(random), value(random)};
  return x;
}

struct figures {
  double rms = 0, mean = 0, peak = 0;
  std::size_t at = 0;
};

/// By definition, in double precision.
template <class Error>
figures figures_of(const samples &r, const samples &m, Error error) {
  figures f;
  for (std::size_t i = 0; i < r.size(); ++i) {
    const double e = error(exact(r[i]), exact(m[i]));
    f.rms += e * e;
    f.mean += e;
    if (std::abs(e) > std::abs(f.peak)) f = {f.rms, f.mean, e, i};
  }
  const auto n = static_cast<double>(r.size());
  return {std::sqrt(f.rms / n), f.mean / n, f.peak, f.at};
}

class Evm : public tests::ProgramTest {
 protected:
  void write_pair(const samples &reference, const samples &measured) const {
    write("r.cf32", bytes_of(reference));
    write("m.cf32", bytes_of(measured));
  }

  [[nodiscard]] outcome evm(std::vector<std::string> options) const {
    options.insert(options.begin(), {"evm", "r.cf32", "m.cf32", "--rate", "1000"});
    outcome result = run(options);
    EXPECT_EQ(0, result.exit_code) << result.err;
    return result;
  }

  /// The numbers behind a label of the summary.
  static std::vector<double> numbers(const outcome &result, const std::string &label) {
    std::vector<double> found;
    std::istringstream lines(result.out);
    for (std::string line; std::getline(lines, line);)
      if (line.starts_with(label))
        for (const char *at = line.c_str() + label.size(); *at;) {
          char *end = nullptr;
          const double value = std::strtod(at, &end);
          if (end != at) found.push_back(value);
          at = end == at ? at + 1 : end;
        }
    return found;
  }
};

TEST_F(Evm, MatchesTheDefinitionsAtAnyScaleAndBlock) {
  for (const float scale : {1.0F, 3e-25F, 7e25F}) {
    SCOPED_TRACE(scale);
    samples r = noise(1003, 1, scale), m = noise(1003, 2, 0.1F * scale);
    for (std::size_t i = 0; i < r.size(); ++i) m[i] += r[i];
    write_pair(r, m);
    const double unit = figures_of(r, r, [](exact a, exact) { return std::abs(a); }).rms;
    const figures error = figures_of(r, m, [=](exact a, exact b) { return 100 * std::abs(b - a) / unit; });
    const figures magnitude =
        figures_of(r, m, [=](exact a, exact b) { return 100 * (std::abs(b) - std::abs(a)) / unit; });
    const figures phase = figures_of(r, m, [](exact a, exact b) { return degrees * std::arg(b / a); });

    const outcome whole = evm({"--csv", "whole.csv"});
    const auto rms = numbers(whole, "EVM RMS"), peak = numbers(whole, "EVM peak");
    ASSERT_EQ(2U, rms.size()) << whole.out;
    ASSERT_EQ(4U, peak.size()) << whole.out;
    EXPECT_NEAR(error.rms, rms[0], 1e-4);
    EXPECT_NEAR(20 * std::log10(error.rms / 100), rms[1], 0.006);
    EXPECT_NEAR(error.peak, peak[0], 1e-3);
    EXPECT_EQ(static_cast<double>(error.at), peak[2]);
    EXPECT_NEAR(static_cast<double>(error.at) / 1000, peak[3], 1e-9);
    for (const auto &[label, f] : {std::pair{"Magnitude error", magnitude}, {"Phase error", phase}}) {
      const auto shown = numbers(whole, label);
      ASSERT_EQ(5U, shown.size()) << whole.out;
      EXPECT_NEAR(f.rms, shown[0], 1e-4) << label;
      EXPECT_NEAR(f.peak, shown[1], 1e-3) << label;
      EXPECT_EQ(static_cast<double>(f.at), shown[2]) << label;
      EXPECT_NEAR(f.mean, shown[4], 1e-5) << label;
    }

    std::istringstream csv(read("whole.csv"));
    std::string line;
    std::getline(csv, line);
    EXPECT_EQ("sample,evm_percent,magnitude_error_percent,phase_error_deg", line);
    for (std::size_t i = 0; i < r.size(); ++i) {
      double index = 0, e = 0, a = 0, p = 0;
      char comma = 0;
      ASSERT_TRUE(csv >> index >> comma >> e >> comma >> a >> comma >> p) << i;
      ASSERT_EQ(static_cast<double>(i), index);
      const exact x(r[i]), y(m[i]);
      ASSERT_NEAR(100 * std::abs(y - x) / unit, e, 1e-4);
      ASSERT_NEAR(100 * (std::abs(y) - std::abs(x)) / unit, a, 1e-4);
      ASSERT_NEAR(degrees * std::arg(y / x), p, 1e-4);
    }

    for (const bool align : {false, true}) {
      std::vector<std::string> options{"--csv", "x.csv"};
      if (align) options.emplace_back("--align");
      const std::string expected = evm(options).out, rows = read("x.csv");
      for (const char *block : {"1", "100", "1003"}) {
        std::vector<std::string> split = options;
        split.insert(split.end(), {"--block", block});
        EXPECT_EQ(expected, evm(split).out);
        EXPECT_EQ(rows, read("x.csv"));
      }
    }
  }
}

TEST_F(Evm, AlignFindsAndRemovesOneGain) {
  const samples r = noise(5000, 1, 0.2F);
  samples m = r;
  for (sample &x : m) x = sample(0, -4) * x;  // without rounding
  write_pair(r, m);
  outcome result = evm({"--align"});
  EXPECT_EQ((std::vector{12.0412, -90.0}), numbers(result, "Alignment             least-squares complex gain"));
  EXPECT_EQ(0, numbers(result, "EVM RMS")[0]) << result.out;
  EXPECT_NEAR(100 * std::sqrt(17.0), numbers(evm({}), "EVM RMS")[0], 1e-2);

  // The least-squares gain itself, in which the noise has a part, and what remains.
  const exact gain = std::polar(0.8, 0.3);
  const samples more = noise(5000, 2, 0.05F);
  exact product;
  double power = 0, left = 0;
  for (std::size_t i = 0; i < r.size(); ++i) {
    m[i] = sample(gain * exact(r[i]) + exact(more[i]));
    product += std::conj(exact(r[i])) * exact(m[i]);
    power += std::norm(exact(r[i]));
  }
  const exact fitted = product / power;
  for (std::size_t i = 0; i < r.size(); ++i) left += std::norm(exact(m[i]) / fitted - exact(r[i]));
  write_pair(r, m);
  result = evm({"--align"});
  const auto shown = numbers(result, "Alignment             least-squares complex gain");
  ASSERT_EQ(2U, shown.size()) << result.out;
  EXPECT_NEAR(20 * std::log10(std::abs(fitted)), shown[0], 6e-5);
  EXPECT_NEAR(degrees * std::arg(fitted), shown[1], 6e-5);
  EXPECT_NEAR(100 * std::sqrt(left / power), numbers(result, "EVM RMS")[0], 1e-4);
}

TEST_F(Evm, ZeroSamplesHaveNoPhase) {
  write_pair({{1, 0}, {0, 0}, {1, 0}, {0, 1}}, {{0, 1}, {1, 0}, {0, 0}, {-1, 0}});
  const outcome result = evm({"--csv", "x.csv"});
  EXPECT_EQ(90, numbers(result, "Phase error")[0]) << result.out;
  EXPECT_EQ(2, numbers(result, "Note")[0]) << result.out;
  EXPECT_NE(std::string::npos, read("x.csv").find("\n2,115.4701,-115.4701,\n")) << read("x.csv");
}

TEST_F(Evm, RefusesBadInputInOneLine) {
  const samples x = noise(100, 1, 0.1F);
  write("r.cf32", bytes_of(x));
  write("short.cf32", bytes_of(x).substr(80));
  write("empty.cf32", "");
  write("zero.cf32", bytes_of(samples(100)));
  write("odd.cf32", bytes_of(x).substr(1));
  write("huge.cf32", bytes_of(samples(100, 1e30F)));
  write("nan.cf32", std::string(800, '\xFF'));
  for (const char *rate : {"1000", "2000"}) {
    write(std::string("rate") + rate + ".sigmf-meta",
          R"({"global": {"core:datatype": "cf32_le", "core:sample_rate": )" + std::string(rate) + "}}");
    write(std::string("rate") + rate + ".sigmf-data", bytes_of(x));
  }
  const auto before = files();
  const struct {
    int code;
    const char *says;
    std::vector<std::string> arguments;
  } refusals[] = {
      {1, "No such file", {"none.cf32", "r.cf32", "--rate", "1"}},
      {1, "No such file", {"r.cf32", "none.cf32", "--rate", "1"}},
      {1, "--rate HZ", {"r.cf32", "r.cf32"}},
      {1, "no whole number", {"r.cf32", "odd.cf32", "--rate", "1"}},
      {1, "no samples", {"empty.cf32", "empty.cf32", "--rate", "1"}},
      {1, "--samples N", {"r.cf32", "short.cf32", "--rate", "1"}},
      {1, "90 samples are fewer than 91", {"r.cf32", "short.cf32", "--rate", "1", "--samples", "91"}},
      {1, "sampled at 1 kHz, rate2000.sigmf-data at 2 kHz", {"rate1000", "rate2000"}},
      {1, "no capture 3", {"rate1000", "rate1000", "--capture", "3"}},
      {1, "no capture 3", {"rate1000", "rate1000", "--reference-capture", "3"}},
      {1, "all samples are zero", {"zero.cf32", "r.cf32", "--rate", "1", "--plot", "x.png", "--csv", "x.csv"}},
      {1, "leave out --align", {"r.cf32", "zero.cf32", "--rate", "1", "--align"}},
      {1, "too large", {"r.cf32", "huge.cf32", "--rate", "1"}},
      {1, "not a finite", {"r.cf32", "nan.cf32", "--rate", "1"}},
      {1, "part of the recording", {"r.cf32", "zero.cf32", "--rate", "1", "--csv", "r.cf32"}},
      {1, "part of the recording", {"r.cf32", "zero.cf32", "--rate", "1", "--csv", "zero.cf32"}},
      {1, ".png or .svg", {"r.cf32", "r.cf32", "--rate", "1", "--plot", "x.gif", "--csv", "x.csv"}},
      {2, "evm --help", {}},
      {2, "MEASURED", {"r.cf32"}},
      {2, "--samples", {"r.cf32", "r.cf32", "--rate", "1", "--samples", "0"}},
      {2, "--rate", {"r.cf32", "r.cf32", "--rate", "nan"}},
  };
  for (const auto &refusal : refusals) {
    std::vector<std::string> arguments{"evm"};
    arguments.insert(arguments.end(), refusal.arguments.begin(), refusal.arguments.end());
    const outcome result = run(arguments);
    SCOPED_TRACE(result.err);
    EXPECT_EQ(refusal.code, result.exit_code);
    EXPECT_NE(std::string::npos, result.err.find(refusal.says)) << refusal.says;
    EXPECT_EQ(1, std::count(result.err.begin(), result.err.end(), '\n'));
    EXPECT_TRUE(result.err.starts_with("lumra: ") && result.err.ends_with('\n'));
    EXPECT_EQ("", result.out);
    EXPECT_EQ(before, files());
  }
  for (const auto &options : {std::vector<std::string>{"rate1000", "rate2000", "--rate", "5"},
                              {"r.cf32", "short.cf32", "--rate", "1", "--samples", "90"}}) {
    std::vector<std::string> arguments{"evm"};
    arguments.insert(arguments.end(), options.begin(), options.end());
    EXPECT_EQ(0, run(arguments).exit_code);
  }
}

TEST_F(Evm, DrawsConstellations) {
  for (const std::size_t count : {std::size_t{1}, std::size_t{300}, std::size_t{50000}}) {
    SCOPED_TRACE(count);
    write_pair(noise(count, 1, 0.1F), noise(count, 2, 0.1F));
    EXPECT_NE(std::string::npos, evm({"--plot", "x.png"}).out.find("x.png"));
    EXPECT_EQ("", evm({"--plot", "x.svg", "--align"}).err);
    const std::string png = read("x.png"), svg = read("x.svg");
    EXPECT_TRUE(png.starts_with("\x89PNG") && png.ends_with(std::string("IEND\xAE\x42\x60\x82")));
    EXPECT_NE(std::string::npos, svg.rfind("</svg>"));
    EXPECT_NE(std::string::npos, svg.find("m.cf32 against r.cf32"));
    EXPECT_EQ(count > 20000, svg.find("20000 of 50000 samples drawn") != std::string::npos);
    EXPECT_LT(svg.size(), std::size_t{8} << 20);
  }
}

TEST_F(Evm, InterruptionLeavesNothing) {
  for (const char *name : {"r.ci8", "m.ci8"}) {
    write(name, "\x01\x01");
    std::filesystem::resize_file(folder_ / name, std::uintmax_t{1} << 34);  // a hole: takes no room
  }
  const pid_t child = start({"evm", "r.ci8", "m.ci8", "--rate", "1", "--csv", "x.csv", "--plot", "x.png"});
  const auto begin = std::chrono::steady_clock::now();
  while (files().size() < 6 && std::chrono::steady_clock::now() - begin < std::chrono::seconds(20))
    std::this_thread::sleep_for(std::chrono::milliseconds(5));
  EXPECT_EQ(6U, files().size());  // both inputs, both unfinished outputs, both logs
  ASSERT_EQ(0, ::kill(child, SIGINT));
  EXPECT_EQ(SIGINT, finish(child).signal);
  EXPECT_EQ((std::vector<std::string>{"m.ci8", "r.ci8"}), files());
}

}  // namespace
