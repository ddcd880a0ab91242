// SPDX-License-Identifier: MIT
#include "qsrfhs/math/mkl_section.hpp"

#include <mkl_cblas.h>
#include <mkl_lapack.h>
#include <mkl_service.h>
#include <mkl_vml.h>

#include <atomic>
#include <chrono>
#include <mutex>
#include <thread>

#include "platform/fork.hpp"
#include "platform/thread.hpp"
#include "qsrfhs/math/mkl_memory.hpp"

namespace qsrfhs {

constinit std::atomic<bool> mkl_gate_closed{false};  // changed under gate_mutex

constinit thread_local mkl_thread mkl_thread::own;
constinit std::atomic<int> mkl_section::uses_of_others{0};
const bool mkl_section::forks_fence = platform::has_fence_for_all_threads();

namespace {

// Each thread says for itself whether it is inside, so that threads do not meet here; a fork looks at all of them.
constinit std::mutex gate_mutex;         // held by a fork from beginning to end
constinit mkl_thread *newest = nullptr;  // under gate_mutex; all threads that may be inside

void before_fork() noexcept {
  constexpr std::chrono::microseconds pause{20};
  gate_mutex.lock();
  mkl_gate_closed = true;
  platform::fence_all_threads();
  // Where others' code runs at the end of a thread, that thread may fork inside of its own section.
  for (const mkl_thread *each = newest; each; each = each->older)
    while (each != &mkl_thread::own && each->inside.load()) std::this_thread::sleep_for(pause);
}

void after_fork_in_parent() noexcept {
  mkl_gate_closed = false;
  gate_mutex.unlock();
}

void after_fork_in_child() noexcept {
  mkl_thread &self = mkl_thread::own;
  newest = self.at == mkl_thread::stage::known ? &self : nullptr;
  self.older = self.newer = nullptr;
  after_fork_in_parent();
}

constexpr platform::fork_handlers fork_handlers{&before_fork, &after_fork_in_parent, &after_fork_in_child};
const platform::fork_participation takes_part(platform::fork_rank::mkl, fork_handlers);

void add(mkl_thread &self) noexcept {
  const std::lock_guard lock(gate_mutex);
  self.older = newest;
  if (newest) newest->newer = &self;
  newest = &self;
}

void remove(mkl_thread &self) noexcept {
  const std::lock_guard lock(gate_mutex);
  (self.newer ? self.newer->older : newest) = self.older;
  if (self.older) self.older->newer = self.newer;
}

/// A thread's buffers are given back when it ends; MKL closes the thread's account with its memory then, in a destructor
/// of its own. Where the system keeps no note of that, they stay until the process ends.
platform::thread_end &end_of_thread() noexcept {
  static platform::thread_end end(
      []() noexcept {
        mkl_section::enter();
        mkl_thread_free_buffers();
      },
      []() noexcept {
        mkl_section::leave();
        remove(mkl_thread::own);
        mkl_thread::own.at = mkl_thread::stage::ended;
      });
  return end;
}

/// What MKL does once for the process, at the first call of a kind: it looks at the processor and the environment and
/// chooses its error handler.
bool set_up_process() noexcept {
  constexpr MKL_INT none = 0, one = 1;
  const float in = 1;
  float out = 1, unused = 0;
  MKL_INT info = 0;
  cblas_saxpy(one, 1.0F, &in, one, &out, one);
  vmsSub(one, &in, &in, &out, VML_HA);
  sgeqrf(&none, &none, &out, &one, &unused, &out, &one, &info);
  return true;
}

// No other thread is to be in the making of it when a fork comes.
[[maybe_unused]] const platform::thread_end &made_at_load = end_of_thread();

}  // namespace

[[gnu::noinline]] void mkl_section::set_up() noexcept {
  mkl_thread &self = mkl_thread::own;
  // Asked before MKL makes its own destructor. Without it the thread could not be taken from the list again.
  if (!end_of_thread().ask()) {
    self.at = mkl_thread::stage::ended;
    return;
  }
  add(self);
  self.at = mkl_thread::stage::known;
  const mkl_section section;
  const mkl_memory::watch not_of_the_caller;  // what is refused here, the computation asks for again
  [[maybe_unused]] static const bool process_is_set_up = set_up_process();
  mkl_free(mkl_malloc(1, 64));  // opens the thread's account
}

[[gnu::noinline]] void mkl_section::wait_for_fork() noexcept {
  do {
    mkl_thread::own.inside.store(false);
    { const std::lock_guard wait(gate_mutex); }
    mkl_thread::own.inside.store(true);
  } while (mkl_gate_closed.load());
}

void mkl_section::pass() noexcept {
  if (const mkl_thread &self = mkl_thread::own; self.depth == 1 && self.at == mkl_thread::stage::known) wait_for_fork();
}

bool mkl_section::in_use() noexcept {
  const std::lock_guard lock(gate_mutex);
  bool any = uses_of_others != 0;
  for (const mkl_thread *each = newest; each; each = each->older) any = any || each->uses != 0;
  return any;
}

}  // namespace qsrfhs
