// SPDX-License-Identifier: MIT
#include "platform/pages.hpp"

#include <sys/mman.h>

#include <new>

namespace platform {

zero_pages::zero_pages(std::size_t bytes)
    : data_(::mmap(nullptr, bytes, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS | MAP_NORESERVE, -1, 0)),
      bytes_(bytes) {
  if (data_ == MAP_FAILED) throw std::bad_alloc();
}

zero_pages::~zero_pages() {
  if (data_) ::munmap(data_, bytes_);
}

}  // namespace platform
