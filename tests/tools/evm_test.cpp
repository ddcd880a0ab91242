// lumra evm, from files to files. SPDX-License-Identifier: MIT
#include "tools/program.hpp"

namespace tests {
namespace {

using exact = std::complex<double>;

constexpr double degrees = 180 / std::numbers::pi;
constexpr const char *header = "sample,evm_percent,magnitude_error_percent,phase_error_deg";

struct figures {
  double rms = 0, mean = 0, peak = 0;
  std::size_t at = 0;
};

/// By definition, in double precision.
figures figures_of(const std::vector<double> &errors) {
  figures f;
  for (std::size_t i = 0; i < errors.size(); ++i) {
    f.rms += errors[i] * errors[i];
    f.mean += errors[i];
    if (std::abs(errors[i]) > std::abs(f.peak)) f = {f.rms, f.mean, errors[i], i};
  }
  const auto n = static_cast<double>(errors.size());
  return {std::sqrt(f.rms / n), f.mean / n, f.peak, f.at};
}

class Evm : public ProgramTest {
 protected:
  void write_pair(const samples &reference, const samples &measured) const {
    write("r.cf32", bytes_of(reference));
    write("m.cf32", bytes_of(measured));
  }

  const std::string line = "evm r.cf32 m.cf32 --rate 1000";
};

TEST_F(Evm, MatchesTheDefinitionsAtAnyScaleAndBlock) {
  for (const float scale : {1.0F, 3e-25F, 7e25F}) {
    SCOPED_TRACE(scale);
    samples r = noise(1003, 1, scale), m = noise(1003, 2, 0.1F * scale);
    double power = 0;
    for (std::size_t i = 0; i < r.size(); ++i) {
      m[i] += r[i];
      power += std::norm(exact(r[i]));
    }
    write_pair(r, m);
    const double percent = 100 / std::sqrt(power / static_cast<double>(r.size()));
    std::vector<double> errors[3];
    for (std::size_t i = 0; i < r.size(); ++i) {
      const exact x(r[i]), y(m[i]);
      errors[0].push_back(percent * std::abs(y - x));
      errors[1].push_back(percent * (std::abs(y) - std::abs(x)));
      errors[2].push_back(degrees * std::arg(y / x));
    }

    const outcome whole = succeed(line);
    const figures error = figures_of(errors[0]);
    const auto rms = whole.numbers("EVM RMS"), peak = whole.numbers("EVM peak");
    EXPECT_NEAR(error.rms, rms.at(0), 1e-4) << whole.out;
    EXPECT_NEAR(20 * std::log10(error.rms / 100), rms.at(1), 0.006);
    EXPECT_NEAR(error.peak, peak.at(0), 1e-3);
    EXPECT_EQ(static_cast<double>(error.at), peak.at(2));
    EXPECT_NEAR(static_cast<double>(error.at) / 1000, peak.at(3), 1e-9);
    for (const auto &[label, f] :
         {std::pair{"Magnitude error", figures_of(errors[1])}, {"Phase error", figures_of(errors[2])}}) {
      const auto shown = whole.numbers(label);
      EXPECT_NEAR(f.rms, shown.at(0), 1e-4) << label;
      EXPECT_NEAR(f.peak, shown.at(1), 1e-3) << label;
      EXPECT_EQ(static_cast<double>(f.at), shown.at(2)) << label;
      EXPECT_NEAR(f.mean, shown.at(4), 1e-5) << label;
    }
    const auto written = rows(line, header);
    ASSERT_EQ(r.size(), written.size());
    for (std::size_t i = 0; i < r.size(); ++i) {
      ASSERT_EQ(static_cast<double>(i), written[i].at(0));
      for (std::size_t k = 0; k < 3; ++k) ASSERT_NEAR(errors[k][i], written[i].at(k + 1), 1e-4);
    }
    for (const std::string options : {" --csv x.csv", " --csv x.csv --align"}) {
      const std::string expected = succeed(line + options).out, csv = read("x.csv");
      for (const char *block : {" --block 1", " --block 100", " --block 1003"}) {
        EXPECT_EQ(expected, succeed(line + options + block).out);
        EXPECT_EQ(csv, read("x.csv"));
      }
    }
  }
}

TEST_F(Evm, AlignFindsAndRemovesTheGainOfLeastSquares) {
  const samples r = noise(5000, 1, 0.2F);
  // A gain without rounding leaves nothing; noise has a part in the gain, and the rest of it remains.
  for (const auto &[gain, deviation] : {std::pair{exact(0, -4), 0.0F}, {std::polar(0.8, 0.3), 0.05F}}) {
    const samples more = noise(5000, 2, 1);
    samples m(r.size());
    exact product;
    double power = 0, left = 0;
    for (std::size_t i = 0; i < r.size(); ++i) {
      m[i] = sample(gain * exact(r[i]) + exact(deviation * more[i]));
      product += std::conj(exact(r[i])) * exact(m[i]);
      power += std::norm(exact(r[i]));
    }
    const exact fitted = product / power;
    for (std::size_t i = 0; i < r.size(); ++i) left += std::norm(exact(m[i]) / fitted - exact(r[i]));
    write_pair(r, m);
    const outcome result = succeed(line + " --align");
    const auto shown = result.numbers("Alignment             least-squares complex gain");
    EXPECT_NEAR(20 * std::log10(std::abs(fitted)), shown.at(0), 6e-5) << result.out;
    EXPECT_NEAR(degrees * std::arg(fitted), shown.at(1), 6e-5);
    EXPECT_NEAR(100 * std::sqrt(left / power), result.numbers("EVM RMS").at(0), deviation == 0 ? 0 : 1e-4);
  }
}

TEST_F(Evm, ZeroSamplesHaveNoPhase) {
  write_pair({{1, 0}, {0, 0}, {1, 0}, {0, 1}}, {{0, 1}, {1, 0}, {0, 0}, {-1, 0}});
  EXPECT_EQ((std::vector{2.0, 115.4701, -115.4701}), rows(line, header).at(2));
  const outcome result = succeed(line);
  EXPECT_EQ(90, result.numbers("Phase error").at(0)) << result.out;
  EXPECT_EQ(2, result.numbers("Note").at(0)) << result.out;
}

TEST_F(Evm, DrawsConstellations) {
  for (const std::size_t count : {std::size_t{1}, std::size_t{300}, std::size_t{50000}}) {
    SCOPED_TRACE(count);
    write_pair(noise(count, 1, 0.1F), noise(count, 2, 0.1F));
    const std::string svg = drawn(line + " --align");
    EXPECT_NE(std::string::npos, svg.find("m.cf32 against r.cf32"));
    EXPECT_EQ(count > 20000, svg.find("20000 of 50000 samples drawn") != std::string::npos);
    EXPECT_LT(svg.size(), std::size_t{8} << 20);
  }
}

}  // namespace
}  // namespace tests
