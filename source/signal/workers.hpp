// The process's own threads, for operations on long records. SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <functional>

namespace dsp {

/// Threads that an operation may use: `wanted`, or for 0 as many as there are processors.
[[nodiscard]] std::size_t thread_count(std::size_t wanted) noexcept;

/// Runs part(0) to part(parts - 1), each once, by the caller and by workers that are started at the first need and then
/// wait for the next. Returns when all parts are done; throws what the first of those threw that failed. The caller
/// runs them all where the system gives no thread. Any thread, but no part may call it.
void run_parts(std::size_t parts, const std::function<void(std::size_t)> &part);

}  // namespace dsp
