// SPDX-License-Identifier: MIT
#include "patience.hpp"

#include <unistd.h>

#include <chrono>
#include <condition_variable>
#include <exception>
#include <memory>
#include <mutex>
#include <thread>
#include <utility>

namespace binding {
namespace {

namespace py = pybind11;

/// What is shorter is waited for.
constexpr double short_seconds = 0.2;
constexpr auto between_polls = std::chrono::milliseconds(50);

struct errand {
  std::function<void()> work;
  std::vector<py::object> held;
  std::mutex mutex;
  std::condition_variable changed;
  bool done = false, abandoned = false;
  std::exception_ptr failed;
};

/// Threads whose work nobody waits for, and the process that they are of: a child has not got them. Guarded by the GIL,
/// never destroyed.
std::vector<std::pair<std::thread, pid_t>> &abandoned_threads() {
  static auto *const threads = new std::vector<std::pair<std::thread, pid_t>>;
  return *threads;
}

void run_errand(const std::shared_ptr<errand> &given) {
  try {
    given->work();
  } catch (...) {
    given->failed = std::current_exception();
  }
  bool abandoned = false;
  {
    const std::lock_guard lock(given->mutex);
    given->done = true;
    abandoned = given->abandoned;
    given->changed.notify_all();
  }
  if (!abandoned) return;
  const py::gil_scoped_acquire held;
  given->held.clear();
}

bool is_main_thread() {
  const py::module_ threading = py::module_::import("threading");
  return threading.attr("current_thread")().is(threading.attr("main_thread")());
}

/// Before the interpreter ends, while threads can still take the GIL.
void join_abandoned() {
  auto threads = std::exchange(abandoned_threads(), {});
  const py::gil_scoped_release released;
  for (auto &[thread, process] : threads)
    if (process == ::getpid())
      thread.join();
    else
      new std::thread(std::move(thread));  // of the parent: neither joined nor destroyed
}

}  // namespace

void run_patiently(double expected_seconds, std::vector<py::object> held, std::function<void()> work) {
  if (expected_seconds < short_seconds || !is_main_thread()) {
    const py::gil_scoped_release released;
    work();
    return;
  }
  const auto given = std::make_shared<errand>();
  given->work = std::move(work);
  given->held = std::move(held);
  std::thread thread([given] { run_errand(given); });
  for (bool done = false; !done;) {
    {
      const py::gil_scoped_release released;
      std::unique_lock lock(given->mutex);
      done = given->changed.wait_for(lock, between_polls, [&] { return given->done; });
    }
    if (done || PyErr_CheckSignals() == 0) continue;
    {
      const std::lock_guard lock(given->mutex);
      given->abandoned = !given->done;
    }
    if (!given->abandoned) {  // it would let go of the objects without the GIL
      thread.join();
      throw py::error_already_set();
    }
    abandoned_threads().emplace_back(std::move(thread), ::getpid());
    throw py::error_already_set();
  }
  thread.join();
  if (given->failed) std::rethrow_exception(given->failed);
}

void add_patience() {
  py::module_::import("atexit").attr("register")(py::cpp_function(&join_abandoned));
}

}  // namespace binding
