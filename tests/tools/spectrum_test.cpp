// lumra spectrum, from files to files. SPDX-License-Identifier: MIT
#include <algorithm>
#include <chrono>
#include <cmath>
#include <complex>
#include <cstring>
#include <functional>
#include <lumra/lumra.hpp>
#include <numbers>
#include <random>
#include <thread>

#include "tools/program.hpp"

namespace {

using tests::csv_row;
using tests::outcome;
using sample = std::complex<double>;
using samples = std::vector<sample>;

/// amplitude * exp(j 2 pi cycles n / period)
void add_tone(samples &x, double amplitude, double cycles, double period) {
  for (std::size_t n = 0; n < x.size(); ++n)
    x[n] += std::polar(amplitude, 2 * std::numbers::pi * cycles * static_cast<double>(n) / period);
}

/// The samples as bytes, each component converted by `convert`.
template <class T>
std::string encode(const samples &x, bool big_endian, const std::function<T(double)> &convert) {
  std::string bytes;
  for (const sample &value : x)
    for (const double component : {value.real(), value.imag()}) {
      const T number = convert(component);
      char raw[sizeof(T)];
      std::memcpy(raw, &number, sizeof(T));
      if (big_endian) std::reverse(std::begin(raw), std::end(raw));
      bytes.append(raw, sizeof(T));
    }
  return bytes;
}

std::string with_type(const std::string &type, const samples &x) {
  const bool big = type.ends_with("_be");
  const std::string stem = type.substr(0, type.find('_'));
  const auto rounded = [](double scale, double middle) {
    return [=](double value) { return std::lround(value * scale + middle); };
  };
  if (stem == "cf32") return encode<float>(x, big, [](double v) { return static_cast<float>(v); });
  if (stem == "cf64") return encode<double>(x, big, [](double v) { return v; });
  if (stem == "ci8") return encode<std::int8_t>(x, big, rounded(128, 0));
  if (stem == "ci16") return encode<std::int16_t>(x, big, rounded(32768, 0));
  if (stem == "ci32") return encode<std::int32_t>(x, big, rounded(2147483648.0, 0));
  if (stem == "cu8") return encode<std::uint8_t>(x, big, rounded(127.5, 127.5));
  if (stem == "cu16") return encode<std::uint16_t>(x, big, rounded(32767.5, 32767.5));
  return encode<std::uint32_t>(x, big, rounded(2147483647.5, 2147483647.5));
}

constexpr std::size_t width = 8;  // of a cf32 sample
std::string as_cf32(const samples &x) {
  return with_type("cf32", x);
}

std::string metadata(const std::string &global, const std::string &captures) {
  return R"({"global": {"core:datatype": "cf32_le", "core:sample_rate": 1000)" + global + R"(}, "captures": [)" +
         captures + "]}";
}

samples noise(std::size_t count) {
  std::mt19937 random(1);
  std::normal_distribution<double> value(0, 0.1);
  samples x(count);
  for (sample &s : x) s = {value(random), value(random)};
  return x;
}

class Spectrum : public tests::ProgramTest {
 protected:
  static void expect_equal(const std::vector<csv_row> &a, const std::vector<csv_row> &b, double tolerance) {
    ASSERT_EQ(a.size(), b.size());
    for (std::size_t k = 0; k < a.size(); ++k) {
      ASSERT_NEAR(a[k].frequency, b[k].frequency, 1e-6);
      ASSERT_NEAR(a[k].level, b[k].level, tolerance) << "bin " << k;
    }
  }
};

TEST_F(Spectrum, EveryFormatShowsTheSameTones) {
  samples x(1024);
  add_tone(x, 0.5, 20, 64);
  add_tone(x, 0.25, -7, 64);
  for (const char *type : {"cf32_le", "cf32_be", "cf64_le", "cf64_be", "ci32_le", "ci32_be", "ci16_le", "ci16_be",
                           "ci8", "cu32_le", "cu32_be", "cu16_le", "cu16_be", "cu8"}) {
    SCOPED_TRACE(type);
    const std::string bytes = with_type(type, x);
    write("x.sigmf-data", bytes);
    write("x.sigmf-meta", R"({"global": {"core:datatype": ")" + std::string(type) + R"(", "core:sample_rate": 64}})");
    write(std::string("x.") + type, bytes);
    const auto rows = spectrum({"x.sigmf-data", "--fft", "64", "--window", "none"});
    ASSERT_EQ(64U, rows.size());
    for (const csv_row &row : rows) {
      if (row.frequency == 20)
        EXPECT_NEAR(-6.0206, row.level, 0.05);
      else if (row.frequency == -7)
        EXPECT_NEAR(-12.0412, row.level, 0.05);
      else
        EXPECT_LT(row.level, -50) << row.frequency;
    }
    const std::string raw = std::string("x.") + type;
    expect_equal(rows, spectrum({raw, "--rate", "64", "--fft", "64", "--window", "none"}), 0);
  }
}

TEST_F(Spectrum, FullScaleToneReadsZeroAtItsFrequency) {
  for (const char *window : {"none", "flattop"})
    for (const int size : {16, 256, 255}) {  // for an odd size bins lie half a spacing off zero
      SCOPED_TRACE(testing::Message() << window << " " << size);
      samples x(5000);
      const int bin = size - 3;
      const double offset = (bin - size / 2.0) * 1e6 / size;
      add_tone(x, 1, bin - size / 2.0, size);
      write("x.sigmf-data", as_cf32(x));
      write("x.sigmf-meta", R"({"global": {"core:datatype": "cf32_le", "core:sample_rate": 1e6},
                                "captures": [{"core:sample_start": 0, "core:frequency": 2.4e9}]})");
      const auto rows = spectrum({"x", "--fft", std::to_string(size), "--window", window, "--overlap", "75"});
      const auto peak = std::max_element(rows.begin(), rows.end(), [](auto &a, auto &b) { return a.level < b.level; });
      EXPECT_EQ(bin, peak - rows.begin());
      EXPECT_NEAR(0, peak->level, 1e-3);
      EXPECT_NEAR(2.4e9 + offset, peak->frequency, 1e-3);
      EXPECT_NEAR(2.4e9 - 5e5, rows.front().frequency, 1e-3);
    }
}

