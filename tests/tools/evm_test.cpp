// lumra evm, from files to files. SPDX-License-Identifier: MIT
#include "tools/program.hpp"

namespace {

using tests::noise;
using tests::numbers;
using tests::outcome;
using tests::sample;
using tests::samples;
using exact = std::complex<double>;

constexpr double degrees = 180 / std::numbers::pi;

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
    write("r.cf32", tests::bytes_of(reference));
    write("m.cf32", tests::bytes_of(measured));
  }

  [[nodiscard]] outcome evm(const std::string &options) const {
    return succeed("evm r.cf32 m.cf32 --rate 1000 " + options);
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

    const outcome whole = evm("--csv whole.csv");
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

    for (const std::string options : {"--csv x.csv", "--csv x.csv --align"}) {
      const std::string expected = evm(options).out, rows = read("x.csv");
      for (const char *block : {" --block 1", " --block 100", " --block 1003"}) {
        EXPECT_EQ(expected, evm(options + block).out);
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
  outcome result = evm("--align");
  EXPECT_EQ((std::vector{12.0412, -90.0}), numbers(result, "Alignment             least-squares complex gain"));
  EXPECT_EQ(0, numbers(result, "EVM RMS")[0]) << result.out;
  EXPECT_NEAR(100 * std::sqrt(17.0), numbers(evm(""), "EVM RMS")[0], 1e-2);

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
  result = evm("--align");
  const auto shown = numbers(result, "Alignment             least-squares complex gain");
  ASSERT_EQ(2U, shown.size()) << result.out;
  EXPECT_NEAR(20 * std::log10(std::abs(fitted)), shown[0], 6e-5);
  EXPECT_NEAR(degrees * std::arg(fitted), shown[1], 6e-5);
  EXPECT_NEAR(100 * std::sqrt(left / power), numbers(result, "EVM RMS")[0], 1e-4);
}

TEST_F(Evm, ZeroSamplesHaveNoPhase) {
  write_pair({{1, 0}, {0, 0}, {1, 0}, {0, 1}}, {{0, 1}, {1, 0}, {0, 0}, {-1, 0}});
  const outcome result = evm("--csv x.csv");
  EXPECT_EQ(90, numbers(result, "Phase error")[0]) << result.out;
  EXPECT_EQ(2, numbers(result, "Note")[0]) << result.out;
  EXPECT_NE(std::string::npos, read("x.csv").find("\n2,115.4701,-115.4701,\n")) << read("x.csv");
}

TEST_F(Evm, DrawsConstellations) {
  for (const std::size_t count : {std::size_t{1}, std::size_t{300}, std::size_t{50000}}) {
    SCOPED_TRACE(count);
    write_pair(noise(count, 1, 0.1F), noise(count, 2, 0.1F));
    EXPECT_NE(std::string::npos, evm("--plot x.png").out.find("x.png"));
    (void)evm("--plot x.svg --align");
    const std::string png = read("x.png"), svg = read("x.svg");
    EXPECT_TRUE(png.starts_with("\x89PNG") && png.ends_with(std::string("IEND\xAE\x42\x60\x82")));
    EXPECT_NE(std::string::npos, svg.rfind("</svg>"));
    EXPECT_NE(std::string::npos, svg.find("m.cf32 against r.cf32"));
    EXPECT_EQ(count > 20000, svg.find("20000 of 50000 samples drawn") != std::string::npos);
    EXPECT_LT(svg.size(), std::size_t{8} << 20);
  }
}

}  // namespace
