// Work without the interpreter's lock: signals in the middle of it, and objects that two threads use at once.
// SPDX-License-Identifier: MIT
#pragma once

#include <pybind11/pybind11.h>

#include <atomic>
#include <chrono>
#include <mutex>
#include <thread>

namespace binding {

namespace py = pybind11;

/// Lets signals act on long work, a few times a second. Used without the GIL.
class interruptions {
 public:
  /// Throws what a signal handler raises, KeyboardInterrupt for one.
  void poll() {
    const auto now = clock::now();
    if (now - latest_ < std::chrono::milliseconds(100)) return;
    latest_ = now;
    const py::gil_scoped_acquire held;
    if (PyErr_CheckSignals() != 0) throw py::error_already_set();
  }

 private:
  using clock = std::chrono::steady_clock;
  clock::time_point latest_ = clock::now();
};

/// Of an object that one thread may use at a time: others wait for their turn.
class turnstile {
 public:
  turnstile() = default;
  turnstile(const turnstile &) = delete;
  turnstile &operator=(const turnstile &) = delete;

 private:
  friend class turn;
  std::mutex mutex_;
  std::atomic<std::thread::id> holder_;
};

/// One thread's turn with one or two objects, without the GIL. The GIL is given up before the wait, so that who has the
/// turn can take it. A signal handler that comes back to an object that its own thread is using is refused.
class turn {
 public:
  explicit turn(turnstile &with) : turn(with, with) {}
  turn(turnstile &one, turnstile &other) : one_(refuse_second(one)), other_(refuse_second(other)) {
    if (&one == &other)
      one.mutex_.lock();
    else
      std::lock(one.mutex_, other.mutex_);
    one.holder_ = other.holder_ = std::this_thread::get_id();
  }
  turn(const turn &) = delete;
  turn &operator=(const turn &) = delete;
  ~turn() {
    one_.holder_ = other_.holder_ = std::thread::id();
    one_.mutex_.unlock();
    if (&one_ != &other_) other_.mutex_.unlock();
  }

 private:
  static turnstile &refuse_second(turnstile &with) {
    if (with.holder_ == std::this_thread::get_id())
      throw std::runtime_error("the object is in use by this thread already");
    return with;
  }

  turnstile &one_, &other_;
  py::gil_scoped_release released_;
};

}  // namespace binding
