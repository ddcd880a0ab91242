// SPDX-License-Identifier: MIT
#include "platform/thread.hpp"

#include <linux/membarrier.h>
#include <sys/resource.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <system_error>
#include <utility>

namespace platform {

thread::thread(routine run, void *argument) {
  if (const int error = pthread_create(&id_, nullptr, run, argument))
    throw std::system_error(error, std::system_category());
  joinable_ = true;
}

thread &thread::operator=(thread &&from) noexcept {
  id_ = from.id_;
  joinable_ = std::exchange(from.joinable_, false);
  return *this;
}

void thread::join() noexcept {
  (void)pthread_join(id_, nullptr);
  joinable_ = false;
}

void thread::detach() noexcept {
  (void)pthread_detach(id_);
  joinable_ = false;
}

thread_end::thread_end(void (*begin)() noexcept, void (*end)() noexcept) noexcept
    : begin_{this, begin, &end_}, end_{this, end, nullptr}, has_key_(pthread_key_create(&key_, &take) == 0) {}

/// The system goes over all keys once more where a destructor has set a value: that is behind the others' destructors.
void thread_end::take(void *value) noexcept {
  step &taken = *static_cast<step *>(value);
  taken.call();
  // This cannot fail: the thread's place for the value is there.
  if (taken.following) (void)taken.of->set(*taken.following);
}

bool thread_end::set(step &next) noexcept {
  return has_key_ && pthread_setspecific(key_, &next) == 0;
}

bool has_fence_for_all_threads() noexcept {
  return syscall(SYS_membarrier, MEMBARRIER_CMD_REGISTER_PRIVATE_EXPEDITED, 0, 0) == 0;
}

void fence_all_threads() noexcept {
  (void)has_fence_for_all_threads();  // which the process may have lost in a fork
  (void)syscall(SYS_membarrier, MEMBARRIER_CMD_PRIVATE_EXPEDITED, 0, 0);
}

void raise_thread_priority() noexcept {
  constexpr int highest = -20;
  (void)setpriority(PRIO_PROCESS, static_cast<id_t>(syscall(SYS_gettid)), highest);  // most users may not
}

}  // namespace platform
