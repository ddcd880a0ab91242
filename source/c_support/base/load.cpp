// What happens when the library is loaded and when the process ends. SPDX-License-Identifier: MIT
#include <strings.h>
#include <cstring>
#include <mutex>

#include "platform/process.hpp"

namespace {

// Lets the OpenMP runtime that MKL may bring live beside another copy of itself.
constexpr const char *duplicate_runtime = "KMP_DUPLICATE_LIB_OK";

// The value found at load, put back at the end; empty where there was none, or none that is worth it.
char earlier_value[8] = "";

[[gnu::constructor]] void attach() {
  platform::pin_library(reinterpret_cast<void *>(&attach));
#ifdef __GLIBCXX__
  // A library that is loaded late gets its thread-local data at a thread's first use, and the process ends where there
  // is no memory for them: in the C++ runtime when the first exception is thrown, as for lack of memory. All threads
  // have those of a library at once when another library refers to one of them by the initial-exec model, as we do
  // here.
  asm volatile("" ::"r"(&std::__once_callable));
#endif
  const char *value = platform::environment(duplicate_runtime);
  if (!value || strcasecmp(value, "TRUE") != 0) {
    // A longer value is replaced for good.
    if (value && std::strlen(value) < sizeof earlier_value) std::memcpy(earlier_value, value, std::strlen(value) + 1);
    platform::set_environment(duplicate_runtime, "TRUE");
  }
}

[[gnu::destructor]] void detach() {
  if (earlier_value[0] != '\0') platform::set_environment(duplicate_runtime, earlier_value);
}

}  // namespace
