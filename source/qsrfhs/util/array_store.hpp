// Arrays by identifier: recycled memory blocks, and the registry that knows who owns what. Both last as long as the
// process. Order of their locks: registry, then recycler or whatever a release function takes.
// SPDX-License-Identifier: MIT
#pragma once

#include <lumra/array_store.h>

#include <array>
#include <cstdint>
#include <mutex>
#include <unordered_map>

#include "qsrfhs/util/brief_mutex.hpp"

namespace qsrfhs {

using array_block = lumra_array_block;

/// Capacity of a block for `bytes` bytes, in units of 4096 bytes.
constexpr std::uint32_t units_for(std::uint32_t bytes) noexcept {
  constexpr std::uint64_t page = 4096;
  const std::uint64_t step = bytes < 65536 ? page : bytes < 1048576 ? 16 * page : 256 * page;
  return static_cast<std::uint32_t>((bytes + step - 1) / step * (step / page));
}

/// Blocks that are not in use, by size. Memory is never given back to the system.
class recycler {
 public:
  static recycler &instance() noexcept;

  /// A block for `count` elements, below 2^29, with whatever contents. Throws std::bad_alloc.
  array_block &take(std::uint32_t count);
  void give_back(array_block &block) noexcept;

  void before_fork() noexcept { mutex_.lock(); }
  void after_fork_in_parent() noexcept { mutex_.unlock(); }
  void after_fork_in_child() noexcept { mutex_.unlock(); }

 private:
  static constexpr std::uint32_t large_class = 32768;  // all blocks from 128 MiB on

  array_block *take_free(std::uint32_t units) noexcept;
  array_block *take_free_large(std::uint32_t units) noexcept;

  brief_mutex mutex_;
  std::array<array_block *, large_class + 1> free_{};  // under mutex_; lists through `next`
};

/// What is to be released by owner. An object is registered at most once at a time.
class cleanup_registry {
 public:
  /// Gives the object back; called under the registry's lock.
  using release_function = void (*)(void *object) noexcept;

  static cleanup_registry &instance() noexcept;

  /// 0, or without a trace LUMRA_REGISTRY_NO_MEMORY, which is not recorded.
  std::int32_t add(std::uint64_t owner, void *object, release_function release) noexcept;
  /// Releases an object that was registered with this function; nothing otherwise.
  void release_object(const void *object, release_function release) noexcept;
  /// Releases all objects of an owner, newest first.
  void release_owner(std::uint64_t owner) noexcept;

  /// Calls visit under the lock if the object is registered with this function; tells whether it is.
  template <class Visit>
  bool visit(const void *object, release_function release, Visit visit) const noexcept {
    const std::lock_guard lock(mutex_);
    const auto found = registrations_.find(object);
    if (found == registrations_.end() || found->second.release != release) return false;
    visit();
    return true;
  }

  void before_fork() noexcept { mutex_.lock(); }
  void after_fork_in_parent() noexcept { mutex_.unlock(); }
  void after_fork_in_child() noexcept { mutex_.unlock(); }

 private:
  struct registration {
    std::uint64_t owner = 0;
    void *object = nullptr;
    release_function release = nullptr;
    registration *older = nullptr, *newer = nullptr;
  };

  void unlink(registration &entry) noexcept;

  mutable brief_mutex mutex_;
  registration *newest_ = nullptr;                                // under mutex_
  std::unordered_map<const void *, registration> registrations_;  // under mutex_, by object
};

}  // namespace qsrfhs
