// SPDX-License-Identifier: MIT
#include "platform/thread.hpp"

#include <pthread.h>
#include <sys/resource.h>
#include <sys/syscall.h>
#include <unistd.h>

namespace platform {

void raise_thread_priority() noexcept {
  constexpr int highest = -20;
  (void)setpriority(PRIO_PROCESS, static_cast<id_t>(syscall(SYS_gettid)), highest);  // most users may not
}

void at_fork(void (*before)(), void (*after_in_parent)(), void (*after_in_child)()) noexcept {
  (void)pthread_atfork(before, after_in_parent, after_in_child);
}

}  // namespace platform
