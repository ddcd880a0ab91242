// SPDX-License-Identifier: MIT
#include "qsrfhs/util/batch_scheduler.hpp"

#include <immintrin.h>
#include <lumra/status.h>

#include <algorithm>
#include <cstring>
#include <exception>
#include <new>

#include "platform/thread.hpp"

namespace qsrfhs {
namespace {

using std::chrono::steady_clock;
using namespace std::chrono_literals;

constexpr auto idle_wait = 5s;  // a thread looks for work that often without being woken
constexpr auto exit_wait = 1s;  // for threads that leave
constexpr auto retry_wait = 1ms;

constexpr std::size_t slot_offset = 4, index_offset = 8, header_offset = 16;

template <class T>
T word(const void *record, std::size_t offset) noexcept {
  T value;
  // NOLINTNEXTLINE(bugprone-sizeof-expression): where T is a pointer, the pointer itself is meant
  std::memcpy(&value, static_cast<const std::byte *>(record) + offset, sizeof value);
  return value;
}

}  // namespace

/// A thread's stay in its team, ended however its worker function ends it. The lock is held at both ends.
class batch_scheduler::membership {
 public:
  membership(batch_scheduler &scheduler, team &of, slot &own, std::unique_lock<std::mutex> &lock) noexcept
      : scheduler_(scheduler), team_(of), slot_(own), lock_(lock) {
    ++team_.running;
  }
  membership(const membership &) = delete;
  membership &operator=(const membership &) = delete;
  ~membership() {
    if (!lock_.owns_lock()) lock_.lock();
    --team_.running;
    slot_.occupied = false;
    scheduler_.state_.thread_left.notify_all();
  }

