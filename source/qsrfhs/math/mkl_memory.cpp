// SPDX-License-Identifier: MIT
#include "qsrfhs/math/mkl_memory.hpp"

#include <mkl_service.h>

#ifndef LUMRA_MKL_RT
#include <i_malloc.h>
#endif

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <new>

namespace qsrfhs::mkl_memory {

constinit thread_local std::uint64_t refusals = 0;

namespace {

[[gnu::tls_model("initial-exec")]] constinit thread_local descriptor_watch *making = nullptr;

void unlink(block &linked) noexcept {
  if (!linked.next) return;
  linked.previous->next = linked.next;
  linked.next->previous = linked.previous;
  linked.previous = linked.next = nullptr;
}

void link(block &made, block &ring) noexcept {
  made.next = &ring;
  made.previous = ring.previous;
  made.previous->next = ring.previous = &made;
}

}  // namespace

/// What MKL calls instead of malloc and its kin.
struct hooks {
  static void *allocate(std::size_t size) noexcept {
    descriptor_watch *const scope = making;
    const bool vital = size <= descriptor_watch::vital_size;
    bool reserved = false;
    void *memory = nullptr;
    if (size <= SIZE_MAX - sizeof(block) && (!scope || !scope->refused() || vital))
      memory = std::malloc(sizeof(block) + size);
    if (!memory) {
      ++refusals;
      reserved = scope && vital && scope->reserve_used_ < descriptor_watch::reserve_count;
      if (!reserved) return nullptr;
      memory = scope->reserve_[scope->reserve_used_++].memory;
    }
    auto *const made = ::new (memory) block{nullptr, nullptr, size, reserved};
    if (scope) link(*made, scope->made_);
    return made + 1;
  }

  static void *allocate_zeroed(std::size_t count, std::size_t size) noexcept {
    std::size_t bytes = 0;
    void *const memory = allocate(__builtin_mul_overflow(count, size, &bytes) ? SIZE_MAX : bytes);
    return memory ? std::memset(memory, 0, bytes) : nullptr;
  }

  static void *reallocate(void *memory, std::size_t size) noexcept {
    void *const moved = allocate(size);
    if (!moved || !memory) return moved;
    std::memcpy(moved, memory, std::min(size, (static_cast<block *>(memory) - 1)->size));
    free(memory);
    return moved;
  }

  static void free(void *memory) noexcept {
    if (!memory) return;
    block *const unused = static_cast<block *>(memory) - 1;
    unlink(*unused);
    if (!unused->reserved) std::free(unused);
  }
};

void attach() noexcept {
#ifndef LUMRA_MKL_RT
  i_malloc = &hooks::allocate;
  i_calloc = &hooks::allocate_zeroed;
  i_realloc = &hooks::reallocate;
  i_free = &hooks::free;
#endif
}

descriptor_watch::descriptor_watch() noexcept {
  // MKL's own record of the thread outlives the descriptor: where there was no memory for it before, it is made before
  // the descriptor's blocks are told apart.
  mkl_free(mkl_malloc(1, alignof(block)));
  making = this;
}

descriptor_watch::~descriptor_watch() {
  making = nullptr;
  if (refused()) mkl_thread_free_buffers();  // the thread's, not lost
  for (block *made = made_.next; made != &made_;) {
    block &each = *made;
    made = each.next;
    each.next = each.previous = nullptr;
    if (refused()) hooks::free(&each + 1);
  }
}

}  // namespace qsrfhs::mkl_memory
