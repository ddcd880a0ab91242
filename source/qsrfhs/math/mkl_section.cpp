// SPDX-License-Identifier: MIT
#include "qsrfhs/math/mkl_section.hpp"

#include <mkl_cblas.h>
#include <mkl_lapack.h>
#include <mkl_service.h>
#include <mkl_vml.h>

#include <condition_variable>
#include <mutex>

#include "platform/fork.hpp"
#include "platform/immortal.hpp"
#include "platform/thread.hpp"

namespace qsrfhs {
namespace {

constinit thread_local int depth = 0;
constinit thread_local bool is_set_up = false;

class gate {
 public:
  static gate &instance() noexcept {
    static platform::immortal<gate> only;
    return only.get();
  }

  void enter() noexcept {
    std::unique_lock lock(mutex_);
    changed_.wait(lock, [this] { return !closed_; });
    ++inside_;
  }
  void leave() noexcept {
    {
      const std::lock_guard lock(mutex_);
      --inside_;
      if (!closed_) return;
    }
    changed_.notify_all();
  }

  /// Where other libraries do something at the end of a thread, that thread may fork inside of a section.
  void before_fork() noexcept {
    std::unique_lock lock(mutex_);
    closed_ = true;
    changed_.wait(lock, [this] { return inside_ == own(); });
    lock.release();
  }
  void after_fork_in_parent() noexcept {
    closed_ = false;
    mutex_.unlock();
    changed_.notify_all();
  }
  void after_fork_in_child() noexcept {
    platform::make_anew(changed_);
    inside_ = own();
    closed_ = false;
    mutex_.unlock();
  }

 private:
  static int own() noexcept { return depth == 0 ? 0 : 1; }

  std::mutex mutex_;
  std::condition_variable changed_;
  int inside_ = 0;       // under mutex_; threads in a section
  bool closed_ = false;  // under mutex_; a fork waits
};

const platform::fork_participant<gate> takes_part(platform::fork_rank::mkl);

void enter() noexcept {
  if (depth++ == 0) gate::instance().enter();
}

void leave() noexcept {
  if (--depth == 0) gate::instance().leave();
}

/// A thread's buffers are given back when it ends; MKL closes the thread's account with its memory then, in a
/// destructor of its own. Without memory to ask for that, they stay until the process ends.
platform::thread_end &end_of_thread() noexcept {
  static platform::thread_end end(
      []() noexcept {
        enter();
        mkl_thread_free_buffers();
      },
      []() noexcept {
        is_set_up = false;
        leave();
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

}  // namespace

mkl_section::mkl_section() noexcept {
  enter();
}

mkl_section::~mkl_section() {
  leave();
}

void mkl_section::set_up_thread() noexcept {
  if (is_set_up) return;
  static std::once_flag process_is_set_up;
  const mkl_section section;
  is_set_up = end_of_thread().ask();  // its key is older than MKL's
  std::call_once(process_is_set_up, &set_up_process);
  mkl_free(mkl_malloc(1, 64));  // opens the thread's account with MKL's memory
}

}  // namespace qsrfhs
