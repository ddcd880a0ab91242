// SPDX-License-Identifier: MIT
#include "terminal/output_file.hpp"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

#include "terminal/failure.hpp"

namespace tool {

namespace fs = std::filesystem;

namespace {

/// One who may write everything is kept from files that nobody may write, too.
bool may_be_written(const fs::path &file, const fs::file_status &status) {
  constexpr auto anybody = fs::perms::owner_write | fs::perms::group_write | fs::perms::others_write;
  return (status.permissions() & anybody) != fs::perms::none && ::access(file.c_str(), W_OK) == 0;
}

}  // namespace

output_file::output_file(fs::path target, const std::vector<fs::path> &inputs) : target_(std::move(target)) {
  recording::descriptor opened(-1);
  if (is_standard_output()) {
    opened = recording::descriptor(::fcntl(STDOUT_FILENO, F_DUPFD_CLOEXEC, STDERR_FILENO + 1));
  } else {
    std::error_code error;
    const fs::file_status status = fs::status(target_, error);
    if (fs::is_directory(status)) fail(EISDIR);
    for (const fs::path &input : inputs)
      if (fs::exists(status) && fs::equivalent(target_, input, error))
        throw failure("{}: is part of the recording; give the result another name", target_.string());
    if (fs::exists(status) && !may_be_written(target_, status))
      throw failure("{}: is protected from writing; give the result another name", target_.string());
    if (fs::exists(status) && !fs::is_regular_file(status)) {
      opened = recording::descriptor(::open(target_.c_str(), O_WRONLY | O_CLOEXEC));
    } else {
      if (fs::exists(status) && fs::is_symlink(fs::symlink_status(target_, error))) target_ = fs::canonical(target_);
      const auto beside = [&](const char *suffix) {
        return fs::path(target_) += fmt::format(".{}.{}", ::getpid(), suffix);
      };
      temporary_ = beside("part");
      former_ = beside("old");
      unfinished_.emplace(temporary_);
      opened = recording::descriptor(::open(temporary_.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0666));
      if (!opened.is_open()) unfinished_->is_finished();  // it is not this one's
    }
  }
  if (!opened.is_open() && errno == EEXIST)
    throw failure("cannot write {}: it is being written already; give each result a name of its own", target_.string());
  if (!opened.is_open()) fail(errno);
  file_.reset(::fdopen(opened.get(), "w"));
  if (!file_) fail(errno);
  opened.release();  // the stream closes it
}

void output_file::write(std::span<const std::byte> bytes) {
  if (std::fwrite(bytes.data(), 1, bytes.size(), file_.get()) != bytes.size()) fail(errno);
}

void output_file::flush() {
  if (std::fflush(file_.get()) != 0) fail(errno);
}

void output_file::finish() {
  flush();
  if (std::fclose(file_.release()) != 0) fail(errno);
}

int output_file::appear(bool keep_former) noexcept {
  if (!unfinished_) return 0;
  struct stat status = {};
  replaced_ = keep_former && ::lstat(target_.c_str(), &status) == 0 && S_ISREG(status.st_mode);
  if (replaced_ && std::rename(target_.c_str(), former_.c_str()) != 0) {
    replaced_ = false;
    return errno;
  }
  appeared_ = std::rename(temporary_.c_str(), target_.c_str()) == 0;
  if (appeared_) return 0;
  const int code = errno;
  if (replaced_) (void)std::rename(former_.c_str(), target_.c_str());
  return code;
}

void output_file::disappear() noexcept {
  if (!appeared_) return;
  if (replaced_)
    (void)std::rename(former_.c_str(), target_.c_str());
  else
    (void)::unlink(target_.c_str());
  appeared_ = false;
}

void output_file::stay() noexcept {
  if (replaced_) (void)::unlink(former_.c_str());
  if (unfinished_) unfinished_->is_finished();
}

void output_file::fail(int code) const {
  throw failure("cannot write {}: {}", is_standard_output() ? "to the standard output" : target_.string(),
                system_reason(code));
}

}  // namespace tool