 private:
  batch_scheduler &scheduler_;
  team &team_;
  slot &slot_;
  std::unique_lock<std::mutex> &lock_;
};

batch_scheduler::state::state() noexcept {
  for (std::size_t i = batches.size(); i-- > 0;) {
    batches[i].following = free;
    free = &batches[i];
  }
}

batch_scheduler::batch_scheduler(std::mutex &mutex, std::int32_t cpu_count, recorder record,
                                 std::chrono::milliseconds limit) noexcept
    : mutex_(mutex), cpu_count_(std::min(cpu_count, max_threads)), record_(record), limit_(limit) {}

std::int32_t batch_scheduler::running(std::int32_t mode) const {
  const std::lock_guard lock(mutex_);
  return mode == pinned_mode ? state_.pinned.running : state_.shared.running;
}

std::int32_t batch_scheduler::RunBatch(worker work, void *records, std::uint32_t count, std::size_t record_size,
                                       std::int32_t mode, void *own) {
  if (count == 0) return 0;
  return mode == pinned_mode ? run_pinned(work, records, count, record_size)
                             : run_shared(work, records, count, record_size, own);
}

/// Fills the team's empty places. A thread that cannot be made leaves its place empty for the next batch to try again.
/// False once stopped.
bool batch_scheduler::start_team(team_kind kind) {
  std::int32_t failures = 0;
  {
    const std::lock_guard lock(mutex_);
    team &starting = kind == team_kind::shared ? state_.shared : state_.pinned;
    if (state_.stopping) return false;
    if (starting.running == cpu_count_) return true;
    for (std::int32_t i = 0; i < cpu_count_; ++i) {
      slot &place = starting.slots[static_cast<std::size_t>(i)];
      if (place.occupied) continue;
      if (place.thread.joinable()) place.thread.detach();  // it has left
      try {
        place.scheduler = this;
        place.thread = platform::thread(
            kind == team_kind::shared ? &serve<&batch_scheduler::serve_shared> : &serve<&batch_scheduler::serve_pinned>,
            &place);
        place.occupied = true;
      } catch (const std::exception &) {
        ++failures;
      }
    }
  }
  for (; failures > 0; --failures)
    (void)record_(kind == team_kind::shared ? LUMRA_THREADS_SHARED_FAILED : LUMRA_THREADS_PINNED_FAILED);
  return true;
}

void batch_scheduler::fill(batch &filled, worker work, void *records, std::uint32_t count,
                           std::size_t record_size) noexcept {
  filled.base = static_cast<std::byte *>(records);
  filled.count = count;
  filled.next = 0;
  filled.remaining.store(static_cast<std::int32_t>(count));
  filled.work = work;
  filled.record_size = record_size;
  filled.done = false;
}

/// False on time-out.
bool batch_scheduler::await(std::unique_lock<std::mutex> &lock, batch &awaited, steady_clock::time_point until) {
  return awaited.completed.wait_until(lock, until, [&] { return awaited.done; });
}

void batch_scheduler::set_work_event() noexcept {
  state_.work_event = true;
  state_.work_wake.notify_one();
}

/// Runs the caller's own record without the lock, and then others that nobody has taken, once a thread has begun: where
/// none comes, the batch times out.
void batch_scheduler::take_part(std::unique_lock<std::mutex> &lock, batch &submitted, void *own) {
  lock.unlock();
  submitted.work(own, nullptr);
  lock.lock();
  while (submitted.next > 0 && submitted.next < submitted.count) {
    void *const record = submitted.base + submitted.next++ * submitted.record_size;
    lock.unlock();
    submitted.work(record, nullptr);
    lock.lock();
    if (submitted.remaining.fetch_sub(1) == 1) submitted.done = true;
  }
  // What the others still have takes as long as the last record did, or less: not worth going to sleep for.
  constexpr int rounds = 200;  // of some 50 ns
  lock.unlock();
  for (int round = 0; round < rounds && submitted.remaining.load(std::memory_order_relaxed) > 0; ++round) _mm_pause();
  lock.lock();
}

std::int32_t batch_scheduler::run_shared(worker work, void *records, std::uint32_t count, std::size_t record_size,
                                         void *own) {
  if (!start_team(team_kind::shared)) {
    auto *const record = static_cast<std::byte *>(records);
    for (std::uint32_t i = 0; i < count; ++i) work(record + i * record_size, nullptr);
    return 0;
  }
  bool in_time = true;
  {
    const auto deadline = steady_clock::now() + limit_;
    std::unique_lock lock(mutex_);
    while (!state_.free && in_time) {
      set_work_event();  // an idle thread takes back the batches that are over
      lock.unlock();
      std::this_thread::sleep_for(retry_wait);
      lock.lock();
      in_time = steady_clock::now() < deadline;
    }
    if (state_.free) {
      batch &submitted = *state_.free;
      state_.free = submitted.following;
      fill(submitted, work, records, count, record_size);
      submitted.in_use = true;
      submitted.following = nullptr;
      batch **last = &state_.active;
      while (*last) last = &(*last)->following;
      *last = &submitted;
      set_work_event();
      const auto until = steady_clock::now() + limit_;
      if (own) take_part(lock, submitted, own);
      in_time = await(lock, submitted, until);
      submitted.in_use = false;  // a worker takes it back later
    }
  }
  return in_time ? 0 : record_(LUMRA_THREADS_SHARED_TIMEOUT);
}

/// The oldest task not handed out, or null; `more` when there is another. Takes back the batches that it comes past and
/// that nobody uses any more.
batch_scheduler::batch *batch_scheduler::take_task(std::uint32_t &index, bool &more) noexcept {
  batch *found = nullptr;
  more = false;
  for (batch **link = &state_.active; *link;) {
    batch &here = **link;
    if (here.next < here.count) {
      if (!found) {
        found = &here;
        index = here.next++;
      }
      if (here.next < here.count || found != &here) {
        more = true;
        break;
      }
    }
    // After a time-out tasks may still be running: they must not finish in another caller's batch.
    if (!here.in_use && here.next == here.count && here.remaining.load() == 0) {
      *link = here.following;
      here.following = state_.free;
      state_.free = &here;
    } else {
      link = &here.following;
    }
  }
  return found;
}

void batch_scheduler::finish_task(batch &of) {
  if (of.remaining.fetch_sub(1) != 1) return;
  const std::lock_guard lock(mutex_);
  of.done = true;
  of.completed.notify_all();
}

void batch_scheduler::serve_shared(slot &own) {
  platform::raise_thread_priority();
  std::unique_lock lock(mutex_);
  const membership stay(*this, state_.shared, own, lock);
  while (!own.stop) {
    (void)state_.work_wake.wait_for(lock, idle_wait, [&] { return state_.work_event || own.stop; });
    if (own.stop) break;
    state_.work_event = false;
    std::uint32_t index = 0;
    bool more = false;
    batch *const from = take_task(index, more);
    if (more) set_work_event();
    if (!from) continue;
    lock.unlock();
    from->work(from->base + index * from->record_size, nullptr);
    finish_task(*from);
    lock.lock();
  }
}

std::int32_t batch_scheduler::run_pinned(worker work, void *records, std::uint32_t count, std::size_t record_size) {
  (void)start_team(team_kind::pinned);
  bool in_time = true;
  {
    const auto deadline = steady_clock::now() + limit_;
    std::unique_lock lock(mutex_);
    batch &header = state_.batches.front();
    fill(header, work, records, count, record_size);
    for (std::uint32_t i = 0; i < count && in_time; ++i) {
      std::byte *record = header.base + i * record_size;
      batch *const address = &header;
      // NOLINTNEXTLINE(bugprone-sizeof-expression): the pointer itself
      std::memcpy(record + header_offset, &address, sizeof address);
      const auto target = word<std::uint32_t>(record, slot_offset);
      if (target >= static_cast<std::uint32_t>(cpu_count_)) continue;  // nobody will run it
      slot &place = state_.pinned.slots[target];
      const std::size_t after = (place.write + 1) % ring_size;
      // A full ring would look like an empty one.
      in_time = header.completed.wait_until(lock, deadline, [&] { return after != place.read; });
      if (!in_time) break;
      place.ring[place.write] = record;
      place.write = after;
      place.wake.notify_one();
    }
    in_time = in_time && await(lock, header, steady_clock::now() + limit_);
  }
  return in_time ? 0 : record_(LUMRA_THREADS_PINNED_TIMEOUT);
}

void batch_scheduler::serve_pinned(slot &own) {
  std::unique_lock lock(mutex_);
  const membership stay(*this, state_.pinned, own, lock);
  while (!own.stop) {
    (void)own.wake.wait_for(lock, idle_wait, [&] { return own.read != own.write || own.stop; });
    if (own.stop) break;
    if (own.read == own.write) continue;
    void *const record = own.ring[own.read];
    auto &header = *word<batch *>(record, header_offset);
    void *const address = header.base + word<std::uint64_t>(record, index_offset) * header.record_size;
    const worker work = header.work;
    own.read = (own.read + 1) % ring_size;
    header.completed.notify_all();  // the ring has room again
    lock.unlock();
    work(address, record);
    finish_task(header);
    lock.lock();
  }
}

void batch_scheduler::stop() noexcept try {
  const auto deadline = steady_clock::now() + exit_wait;
  std::unique_lock lock(mutex_, std::defer_lock);
  // A process may end in a state in which the lock is never given back.
  while (!lock.try_lock()) {
    if (steady_clock::now() >= deadline) return;
    std::this_thread::sleep_for(retry_wait);
  }
  state_.stopping = true;
  const auto for_each_slot = [this](auto &&work) {
    for (team *each : {&state_.shared, &state_.pinned})
      for (slot &place : each->slots) work(place);
  };
  for_each_slot([](slot &place) { place.stop = true; });
  state_.work_wake.notify_all();
  for (slot &place : state_.pinned.slots) place.wake.notify_all();
  (void)state_.thread_left.wait_until(lock, deadline, [&] {
    bool all_left = true;
    for_each_slot([&](const slot &place) { all_left = all_left && !place.occupied; });
    return all_left;
  });
  for_each_slot([](slot &place) {
    if (!place.thread.joinable()) return;
    if (place.occupied)
      place.thread.detach();  // busy, or gone without a trace
    else
      place.thread.join();
  });
} catch (const std::exception &) {
  // The process ends all the same.
}

void batch_scheduler::forget_threads() noexcept {
  // Not destroyed before: its threads do not exist, and condition variables would wait for them.
  new (&state_) state;
}

}  // namespace qsrfhs
