// SPDX-License-Identifier: MIT
#include "qsrfhs/util/array_store.hpp"

#include <lumra/status.h>

#include <algorithm>
#include <cstring>
#include <limits>
#include <new>
#include <optional>
#include <span>

#include "host/host_array.hpp"
#include "host/resize_service.hpp"
#include "platform/fork.hpp"
#include "platform/immortal.hpp"
#include "qsrfhs/util/management.hpp"

namespace qsrfhs {
namespace {

constexpr std::uint32_t unit = 4096;
constexpr std::int32_t end_of_counts = 1 << 29;  // the bytes no longer fit 32 bits

static_assert(sizeof(lumra_array_ref) == 12 && sizeof(lumra_array_block) == 64);

void set_count(array_block &block, std::uint32_t count) noexcept {
  block.count = count;
  block.bytes = count * static_cast<std::uint32_t>(sizeof(lumra_cf32));
  block.count_field->count = static_cast<std::int32_t>(count);
}

array_block &make_block(std::uint32_t units) {
  // The description lies at the start of the memory, well before the elements: they begin at least 257 bytes in.
  constexpr std::size_t lead = 512, boundary = 256;
  void *const raw = ::operator new (std::size_t{units} * unit + lead + boundary);
  auto *const block = ::new (raw) array_block{};
  char *const beyond = static_cast<char *>(raw) + lead;
  char *const data = beyond - reinterpret_cast<std::uintptr_t>(beyond) % boundary;
  block->units = units;
  block->raw = raw;
  block->count_field = reinterpret_cast<lumra_cf32_block *>(data - host::header_size(host::element_type::cf32, 1));
  block->data = block->count_field->elements;
  block->handle = &block->count_field;
  return *block;
}

void give_back_array(void *block) noexcept {
  recycler::instance().give_back(*static_cast<array_block *>(block));
}

bool is_valid(lumra_array_ref *const *array) noexcept {
  return array && *array && (*array)->kind == 1;
}

/// What a reference's block holds; none for a null block and for one that is not in use.
std::optional<std::span<const lumra_cf32>> stored(const array_block *block) noexcept {
  std::optional<std::span<const lumra_cf32>> elements;
  if (block) {
    cleanup_registry::instance().visit(block, &give_back_array,
                                       [&] { elements = std::span<const lumra_cf32>(block->data, block->count); });
  }
  return elements;
}

/// Elements `offset` and following of the array; zeros where it has none. The two may overlap.
void copy_with_zeros(std::span<const lumra_cf32> array, std::int64_t offset, std::span<lumra_cf32> out) noexcept {
  const auto size = static_cast<std::int64_t>(out.size()), stored = static_cast<std::int64_t>(array.size());
  const std::int64_t first = std::clamp<std::int64_t>(-offset, 0, size);
  const std::int64_t last = std::clamp<std::int64_t>(stored - offset, first, size);
  constexpr lumra_cf32 zero{0, 0};
  if (last > first)
    std::memmove(out.data() + first, array.data() + (offset + first),
                 static_cast<std::size_t>(last - first) * sizeof zero);
  std::fill(out.begin(), out.begin() + first, zero);
  std::fill(out.begin() + last, out.end(), zero);
}

const platform::fork_participant<cleanup_registry> registry_takes_part(platform::fork_rank::registered_arrays);
const platform::fork_participant<recycler> blocks_take_part(platform::fork_rank::recycled_arrays);

}  // namespace

recycler &recycler::instance() noexcept {
  static platform::immortal<recycler> blocks;
  return blocks.get();
}

array_block &recycler::take(std::uint32_t count) {
  const std::uint32_t units = units_for(count * static_cast<std::uint32_t>(sizeof(lumra_cf32)));
  const std::uint32_t size_class = std::min(units, large_class);
  array_block *block = nullptr;
  {
    const std::lock_guard lock(mutex_);
    block = size_class == large_class ? take_free_large(units) : take_free(units);
  }
  if (!block) {
    block = &make_block(units);
    block->size_class = size_class;
  }
  set_count(*block, count);
  return *block;
}

void recycler::give_back(array_block &block) noexcept {
  const std::lock_guard lock(mutex_);
  array_block *&head = free_[block.size_class];
  block.next = head;
  head = &block;
}

array_block *recycler::take_free(std::uint32_t units) noexcept {
  array_block *&head = free_[units];
  array_block *const taken = head;
  if (taken) head = taken->next;
  return taken;
}

/// Best fit behind the head, where it beats the head and wastes at most half; else the head, where it wastes at most a
/// tenth. A best fit that wastes more rules out the head, too.
array_block *recycler::take_free_large(std::uint32_t units) noexcept {
  array_block *&head = free_[large_class];
  if (!head) return nullptr;
  std::uint64_t fewest = head->units >= units ? head->units : std::numeric_limits<std::uint64_t>::max();
  array_block **best = nullptr;
  for (array_block **link = &head->next; *link; link = &(*link)->next) {
    if ((*link)->units < units || (*link)->units >= fewest) continue;
    fewest = (*link)->units;
    best = link;
  }
  const std::uint32_t most = best ? (*best)->units / 2 : head->units * 9 / 10;
  if (most > units || (!best && head->units < units)) return nullptr;
  array_block *&link = best ? *best : head;
  array_block *const taken = link;
  link = taken->next;
  return taken;
}

cleanup_registry &cleanup_registry::instance() noexcept {
  static platform::immortal<cleanup_registry> registry;
  return registry.get();
}

std::int32_t cleanup_registry::add(std::uint64_t owner, void *object, release_function release) noexcept try {
  const std::lock_guard lock(mutex_);
  registration &added = registrations_[object];
  added = {owner, object, release, newest_, nullptr};
  if (newest_) newest_->newer = &added;
  newest_ = &added;
  return 0;
} catch (...) {
  return LUMRA_REGISTRY_NO_MEMORY;
}

void cleanup_registry::unlink(registration &entry) noexcept {
  (entry.newer ? entry.newer->older : newest_) = entry.older;
  if (entry.older) entry.older->newer = entry.newer;
}

void cleanup_registry::release_object(const void *object, release_function release) noexcept {
  const std::lock_guard lock(mutex_);
  const auto found = registrations_.find(object);
  if (found == registrations_.end() || found->second.release != release) return;
  release(found->second.object);
  unlink(found->second);
  registrations_.erase(found);
}

void cleanup_registry::release_owner(std::uint64_t owner) noexcept {
  const std::lock_guard lock(mutex_);
  for (registration *entry = newest_; entry;) {
    registration &seen = *entry;
    entry = seen.older;
    if (seen.owner != owner) continue;
    seen.release(seen.object);
    unlink(seen);
    registrations_.erase(seen.object);
  }
}

}  // namespace qsrfhs

