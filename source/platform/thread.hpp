// What the standard library does not know of threads and forks. SPDX-License-Identifier: MIT
#pragma once

namespace platform {

/// Gives the calling thread the highest ordinary priority, as far as the process may.
void raise_thread_priority() noexcept;

/// Calls before() in the forking thread, then after_in_parent() and after_in_child() in the two processes.
void at_fork(void (*before)(), void (*after_in_parent)(), void (*after_in_child)()) noexcept;

}  // namespace platform
