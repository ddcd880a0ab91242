// SPDX-License-Identifier: MIT
#include "platform/process.hpp"

#include <dlfcn.h>

#include <cstdio>
#include <cstdlib>

namespace platform {

void *find_symbol(const char *name) noexcept {
  return dlsym(RTLD_DEFAULT, name);
}

void pin_library(void *address) noexcept {
  Dl_info info{};
  if (dladdr(address, &info) != 0 && info.dli_fname)
    (void)dlopen(info.dli_fname, RTLD_LAZY | RTLD_NOLOAD | RTLD_NODELETE);
}

bool is_readable(const void *begin, std::size_t bytes) noexcept {
  auto next = reinterpret_cast<std::uintptr_t>(begin);
  if (bytes > UINTPTR_MAX - next) return false;
  const std::uintptr_t end = next + bytes;
  std::FILE *maps = std::fopen("/proc/self/maps", "re");
  if (!maps) return false;
  char line[512];
  // Mappings come in rising order; every line that continues the range moves `next` on.
  while (next < end && std::fgets(line, sizeof line, maps)) {
    char *rest = nullptr;
    const std::uintptr_t first = std::strtoull(line, &rest, 16);
    if (*rest != '-') continue;  // the tail of a long line
    const std::uintptr_t last = std::strtoull(rest + 1, &rest, 16);
    if (last <= next) continue;
    if (first > next || rest[0] != ' ' || rest[1] != 'r') break;
    next = last;
  }
  std::fclose(maps);
  return next >= end;
}

const char *environment(const char *name) noexcept {
  return std::getenv(name);
}

void set_environment(const char *name, const char *value) noexcept {
  (void)setenv(name, value, 1);
}

}  // namespace platform
