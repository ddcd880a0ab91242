// SPDX-License-Identifier: MIT
#include "host/array_allocator.hpp"

#include <lumra/status.h>

#include <cstring>
#include <limits>

#include "platform/fork.hpp"
#include "platform/immortal.hpp"

namespace host {
namespace {

constexpr std::uint64_t max_count = std::numeric_limits<std::int32_t>::max();

bool is_valid(element_type type, std::int32_t dimensions) noexcept {
  return element_size(type) != 0 && (dimensions == 1 || dimensions == 2);
}

const platform::fork_participant<array_allocator> takes_part(platform::fork_rank::host_arrays);

}  // namespace

array_allocator &array_allocator::instance() noexcept {
  static platform::immortal<array_allocator> allocator;
  return allocator.get();
}

/// 0 for a block of another maker.
std::size_t array_allocator::capacity_of(void *block) const {
  const std::lock_guard lock(mutex_);
  const auto found = blocks_.find(block);
  return found == blocks_.end() ? 0 : found->second.capacity;
}

std::int32_t array_allocator::create(element_type type, std::int32_t dimensions, const std::int32_t *sizes,
                                     void ***handle) noexcept {
  if (!handle) return LUMRA_TOOLKIT_NO_MEMORY;
  *handle = nullptr;
  if (!is_valid(type, dimensions) || !sizes) return LUMRA_TOOLKIT_BAD_OPTION;
  std::uint64_t count = 1;
  for (std::int32_t d = 0; d < dimensions; ++d) {
    if (sizes[d] < 0) return LUMRA_TOOLKIT_NEGATIVE_SIZE;
    count *= static_cast<std::uint64_t>(sizes[d]);
  }
  const std::int32_t status = resize(type, dimensions, handle, count);
  if (status == LUMRA_SUCCESS) std::memcpy(**handle, sizes, static_cast<std::size_t>(dimensions) * sizeof *sizes);
  return status;
}

std::int32_t array_allocator::resize(element_type type, std::int32_t dimensions, void ***handle,
                                     std::uint64_t count) noexcept try {
  if (!handle) return LUMRA_TOOLKIT_NO_MEMORY;
  if (!is_valid(type, dimensions)) return LUMRA_TOOLKIT_BAD_OPTION;
  if (count > max_count) return LUMRA_TOOLKIT_NO_MEMORY;
  if (count == 0 && *handle && **handle) return LUMRA_SUCCESS;  // every block has that room; scratch is emptied so
  const std::size_t header = header_size(type, dimensions);
  const std::size_t bytes = static_cast<std::size_t>(count) * element_size(type);

  void *const old = *handle ? **handle : nullptr;
  const std::size_t old_capacity = old ? capacity_of(old) : 0;
  if (old && old_capacity == 0) return LUMRA_TOOLKIT_NO_MEMORY;
  if (old && old_capacity >= header + bytes) return LUMRA_SUCCESS;

  // Element 0 lies on an alignment boundary, the sizes in front of it.
  const auto lead = static_cast<std::size_t>(alignment);
  allocation fresh;
  fresh.memory.reset(::operator new(lead + bytes, alignment));
  fresh.capacity = header + bytes;
  if (!*handle) fresh.cell = std::make_unique<void *>(nullptr);
  char *const start = static_cast<char *>(fresh.memory.get());
  void *const block = start + lead - header;
  std::memset(start, 0, lead + bytes);
  if (old) std::memcpy(block, old, old_capacity);

  void **cell = fresh.cell ? fresh.cell.get() : *handle;
  allocation replaced;  // freed outside the lock
  {
    const std::lock_guard lock(mutex_);
    allocation &added = blocks_.emplace(block, std::move(fresh)).first->second;
    if (const auto found = blocks_.find(old); found != blocks_.end()) {
      added.cell = std::move(found->second.cell);
      replaced = std::move(found->second);
      blocks_.erase(found);
    }
  }
  *handle = cell;
  *cell = block;
  return LUMRA_SUCCESS;
} catch (...) {
  return LUMRA_TOOLKIT_NO_MEMORY;
}

void array_allocator::destroy(void ***handle) noexcept {
  if (!handle || !*handle) return;
  void **const cell = *handle;
  *handle = nullptr;
  allocation freed;
  {
    const std::lock_guard lock(mutex_);
    const auto found = blocks_.find(*cell);
    if (found == blocks_.end()) return;
    freed = std::move(found->second);
    blocks_.erase(found);
  }
  *cell = nullptr;
}

}  // namespace host
