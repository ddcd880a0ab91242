// Runs the program lumra in a folder of its own, as a user would. SPDX-License-Identifier: MIT
#pragma once

#include <fcntl.h>
#include <gtest/gtest.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <csignal>
#include <cstdint>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <string>
#include <vector>

namespace tests {

struct outcome {
  int exit_code = -1;  // -1: ended by a signal
  int signal = 0;
  std::string out, err;
};

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

  /// Starts the program; paths are relative to the folder.
  [[nodiscard]] pid_t start(const std::vector<std::string> &arguments) const {
    std::vector<std::string> all{LUMRA_PROGRAM};
    all.insert(all.end(), arguments.begin(), arguments.end());
    std::vector<char *> argv;
    argv.reserve(all.size() + 1);
    for (std::string &argument : all) argv.push_back(argument.data());
    argv.push_back(nullptr);
    const std::string out = logs_ + "out", err = logs_ + "err";
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_addchdir_np(&actions, folder_.c_str());
    posix_spawn_file_actions_addopen(&actions, 1, out.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600);
    posix_spawn_file_actions_addopen(&actions, 2, err.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600);
    pid_t child = -1;
    EXPECT_EQ(0, ::posix_spawn(&child, LUMRA_PROGRAM, &actions, nullptr, argv.data(), environ));
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

  [[nodiscard]] outcome run(const std::vector<std::string> &arguments) const { return finish(start(arguments)); }

  /// Runs `spectrum`, which must succeed, and gives its CSV.
  [[nodiscard]] std::vector<csv_row> spectrum(std::vector<std::string> arguments) const {
    arguments.insert(arguments.begin(), "spectrum");
    arguments.insert(arguments.end(), {"--csv", "result.csv"});
    const outcome result = run(arguments);
    EXPECT_EQ(0, result.exit_code) << result.err;
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
