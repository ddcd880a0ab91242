// SPDX-License-Identifier: MIT
#include "host_arrays.hpp"

#include <utility>

namespace fuzz {
namespace {

hosting *current = nullptr;
constexpr std::uint64_t most_bytes = 1 << 24;

/// Unset elements are NaN. Not inlined: the size sanitizer misses the room for the first element of empty blocks.
[[gnu::noinline]] void *new_block(std::size_t bytes) {
  void *const block = std::malloc(bytes);
  std::memset(block, 0xFF, bytes);
  return block;
}

bool is_wide(host::element_type type) noexcept {
  return type == host::element_type::f64 || type == host::element_type::cf64;
}
bool is_complex(host::element_type type) noexcept {
  return type == host::element_type::cf32 || type == host::element_type::cf64;
}

}  // namespace

hosting::hosting(input &in, unit size_unit) : unit_(size_unit) {
  const unsigned b = in.byte();
  how_ = b % 8 < 5 ? behaviour::obliging : static_cast<behaviour>(b % 8 - 4);
  if (how_ == behaviour::refusing || how_ == behaviour::throwing) {
    patience_ = static_cast<int>(in.choice(8));
    once_ = in.flag();
  }
  current = this;
  qsHost_SetArrayResize(is_own_allocator() ? nullptr : &serve);
}

hosting::~hosting() {
  qsHost_SetArrayResize(nullptr);
  current = nullptr;
  for (void **cell : cells_) {
    std::free(*cell);
    std::free(cell);
  }
}

std::int32_t hosting::serve(std::int32_t type, std::int32_t dimensions, void *address, std::uint64_t size) {
  hosting &self = *current;
  const auto element = host::element_type{type};
  hold(host::element_size(element) != 0 && (dimensions == 1 || dimensions == 2) && address, "arguments of the service");
  const std::uint64_t bytes = self.unit_ == unit::bytes ? size : size * host::element_size(element);
  const bool fails = self.how_ != behaviour::obliging && self.patience_-- <= 0 && !(self.once_ && self.failed_);
  if (fails || bytes > most_bytes) {
    self.failed_ = true;
    if (self.how_ == behaviour::throwing) throw bytes;
    return 1;
  }
  auto **&handle = *static_cast<void ***>(address);
  if (!handle) {
    handle = static_cast<void **>(std::calloc(1, sizeof(void *)));
    self.cells_.push_back(handle);
  }
  const std::size_t header = host::header_size(element, dimensions);
  void *const fresh = new_block(header + bytes);
  if (*handle)
    std::memcpy(fresh, *handle, header);
  else
    std::memset(fresh, 0, header);
  std::free(*handle);
  *handle = fresh;
  return 0;
}

std::int32_t array::size(int dimension) const noexcept {
  std::int32_t sizes[2] = {0, 0};
  if (handle && *handle) std::memcpy(sizes, *handle, static_cast<std::size_t>(dimensions) * sizeof *sizes);
  return sizes[dimension];
}

std::size_t array::count() const noexcept {
  const std::int64_t rows = size(0), columns = dimensions == 2 ? size(1) : 1;
  return rows < 0 || columns < 0 ? 0 : static_cast<std::size_t>(rows * columns);
}

std::size_t array::bytes() const noexcept {
  return handle && *handle ? host::header_size(type, dimensions) + count() * host::element_size(type) : 0;
}

std::vector<std::complex<double>> array::now() const {
  std::vector<std::complex<double>> all(count());
  const char *const first = all.empty() ? nullptr : static_cast<char *>(*handle) + host::header_size(type, dimensions);
  const auto part = [&](std::size_t i) {
    float narrow;
    double wide;
    if (!is_wide(type)) return std::memcpy(&narrow, first + i * sizeof narrow, sizeof narrow), double{narrow};
    return std::memcpy(&wide, first + i * sizeof wide, sizeof wide), wide;
  };
  for (std::size_t i = 0; i < all.size(); ++i)
    all[i] = is_complex(type) ? std::complex(part(2 * i), part(2 * i + 1)) : part(i);
  return all;
}

array &call::give(host::element_type type, int dimensions, role as, int rows, int columns) {
  const unsigned b = in_.byte();
  if (b >= 232) {
    plain_ = false;
    for (const auto &known : arrays_) {
      if (b < 250 && known->type == type && known->dimensions == dimensions && in_.flag()) {
        known->shared_work = known->shared_work || as == works || (known->roles & works);
        known->roles |= as;
        return *known;
      }
    }
  }
  array &made = *arrays_.emplace_back(std::make_unique<array>());
  made.type = type;
  made.dimensions = dimensions;
  made.roles = as;
  if (b == 255) made.handle = nullptr;
  if (b >= 254) return made;  // a null block
  std::int32_t sizes[2] = {rows >= 0 ? rows : in_.count(), 1};
  if (dimensions == 2) {
    if (rows < 0) sizes[0] %= 24;
    sizes[1] = columns >= 0 ? columns : in_.count() % 24;
  }
  const bool negative = b == 253;
  const std::size_t n = negative ? 0 : static_cast<std::size_t>(sizes[0]) * static_cast<std::size_t>(sizes[1]);
  if (negative) sizes[dimensions - 1] = std::min(input::extreme(in_.byte()), -1);
  if (host_.is_own_allocator()) {
    const std::int32_t room = static_cast<std::int32_t>(n);
    const std::int32_t room2[] = {room, 1};
    void **owned = nullptr;
    hold(qsHost_ArrayNew(static_cast<int>(type), dimensions, room2, &owned) == 0, "an array of the own allocator");
    made.block = *owned;
    made.handle = owned;
  } else {
    made.block = new_block(host::header_size(type, dimensions) + n * host::element_size(type));
  }
  std::memcpy(made.block, sizes, static_cast<std::size_t>(dimensions) * sizeof *sizes);
  char *const first = static_cast<char *>(made.block) + host::header_size(type, dimensions);
  const std::size_t parts = n * (is_complex(type) ? 2 : 1);
  if (parts != 0) made.tame = is_wide(type) ? fill<double>(in_, first, parts) : fill<float>(in_, first, parts);
  made.values = made.now();
  const auto *const raw = static_cast<unsigned char *>(made.block);
  if (as == reads) made.before.assign(raw, raw + made.bytes());
  return made;
}

void call::check_inputs(int line) const {
  for (const auto &a : arrays_) {
    if (a->roles != reads || a->before.empty()) continue;
    hold(std::memcmp(*a->handle, a->before.data(), a->before.size()) == 0, "an input was changed", line);
  }
}

bool call::check(std::int32_t code, std::initializer_list<std::int32_t> codes, int line) const {
  check_code(code, codes, line);
  for (const auto &a : arrays_) {
    if (!a->handle || !*a->handle) continue;
    hold(code != 0 || !a->shared_work || idle_, "workspace that is another array, too", line);
    const bool empties = (a->roles & works) || (code != 0 && (a->roles & writes));
    hold(!empties || (a->size(0) == 0 && (a->dimensions == 1 || a->size(1) == 0)), "an array is not empty", line);
  }
  check_inputs(line);
  return code == 0;
}

call::~call() {
  for (const auto &a : arrays_) {
    if (!a->handle) continue;
    if (host_.is_own_allocator())
      qsHost_ArrayFree(&a->handle);
    else
      std::free(std::exchange(*a->handle, nullptr));
  }
}

}  // namespace fuzz
