// How the library resizes an array: by the service handed over, the process's own, or its own allocator, in that order.
// SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <span>

#include "host/host_array.hpp"

namespace host {

/// Hands over a service; null searches the process again at the next use.
void set_resize_service(lumra_array_resize service) noexcept;

/// Asks for room for `count` elements. A host's service is given `host_size` as its size argument, our own allocator
/// the count. The sizes in the block are the caller's to write. False when refused. A host's service may throw.
bool request_resize(element_type type, std::int32_t dimensions, void *handle_address, std::uint64_t count,
                    std::uint64_t host_size);

/// Makes a vector of `count` elements out of an output, leaving alone one that has that count. True when it has it.
template <class Block>
bool resize_vector(Block ***handle_address, std::int32_t count, std::uint64_t host_size) {
  Block **&handle = *handle_address;
  if (has_block(handle) && (*handle)->count == count) return true;
  const auto elements = static_cast<std::uint64_t>(count);
  if (!request_resize(type_of<element_of<Block>>, 1, handle_address, elements, host_size)) return false;
  if (!has_block(handle)) return false;
  (*handle)->count = count;
  return true;
}

/// Sizes an output that shrinks in place: one with room for `count` elements only gets the count, any other is resized,
/// with the size argument in bytes. Returns what may be written: `count` elements, or where the resize was refused as
/// many of them as there were before.
template <class Block>
std::span<element_of<Block>> size_output(Block ***handle_address, std::size_t count) noexcept {
  const auto wanted = static_cast<std::int32_t>(count);
  Block **&handle = *handle_address;
  if (has_block(handle) && wanted <= (*handle)->count) {
    (*handle)->count = wanted;
  } else {
    try {
      (void)resize_vector(handle_address, wanted, count * sizeof(element_of<Block>));
    } catch (...) {  // a host's service that throws has refused
    }
  }
  const std::span<element_of<Block>> room = elements(handle);
  return room.first(std::min(count, room.size()));
}

}  // namespace host
