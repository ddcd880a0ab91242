// Forks of a process with other threads inside the library. In the child only the forking thread exists: whatever lock
// another one held would stay locked there, and what it guarded half changed. So the forking thread first takes all
// locks of the library, and gives them back in both processes. SPDX-License-Identifier: MIT
#pragma once

#include <condition_variable>
#include <cstddef>
#include <new>

namespace platform {

/// Who takes part, in the order in which their locks are taken, here and wherever else one is taken inside another.
enum class fork_rank : std::size_t {
  sessions,
  fifos,
  filters,
  registered_arrays,
  recycled_arrays,
  resampler_descriptors,
  host_arrays,
  resize_service,
  lookup_batches,
  object_handles,
  idle_transforms,
  shared_workers,
  error_list,
  mkl,
  count
};

struct fork_handlers {
  void (*before)() noexcept;
  void (*after_in_parent)() noexcept;
  void (*after_in_child)() noexcept;
};

/// To be defined with static storage: from the library's loading on, the handlers are called. One set a rank.
class fork_participation {
 public:
  fork_participation(fork_rank rank, const fork_handlers &handlers) noexcept;
};

/// To be defined beside the process's only object of a class, T::instance(): makes the object while the library is
/// loaded, so that no fork finds another thread making it, and lets it take part with its functions before_fork(),
/// after_fork_in_parent() and after_fork_in_child().
template <class T>
class fork_participant : fork_participation {
 public:
  explicit fork_participant(fork_rank rank) noexcept : fork_participation(rank, ((void)T::instance(), handlers)) {}

 private:
  static constexpr fork_handlers handlers{[]() noexcept { T::instance().before_fork(); },
                                          []() noexcept { T::instance().after_fork_in_parent(); },
                                          []() noexcept { T::instance().after_fork_in_child(); }};
};

/// For the child: threads of the parent may have waited on the condition variable, which would count on them for ever.
inline void make_anew(std::condition_variable &forgotten) noexcept {
  ::new (static_cast<void *>(&forgotten)) std::condition_variable;
}

}  // namespace platform
