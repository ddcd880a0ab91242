// SPDX-License-Identifier: MIT
#include "support/memory_faults.hpp"

#include <atomic>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <new>

namespace tests::memory_faults {
namespace {

std::atomic<bool> armed{false};
std::atomic<int> count{0};
std::atomic<int> failing{0};
std::atomic<long> outstanding{0};

void *allocate(std::size_t size, std::size_t alignment) noexcept {
  if (armed && ++count == failing) return nullptr;
  if (size > SIZE_MAX - alignment) return nullptr;
  void *memory = std::aligned_alloc(alignment, (size + alignment - 1) / alignment * alignment);
  if (memory) ++outstanding;
  return memory;
}

void *allocate_or_throw(std::size_t size, std::size_t alignment) {
  if (void *memory = allocate(size, alignment)) return memory;
  throw std::bad_alloc();
}

void release(void *memory) noexcept {
  if (memory) --outstanding;
  std::free(memory);
}

constexpr std::size_t plain = alignof(std::max_align_t);

}  // namespace

fail_at::fail_at(int n) noexcept {
  count = 0;
  failing = n;
  armed = true;
}

fail_at::~fail_at() {
  armed = false;
}

int calls() noexcept {
  return count;
}

long live() noexcept {
  return outstanding;
}

}  // namespace tests::memory_faults

using namespace tests::memory_faults;

void *operator new(std::size_t n) {
  return allocate_or_throw(n, plain);
}
void *operator new[](std::size_t n) {
  return allocate_or_throw(n, plain);
}
void *operator new(std::size_t n, std::align_val_t a) {
  return allocate_or_throw(n, static_cast<std::size_t>(a));
}
void *operator new[](std::size_t n, std::align_val_t a) {
  return allocate_or_throw(n, static_cast<std::size_t>(a));
}
void *operator new(std::size_t n, const std::nothrow_t &) noexcept {
  return allocate(n, plain);
}
void *operator new[](std::size_t n, const std::nothrow_t &) noexcept {
  return allocate(n, plain);
}
void *operator new(std::size_t n, std::align_val_t a, const std::nothrow_t &) noexcept {
  return allocate(n, static_cast<std::size_t>(a));
}
void *operator new[](std::size_t n, std::align_val_t a, const std::nothrow_t &) noexcept {
  return allocate(n, static_cast<std::size_t>(a));
}
void operator delete(void *p) noexcept {
  release(p);
}
void operator delete[](void *p) noexcept {
  release(p);
}
void operator delete(void *p, std::size_t) noexcept {
  release(p);
}
void operator delete[](void *p, std::size_t) noexcept {
  release(p);
}
void operator delete(void *p, std::align_val_t) noexcept {
  release(p);
}
void operator delete[](void *p, std::align_val_t) noexcept {
  release(p);
}
void operator delete(void *p, std::size_t, std::align_val_t) noexcept {
  release(p);
}
void operator delete[](void *p, std::size_t, std::align_val_t) noexcept {
  release(p);
}
void operator delete(void *p, const std::nothrow_t &) noexcept {
  release(p);
}
void operator delete[](void *p, const std::nothrow_t &) noexcept {
  release(p);
}
void operator delete(void *p, std::align_val_t, const std::nothrow_t &) noexcept {
  release(p);
}
void operator delete[](void *p, std::align_val_t, const std::nothrow_t &) noexcept {
  release(p);
}
