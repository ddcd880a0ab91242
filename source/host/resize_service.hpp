// How the library resizes an array: by the service handed over, the process's own, or its own allocator, in that order.
// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>

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

}  // namespace host