using namespace qsrfhs;

int32_t qsUtilHS_AllocateArray_CSG(lumra_array_ref **array, int32_t count, uint64_t owner) {
  if (!is_valid(array)) return Management::addError(LUMRA_ARRAY_ALLOCATE_REFERENCE);
  if (count < 0) return Management::addError(LUMRA_ARRAY_NEGATIVE_COUNT);
  if (count == 0) {
    (*array)->block = nullptr;
    return 0;
  }
  if (count >= end_of_counts) return Management::addError(LUMRA_ARRAY_NO_BLOCK);
  array_block *block = nullptr;
  try {
    block = &recycler::instance().take(static_cast<std::uint32_t>(count));
  } catch (const std::bad_alloc &) {
    return Management::addError(LUMRA_ARRAY_NO_BLOCK);
  }
  if (const std::int32_t status = cleanup_registry::instance().add(owner, block, &give_back_array)) {
    recycler::instance().give_back(*block);
    return status;
  }
  (*array)->block = block;
  return 0;
}

int32_t qsUtilHS_FreeArray_CSG(lumra_array_ref **array) {
  if (!is_valid(array)) return Management::addError(LUMRA_ARRAY_FREE_REFERENCE);
  const array_block *const block = (*array)->block;
  (*array)->block = nullptr;
  if (block) cleanup_registry::instance().release_object(block, &give_back_array);
  return 0;
}

int32_t qsUtilHS_FreeArrayIDH_CSG(uint64_t owner) {
  cleanup_registry::instance().release_owner(owner);
  return 0;
}

int32_t qsUtilHS_ArrayLength_CSG(lumra_array_ref **array, uint32_t *length) {
  if (!is_valid(array) || !length) return Management::addError(LUMRA_ARRAY_LENGTH_REFERENCE);
  const auto elements = stored((*array)->block);
  if (!elements) return Management::addError(LUMRA_ARRAY_LENGTH_NONE);
  *length = static_cast<std::uint32_t>(elements->size());
  return 0;
}

int32_t qsUtilHS_ReadArray_CSG(lumra_array_ref **array, lumra_cf32_array *destination, int32_t offset, int32_t count) {
  if (!is_valid(array) || !destination) return Management::addError(LUMRA_ARRAY_READ_REFERENCE);
  if (count < 0) return Management::addError(LUMRA_ARRAY_NEGATIVE_COUNT);
  const auto out = host::size_output(destination, static_cast<std::size_t>(count));
  if (!host::has_block(*destination) || (**destination)->count != count)
    return Management::addError(LUMRA_ARRAY_READ_RESIZE);
  copy_with_zeros(stored((*array)->block).value_or(std::span<const lumra_cf32>{}), offset, out);
  return 0;
}
