// SPDX-License-Identifier: MIT
#include "recording/byte_reader.hpp"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <utility>
#include <vector>

#include "recording/failure.hpp"
#include "recording/file.hpp"

namespace recording {
namespace {

class file_reader final : public byte_reader {
 public:
  file_reader(std::filesystem::path file, std::uint64_t begin)
      : path_(std::move(file)), begin_(begin), file_(::open(path_.c_str(), O_RDONLY | O_CLOEXEC)) {
    if (!file_.is_open()) throw failure("{}: {}", path_.string(), system_reason(errno));
    (void)::posix_fadvise(file_.get(), 0, 0, POSIX_FADV_SEQUENTIAL);
  }

  std::size_t read(std::uint64_t offset, std::span<std::byte> to) override {
    std::size_t got = 0;
    while (got < to.size()) {
      const ssize_t count =
          ::pread(file_.get(), to.data() + got, to.size() - got, static_cast<off_t>(begin_ + offset + got));
      if (count < 0 && errno == EINTR) continue;
      if (count < 0) throw failure("{}: {}", path_.string(), system_reason(errno));
      if (count == 0) break;
      got += static_cast<std::size_t>(count);
    }
    return got;
  }

 private:
  std::filesystem::path path_;
  std::uint64_t begin_;
  descriptor file_;
};

class standard_input final : public sequential_reader {
  std::size_t next(std::span<std::byte> to) override {
    for (;;) {
      const ssize_t count = ::read(STDIN_FILENO, to.data(), to.size());
      if (count >= 0) return static_cast<std::size_t>(count);
      if (errno != EINTR) throw failure("standard input: {}", system_reason(errno));
    }
  }
};

}  // namespace

std::unique_ptr<byte_reader> read_file(const std::filesystem::path &file, std::uint64_t begin) {
  return std::make_unique<file_reader>(file, begin);
}

std::unique_ptr<byte_reader> read_standard_input() {
  return std::make_unique<standard_input>();
}

std::size_t sequential_reader::fill(std::span<std::byte> to) {
  std::size_t got = 0;
  while (got < to.size()) {
    const std::size_t count = next(to.subspan(got));
    if (count == 0) break;
    got += count;
  }
  position_ += got;
  return got;
}

std::size_t sequential_reader::read(std::uint64_t offset, std::span<std::byte> to) {
  if (offset < position_) throw failure("samples that come once were to be read again; save them to a file first");
  std::vector<std::byte> skipped(std::min<std::uint64_t>(offset - position_, std::uint64_t{1} << 16));
  while (position_ < offset) {
    const auto count = std::min<std::uint64_t>(offset - position_, skipped.size());
    if (fill(std::span(skipped).first(count)) < count) return 0;
  }
  return fill(to);
}

}  // namespace recording
