// Runs the program lumra in a folder of its own, as a user would. SPDX-License-Identifier: MIT
#pragma once

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

/// All numbers in a text, whatever stands between them.
inline std::vector<double> numbers_in(const std::string &text) {
  std::vector<double> found;
  for (const char *at = text.c_str(); *at;) {
    char *end = nullptr;
    const double value = std::strtod(at, &end);
    if (end != at) found.push_back(value);
    at = end == at ? at + 1 : end;
  }
  return found;
}

struct outcome {
  int exit_code = -1;  // -1: ended by a signal
  int signal = 0;
  std::string out, err;

  /// The numbers behind a label of the summary.
  [[nodiscard]] std::vector<double> numbers(const std::string &label) const {
    std::istringstream lines(out);
    for (std::string line; std::getline(lines, line);)
      if (line.starts_with(label)) return numbers_in(line.substr(label.size()));
    return {};
  }
};

class ProgramTest : public testing::Test {
 protected:
  void SetUp() override {
    std::string name = testing::TempDir() + "lumra-XXXXXX";
    ASSERT_NE(nullptr, ::mkdtemp(name.data()));
    folder_ = name;
    (void)std::signal(SIGINT, SIG_DFL);  // a shell ignores it for jobs in the background, and then so does the program
  }
  void TearDown() override { std::filesystem::remove_all(folder_); }

  /// Starts the program in the folder. The shell reads the line, and what stands in front of the program: settings, and
  /// "exec" at the end.
  [[nodiscard]] pid_t start(const std::string &line, const std::string &front = "exec") const {
    std::string command = "cd " + folder_.string() + "; " + front + " " + LUMRA_PROGRAM + " >.out 2>.err " + line;
    std::string shell = "/bin/sh", option = "-c";
    char *arguments[] = {shell.data(), option.data(), command.data(), nullptr};
    pid_t child = -1;
    EXPECT_EQ(0, ::posix_spawn(&child, shell.c_str(), nullptr, nullptr, arguments, environ));
    return child;
  }

  [[nodiscard]] outcome finish(pid_t child) const {
    int status = 0;
    EXPECT_EQ(child, ::waitpid(child, &status, 0));
    outcome result{-1, 0, read(".out"), read(".err")};
    if (WIFEXITED(status)) result.exit_code = WEXITSTATUS(status);
    if (WIFSIGNALED(status)) result.signal = WTERMSIG(status);
    for (const char *name : {".out", ".err"}) std::filesystem::remove(folder_ / name);
    return result;
  }

  [[nodiscard]] outcome run(const std::string &line, const std::string &front = "exec") const {
    return finish(start(line, front));
  }

  /// The same; must succeed.
  outcome succeed(const std::string &line) const {
    outcome result = run(line);
    EXPECT_EQ(0, result.exit_code) << line << ": " << result.err;
    EXPECT_EQ("", result.err);
    return result;
  }

  /// Must fail in one line that says this, and change nothing in the folder.
  void refuse(int code, const std::string &says, const std::string &line, const std::string &front = "exec") const {
    const auto before = files();
    const outcome result = run(line, front);
    SCOPED_TRACE(front + " " + line + ": " + result.err);
    EXPECT_EQ(code, result.exit_code);
    EXPECT_NE(std::string::npos, result.err.find(says)) << says;
    EXPECT_EQ(1, std::count(result.err.begin(), result.err.end(), '\n'));
    EXPECT_TRUE(result.err.starts_with("lumra: ") && result.err.ends_with('\n'));
    EXPECT_EQ("", result.out);
    EXPECT_EQ(before, files());
  }

  /// Starts the program and waits until so many of its outputs are begun.
  [[nodiscard]] pid_t start_outputs(const std::string &line, std::ptrdiff_t outputs) const {
    const pid_t child = start(line);
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

  /// Runs a command that takes --csv and gives the rows of that file.
  [[nodiscard]] std::vector<std::vector<double>> rows(const std::string &line, const std::string &header) const {
    succeed(line + " --csv result.csv");
    std::istringstream text(read("result.csv"));
    std::string row;
    EXPECT_TRUE(std::getline(text, row) && row == header) << row;
    std::vector<std::vector<double>> found;
    while (std::getline(text, row)) found.push_back(numbers_in(row));
    return found;
  }

  /// Draws a picture of each kind, which must be whole, and gives the SVG.
  [[nodiscard]] std::string drawn(const std::string &line) const {
    for (const std::string file : {"x.png", "x.svg"})
      EXPECT_NE(std::string::npos, succeed(line + " --plot " + file).out.find(file));
    const std::string png = read("x.png"), svg = read("x.svg");
    EXPECT_TRUE(png.starts_with("\x89PNG\r\n\x1A\n") && png.ends_with("IEND\xAE\x42\x60\x82"));
    EXPECT_TRUE(svg.starts_with("<?xml") && svg.find("</svg>") != std::string::npos);
    return svg;
  }

  void write(const std::string &name, const std::string &content) const {
    std::ofstream(folder_ / name, std::ios::binary) << content;
  }
  /// A file of zeros behind what it begins with, which takes no room.
  void write_hole(const std::string &name, int bits, const std::string &begin = "") const {
    write(name, begin);
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
};

}  // namespace tests
