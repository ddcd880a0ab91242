// The process's own threads, for operations on long records. SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <type_traits>

namespace dsp {

/// Threads that an operation may use: `wanted`, or for 0 as many as there are processors.
[[nodiscard]] std::size_t thread_count(std::size_t wanted) noexcept;

/// A function of a part's number, which outlives it.
class part_of_work {
 public:
  template <class Part>
  requires(!std::is_same_v<Part, part_of_work>) part_of_work(const Part &part)
  noexcept  // NOLINT(google-explicit-constructor): a lambda is given where one is used
      : part_(&part), call_([](const void *called, std::size_t k) { (*static_cast<const Part *>(called))(k); }) {}
  void operator()(std::size_t k) const { call_(part_, k); }

 private:
  const void *part_;
  void (*call_)(const void *, std::size_t);
};

/// Runs part(0) to part(parts - 1), each once, by the caller and by workers that are started at the first need and then
/// wait for the next: one less than there are processors. Returns when all parts are done; throws what the first of
/// those threw that failed. A worker that is late is not waited for: the caller runs whatever no other has begun, and
/// so all parts where the system gives no thread. Workers round as the caller does, and take denormals as it does.
/// Allocates nothing. Any thread, but no part may call it.
void run_parts(std::size_t parts, part_of_work part);

}  // namespace dsp
