// Runs the program lumra in a folder of its own, as a user would. SPDX-License-Identifier: MIT
#pragma once

#include <fcntl.h>
#include <gtest/gtest.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cmath>
#include <complex>
#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <numbers>
#include <random>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

namespace tests {

using sample = std::complex<float>;
using samples = std::vector<sample>;

inline std::string bytes_of(const samples &x) {
  return {reinterpret_cast<const char *>(x.data()), x.size() * sizeof(sample)};
}

inline samples noise(std::size_t count, unsigned seed = 1, float deviation = 0.1F) {
  std::mt19937 random(seed);
  std::normal_distribution<float> value(0, deviation);
  samples x(count);
  for (sample &s : x) s = {value(random), value(random)};
  return x;
}

/// amplitude * exp(j 2 pi frequency n), frequency in cycles per sample.
inline samples tone(std::size_t count, double amplitude, double frequency) {
  samples x(count);
  for (std::size_t n = 0; n < count; ++n)
    x[n] = sample(std::polar(amplitude, 2 * std::numbers::pi * std::fmod(frequency * static_cast<double>(n), 1)));
  return x;
}

/// Of cf32_le samples, 1000 a second; the texts are more fields, and elements of the lists.
inline std::string metadata(const std::string &global = "", const std::string &captures = "",
                            const std::string &annotations = "") {
  return R"({"global": {"core:datatype": "cf32_le", "core:sample_rate": 1000)" + global + R"(}, "captures": [)" +
         captures + R"(], "annotations": [)" + annotations + "]}";
}

struct outcome {
  int exit_code = -1;  // -1: ended by a signal
  int signal = 0;
  std::string out, err;
};

/// The numbers behind a label of the summary.
inline std::vector<double> numbers(const outcome &result, const std::string &label) {
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

struct csv_row {
  double frequency, level;
};

class ProgramTest : public testing::Test {
 protected:
  void SetUp() override {
    std::string name = testing::TempDir() + "lumra-XXXXXX";
    ASSERT_NE(nullptr, ::mkdtemp(name.data()));
    folder_ = name;
  }
  void TearDown() override { std::filesystem::remove_all(folder_); }

  /// Starts the program; paths are relative to the folder. More may be put in front of the environment.
  [[nodiscard]] pid_t start(const std::vector<std::string> &arguments, std::vector<std::string> settings = {}) const {
    std::vector<std::string> all{LUMRA_PROGRAM};
    all.insert(all.end(), arguments.begin(), arguments.end());
    std::vector<char *> argv;
    argv.reserve(all.size() + 1);
    for (std::string &argument : all) argv.push_back(argument.data());
    argv.push_back(nullptr);
    std::vector<char *> environment;
    for (std::string &setting : settings) environment.push_back(setting.data());
    for (char **inherited = environ; *inherited; ++inherited) environment.push_back(*inherited);
    environment.push_back(nullptr);
    const std::string out = logs_ + "out", err = logs_ + "err";
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_addchdir_np(&actions, folder_.c_str());
    posix_spawn_file_actions_addopen(&actions, 1, out.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600);
    posix_spawn_file_actions_addopen(&actions, 2, err.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600);
    pid_t child = -1;
    EXPECT_EQ(0, ::posix_spawn(&child, LUMRA_PROGRAM, &actions, nullptr, argv.data(), environment.data()));
    posix_spawn_file_actions_destroy(&actions);
    return child;
  }

  [[nodiscard]] outcome finish(pid_t child) const {
    int status = 0;
    EXPECT_EQ(child, ::waitpid(child, &status, 0));
    outcome result;
    if (WIFEXITED(status)) result.exit_code = WEXITSTATUS(status);
    if (WIFSIGNALED(status)) result.signal = WTERMSIG(status);
    result.out = read(logs_ + "out");
    result.err = read(logs_ + "err");
    (void)std::filesystem::remove(folder_ / (logs_ + "out"));
    (void)std::filesystem::remove(folder_ / (logs_ + "err"));
    return result;
  }

  static std::vector<std::string> words(const std::string &line) {
    std::istringstream text(line);
    return {std::istream_iterator<std::string>(text), {}};
  }

  /// The arguments, separated by blanks.
  [[nodiscard]] outcome run(const std::string &line) const { return finish(start(words(line))); }

  /// The same; must succeed.
  outcome succeed(const std::string &line) const {
    outcome result = run(line);
    EXPECT_EQ(0, result.exit_code) << line << ": " << result.err;
    EXPECT_EQ("", result.err);
    return result;
  }

  /// Starts the program and waits until so many of its outputs are begun.
  [[nodiscard]] pid_t start_outputs(const std::string &line, std::ptrdiff_t outputs) const {
    const pid_t child = start(words(line));
    const auto begun = [&] {
      const auto names = files();
      return std::count_if(names.begin(), names.end(), [](const auto &name) { return name.ends_with(".part"); });
    };
    const auto give_up = std::chrono::steady_clock::now() + std::chrono::seconds(20);
    while (begun() < outputs && std::chrono::steady_clock::now() < give_up)
      std::this_thread::sleep_for(std::chrono::milliseconds(2));
    EXPECT_EQ(outputs, begun());
    return child;
  }

  /// Runs `spectrum`, which must succeed, and gives its CSV.
  [[nodiscard]] std::vector<csv_row> spectrum(const std::string &options) const {
    succeed("spectrum --csv result.csv " + options);
    std::istringstream text(read("result.csv"));
    std::string line;
    EXPECT_TRUE(std::getline(text, line) && line == "frequency_hz,level_dbfs") << line;
    std::vector<csv_row> rows;
    char comma = 0;
    for (csv_row row{}; text >> row.frequency >> comma >> row.level;) rows.push_back(row);
    return rows;
  }

  void write(const std::string &name, const std::string &content) const {
    std::ofstream(folder_ / name, std::ios::binary) << content;
  }
  /// A file of zeros that takes no room.
  void write_hole(const std::string &name, int bits) const {
    write(name, "");
    std::filesystem::resize_file(folder_ / name, std::uintmax_t{1} << bits);
  }
  [[nodiscard]] std::string read(const std::string &name) const {
    std::ostringstream content;
    content << std::ifstream(folder_ / name, std::ios::binary).rdbuf();
    return content.str();
  }
  /// The names in the folder, sorted.
  [[nodiscard]] std::vector<std::string> files() const {
    std::vector<std::string> names;
    for (const auto &entry : std::filesystem::directory_iterator(folder_))
      names.push_back(entry.path().filename().string());
    std::sort(names.begin(), names.end());
    return names;
  }

  std::filesystem::path folder_;

 private:
  std::string logs_ = ".std";
};

}  // namespace tests
