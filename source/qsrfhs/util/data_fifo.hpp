// Named byte FIFOs and their table. SPDX-License-Identifier: MIT
#pragma once

#include <array>
#include <atomic>
#include <condition_variable>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <memory>
#include <mutex>
#include <string_view>
#include <unordered_map>

#include "qsrfhs/util/wanted_bytes.hpp"

namespace qsrfhs {

/// A ring of bytes between two ends, each with a lock of its own that is held while it transfers, so that the ends meet
/// only in the counts of what they moved. The object itself is never freed, only used again, so that a thread which
/// looked it up while it was being closed finds a lock to take and, behind it, another handle.
class data_fifo {
 public:
  static constexpr std::size_t longest_name = 255;
  struct free_memory {
    void operator()(void *memory) const noexcept { std::free(memory); }
  };
  using memory = std::unique_ptr<std::byte[], free_memory>;

  void open(std::string_view name, memory buffer, std::uint32_t capacity, std::uint64_t handle) noexcept;
  /// Lets waiting transfers go, waits for all to leave, and frees the buffer.
  void close() noexcept;
  /// Refuses the handle from now on and lets the transfers finish; true when there were none, and the object is free.
  [[nodiscard]] bool forget() noexcept;

  // Each looks whether the FIFO is still the one with this handle, and open.
  std::int32_t write(std::uint64_t handle, const std::byte *source, std::uint32_t count) noexcept;
  std::int32_t read(std::uint64_t handle, std::byte *destination, std::uint32_t count) noexcept;
  std::int32_t flush(std::uint64_t handle) noexcept;
  std::int32_t get_status(std::uint64_t handle, std::uint32_t &capacity, std::uint32_t &held) const noexcept;

  // For the table, under its lock.
  [[nodiscard]] std::string_view name() const noexcept { return name_.data(); }
  [[nodiscard]] std::uint64_t handle() const noexcept { return handle_; }
  data_fifo *next_spare = nullptr;
  data_fifo *made_before = nullptr;
  void before_fork() noexcept;
  void after_fork_in_parent() noexcept;
  void after_fork_in_child() noexcept;

 private:
  enum class state : std::uint32_t { open = 1, closing = 2 };
  struct alignas(64) end {
    std::mutex mutex;
    std::uint32_t position = 0;  // under mutex; up to and including the capacity
    std::uint32_t waiting = 0;   // under mutex; transfers that wait
    std::uint64_t seen = 0;      // under mutex; what the other end had moved when this one last looked
    alignas(64) std::atomic<std::uint64_t> moved{0};  // bytes ever; only rises, under mutex
    std::condition_variable idle;
    alignas(64) wanted_bytes wish;
  };

  template <class Copy>
  std::int32_t transfer(std::uint64_t handle, end &own, end &other, std::uint32_t count, Copy copy) noexcept;
  bool has(end &own, const end &other, std::uint32_t count) noexcept;
  std::int32_t wait(std::unique_lock<std::mutex> &lock, end &own, const end &other, std::uint32_t count) noexcept;
  [[nodiscard]] std::uint64_t fill() const noexcept;
  [[nodiscard]] memory retire() noexcept;
  void hand_back_if_forgotten() noexcept;

  // Changed under both ends' mutexes, or while no transfer is in here.
  std::atomic<std::uint64_t> handle_{0};  // 0 unless open
  std::atomic<state> state_{state::closing};
  std::atomic<std::uint32_t> capacity_{0};
  memory buffer_;
  end writer_, reader_;  // their mutexes in this order
  std::array<char, longest_name + 1> name_{};
};

/// The FIFOs of the process: 16 slots, and the cells that hold handles. A handle is generation * 16 + slot. Order of
/// locks: the table's, then a FIFO's.
class fifo_table {
 public:
  static fifo_table &instance() noexcept;

  /// Null for a slot that is empty. Whether the handle is still good is for the FIFO to say.
  [[nodiscard]] data_fifo *find(std::uint64_t handle) const noexcept {
    return slots_[handle % slot_count].load(std::memory_order_acquire);
  }

  /// What becomes of a FIFO of the name that holds as much as is asked for.
  enum class existing { reused, forgotten };
  std::uint64_t create(std::string_view name, std::uint32_t capacity, existing same_name,
                       std::uint64_t **cell) noexcept;
  void remove(std::uint64_t handle) noexcept;
  std::int32_t unreserve(std::uint64_t **cell) noexcept;
  /// Keeps an object that nobody uses for the next FIFO.
  void recycle(data_fifo &fifo) noexcept;

  void before_fork() noexcept;
  void after_fork_in_parent() noexcept;
  void after_fork_in_child() noexcept;

 private:
  static constexpr std::size_t slot_count = 16;

  std::uint64_t open_in(std::size_t slot, std::string_view name, std::uint32_t capacity);

  std::mutex mutex_;
  std::array<std::atomic<data_fifo *>, slot_count> slots_{};                   // changed under mutex_
  std::uint64_t next_generation_ = 1;                                          // under mutex_
  data_fifo *spares_ = nullptr;                                                // under mutex_
  data_fifo *newest_ = nullptr;                                                // under mutex_; all ever made
  std::unordered_map<std::uint64_t *, std::unique_ptr<std::uint64_t>> cells_;  // under mutex_
};

}  // namespace qsrfhs
