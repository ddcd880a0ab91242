// A process-wide object that is never destroyed: host threads may still call in while the process ends.
// Made in static storage, so that making it cannot run out of memory. SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <new>

namespace platform {

template <class T>
class immortal {
 public:
  immortal() { ::new (static_cast<void *>(storage_)) T; }
  T &get() noexcept { return *std::launder(reinterpret_cast<T *>(storage_)); }

 private:
  alignas(T) std::byte storage_[sizeof(T)];
};

}  // namespace platform
