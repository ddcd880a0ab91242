// Host arrays of the tests: blocks of exactly the size they say, so that a sanitizer sees every access beyond.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <initializer_list>
#include <optional>
#include <span>
#include <unordered_map>
#include <vector>

#include "host/host_array.hpp"
#include "host/resize_service.hpp"
#include "support/fault_counter.hpp"
#include "support/guarded.hpp"

namespace tests {

/// Where blocks are made from now on: malloc'ed, or, with an edge, at a page that faults.
inline std::optional<edge> &block_edge() {
  static std::optional<edge> at;
  return at;
}
inline std::unordered_map<void *, guarded> &guarded_blocks() {
  static std::unordered_map<void *, guarded> blocks;
  return blocks;
}

/// A block of `header` + `bytes` bytes, all zero. Not inlined: the size sanitizer would miss the room for the first
/// element in blocks that have none, while the address sanitizer sees what is touched.
[[gnu::noinline]] inline void *new_block(std::size_t header, std::size_t bytes) {
  if (!block_edge()) return std::calloc(1, header + bytes);
  guarded memory(header + bytes, *block_edge());
  void *const block = memory.data();
  guarded_blocks().emplace(block, std::move(memory));
  return block;
}

inline void free_block(void *block) noexcept {
  if (guarded_blocks().erase(block) == 0) std::free(block);
}

/// A vector or matrix in a block of its own; resizable by fake_host, and by nothing else.
template <class Block>
class test_array {
 public:
  using element = host::element_of<Block>;
  static constexpr std::size_t header = offsetof(Block, elements);

  test_array() = default;  // a null block
  explicit test_array(std::size_t count) : block_(make(count)) {
    // Not through the member: a block of few elements is shorter than its type.
    const auto word = static_cast<std::int32_t>(count);
    std::memcpy(block_, &word, sizeof word);
  }
  test_array(std::initializer_list<element> values) : test_array(std::span(values.begin(), values.size())) {}
  explicit test_array(std::span<const element> values) : test_array(values.size()) {
    if (!values.empty()) std::memcpy(block_->elements, values.data(), values.size_bytes());
  }
  test_array(std::int32_t rows, std::int32_t columns, std::span<const element> values = {})
      : block_(make(static_cast<std::size_t>(rows) * static_cast<std::size_t>(columns))) {
    const std::int32_t words[] = {rows, columns};
    std::memcpy(block_, words, sizeof words);
    if (!values.empty()) std::memcpy(block_->elements, values.data(), values.size_bytes());
  }
  test_array(const test_array &) = delete;
  test_array &operator=(const test_array &) = delete;
  ~test_array() { free_block(block_); }

  [[nodiscard]] Block **handle() noexcept { return handle_; }
  operator Block **() noexcept {  // as exports take it
    handed_over_ = true;
    return handle_;
  }
  [[nodiscard]] Block ***address() noexcept { return &handle_; }
  [[nodiscard]] Block *block() noexcept { return handle_ ? *handle_ : nullptr; }
  [[nodiscard]] bool handed_over() const noexcept { return handed_over_; }
  [[nodiscard]] std::span<element> elements() noexcept {
    if constexpr (requires { block()->rows; })
      return {block()->elements, static_cast<std::size_t>(block()->rows) * static_cast<std::size_t>(block()->columns)};
    else
      return host::elements(handle_);
  }
  [[nodiscard]] std::vector<element> copy() { return {elements().begin(), elements().end()}; }

 private:
  static Block *make(std::size_t count) { return static_cast<Block *>(new_block(header, count * sizeof(element))); }

  Block *block_ = nullptr;
  Block **handle_ = &block_;
  bool handed_over_ = false;
};

using f32_array = test_array<lumra_f32_block>;
using f64_array = test_array<lumra_f64_block>;
using cf32_array = test_array<lumra_cf32_block>;
using cf64_array = test_array<lumra_cf64_block>;

/// The process's resize service while it lives: records what it is asked, refuses what it is told to refuse, and
/// allocates exactly what was asked for.
class fake_host {
 public:
  enum class unit { bytes, elements };  // what the size argument counts
  struct call {
    std::int32_t type, dimensions;
    std::uint64_t size;
  };

  explicit fake_host(unit size_unit) : unit_(size_unit) {
    current() = this;
    qsHost_SetArrayResize(&serve);
  }
  fake_host(const fake_host &) = delete;
  fake_host &operator=(const fake_host &) = delete;
  ~fake_host() {
    qsHost_SetArrayResize(nullptr);
    current() = nullptr;
    for (void **cell : cells_) {
      free_block(*cell);
      std::free(cell);
    }
  }

  std::vector<call> calls;
  fault_counter resizes;  // refuses one of them
  int refuse_from = -1;   // index of the first call that is refused, -1 for none
  int refuse_until = 1 << 30;
  bool empties_in_place = false;  // leaves a block that loses its elements where it is

 private:
  static fake_host *&current() {
    static fake_host *host = nullptr;
    return host;
  }

  static std::int32_t serve(std::int32_t type, std::int32_t dimensions, void *address, std::uint64_t size) {
    fake_host &self = *current();
    const int index = static_cast<int>(self.calls.size());
    self.calls.push_back({type, dimensions, size});
    if (self.resizes.fails()) return 1;
    if (self.refuse_from >= 0 && index >= self.refuse_from && index < self.refuse_until) return 1;
    auto **&handle = *static_cast<void ***>(address);
    if (self.empties_in_place && size == 0 && handle && *handle) return 0;
    if (!handle) {  // arrays made here are freed with the host
      handle = static_cast<void **>(std::calloc(1, sizeof(void *)));
      self.cells_.push_back(handle);
    }
    const auto element = host::element_type{type};
    const std::size_t header = host::header_size(element, dimensions);
    const std::size_t width = self.unit_ == unit::bytes ? 1 : host::element_size(element);
    void *fresh = new_block(header, static_cast<std::size_t>(size) * width);
    if (!fresh) return 1;
    if (*handle) std::memcpy(fresh, *handle, header);  // the sizes stay as they were; the elements need not
    free_block(*handle);
    *handle = fresh;
    return 0;
  }

  unit unit_;
  std::vector<void **> cells_;
};

}  // namespace tests
