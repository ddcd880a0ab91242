// lumra spectrum, from files to files. SPDX-License-Identifier: MIT
#include <lumra/lumra.hpp>

#include "tools/program.hpp"

namespace tests {
namespace {

struct bin {
  double frequency, level;
};

class Spectrum : public ProgramTest {
 protected:
  [[nodiscard]] std::vector<bin> spectrum(const std::string &options) const {
    std::vector<bin> bins;
    for (const auto &row : rows("spectrum " + options, "frequency_hz,level_dbfs"))
      bins.push_back({row.at(0), row.at(1)});
    return bins;
  }
  static void expect_equal(const std::vector<bin> &a, const std::vector<bin> &b) {
    ASSERT_EQ(a.size(), b.size());
    for (std::size_t k = 0; k < a.size(); ++k) {
      ASSERT_NEAR(a[k].frequency, b[k].frequency, 1e-6);
      ASSERT_EQ(a[k].level, b[k].level) << "bin " << k;
    }
  }
};

TEST_F(Spectrum, EveryFormatShowsTheSameTone) {
  using namespace std::string_literals;
  const struct {
    std::string type, plus, minus;  // the latter, most significant byte first: half of full scale
  } formats[] = {{"cf32", "\x3F\0\0\0"s, "\xBF\0\0\0"s},
                 {"cf64", "\x3F\xE0\0\0\0\0\0\0"s, "\xBF\xE0\0\0\0\0\0\0"s},
                 {"ci8", "\x40", "\xC0"},
                 {"ci16", "\x40\0"s, "\xC0\0"s},
                 {"ci32", "\x40\0\0\0"s, "\xC0\0\0\0"s},
                 {"cu8", "\xBF", "\x40"},
                 {"cu16", "\xBF\xFF", "\x40\0"s},
                 {"cu32", "\xBF\xFF\xFF\xFF", "\x40\0\0\0"s}};
  for (const auto &format : formats)
    for (const std::string order : {"_le", "_be", ""}) {
      SCOPED_TRACE(format.type + order);
      std::string plus = format.plus, minus = format.minus, bytes;
      if (order != "_be")
        for (std::string *value : {&plus, &minus}) std::reverse(value->begin(), value->end());
      for (int n = 0; n < 64; ++n) bytes += plus + plus + minus + plus + minus + minus + plus + minus;
      write("x.sigmf-data", bytes);
      write("x.sigmf-meta", R"({"global": {"core:sample_rate": 64, "core:datatype": ")" + format.type + order + "\"}}");
      const auto bins = spectrum("x.sigmf-data --fft 64 --window none");
      ASSERT_EQ(64U, bins.size());
      for (const bin &b : bins)
        if (b.frequency == 16)
          EXPECT_NEAR(-3.0103, b.level, 0.05);
        else
          EXPECT_LT(b.level, -50) << b.frequency;
      write("x." + format.type + order, bytes);
      expect_equal(bins, spectrum("x." + format.type + order + " --rate 64 --fft 64 --window none"));
    }
}

TEST_F(Spectrum, FullScaleToneReadsZeroAtItsFrequency) {
  for (const char *window : {"none", "flattop"})
    for (const int size : {16, 256, 255}) {  // for an odd size bins lie half a spacing off zero
      SCOPED_TRACE(testing::Message() << window << " " << size);
      const int place = size - 3;
      const double offset = (place - size / 2.0) * 1000 / size;
      write("x.sigmf-data", bytes_of(tone(5000, 1, offset / 1000)));
      write("x.sigmf-meta", metadata("", R"({"core:sample_start": 0, "core:frequency": 2.4e9})"));
      const auto bins = spectrum("x --overlap 75 --fft " + std::to_string(size) + " --window " + window);
      const auto peak = std::max_element(bins.begin(), bins.end(), [](auto &a, auto &b) { return a.level < b.level; });
      EXPECT_EQ(place, peak - bins.begin());
      EXPECT_NEAR(0, peak->level, 1e-3);
      EXPECT_NEAR(2.4e9 + offset, peak->frequency, 1e-6);
      EXPECT_NEAR(2.4e9 - 500, bins.front().frequency, 1e-6);
    }
}

TEST_F(Spectrum, EqualsOneCallOnTheWholeForAnyBlock) {
  const samples x = noise(20011);
  write("x.cf32", bytes_of(x));
  constexpr std::int32_t size = 100;
  lumra::host_array<sample> whole(x.size());
  std::copy(x.begin(), x.end(), whole.elements().begin());
  lumra::session session;
  for (const double overlap : {0.0, 29.0, 99.5}) {
    lumra::spectrum expected;
    session.power_spectrum(lumra::window::flat_top, size, overlap, whole, 1e-3, expected);
    for (const char *block : {"1", "100", "177", "1000000"}) {
      SCOPED_TRACE(testing::Message() << "overlap " << overlap << " block " << block);
      const auto bins =
          spectrum("x.cf32 --rate 1000 --fft 100 --overlap " + std::to_string(overlap) + " --block " + block);
      ASSERT_EQ(100U, bins.size());
      for (std::size_t k = 0; k < bins.size(); ++k) {
        const double full_scale = 0.21557895 * size * 0.21557895 * size;
        ASSERT_NEAR(10 * std::log10(expected.power.elements()[k] / full_scale), bins[k].level, 5e-4) << "bin " << k;
      }
    }
  }
}

TEST_F(Spectrum, HonoursWhatTheMetadataSay) {
  constexpr std::size_t width = sizeof(sample);
  const std::string bytes = bytes_of(noise(1000));
  const std::string junk(40, '\xFF');  // read as samples it would be NaN
  write("plain.cf32", bytes);
  const auto plain = spectrum("plain.cf32 --rate 1000 --fft 64");
  const struct {
    const char *what;
    std::string global, captures, data;
    const char *options = "";
  } recordings[] = {
      {"no captures", "", "", bytes},
      {"header", "", R"({"core:sample_start": 0, "core:header_bytes": 40})", junk + bytes},
      {"header before each capture", "",
       R"({"core:sample_start": 0, "core:header_bytes": 40}, {"core:sample_start": 333, "core:header_bytes": 7})",
       junk + bytes.substr(0, 333 * width) + junk.substr(0, 7) + bytes.substr(333 * width)},
      {"trailing bytes", R"(, "core:trailing_bytes": 40)", "", bytes + junk},
      {"offset", R"(, "core:offset": 5000)",
       R"({"core:sample_start": 5000, "core:global_index": 9}, {"core:sample_start": 5100, "core:global_index": 109})",
       bytes},
      {"samples before the first capture", "", R"({"core:sample_start": 5})", junk + bytes},
      {"data of another name", R"(, "core:dataset": "plain.cf32")", "", ""},
      {"one of two captures", "", R"({"core:frequency": 5}, {"core:sample_start": 40, "core:frequency": 0})",
       bytes.substr(0, 40 * width) + bytes, " --capture 1"},
  };
  for (const auto &r : recordings) {
    SCOPED_TRACE(r.what);
    write("x.sigmf-meta", metadata(r.global, r.captures));
    write("x.sigmf-data", r.data);
    expect_equal(plain, spectrum(std::string("x --fft 64") + r.options));
  }
}

TEST_F(Spectrum, DrawsPictures) {
  write("it's \"a\" <b> & \\c {d}_e \xC3\xA9 \xFF.cf32", bytes_of(noise(40000)));
  write("zero.cf32", bytes_of(samples(64)));
  for (const std::string options : {"it* --fft 16", "it* --fft 64", "it* --fft 32768", "zero.cf32 --fft 64"})
    EXPECT_NE(std::string::npos, drawn("spectrum --rate 2e6 " + options).find("Frequency (MHz)")) << options;
}

TEST_F(Spectrum, PrintsWhatADensityNeeds) {
  write("x.ci16", std::string(4000, '\0'));
  const std::string line = "spectrum x.ci16 --rate 64000 --fft 64";
  for (const auto &[options, says] : {std::pair{"", "noise bandwidth 3.7702 bins"},
                                      {"", "3770.25 Hz"},
                                      {" --window none", "noise bandwidth 1.0000 bins"}})
    EXPECT_NE(std::string::npos, succeed(line + options).out.find(says)) << says;
}

}  // namespace
}  // namespace tests