TEST_F(Spectrum, EqualsOneCallOnTheWholeForAnyBlock) {
  const samples x = noise(20011);
  write("x.cf32", as_cf32(x));
  constexpr std::int32_t size = 100;
  lumra::host_array<std::complex<float>> whole(x.size());
  std::copy(x.begin(), x.end(), whole.elements().begin());
  lumra::session session;
  session.initialize_window(lumra::window::flat_top, size);
  for (const double overlap : {0.0, 29.0, 99.5}) {
    lumra::spectrum expected;
    session.power_spectrum(lumra::window::flat_top, size, overlap, whole, 1e-3, expected);
    for (const char *block : {"1", "100", "177", "1000000"}) {
      SCOPED_TRACE(testing::Message() << "overlap " << overlap << " block " << block);
      const auto rows = spectrum(
          {"x.cf32", "--rate", "1000", "--fft", "100", "--overlap", std::to_string(overlap), "--block", block});
      ASSERT_EQ(100U, rows.size());
      for (std::size_t k = 0; k < rows.size(); ++k) {
        const double full_scale = 0.21557895 * size * 0.21557895 * size;
        ASSERT_NEAR(10 * std::log10(expected.power.elements()[k] / full_scale), rows[k].level, 5e-4) << "bin " << k;
      }
    }
  }
}

