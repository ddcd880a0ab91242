// SPDX-License-Identifier: MIT
#include "qsrfhs/math/mkl_runtime.hpp"

#include <mkl_cblas.h>
#include <mkl_lapack.h>
#include <mkl_service.h>
#include <mkl_vml.h>

#include <algorithm>
#include <array>
#include <atomic>
#include <mutex>

#include "platform/thread.hpp"
#include "qsrfhs/math/mkl_memory.hpp"
#include "qsrfhs/math/mkl_section.hpp"

namespace qsrfhs::mkl_runtime {
namespace {

/// Computations that are under way in one thread, which alone writes the number: an atomic addition by every thread
/// to one number would cost as much as a short transform.
struct alignas(64) counter {
  std::atomic<bool> taken{false};
  std::atomic<int> uses{0};
};

constinit std::array<counter, 256> counters;
constinit counter shared;  // by all threads that found no other

constinit thread_local counter *own = nullptr;
constinit thread_local bool is_set_up = false;

counter &take_counter() noexcept {
  for (counter &c : counters)
    if (!c.taken.load(std::memory_order_relaxed) && !c.taken.exchange(true, std::memory_order_acquire)) return c;
  return shared;
}

/// A thread's buffers are given back when it ends; MKL closes the thread's account with its memory then, in a
/// destructor of its own. Without memory to ask for that, they stay until the process ends.
platform::thread_end &end_of_thread() noexcept {
  static platform::thread_end end(
      []() noexcept {
        mkl_section::enter();
        mkl_thread_free_buffers();
      },
      []() noexcept {
        own->taken.store(false, std::memory_order_release);
        own = nullptr;
        is_set_up = false;
        mkl_section::leave();
      });
  return end;
}

/// What MKL does once for the process, at the first call of a kind: it looks at the processor and the environment and
/// chooses its error handler.
void set_up_process() noexcept {
  constexpr MKL_INT none = 0, one = 1;
  const float in = 1;
  float out = 1, unused = 0;
  MKL_INT info = 0;
  cblas_saxpy(one, 1.0F, &in, one, &out, one);
  vmsSub(one, &in, &in, &out, VML_HA);
  sgeqrf(&none, &none, &out, &one, &unused, &out, &one, &info);
}

/// Before a thread first computes, inside of a section, since MKL takes locks for it.
[[gnu::noinline]] void set_up_thread() noexcept {
  static std::once_flag process_is_set_up;
  if (!own) own = &take_counter();
  const mkl_section section;
  is_set_up = end_of_thread().ask();  // its key is older than MKL's
  std::call_once(process_is_set_up, &set_up_process);
  mkl_free(mkl_malloc(1, 64));  // opens the thread's account with MKL's memory
}

void add(int change) noexcept {
  std::atomic<int> &uses = own->uses;
  if (own == &shared)
    uses.fetch_add(change, std::memory_order_relaxed);
  else
    uses.store(uses.load(std::memory_order_relaxed) + change, std::memory_order_relaxed);
}

bool idle(const counter &c) noexcept {
  return c.uses.load() == 0;
}

[[gnu::constructor]] void attach() noexcept {
#ifdef LUMRA_MKL_RT
  mkl_set_interface_layer(MKL_INTERFACE_LP64);
  mkl_set_threading_layer(LUMRA_MKL_RT_LAYER);
#endif
  mkl_memory::attach();
}

/// Unless other threads still compute.
[[gnu::destructor]] void detach() noexcept {
  if (std::all_of(counters.begin(), counters.end(), idle) && idle(shared)) mkl_free_buffers();
}

}  // namespace

void begin_use() noexcept {
  if (!is_set_up) [[unlikely]]
    set_up_thread();
  add(1);
}

void end_use() noexcept {
  add(-1);
}

}  // namespace qsrfhs::mkl_runtime
