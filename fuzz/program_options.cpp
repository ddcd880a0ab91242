// Any command line, one argument a line, in a folder with recordings. SPDX-License-Identifier: MIT
#include <fcntl.h>
#include <sanitizer/common_interface_defs.h>
#include <sys/mman.h>
#include <unistd.h>

#include <cstdint>
#include <vector>

#include "program.hpp"
#include "program_scratch.hpp"

namespace {

/// Where the program's lines go while the fuzzer keeps its own standard error stream.
class captured_errors {
 public:
  captured_errors() : file_(::memfd_create("errors", MFD_CLOEXEC)), own_(::dup(STDERR_FILENO)) {
    __sanitizer_set_report_fd(reinterpret_cast<void *>(static_cast<std::intptr_t>(own_)));
  }
  template <class Work>
  int during(Work work, std::string &text) const {
    fuzz::require(::ftruncate(file_, 0) == 0 && ::lseek(file_, 0, SEEK_SET) == 0, "an empty file for errors");
    ::dup2(file_, STDERR_FILENO);
    const int code = work();
    ::dup2(own_, STDERR_FILENO);
    text.resize(static_cast<std::size_t>(::lseek(file_, 0, SEEK_END)));
    fuzz::require(::pread(file_, text.data(), text.size(), 0) == static_cast<ssize_t>(text.size()), "errors are read");
    return code;
  }

 private:
  int file_, own_;
};

constexpr const char *inputs[] = {"x.cf32", "y.ci16", "z.sigmf-data", "z.sigmf-meta"};

void write_inputs(const fuzz::scratch_folder &folder) {
  std::string samples(512, '\0');
  for (std::size_t i = 3; i < samples.size(); i += 4) samples[i] = i % 8 == 3 ? '\x3E' : '\xBD';  // 0.125, -0.03125
  for (const char *name : {"x.cf32", "y.ci16", "z.sigmf-data"}) folder.write(name, samples);
  folder.write("z.sigmf-meta",
               R"({"global": {"core:datatype": "cf32_le", "core:sample_rate": 1000},
                   "captures": [{"core:sample_start": 0, "core:frequency": 1e9}, {"core:sample_start": 32}],
                   "annotations": [{"core:sample_start": 3, "core:sample_count": 9}]})");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size) {
  static const fuzz::scratch_folder folder;
  static const captured_errors errors;
  static const bool prepared = [] {
    // Pictures would take a process each.
    return ::chdir(folder.path().c_str()) == 0 && ::setenv("PATH", "/nowhere", 1) == 0 &&
           ::dup2(::open("/dev/null", O_WRONLY), STDOUT_FILENO) == STDOUT_FILENO &&
           ::dup2(::open("/dev/null", O_RDONLY), STDIN_FILENO) == STDIN_FILENO;
  }();
  fuzz::require(prepared, "a folder to work in");
  const std::string text(reinterpret_cast<const char *>(data), size);
  if (text.find('/') != std::string::npos) return 0;           // nothing outside of the folder
  if (text.find("--generate") != std::string::npos) return 0;  // the build's own, which makes a folder

  std::vector<std::string> words{"lumra"};
  for (std::size_t begin = 0; begin < text.size() && words.size() < 32;) {
    const std::size_t end = std::min(text.find('\n', begin), text.size());
    words.push_back(text.substr(begin, end - begin));
    begin = end + 1;
  }
  std::vector<const char *> arguments;
  for (const std::string &word : words) arguments.push_back(word.c_str());

  write_inputs(folder);
  std::string said;
  const int code =
      errors.during([&] { return tool::run_program(static_cast<int>(arguments.size()), arguments.data()); }, said);
  fuzz::require(code >= 0 && code <= 2, "a known exit code", said);
  fuzz::require(said.ends_with('\n') == (code != 0), "failures are told, and they alone", said);
  if (code != 0) {
    said.pop_back();
    fuzz::require_one_line(said);
  }
  std::vector<std::string> made;
  for (const auto &entry : std::filesystem::directory_iterator(folder.path())) {
    const std::string name = entry.path().filename();
    if (std::find(std::begin(inputs), std::end(inputs), name) == std::end(inputs)) made.push_back(name);
  }
  for (const std::string &name : made) {
    fuzz::require(code == 0, "a failure leaves nothing behind", name);
    const bool from_default = name.ends_with("Hz.sigmf-data") || name.ends_with("Hz.sigmf-meta");
    const std::string base = name.substr(0, name.rfind(".sigmf-"));
    fuzz::require(from_default || text.find(name) != std::string::npos || text.find(base) != std::string::npos,
                  "only what was named is written", name);
    std::filesystem::remove(folder.path() / name);
  }
  return 0;
}
