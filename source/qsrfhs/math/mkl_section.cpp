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

namespace {

struct thread_state {
  enum class stage { fresh, known, ended };

  std::atomic<bool> inside{false};
  std::atomic<int> uses{0};  // only this thread writes it: all threads counting in one place would cost too much
  stage at = stage::fresh;
  int depth = 0;
  thread_state *older = nullptr, *newer = nullptr;  // under gate_mutex
};
constinit thread_local thread_state own;

/// Not inlined: compilers ask for the address of thread-local data at each use, which takes longer than all the rest.
[[gnu::noinline]] thread_state &own_state() noexcept {
  return own;
}

std::atomic<int> uses_of_others{0};  // by threads that are in no list

// Each thread says for itself whether it is inside, so that threads do not meet here; a fork looks at all of them.
constinit std::mutex gate_mutex;           // held by a fork from beginning to end
constinit thread_state *newest = nullptr;  // under gate_mutex; all threads that may be inside

// Whether a fork lets the threads pass the barrier between saying that they are inside and looking at the gate.
const bool fork_fences = platform::has_fence_for_all_threads();

void before_fork() noexcept {
  constexpr std::chrono::microseconds pause{20};
  gate_mutex.lock();
  mkl_gate_closed = true;
  if (fork_fences) platform::fence_all_threads();
  // Where others' code runs at the end of a thread, that thread may fork inside of its own section.
  for (const thread_state *each = newest; each; each = each->older)
    while (each != &own && each->inside.load()) std::this_thread::sleep_for(pause);
}

void after_fork_in_parent() noexcept {
  mkl_gate_closed = false;
  gate_mutex.unlock();
}

void after_fork_in_child() noexcept {
  thread_state &self = own_state();
  newest = self.at == thread_state::stage::known ? &self : nullptr;
  self.older = self.newer = nullptr;
  after_fork_in_parent();
}

constexpr platform::fork_handlers fork_handlers{&before_fork, &after_fork_in_parent, &after_fork_in_child};
const platform::fork_participation takes_part(platform::fork_rank::mkl, fork_handlers);

void add(thread_state &self) noexcept {
  const std::lock_guard lock(gate_mutex);
  self.older = newest;
  if (newest) newest->newer = &self;
  newest = &self;
}

void remove(thread_state &self) noexcept {
  const std::lock_guard lock(gate_mutex);
  (self.newer ? self.newer->older : newest) = self.older;
  if (self.older) self.older->newer = self.newer;
}

void set_up(thread_state &self) noexcept;

void count_use(thread_state &self, int change) noexcept {
  if (self.at == thread_state::stage::known)
    self.uses.store(self.uses.load(std::memory_order_relaxed) + change, std::memory_order_relaxed);
  else
    uses_of_others.fetch_add(change, std::memory_order_relaxed);
}

[[gnu::noinline]] void wait_for_fork(thread_state &self) noexcept {
  do {
    self.inside.store(false);
    { const std::lock_guard wait(gate_mutex); }
    self.inside.store(true);
  } while (mkl_gate_closed.load());
}

thread_state &enter() noexcept {
  thread_state &self = own_state();
  if (self.at == thread_state::stage::fresh) set_up(self);
  if (self.depth++ > 0 || self.at != thread_state::stage::known) return self;
  if (fork_fences) {
    self.inside.store(true, std::memory_order_relaxed);
    std::atomic_signal_fence(std::memory_order_seq_cst);
  } else {
    self.inside.store(true);
  }
  if (mkl_gate_closed.load()) wait_for_fork(self);
  return self;
}

void leave(thread_state &self) noexcept {
  if (--self.depth == 0) self.inside.store(false, std::memory_order_release);
}

/// A thread's buffers are given back when it ends; MKL closes the thread's account with its memory then, in a destructor
/// of its own. Where the system keeps no note of that, they stay until the process ends.
platform::thread_end &end_of_thread() noexcept {
  static platform::thread_end end(
      []() noexcept {
        (void)enter();
        mkl_thread_free_buffers();
      },
      []() noexcept {
        thread_state &self = own_state();
        leave(self);
        remove(self);
        self.at = thread_state::stage::ended;
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

void set_up(thread_state &self) noexcept {
  // Asked before MKL makes its own destructor. Without it the thread could not be taken from the list again.
  if (!end_of_thread().ask()) {
    self.at = thread_state::stage::ended;
    return;
  }
  add(self);
  self.at = thread_state::stage::known;
  const mkl_section section;
  const mkl_memory::watch not_of_the_caller;  // what is refused here, the computation asks for again
  [[maybe_unused]] static const bool process_is_set_up = set_up_process();
  mkl_free(mkl_malloc(1, 64));  // opens the thread's account
}

// No other thread is to be in the making of it when a fork comes.
[[maybe_unused]] const platform::thread_end &made_at_load = end_of_thread();

}  // namespace

mkl_section::mkl_section() noexcept : thread_(&enter()) {}

mkl_section::~mkl_section() {
  leave(*static_cast<thread_state *>(thread_));
}

void mkl_section::pass() noexcept {
  if (thread_state &self = *static_cast<thread_state *>(thread_);
      self.depth == 1 && self.at == thread_state::stage::known)
    wait_for_fork(self);
}

void mkl_section::begin_use() noexcept {
  thread_state &self = own_state();
  if (self.at == thread_state::stage::fresh) set_up(self);
  count_use(self, 1);
}

void mkl_section::end_use() noexcept {
  count_use(own_state(), -1);
}

bool mkl_section::in_use() noexcept {
  const std::lock_guard lock(gate_mutex);
  bool any = uses_of_others != 0;
  for (const thread_state *each = newest; each; each = each->older) any = any || each->uses != 0;
  return any;
}

}  // namespace qsrfhs
