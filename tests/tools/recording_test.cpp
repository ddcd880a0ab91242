// Reading and writing of recordings, without the program. SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <bit>
#include <cmath>
#include <complex>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <nlohmann/json.hpp>

#include "recording/derived_metadata.hpp"
#include "recording/failure.hpp"
#include "recording/file.hpp"
#include "recording/open.hpp"
#include "recording/sample_encoder.hpp"
#include "recording/sample_reader.hpp"
#include "recording/sigmf_archive_writer.hpp"
#include "recording/wav.hpp"

namespace tests {
namespace {

namespace fs = std::filesystem;
using complex_samples = std::vector<std::complex<double>>;
using recording::endless;

class file_sink final : public recording::byte_sink {
 public:
  explicit file_sink(const fs::path &path) : file_(std::fopen(path.c_str(), "w+b")) {}
  void write(std::span<const std::byte> bytes) override {
    ASSERT_EQ(bytes.size(), std::fwrite(bytes.data(), 1, bytes.size(), file_.get()));
  }
  [[nodiscard]] int descriptor() const { return ::fileno(file_.get()); }

 private:
  recording::stream file_;
};

class Recording : public testing::Test {
 protected:
  void SetUp() override {
    std::string name = testing::TempDir() + "recording-XXXXXX";
    ASSERT_NE(nullptr, ::mkdtemp(name.data()));
    folder_ = name;
  }
  void TearDown() override { fs::remove_all(folder_); }

  void write(const std::string &name, const std::string &content) const {
    std::ofstream(folder_ / name, std::ios::binary) << content;
  }
  /// Metadata of ci8 samples, 1000 a second, with more in the fields and lists.
  static std::string metadata(const std::string &global, const std::string &captures,
                              const std::string &annotations = "") {
    return R"({"global": {"core:version": "1.2.0", "core:datatype": "ci8", "core:sample_rate": 1000)" + global +
           R"(}, "captures": [)" + captures + R"(], "annotations": [)" + annotations + "]}";
  }
  /// Opens a pair of this metadata and data.
  [[nodiscard]] recording::source open_pair(const std::string &meta, const std::string &data,
                                            const recording::options &said = {}) const {
    write("x.sigmf-meta", meta);
    write("x.sigmf-data", data);
    return recording::open(folder_ / "x", said);
  }
  [[nodiscard]] recording::source open(const char *name, const recording::options &said = {}) const {
    return recording::open(folder_ / name, said);
  }
  /// All that was chosen, read in pieces.
  static complex_samples samples_of(const recording::source &source, std::size_t piece = 7) {
    recording::sample_reader reader(source, source.chosen_first, source.chosen_samples);
    complex_samples all, part(piece);
    while (const std::size_t count = reader.read(part))
      all.insert(all.end(), part.begin(), part.begin() + static_cast<std::ptrdiff_t>(count));
    return all;
  }
  template <class Work>
  static std::string refusal(Work work) {
    try {
      work();
    } catch (const recording::failure &reason) {
      return reason.what();
    }
    return "no refusal";
  }

