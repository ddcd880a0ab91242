// What the subcommands of lumra have in common: refusals in one line, interruption. SPDX-License-Identifier: MIT
#include <array>

#include "tools/program.hpp"

namespace tests {
namespace {

using Program = ProgramTest;

TEST_F(Program, RefusesBadInputInOneLine) {
  const std::string bytes = bytes_of(noise(100));
  const std::vector huge(32, 1e300);
  for (const auto &[name, content] : std::initializer_list<std::pair<const char *, std::string>>{
           {"x.cf32", bytes},
           {"x.bin", bytes},
           {"cut.cf32", bytes.substr(0, 99)},
           {"short.cf32", bytes.substr(80)},
           {"empty.cf32", ""},
           {"zero.cf32", bytes_of(samples(100))},
           {"other.cf32", bytes_of(noise(100, 2))},
           {"protected", ""},
           {"nan.cf32", bytes.substr(0, 640) + std::string(160, '\xFF')},
           {"huge.cf64", std::string(reinterpret_cast<const char *>(huge.data()), 256)},
           {"large.cf32", bytes_of(samples(100, 1e30F))},
           {"full.cf32", bytes_of(samples(4000, 3.4e38F))},
           {"lone.sigmf-data", bytes},
           {"alone.sigmf-meta", metadata()}})
    write(name, content);
  for (const auto &[name, meta] : std::initializer_list<std::pair<std::string, std::string>>{
           {"norate", R"({"global": {"core:datatype": "cf32_le"}})"},
           {"rate2000", R"({"global": {"core:datatype": "cf32_le", "core:sample_rate": 2000}})"},
           {"rate1000", metadata()},
           {"retuned", metadata("", R"({"core:frequency": 1}, {"core:sample_start": 9, "core:frequency": 2})")}}) {
    write(name + ".sigmf-meta", meta);
    write(name + ".sigmf-data", bytes);
  }
  for (const char *name : {"full.svg", "full.sigmf-data", "fullmeta.sigmf-meta"})
    std::filesystem::create_symlink("/dev/full", folder_ / name);

  std::filesystem::permissions(folder_ / "protected", std::filesystem::perms::owner_read);

  const struct {
    int code;
    const char *says, *line;
  } refusals[] = {
      {1, "No such file", "spectrum none.cf32 --rate 1"},
      {1, "not a regular file", "spectrum /dev/zero --rate 1 --format ci8"},
      {1, "--rate HZ", "spectrum x.cf32"},
      {1, "--format", "spectrum x.bin --rate 1"},
      {1, "unknown sample type", "spectrum x.bin --rate 1 --format cf16"},
      {1, "no whole number", "spectrum cut.cf32 --rate 1"},
      {1, "no samples", "spectrum empty.cf32 --rate 1"},
      {1, "fewer than N = 128", "spectrum x.cf32 --rate 1 --fft 128"},
      {1, "sample 80 is not", "spectrum nan.cf32 --rate 1 --fft 16"},
      {1, "sample 0 is not", "spectrum huge.cf64 --rate 1 --fft 16"},
      {1, "too large", "spectrum large.cf32 --rate 1"},
      {1, "No such file", "spectrum alone"},
      {2, "--csv and --plot are both", "spectrum x.cf32 --rate 1 --csv y.svg --plot ./y.svg"},
      {2, "--json and --csv are both to be the standard output", "power x.cf32 --rate 1 --csv - --json -"},
      {1, "protected", "level x.cf32 --rate 1 --csv protected"},
      {1, "part of the recording", "spectrum x.cf32 --rate 1 --csv x.cf32"},
      {1, "No such file", "spectrum x.cf32 --rate 1 --csv none/x.csv"},
      {1, ".png, .svg or .pdf", "spectrum x.cf32 --rate 1 --plot x.gif --csv x.csv"},
      {2, "--fft", "spectrum x.cf32 --rate 1 --fft 15"},
      {2, "--fft", "spectrum x.cf32 --rate 1 --fft 134217729"},
      {2, "--overlap", "spectrum x.cf32 --rate 1 --overlap 100"},
      {2, "--overlap", "spectrum x.cf32 --rate 1 --overlap nan"},
      {2, "--window", "spectrum x.cf32 --rate 1 --window han"},
      {2, "--rate", "spectrum x.cf32 --rate -5"},
      {2, "RECORDING", "spectrum"},
      {2, "no option --colour", "spectrum --colour"},
      {2, "did you mean --window?", "tone --windwo hann x.cf32"},
      {2, "'specturm'; did you mean spectrum?", "specturm --fft 1 x"},
      {2, "1x", "spectrum x.cf32 --rate 1x"},
      {2, "--every", "spectrum x.cf32 zero.cf32 --rate 1 --every 20 --json x.json"},
      {1, "no bin within", "spectrum x.cf32 --rate 1 --center 9 --span 1"},
      {1, "above 2^27", "spectrum x.cf32 --rate 1 --rbw 1e-30"},
      {2, "--channel", "power x.cf32 --rate 1 --channel 1"},
      {2, "'b' in '1,b'", "power x.cf32 --rate 1 --adjacent 1,b"},
      {1, "beyond the band", "power x.cf32 --rate 1 --channel 0.4:0.3"},
      {1, "--at", "tone x.cf32 --rate 1 --at 3"},
      {2, "--range", "waterfall x.cf32 --rate 1 --range 3:2"},
      {2, "shows one waterfall", "waterfall x.cf32 zero.cf32 --rate 1 --plot x.png"},
      {1, "unrelated", "evm x.cf32 other.cf32 --rate 1 --align delay"},
      {1, "no samples", "evm empty.cf32 empty.cf32 --rate 1"},
      {1, "--samples N", "evm x.cf32 short.cf32 --rate 1"},
      {1, "90 samples are fewer than 91", "evm x.cf32 short.cf32 --rate 1 --samples 91"},
      {1, "sampled at 1 kHz, rate2000.sigmf-data at 2 kHz", "evm rate1000 rate2000"},
      {1, "no capture 3", "evm rate1000 rate1000 --capture 3"},
      {1, "no capture 3", "evm rate1000 rate1000 --reference-capture 3"},
      {1, "choose one with --reference-capture", "evm retuned rate1000"},
      {1, "choose one with --capture", "evm rate1000 retuned"},
      {1, "all samples are zero", "evm zero.cf32 x.cf32 --rate 1 --plot x.png --csv x.csv"},
      {1, "leave out --align", "evm x.cf32 zero.cf32 --rate 1 --align"},
      {1, "too large", "evm x.cf32 large.cf32 --rate 1"},
      {1, "part of the recording", "evm x.cf32 zero.cf32 --rate 1 --csv x.cf32"},
      {1, "part of the recording", "evm x.cf32 zero.cf32 --rate 1 --csv zero.cf32"},
      {2, "evm --help", "evm"},
      {2, "MEASURED", "evm x.cf32"},
      {2, "--samples", "evm x.cf32 x.cf32 --rate 1 --samples 0"},
      {2, "--rate", "evm x.cf32 x.cf32 --rate nan"},
      {1, "--rate HZ", "resample x.cf32 --to 1"},
      {1, "--rate HZ", "resample norate --to 1"},
      {1, "no samples", "resample empty.cf32 --to 1 --rate 1"},
      {1, "too large", "resample full.cf32 --to 1.5 --rate 1"},
      {1, "beyond a factor of 10000", "resample x.cf32 --to 10001 --rate 1"},
      {1, "beyond a factor of 1e+09", "resample x.cf32 --to 1e-300 --rate 1e300"},
      {1, "part of the recording", "resample norate --to 1 --rate 2 --output norate"},
      {1, "part of the recording", "resample norate.sigmf-data --to 1 --rate 2 --output ./norate.sigmf-meta"},
      {1, "is a folder", "resample x.cf32 --to 1 --rate 2 --output ./"},
      {1, "No such file", "resample x.cf32 --to 1 --rate 2 --output none/y"},
      {1, "No space left", "resample x.cf32 --to 1 --rate 2 --output full"},
      {1, "No space left", "resample x.cf32 --to 1 --rate 2 --output fullmeta"},
      {2, "--to is required: it is the new rate", "resample x.cf32 --rate 1"},
      {2, "--to", "resample x.cf32 --to 0"},
      {2, "RECORDING", "resample --to 1"},
      {1, "--format and --rate", "resample lone.sigmf-data --to 1"},
      {2, "--channel CENTER:RATE is required", "channels x.cf32 --rate 1"},
      {2, "'1:0' is not CENTER:RATE", "channels x.cf32 --rate 1 --channel 1:0"},
      {1, "is wider than the recording", "channels x.cf32 --rate 1 --channel 0:2"},
      {1, "beyond the band, -0.5 Hz to 0.5 Hz", "channels x.cf32 --rate 1 --channel 0.4:0.3"},
      {1, "begins with c", "channels x.cf32 --rate 1 --channel 0:0.3 --datatype ri16"},
      {1, "with --output BASE", "channels - --format cf32 --rate 1 --channel 0:0.3 </dev/null"},
      {1, "disk full", "spectrum zero.cf32 --rate 1 --plot full.svg"},
  };
  for (const auto &[code, says, line] : refusals) refuse(code, says, line);
  EXPECT_EQ(2, run("").exit_code);
  for (const char *line :
       {"spectrum --help", "evm rate1000 rate2000 --rate 5", "evm x.cf32 short.cf32 --rate 1 --samples 90"})
    succeed(line);
}

TEST_F(Program, InterruptionLeavesNothing) {
  write_hole("x.ci8", 36);
  write_hole("one.ci8", 36, "\x01\x01");
  const auto before = files();
  for (const auto &[line, signal] : {std::pair{"spectrum x.ci8 --rate 1e6 --csv x.csv --plot x.png", SIGINT},
                                     {"spectrum x.ci8 --rate 1e6 --csv x.csv --plot x.png", SIGTERM},
                                     {"evm one.ci8 x.ci8 --rate 1 --csv x.csv --plot x.png", SIGINT},
                                     {"resample x.ci8 --rate 1e6 --to 1e3", SIGINT}}) {
    SCOPED_TRACE(line);
    const pid_t child = start_outputs(line, 2);
    ASSERT_EQ(0, ::kill(child, signal));
    const auto result = finish(child);
    EXPECT_EQ(signal, result.signal);
    EXPECT_EQ("", result.out + result.err);
    EXPECT_EQ(before, files());
  }
}

TEST_F(Program, OutputsAppearTogetherOrNotAtAll) {
  write("x.cf32", bytes_of(noise(4000)));
  write("o.csv", "from before");
  for (const auto &[front, line, says] : std::initializer_list<std::array<std::string, 3>>{
           {"exec", "spectrum x.cf32 --rate 1 --csv o.csv --plot o.svg >/dev/full", "standard output: No space left"},
           {"ulimit -f 1; exec", "evm x.cf32 x.cf32 --rate 1 --csv o.csv", "o.csv: File too large"},
           {"ulimit -f 1; exec", "resample x.cf32 --rate 1 --to 2 --output o", "sigmf-data: File too large"},
           {"exec", "--help >/dev/full", "standard output: No space left"}}) {
    refuse(1, says, line, front);
    EXPECT_EQ("from before", read("o.csv"));
  }
}

#ifdef LUMRA_FAILING_MALLOC
TEST_F(Program, EndsInOneLineWheneverMemoryRunsOut) {
  write("x.sigmf-data", bytes_of(noise(200)));
  write("x.sigmf-meta", metadata(R"(, "core:description": "longer than a string that needs no memory")",
                                 R"({"core:frequency": 1e9})", R"({"core:sample_count": 9, "core:label": "a"})"));
  const auto before = files();
  long all = 0;  // allocations of a run in which none fails
  const auto run_failing = [&](const char *line, long at, long count) {
    outcome result =
        run(line, "export LUMRA_FAIL_REPORT=.report LUMRA_FAIL_AT=" + std::to_string(at) +
                      " LUMRA_FAIL_COUNT=" + std::to_string(count) + " LD_PRELOAD=" LUMRA_FAILING_MALLOC "; exec");
    if (at == 0) all = std::stol(read(".report"));
    for (const std::string &name : files())
      if (name == ".report" || (result.exit_code == 0 && name.starts_with("o.")))
        std::filesystem::remove(folder_ / name);
    return result;
  };
  for (const char *line : {"info", "spectrum x --fft 16 --csv o.csv --plot o.svg", "waterfall x --fft 16 --json o.json",
                           "level x --csv o.csv", "evm x x --align --csv o.csv", "evm x x --align delay --json o.json",
                           "resample x --to 500 --output o"}) {
    (void)run_failing(line, 0, 1);
    ASSERT_GT(all, 100);
    for (const long count : {1, 0})
      // The first two thirds make the command line ready, one option like another.
      for (long at = 1; at <= all; at += at < 2 * all / 3 ? 23 : count == 1 ? 1 : 7) {
        const outcome result = run_failing(line, at, count);
        SCOPED_TRACE(testing::Message() << line << ", " << at << " of " << all << " fails, then " << result.signal
                                        << result.err);
        ASSERT_EQ(before, files());
        if (result.exit_code == 0 && result.err.empty()) continue;  // the C and C++ runtimes have reserves
        ASSERT_EQ(1, result.exit_code);
        ASSERT_EQ(1, std::count(result.err.begin(), result.err.end(), '\n'));
        // gnuplot has no memory either, and says so in its own words.
        ASSERT_TRUE(result.err.starts_with("lumra: not enough memory; ") || result.err.starts_with("lumra: gnuplot"));
      }
  }
}
#endif

}  // namespace
}  // namespace tests
