// Where the bytes of samples come from. SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <memory>
#include <span>

namespace recording {

class byte_reader {
 public:
  virtual ~byte_reader() = default;

  /// Fills `to` with the bytes from `offset` on and gives how many there were: fewer only where they end. Bytes that
  /// come once are asked for in rising order. Throws failure.
  virtual std::size_t read(std::uint64_t offset, std::span<std::byte> to) = 0;
};

/// The bytes of a file from `begin` on, in any order.
std::unique_ptr<byte_reader> read_file(const std::filesystem::path &file, std::uint64_t begin = 0);

/// Bytes that come one after the other: skips those that are not asked for, and fails when asked to go back.
class sequential_reader : public byte_reader {
 public:
  std::size_t read(std::uint64_t offset, std::span<std::byte> to) final;

 protected:
  /// Gives the next bytes, at most so many, and none where they end.
  virtual std::size_t next(std::span<std::byte> to) = 0;

 private:
  std::size_t fill(std::span<std::byte> to);

  std::uint64_t position_ = 0;
};

/// The standard input from where it stands.
std::unique_ptr<byte_reader> read_standard_input();

}  // namespace recording