TEST_F(Spectrum, HonoursWhatTheMetadataSay) {
  const samples x = noise(1000);
  const std::string bytes = as_cf32(x);
  const std::string junk(40, '\xFF');  // read as samples it would be NaN
  write("plain.cf32", bytes);
  const auto plain = spectrum({"plain.cf32", "--rate", "1000", "--fft", "64"});
  const struct {
    const char *what;
    std::string global, captures, data;
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
  };
  for (const auto &r : recordings) {
    SCOPED_TRACE(r.what);
    write("x.sigmf-meta", metadata(r.global, r.captures));
    write("x.sigmf-data", r.data);
    expect_equal(plain, spectrum({"x.sigmf-meta", "--fft", "64"}), 0);
  }
  write("y.sigmf-meta", metadata(R"(, "core:dataset": "plain.cf32")", ""));
  expect_equal(plain, spectrum({"y", "--fft", "64"}), 0);
  write("z.sigmf-meta", metadata("", R"({"core:sample_start": 0, "core:frequency": 5},
                                        {"core:sample_start": 40, "core:frequency": 0})"));
  write("z.sigmf-data", bytes.substr(0, 40 * width) + bytes);
  expect_equal(plain, spectrum({"z", "--fft", "64", "--capture", "1"}), 0);
}

TEST_F(Spectrum, RefusesBadInputInOneLine) {
  const std::string bytes = as_cf32(noise(100));
  write("x.cf32", bytes);
  write("cut.cf32", bytes.substr(0, 99));
  write("x.bin", bytes);
  write("empty.cf32", "");
  write("nan.cf32", bytes.substr(0, 80 * width) + std::string(160, '\xFF'));
  write("huge.cf64", encode<double>(samples(64, 1e300), false, [](double v) { return v; }));
  write("large.cf32", as_cf32(samples(64, 1e30)));
  const auto sigmf = [&](const std::string &name, const std::string &meta) {
    write(name + ".sigmf-meta", meta);
    write(name + ".sigmf-data", bytes);
  };
  sigmf("broken", "{\"global\": ");
  sigmf("list", "[]");
  sigmf("overflow", R"({"global": {"core:sample_rate": 1e999}})");
  sigmf("norate", R"({"global": {"core:datatype": "cf32_le"}})");
  sigmf("notype", R"({"global": {"core:sample_rate": 1}})");
  sigmf("real", R"({"global": {"core:datatype": "rf32_le", "core:sample_rate": 1}})");
  sigmf("rate", R"({"global": {"core:datatype": "cf32_le", "core:sample_rate": "fast"}})");
  sigmf("negative", R"({"global": {"core:datatype": "cf32_le", "core:sample_rate": -1}})");
  sigmf("channels", metadata(R"(, "core:num_channels": 2)", ""));
  sigmf("retuned", metadata("", R"({"core:sample_start": 0, "core:frequency": 1},
                                   {"core:sample_start": 9, "core:frequency": 2})"));
  sigmf("gap", metadata("", R"({"core:sample_start": 0, "core:global_index": 0},
                               {"core:sample_start": 9, "core:global_index": 10})"));
  sigmf("beyond", metadata("", R"({"core:sample_start": 101})"));
  sigmf("order", metadata("", R"({"core:sample_start": 10}, {"core:sample_start": 9})"));
  sigmf("header", metadata("", R"({"core:header_bytes": -1})"));
  sigmf("outside", metadata(R"(, "core:dataset": "../x.cf32")", ""));
  write("alone.sigmf-meta", metadata("", ""));
  std::filesystem::create_symlink("/dev/full", folder_ / "full.png");
  const auto before = files();

  const struct {
    int code;
    const char *says;
    std::vector<std::string> arguments;
  } refusals[] = {
      {1, "No such file", {"none.cf32", "--rate", "1"}},
      {1, "not a regular file", {"/dev/zero", "--rate", "1", "--format", "ci8"}},
      {1, "--rate HZ", {"x.cf32"}},
      {1, "--format", {"x.bin", "--rate", "1"}},
      {1, "unknown sample type", {"x.bin", "--rate", "1", "--format", "cf16"}},
      {1, "no whole number", {"cut.cf32", "--rate", "1"}},
      {1, "no samples", {"empty.cf32", "--rate", "1"}},
      {1, "fewer than N = 128", {"x.cf32", "--rate", "1", "--fft", "128"}},
      {1, "sample 80 is not", {"nan.cf32", "--rate", "1", "--fft", "16"}},
      {1, "sample 0 is not", {"huge.cf64", "--rate", "1"}},
      {1, "too large", {"large.cf32", "--rate", "1"}},
      {1, "not valid JSON", {"broken"}},
      {1, "no global", {"list"}},
      {1, "out of range", {"overflow"}},
      {1, "--rate HZ", {"norate"}},
      {1, "--format", {"notype"}},
      {1, "are real", {"real"}},
      {1, "must be a number", {"rate"}},
      {1, "not positive", {"negative"}},
      {1, "several channels", {"channels"}},
      {1, "--capture", {"retuned"}},
      {1, "no capture 2", {"retuned", "--capture", "2"}},
      {1, "samples are missing", {"gap"}},
      {1, "ends before capture 0", {"beyond"}},
      {1, "core:sample_start", {"order"}},
      {1, "core:header_bytes", {"header"}},
      {1, "same folder", {"outside"}},
      {1, "No such file", {"alone"}},
      {1, "archives", {"x.sigmf"}},
      {1, "part of the recording", {"x.cf32", "--rate", "1", "--csv", "x.cf32"}},
      {1, "No such file", {"x.cf32", "--rate", "1", "--csv", "none/x.csv"}},
      {1, "No space left", {"x.cf32", "--rate", "1", "--csv", "/dev/full"}},
      {1, ".png or .svg", {"x.cf32", "--rate", "1", "--plot", "x.gif", "--csv", "x.csv"}},
      {2, "--fft", {"x.cf32", "--rate", "1", "--fft", "15"}},
      {2, "--fft", {"x.cf32", "--rate", "1", "--fft", "134217729"}},
      {2, "--overlap", {"x.cf32", "--rate", "1", "--overlap", "100"}},
      {2, "--overlap", {"x.cf32", "--rate", "1", "--overlap", "nan"}},
      {2, "--window", {"x.cf32", "--rate", "1", "--window", "hann"}},
      {2, "--rate", {"x.cf32", "--rate", "-5"}},
      {2, "RECORDING", {}},
      {2, "--colour", {"x.cf32", "--colour"}},
  };
  for (const auto &refusal : refusals) {
    std::vector<std::string> arguments{"spectrum"};
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
  EXPECT_EQ(2, run({}).exit_code);
  EXPECT_EQ(0, run({"spectrum", "--help"}).exit_code);
}

TEST_F(Spectrum, DrawsPictures) {
  const std::string name = "it's \"a\" <b> & \\c {d}_e \xC3\xA9 \xFF";
  write(name + ".cf32", as_cf32(noise(40000)));
  write("zero.cf32", as_cf32(samples(64)));
  for (const std::string &recording : {name + ".cf32", std::string("zero.cf32")})
    for (const char *size : {"16", "64", "32768"}) {
      if (recording == "zero.cf32" && std::string(size) == "32768") continue;
      SCOPED_TRACE(recording + " " + size);
      for (const char *file : {"x.png", "x.svg"}) {
        const outcome result = run({"spectrum", recording, "--rate", "2e6", "--fft", size, "--plot", file});
        ASSERT_EQ(0, result.exit_code) << result.err;
        EXPECT_EQ("", result.err);
        EXPECT_NE(std::string::npos, result.out.find(file));
      }
      const std::string png = read("x.png"), svg = read("x.svg");
      EXPECT_TRUE(png.starts_with(std::string("\x89PNG\r\n\x1A\n\0\0\0\rIHDR\0\0\x05\0\0\0\x02\xD0", 24)));
      EXPECT_TRUE(png.ends_with(std::string("IEND\xAE\x42\x60\x82")));
      EXPECT_TRUE(svg.starts_with("<?xml"));
      EXPECT_NE(std::string::npos, svg.rfind("</svg>"));
      EXPECT_NE(std::string::npos, svg.find("Frequency (MHz)"));
    }
  std::filesystem::create_symlink("/dev/full", folder_ / "full.svg");
  const outcome full = run({"spectrum", "zero.cf32", "--rate", "1", "--plot", "full.svg"});
  EXPECT_EQ(1, full.exit_code) << full.out;
}

TEST_F(Spectrum, PrintsWhatADensityNeeds) {
  write("x.ci16", std::string(4000, '\0'));
  const outcome flat = run({"spectrum", "x.ci16", "--rate", "64000", "--fft", "64"});
  EXPECT_NE(std::string::npos, flat.out.find("noise bandwidth 3.7702 bins")) << flat.out;
  EXPECT_NE(std::string::npos, flat.out.find("3770.25 Hz")) << flat.out;
  const outcome none = run({"spectrum", "x.ci16", "--rate", "64000", "--fft", "64", "--window", "none"});
  EXPECT_NE(std::string::npos, none.out.find("noise bandwidth 1.0000 bins")) << none.out;
}

TEST_F(Spectrum, InterruptionLeavesNothing) {
  write("long.ci8", "");
  std::filesystem::resize_file(folder_ / "long.ci8", std::uintmax_t{1} << 36);  // a hole: takes no room
  for (const int signal : {SIGINT, SIGTERM}) {
    const pid_t child = start({"spectrum", "long.ci8", "--rate", "1e6", "--csv", "x.csv", "--plot", "x.png"});
    const auto begin = std::chrono::steady_clock::now();
    const auto since = [&] { return std::chrono::steady_clock::now() - begin; };
    const auto both_begun = [&] {
      const auto names = files();
      return std::count_if(names.begin(), names.end(), [](const auto &name) { return name.ends_with(".part"); }) == 2;
    };
    while (!both_begun() && since() < std::chrono::seconds(20))
      std::this_thread::sleep_for(std::chrono::milliseconds(5));
    EXPECT_TRUE(both_begun());
    ASSERT_EQ(0, ::kill(child, signal));
    const outcome result = finish(child);
    EXPECT_EQ(signal, result.signal);
    EXPECT_EQ("", result.out + result.err);
    EXPECT_EQ(std::vector<std::string>{"long.ci8"}, files());
  }
}

TEST_F(Spectrum, InfoNamesLibraryPathAndMkl) {
  const outcome result = run({"info"});
  EXPECT_EQ(0, result.exit_code);
  for (const std::string &part : {lumra::library().version_text, std::string(LUMRA_MKL_VERSION), std::string("AVX")})
    EXPECT_NE(std::string::npos, result.out.find(part)) << part;
}

}  // namespace
