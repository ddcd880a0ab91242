// SPDX-License-Identifier: MIT
#include "open/handle.hpp"

#include <array>
#include <atomic>
#include <cstddef>
#include <functional>
#include <mutex>
#include <utility>

#include "platform/fork.hpp"

namespace doors {
namespace {

/// Cells in slabs that live as long as the process. Slabs are looked through without a lock; there is one for every
/// 1024 objects that were alive at once.
class cell_table {
 public:
  cell *take(const void *kind, void *object) {
    const std::lock_guard lock(mutex_);
    if (!free_) add_slab();
    cell *const taken = free_;
    free_ = static_cast<cell *>(taken->object);
    *taken = {kind, object};
    return taken;
  }
  void *release(cell *released) noexcept {
    const std::lock_guard lock(mutex_);
    void *const object = released->object;
    *released = {nullptr, free_};
    free_ = released;
    return object;
  }
  /// The cell at an address; null where there is none.
  [[nodiscard]] cell *find(const void *address) const noexcept {
    const auto place = reinterpret_cast<std::uintptr_t>(address);
    for (slab *s = newest_.load(std::memory_order_acquire); s; s = s->older) {
      const auto offset = place - reinterpret_cast<std::uintptr_t>(s->cells.data());
      if (offset < sizeof s->cells && offset % sizeof(cell) == 0) return &s->cells[offset / sizeof(cell)];
    }
    return nullptr;
  }

  void before_fork() noexcept { mutex_.lock(); }
  void after_fork() noexcept { mutex_.unlock(); }

 private:
  struct slab {
    slab *older = nullptr;
    std::array<cell, 1024> cells{};
  };

  void add_slab() {
    auto *const added = new slab;
    added->older = newest_.load(std::memory_order_relaxed);
    for (cell &c : added->cells) c.object = std::exchange(free_, &c);
    newest_.store(added, std::memory_order_release);
  }

  std::mutex mutex_;
  cell *free_ = nullptr;  // under mutex_
  std::atomic<slab *> newest_{nullptr};
};

constinit cell_table table;

constexpr platform::fork_handlers fork_handlers{[]() noexcept { table.before_fork(); },
                                                []() noexcept { table.after_fork(); },
                                                []() noexcept { table.after_fork(); }};
const platform::fork_participation takes_part(platform::fork_rank::object_handles, fork_handlers);

}  // namespace

cell *take_cell(const void *kind, void *object) {
  return table.take(kind, object);
}

void *find_object(const void *address, const void *kind) noexcept {
  const cell *const found = table.find(address);
  return found && found->kind == kind ? found->object : nullptr;
}

void *release_cell(const void *address, const void *kind) noexcept {
  cell *const found = table.find(address);
  return found && found->kind == kind ? table.release(found) : nullptr;
}

}  // namespace doors