  fs::path folder_;
};

/// Bytes 0, 1, 2 ... as signed I and Q.
std::string counting(std::size_t bytes) {
  std::string data(bytes, '\0');
  for (std::size_t i = 0; i < bytes; ++i) data[i] = static_cast<char>(i);
  return data;
}

TEST_F(Recording, TypesAreScaledToFullScaleAndBack) {
  for (const char prefix : {'c', 'r'})
    for (const std::string type : {"f32", "f64", "i8", "i16", "i32", "u8", "u16", "u32"})
      for (const std::string order : {"_le", "_be"}) {
        const std::string name = prefix + type + order;
        SCOPED_TRACE(name);
        const recording::sample_format format = recording::parse_format(name);
        const auto bits = static_cast<int>(8 * format.bytes() / format.components());
        const double half = type[0] == 'u' ? (std::ldexp(1.0, bits) - 1) / 2 : std::ldexp(1.0, bits - 1);
        const complex_samples x{{0.25, -0.75}, {-1, 0.1}, {1, -1}, {2, 0}, {0, -1.5}};
        {
          file_sink sink(folder_ / "x.bin");
          recording::sample_encoder encoder(sink, format);
          std::vector<double> real;
          for (const auto &each : x) real.push_back(each.real());
          format.is_complex ? encoder.write(x) : encoder.write(real);
          // 1 is beyond full scale where that is 2^(b - 1), as 2 and -1.5 are.
          const std::uint64_t beyond = type[0] == 'f' ? 0 : (type[0] == 'i' ? 2 : 1) + (format.is_complex ? 1 : 0);
          EXPECT_EQ(beyond, encoder.clipped());
        }
        recording::options said;
        said.rate = 1;
        said.format = name;
        const recording::source source = open("x.bin", said);
        const complex_samples y = samples_of(source);
        ASSERT_EQ(x.size(), y.size());
        for (std::size_t i = 0; i < x.size(); ++i)
          for (const bool q : {false, true}) {
            const double given = q ? format.is_complex ? x[i].imag() : 0 : x[i].real(),
                         got = q ? y[i].imag() : y[i].real();
            const double top = type[0] == 'i' ? (half - 1) / half : 1;
            const double expected = type[0] == 'f' ? given : std::clamp(given, -1.0, top);
            EXPECT_NEAR(expected, got, type == "f64" ? 0 : type == "f32" ? 1e-8 : 0.5000001 / half) << i;
            if (q && !format.is_complex) continue;
            EXPECT_TRUE(type[0] != 'i' || got * half == std::rint(got * half));
          }
        // The codes themselves lie there in the order named.
        std::string first(4, '\0');
        std::ifstream(folder_ / "x.bin", std::ios::binary).read(first.data(), 4);
        EXPECT_TRUE(type != "i16" || first[1] == (order == "_le" ? '\x20' : '\0'));  // 0.25 is 0x2000
        recording::sample_reader counted(source, 0, source.samples);
        counted.count_clipped();
        complex_samples room(x.size());
        counted.read(room);
        EXPECT_EQ(type[0] == 'f' ? 0U : format.is_complex ? 4U : 3U, counted.clipped());
      }
}

TEST_F(Recording, CapturesAreOneStretchOnlyWhereTheyAreOneSignal) {
  const std::string times[] = {
      R"("core:datetime": "2024-02-29T23:59:59.990Z")", R"("core:datetime": "2024-03-01T00:00:00Z")",
      R"("core:datetime": "2024-03-01T00:00:00.00049Z")", R"("core:datetime": "2024-03-01T00:00:00.0006Z")"};
  const std::string tuned = R"("core:frequency": 1e9)", second = R"({"core:sample_start": 10, )";
  const struct {
    std::string first, next;
    bool joined;
  } cases[] = {
      {tuned, tuned, false},
      {tuned + "," + times[0], tuned, false},
      {tuned + "," + times[0], tuned + "," + times[1], true},
      {tuned + "," + times[0], tuned + "," + times[2], true},
      {tuned + "," + times[0], tuned + "," + times[3], false},
      {tuned + "," + times[0], times[1], false},
      {times[0], tuned + "," + times[1], false},
      {times[0], times[1], true},
      {tuned + "," + times[0], R"("core:frequency": 2e9, )" + times[1], false},
      {R"("core:global_index": 5, )" + times[0], R"("core:global_index": 15, )" + times[1], true},
      {R"("core:global_index": 5, )" + times[0], R"("core:global_index": 16, )" + times[1], false},
      {R"("core:datetime": "2024-02-30T00:00:00Z")", R"("core:datetime": "2024-02-30T00:00:00.01Z")", false},
  };
  for (const auto &each : cases) {
    SCOPED_TRACE(each.first + " / " + each.next);
    const auto source = open_pair(metadata("", "{" + each.first + "}," + second + each.next + "}"), counting(50));
    ASSERT_EQ(each.joined ? 1U : 2U, source.stretches.size());
    EXPECT_EQ(each.joined ? 25U : 10U, source.stretches.front().samples);
    EXPECT_EQ(0U, source.stretches.front().first);
    EXPECT_EQ(25U, source.stretches.back().first + source.stretches.back().samples);
  }
}

TEST_F(Recording, OptionsChooseSamples) {
  // 25 samples in captures of 10, 10 and 5, each with two bytes in front of it.
  const std::string captures = R"({"core:header_bytes": 2, "core:frequency": 1},
      {"core:header_bytes": 2, "core:sample_start": 10, "core:frequency": 2},
      {"core:header_bytes": 2, "core:sample_start": 20, "core:frequency": 2})";
  using stretches = std::vector<std::array<std::uint64_t, 3>>;  // first, samples, frequency
  const struct {
    std::optional<std::int64_t> capture;
    std::optional<double> start, duration;
    stretches expected;
  } cases[] = {
      {{}, {}, {}, {{0, 10, 1}, {10, 10, 2}, {20, 5, 2}}},
      {1, {}, {}, {{10, 10, 2}}},
      {2, 0.001, 0.002, {{21, 2, 2}}},
      {2, 0.001, 9.0, {{21, 4, 2}}},
      {{}, 0.008, 0.013, {{8, 2, 1}, {10, 10, 2}, {20, 1, 2}}},
      {{}, 0.0204, {}, {{20, 5, 2}}},
  };
  for (const auto &each : cases) {
    recording::options said;
    said.capture = each.capture;
    said.start = each.start;
    said.duration = each.duration;
    const auto source = open_pair(metadata("", captures), counting(56), said);
    stretches seen;
    for (const auto &s : source.stretches)
      seen.push_back({s.first, s.samples, static_cast<std::uint64_t>(s.frequency.value_or(0))});
    EXPECT_EQ(each.expected, seen);
    // Sample n of capture c begins at byte 2 n + 2 (c + 1), whose value is its number.
    for (const auto &s : source.stretches) {
      recording::sample_reader reader(source, s);
      std::complex<float> last;
      reader.seek(s.samples - 1);
      EXPECT_EQ(1U, reader.read(std::span(&last, 1)));
      EXPECT_EQ(0U, reader.read(std::span(&last, 1)));
      const std::uint64_t n = s.first + s.samples - 1;
      EXPECT_EQ(static_cast<float>(2 * n + 2 * (std::min<std::uint64_t>(n / 10, 2) + 1)), last.real() * 128);
    }
  }
  const auto refused = [&](auto field, auto value) {
    recording::options said;
    said.*field = value;
    return refusal([&] { (void)open_pair(metadata("", captures), counting(56), said); });
  };
  EXPECT_NE(std::string::npos, refused(&recording::options::capture, -1).find("no capture -1; there are 3"));
  EXPECT_NE(std::string::npos, refused(&recording::options::capture, 3).find("no capture 3;"));
  EXPECT_NE(std::string::npos, refused(&recording::options::channel, 1).find("no channel 1; there is 1"));
  EXPECT_NE(std::string::npos, refused(&recording::options::start, 0.025).find("behind its end"));
  EXPECT_NE(std::string::npos, refused(&recording::options::start, -1).find("--start"));
  EXPECT_NE(std::string::npos, refused(&recording::options::duration, 0.0004).find("--duration"));
  EXPECT_NE(std::string::npos, refused(&recording::options::duration, NAN).find("--duration"));
}

TEST_F(Recording, ChannelsAreReadOneAtATime) {
  for (const int channel : {0, 2}) {
    recording::options said;
    said.channel = channel;
    const auto source = open_pair(metadata(R"(, "core:num_channels": 3)", "{}"), counting(60), said);
    const complex_samples x = samples_of(source);
    ASSERT_EQ(10U, x.size());
    for (std::size_t n = 0; n < x.size(); ++n) EXPECT_EQ(static_cast<double>(6 * n) + 2 * channel, x[n].real() * 128);
  }
}

TEST_F(Recording, EveryKindOfFileHoldsTheSameSamples) {
  const recording::sample_format ci16 = recording::parse_format("ci16");
  const std::string meta = metadata(R"(, "core:datatype": "ci16_le")", R"({"core:frequency": 5})");
  const std::string data = counting(40000);
  const complex_samples expected = samples_of(open_pair(meta, data), 999);
  ASSERT_EQ(10000U, expected.size());
  {
    file_sink archive(folder_ / "y.sigmf"), wav(folder_ / "y.wav"), wide(folder_ / "wide.wav");
    recording::sigmf_archive_writer members(archive, "y", nlohmann::json::parse(meta), data.size());
    recording::sample_encoder to_archive(members, ci16);
    to_archive.write(expected);
    members.finish();
    recording::wav_writer sound(wav.descriptor(), "y.wav", ci16, 1000, expected.size());
    recording::sample_encoder to_wav(sound, ci16);
    to_wav.write(expected);
    sound.finish();
    EXPECT_NE(std::string::npos, refusal([&] {
                                   recording::wav_writer(wide.descriptor(), "wide.wav", ci16, 0.5, 1);
                                 }).find("whole number"));
  }
  // Other programs put the data first, and compress.
  const std::string shell =
      "cd " + folder_.string() +
      "; tar -cf z.sigmf x.sigmf-data x.sigmf-meta; gzip -k z.sigmf; xz -k y.sigmf; cp x.sigmf-data "
      "x.ci16; cp x.sigmf-meta v.sigmf-meta; head -c 30000 y.sigmf >cut.sigmf; head -c 100 y.sigmf.xz >cut.sigmf.xz; "
      "tar -cf "
      "two.tar x.sigmf-meta v.sigmf-meta; tar -cf none.tar x.ci16; tar -cf alone.tar x.sigmf-meta";
  ASSERT_EQ(0, std::system(shell.c_str()));
  const struct {
    const char *name, *datatype;
    bool ranged;
  } files[] = {{"y.sigmf", "ci16_le", true},     {"z.sigmf", "ci16_le", true}, {"z.sigmf.gz", "ci16_le", false},
               {"y.sigmf.xz", "ci16_le", false}, {"x.ci16", "ci16_le", true},  {"y.wav", "Signed 16 bit PCM", true}};
  for (const auto &file : files) {
    SCOPED_TRACE(file.name);
    recording::options said;
    if (std::string_view(file.name) == "x.ci16") said.rate = 1000;
    said.start = 1;
    const auto source = open(file.name, said);
    EXPECT_EQ(file.datatype, source.datatype);
    EXPECT_EQ(file.ranged, source.ranged);
    EXPECT_EQ(1000, source.rate);
    EXPECT_EQ(10000U, source.samples);
    EXPECT_TRUE(std::equal(expected.begin() + 1000, expected.end(), samples_of(source, 999).begin()));
  }
  for (const auto &[name, says] :
       std::initializer_list<std::pair<const char *, const char *>>{{"cut.sigmf", "is the file complete?"},
                                                                    {"cut.sigmf.xz", "is the file complete?"},
                                                                    {"two.tar", "several recordings"},
                                                                    {"none.tar", "no .sigmf-meta"},
                                                                    {"alone.tar", "holds no x.sigmf-data"}}) {
    const std::string said = refusal([&, file = name] { samples_of(open(file)); });
    EXPECT_NE(std::string::npos, said.find(says)) << name << ": " << said;
  }
  fs::copy(folder_ / "x.ci16", folder_ / "x.wav");
  EXPECT_NE(std::string::npos, refusal([&] { (void)open("x.wav"); }).find("not a WAV file"));
}

TEST_F(Recording, AFileThatShrinksIsToldOf) {
  const auto source = open_pair(metadata("", "{}"), counting(100));
  fs::resize_file(folder_ / "x.sigmf-data", 51);
  EXPECT_NE(std::string::npos, refusal([&] { samples_of(source); }).find("became shorter"));
}

TEST_F(Recording, FaultsOfMetadataDoNotHinderReading) {
  const struct {
    std::string captures, annotations;
    const char *says;
  } cases[] = {
      {"", "", "there are no captures"},
      {R"({"core:datetime": "yesterday"})", "", "'yesterday' is no time"},
      {R"({"core:sample_start": 3})", "", "3 samples in front"},
      {"{}, {}", "", "capture 0 holds no samples"},
      {"{}", "3", "annotation 0 is missing or not an object; it is left out"},
      {"{}", "{}", "annotation 0: core:sample_start is missing; it is left out"},
      {"{}", R"({"core:sample_start": 0, "core:sample_count": 26})", "annotation 0 reaches beyond"},
      {"{}", R"({"core:sample_start": 0, "core:freq_lower_edge": 2})", "one edge"},
      {"{}", R"({"core:sample_start": 0, "core:freq_lower_edge": 2, "core:freq_upper_edge": 1})", "lies above"},
      {"{}", R"({"core:sample_start": 0, "core:label": 7})", "core:label must be a text"},
  };
  for (const auto &each : cases) {
    const auto source = open_pair(metadata("", each.captures, each.annotations), counting(50));
    ASSERT_EQ(1U, source.faults.size()) << each.says;
    EXPECT_NE(std::string::npos, source.faults[0].find(each.says)) << source.faults[0];
    EXPECT_EQ(25U, samples_of(source).size() + source.chosen_first);
  }
}

TEST_F(Recording, RefusesMetadataThatCannotBeFollowed) {
  const std::pair<const char *, std::string> refusals[] = {
      {"not valid JSON near byte 1", ""},
      {"not valid JSON", "{\"global\": "},
      {"no global", "[]"},
      {"out of range", R"({"global": {"core:sample_rate": 1e999}})"},
      {"say --format", R"({"global": {"core:sample_rate": 1}})"},
      {"unknown sample type 'ci24'", R"({"global": {"core:datatype": "ci24"}})"},
      {"is missing; say --rate HZ", R"({"global": {"core:datatype": "cf32_le"}})"},
      {"must be a number", R"({"global": {"core:datatype": "cf32_le", "core:sample_rate": "fast"}})"},
      {"not positive; say --rate HZ", R"({"global": {"core:datatype": "cf32_le", "core:sample_rate": -1}})"},
      {"from 1 to 4096", metadata(R"(, "core:num_channels": 4097)", "")},
      {"from 1 to 4096", metadata(R"(, "core:num_channels": 0)", "")},
      {"metadata only", metadata(R"(, "core:metadata_only": true)", "")},
      {"core:trailing_bytes", metadata(R"(, "core:trailing_bytes": 101)", "")},
      {"no whole number of samples", metadata(R"(, "core:trailing_bytes": 1)", "")},
      {"ends before capture 0", metadata("", R"({"core:sample_start": 101})")},
      {"ends before capture 0", metadata("", R"({"core:sample_start": 4503599627370496})")},
      {"core:sample_start", metadata("", R"({"core:sample_start": 10}, {"core:sample_start": 9})")},
      {"core:offset", metadata(R"(, "core:offset": 11)", R"({"core:sample_start": 10})")},
      {"core:header_bytes", metadata("", R"({"core:header_bytes": -1})")},
      {"same folder", metadata(R"(, "core:dataset": "../x.cf32")", "")},
      {"same folder", metadata(R"(, "core:dataset": "..")", "")},
      {"same folder", metadata(R"(, "core:dataset": "x.cf32\u0000")", "")},
      {"deeper than 64", metadata(R"(, "x": )" + std::string(63, '[') + std::string(63, ']'), "")},
      {"deeper than 64", metadata(R"(, "x": )" + std::string(100000, '['), "")},
      {"64 MiB", std::string((std::size_t{64} << 20) + 1, ' ')},
  };
  for (const auto &[says, meta] : refusals) {
    const std::string said = refusal([&, text = &meta] { (void)open_pair(*text, counting(100)); });
    EXPECT_NE(std::string::npos, said.find(says)) << said;
  }
  const std::string deep = std::string(62, '[') + std::string(62, ']');
  EXPECT_EQ("no refusal", refusal([&] { (void)open_pair(metadata(R"(, "x": )" + deep, ""), counting(100)); }));
}

TEST_F(Recording, WhatIsCutCarriesItsPartOfTheMetadata) {
  recording::options said;
  said.start = 0.006;
  said.duration = 0.008;
  const auto source = open_pair(
      metadata(
          R"(, "core:offset": 100, "core:sha512": "x", "core:author": "A")",
          R"({"core:sample_start": 100, "core:frequency": 1, "core:datetime": "2023-12-31T23:59:59.996Z"},
                  {"core:sample_start": 110, "core:frequency": 2, "x:y": 3}, {"core:sample_start": 120})",
          R"({"core:sample_start": 100, "core:sample_count": 6}, {"core:sample_start": 104, "core:sample_count": 4},
                  {"core:sample_start": 111, "core:label": "b"}, {"core:sample_start": 114})"),
      counting(50), said);
  recording::derivation cut;
  cut.pieces = {{source.chosen_first, source.chosen_samples, 0, source.chosen_samples}};
  cut.rate = 1000;
  cut.datatype = "cf32_le";
  const auto expected = nlohmann::json::parse(R"({
      "global": {"core:version": "1.2.0", "core:datatype": "cf32_le", "core:sample_rate": 1000.0, "core:author": "A",
                 "core:description": "x"},
      "captures": [{"core:sample_start": 0, "core:frequency": 1.0, "core:datetime": "2024-01-01T00:00:00.002000000Z"},
                   {"core:sample_start": 4, "core:frequency": 2.0, "x:y": 3}],
      "annotations": [{"core:sample_start": 0, "core:sample_count": 2},
                      {"core:sample_start": 5, "core:label": "b"}]})");
  EXPECT_EQ(expected, recording::derived_metadata(source, cut));
}

}  // namespace
}  // namespace tests
