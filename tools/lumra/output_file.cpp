// SPDX-License-Identifier: MIT
#include "output_file.hpp"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <system_error>

#include "failure.hpp"

namespace tool {
namespace {

namespace fs = std::filesystem;

[[noreturn]] void fail(const fs::path &file, int code) {
  throw failure("cannot write {}: {}", file.string(), std::generic_category().message(code));
}

}  // namespace

output_file::output_file(fs::path target, const std::vector<fs::path> &inputs) : target_(std::move(target)) {
  std::error_code error;
  const fs::file_status status = fs::status(target_, error);
  if (fs::is_directory(status)) fail(target_, EISDIR);
  for (const fs::path &input : inputs)
    if (fs::exists(status) && fs::equivalent(target_, input, error))
      throw failure("{}: is part of the recording; give the result another name", target_.string());
  int descriptor = -1;
  if (fs::exists(status) && !fs::is_regular_file(status)) {
    descriptor = ::open(target_.c_str(), O_WRONLY | O_CLOEXEC);
  } else {
    if (fs::is_symlink(fs::symlink_status(target_, error)) && fs::exists(status)) target_ = fs::canonical(target_);
    temporary_ = target_;
    temporary_ += fmt::format(".{}.part", ::getpid());
    unfinished_ = std::make_unique<unfinished_file>(temporary_);
    descriptor = ::open(temporary_.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0666);
  }
  if (descriptor < 0) {
    const int code = errno;
    temporary_.clear();
    fail(target_, code);
  }
  file_.reset(::fdopen(descriptor, "w"));
  if (!file_) fail(target_, errno);
}

output_file::~output_file() {
  if (!temporary_.empty()) ::unlink(temporary_.c_str());
}

void output_file::write(const char *data, std::size_t size) {
  if (std::fwrite(data, 1, size, file_.get()) != size) fail(target_, errno);
}

void output_file::commit() {
  finish();
  take_place();
}

void output_file::commit_with(output_file &other) {
  finish();
  other.finish();
  const held_signals until_both_are_there;
  const bool in_place = temporary_.empty();
  const bool replaces = !in_place && fs::is_regular_file(fs::symlink_status(target_));
  fs::path former = target_;
  former += fmt::format(".{}.old", ::getpid());
  if (replaces && std::rename(target_.c_str(), former.c_str()) != 0) fail(target_, errno);
  try {
    take_place();
    other.take_place();
  } catch (const failure &) {
    if (replaces)
      (void)std::rename(former.c_str(), target_.c_str());
    else if (!in_place && temporary_.empty())
      ::unlink(target_.c_str());
    throw;
  }
  if (replaces) ::unlink(former.c_str());
}

/// Everything is in the file, and it is closed.
void output_file::finish() {
  if (std::fflush(file_.get()) != 0) fail(target_, errno);
  if (std::fclose(file_.release()) != 0) fail(target_, errno);
}

void output_file::take_place() {
  if (temporary_.empty()) return;
  if (std::rename(temporary_.c_str(), target_.c_str()) != 0) fail(target_, errno);
  temporary_.clear();
}

}  // namespace tool
