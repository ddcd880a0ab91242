// SPDX-License-Identifier: MIT
#include "qsrfhs/util/data_fifo.hpp"

#include <lumra/data_fifo.h>
#include <lumra/status.h>

#include <algorithm>
#include <cstring>
#include <limits>
#include <new>
#include <utility>

#include "platform/fork.hpp"
#include "platform/immortal.hpp"

namespace qsrfhs {
namespace {

using namespace std::chrono_literals;

constexpr std::chrono::milliseconds longest_wait = 100ms;

const platform::fork_participant<fifo_table> takes_part(platform::fork_rank::fifos);

}  // namespace

void data_fifo::open(std::string_view name, memory buffer, std::uint32_t capacity, std::uint64_t handle) noexcept {
  const std::scoped_lock lock(writer_.mutex, reader_.mutex);
  name_.fill('\0');
  std::copy_n(name.begin(), std::min(name.size(), longest_name), name_.begin());
  buffer_ = std::move(buffer);
  capacity_ = capacity;
  for (end *side : {&writer_, &reader_}) {
    side->position = 0;
    side->seen = 0;
    side->moved = 0;
  }
  state_ = state::open;
  handle_ = handle;
}

void data_fifo::close() noexcept {
  state_ = state::closing;
  handle_ = 0;
  // Who takes an end's lock from here on finds the FIFO closed.
  for (end *side : {&writer_, &reader_}) {
    std::unique_lock lock(side->mutex);
    side->wish.grant_if([](std::uint32_t) { return true; });
    side->idle.wait(lock, [side] { return side->waiting == 0; });
  }
  const std::scoped_lock lock(writer_.mutex, reader_.mutex);
  buffer_.reset();
}

bool data_fifo::forget() noexcept {
  const std::scoped_lock lock(writer_.mutex, reader_.mutex);
  handle_ = 0;
  return retire() != nullptr;
}

/// The buffer of a forgotten FIFO that nobody waits in, to be freed; null while there is somebody. Under both locks.
data_fifo::memory data_fifo::retire() noexcept {
  if (handle_ != 0 || state_ == state::closing || writer_.waiting != 0 || reader_.waiting != 0) return nullptr;
  state_ = state::closing;
  return std::move(buffer_);
}

void data_fifo::hand_back_if_forgotten() noexcept {
  if (handle_ != 0) return;
  memory freed;
  {
    const std::scoped_lock lock(writer_.mutex, reader_.mutex);
    freed = retire();
  }
  if (freed) fifo_table::instance().recycle(*this);
}

std::uint64_t data_fifo::fill() const noexcept {
  // In this order: what was read had been written before.
  const std::uint64_t read = reader_.moved, written = writer_.moved;
  return written - read;
}

/// Whether there are bytes to read, or room to write. Looks at the other end's count only where it has to.
bool data_fifo::has(end &own, const end &other, std::uint32_t count) noexcept {
  const auto enough = [&] {
    const std::uint64_t moved = own.moved.load(std::memory_order_relaxed);
    return &own == &reader_ ? own.seen - moved >= count : capacity_ - (moved - own.seen) >= count;
  };
  if (enough()) return true;
  own.seen = other.moved;
  return enough();
}

/// Waits for bytes or room. The other end first publishes its count, then looks for a wish; this one goes the other way
/// round, so that one of the two sees the other.
std::int32_t data_fifo::wait(std::unique_lock<std::mutex> &lock, end &own, const end &other,
                             std::uint32_t count) noexcept {
  const wanted_bytes::wish made = own.wish.want(count);
  if (has(own, other, count)) {
    (void)own.wish.withdraw(made);
    return LUMRA_SUCCESS;
  }
  ++own.waiting;
  lock.unlock();
  const bool granted = own.wish.wait_for(made, longest_wait);
  lock.lock();
  if (--own.waiting == 0) own.idle.notify_all();
  if (state_ == state::closing) return LUMRA_FIFO_UNKNOWN;
  // A second waiter on this side may have been meant: what cannot fit never goes on.
  return granted && count <= capacity_ ? LUMRA_SUCCESS : LUMRA_REFUSED;
}

template <class Copy>
std::int32_t data_fifo::transfer(std::uint64_t handle, end &own, end &other, std::uint32_t count, Copy copy) noexcept {
  std::unique_lock lock(own.mutex);
  if (handle_ != handle) return LUMRA_FIFO_UNKNOWN;
  if (count == 0) return 0;
  const bool waits = !has(own, other, count);
  if (waits) {
    if (const std::int32_t status = wait(lock, own, other, count); status != LUMRA_SUCCESS) {
      lock.unlock();
      hand_back_if_forgotten();
      return status;
    }
  }

  const std::uint32_t position = own.position, first = std::min(count, capacity_ - position);
  copy(buffer_.get() + position, first, buffer_.get(), count - first);
  // A granted wish is enough to copy. But where a flush came in between, the bytes behind it are not taken.
  if (has(own, other, count)) {
    own.position = first < count ? count - first : position + count;
    own.moved = own.moved.load(std::memory_order_relaxed) + count;
  }
  other.wish.grant_if([&](std::uint32_t bytes) { return (&other == &reader_ ? fill() : capacity_ - fill()) >= bytes; });
  if (waits) {
    lock.unlock();
    hand_back_if_forgotten();
  }
  return static_cast<std::int32_t>(count);
}

std::int32_t data_fifo::write(std::uint64_t handle, const std::byte *source, std::uint32_t count) noexcept {
  return transfer(handle, writer_, reader_, count,
                  [source](std::byte *ring, std::uint32_t first, std::byte *start, std::uint32_t rest) {
                    std::memcpy(ring, source, first);
                    std::memcpy(start, source + first, rest);
                  });
}

std::int32_t data_fifo::read(std::uint64_t handle, std::byte *destination, std::uint32_t count) noexcept {
  return transfer(
      handle, reader_, writer_, count,
      [destination](const std::byte *ring, std::uint32_t first, const std::byte *start, std::uint32_t rest) {
        std::memcpy(destination, ring, first);
        std::memcpy(destination + first, start, rest);
      });
}

std::int32_t data_fifo::flush(std::uint64_t handle) noexcept {
  const std::scoped_lock lock(writer_.mutex, reader_.mutex);
  if (handle_ != handle) return LUMRA_FIFO_UNKNOWN;
  const std::uint64_t written = writer_.moved;
  reader_.moved = reader_.seen = writer_.seen = written;
  writer_.position = reader_.position = 0;
  return LUMRA_SUCCESS;
}

std::int32_t data_fifo::get_status(std::uint64_t handle, std::uint32_t &capacity, std::uint32_t &held) const noexcept {
  const std::uint32_t bytes = capacity_;
  // More than fits may have gone through while we looked.
  const auto in_it = static_cast<std::uint32_t>(std::min<std::uint64_t>(fill(), bytes));
  if (handle_ != handle) return LUMRA_FIFO_UNKNOWN;
  capacity = bytes;
  held = in_it;
  return LUMRA_SUCCESS;
}

void data_fifo::before_fork() noexcept {
  for (end *side : {&writer_, &reader_}) side->mutex.lock();
  for (end *side : {&writer_, &reader_}) side->wish.before_fork();
}

void data_fifo::after_fork_in_parent() noexcept {
  for (end *side : {&reader_, &writer_}) {
    side->wish.after_fork_in_parent();
    side->mutex.unlock();
  }
}

void data_fifo::after_fork_in_child() noexcept {
  for (end *side : {&reader_, &writer_}) {
    side->wish.after_fork_in_child();
    side->waiting = 0;
    platform::make_anew(side->idle);
    side->mutex.unlock();
  }
}

fifo_table &fifo_table::instance() noexcept {
  static platform::immortal<fifo_table> table;
  return table.get();
}

std::uint64_t fifo_table::create(std::string_view name, std::uint32_t capacity, existing same_name,
                                 std::uint64_t **cell_out) noexcept try {
  *cell_out = nullptr;
  auto made = std::make_unique<std::uint64_t>(0);
  const std::lock_guard lock(mutex_);
  std::uint64_t &cell = *made;
  cells_[&cell] = std::move(made);
  *cell_out = &cell;

  std::size_t chosen = slot_count;
  for (std::size_t slot = 0; slot < slot_count; ++slot) {
    data_fifo *const fifo = slots_[slot].load();
    if (fifo && fifo->name() == name) {
      chosen = slot;
      break;
    }
    if (!fifo && chosen == slot_count) chosen = slot;
  }
  if (chosen == slot_count) return 0;

  data_fifo *const found = slots_[chosen].load();
  bool replace = false;
  if (found) {
    std::uint32_t unused = 0, fill = 0;
    const std::uint64_t handle = found->handle();
    (void)found->get_status(handle, unused, fill);
    replace = fill < capacity;  // what it holds, not what it could hold: on purpose
    if (!replace && same_name == existing::reused) {
      (void)found->flush(handle);
      return cell = handle;
    }
  }
  cell = open_in(chosen, name, capacity);
  if (!found || cell == 0) return cell;
  if (replace) {
    found->close();
  } else if (!found->forget()) {
    return cell;
  }
  found->next_spare = std::exchange(spares_, found);
  return cell;
} catch (const std::bad_alloc &) {
  return 0;
}

/// Puts a new FIFO into a slot, in place of whatever is there. Returns its handle, 0 without memory.
std::uint64_t fifo_table::open_in(std::size_t slot, std::string_view name, std::uint32_t capacity) {
  // Zeros that take no memory until they are written to.
  data_fifo::memory buffer(static_cast<std::byte *>(std::calloc(std::max(capacity, 1U), 1)));
  if (!buffer) return 0;
  data_fifo *fifo = spares_;
  if (fifo) {
    spares_ = fifo->next_spare;
  } else {
    fifo = new (std::nothrow) data_fifo;
    if (!fifo) return 0;
    fifo->made_before = std::exchange(newest_, fifo);
  }
  const std::uint64_t handle = next_generation_++ * slot_count + slot;
  fifo->open(name, std::move(buffer), capacity, handle);
  slots_[slot].store(fifo, std::memory_order_release);
  return handle;
}

void fifo_table::remove(std::uint64_t handle) noexcept {
  data_fifo *removed = nullptr;
  {
    const std::lock_guard lock(mutex_);
    std::atomic<data_fifo *> &slot = slots_[handle % slot_count];
    data_fifo *const fifo = slot.load();
    if (!fifo || handle == 0 || fifo->handle() != handle) return;
    slot.store(nullptr);
    removed = fifo;
  }
  removed->close();
  recycle(*removed);
}

std::int32_t fifo_table::unreserve(std::uint64_t **cell) noexcept {
  std::uint64_t handle = 0;
  {
    const std::lock_guard lock(mutex_);
    const auto found = cells_.find(*cell);
    if (found == cells_.end()) return LUMRA_FIFO_UNKNOWN;
    *cell = nullptr;
    handle = *found->second;
    cells_.erase(found);
  }
  remove(handle);
  return LUMRA_SUCCESS;
}

void fifo_table::recycle(data_fifo &fifo) noexcept {
  const std::lock_guard lock(mutex_);
  fifo.next_spare = std::exchange(spares_, &fifo);
}

void fifo_table::before_fork() noexcept {
  mutex_.lock();
  for (data_fifo *fifo = newest_; fifo; fifo = fifo->made_before) fifo->before_fork();
}

void fifo_table::after_fork_in_parent() noexcept {
  for (data_fifo *fifo = newest_; fifo; fifo = fifo->made_before) fifo->after_fork_in_parent();
  mutex_.unlock();
}

/// FIFOs that threads of the parent were closing, or still waited in, are over here.
void fifo_table::after_fork_in_child() noexcept {
  spares_ = nullptr;
  for (data_fifo *fifo = newest_; fifo; fifo = fifo->made_before) {
    fifo->after_fork_in_child();
    if (std::find(slots_.begin(), slots_.end(), fifo) != slots_.end()) continue;
    fifo->close();
    fifo->next_spare = std::exchange(spares_, fifo);
  }
  mutex_.unlock();
}

}  // namespace qsrfhs

using namespace qsrfhs;

uint64_t qsLTEHS_DataFIFOCreate(const char *name, uint32_t capacity, uint32_t flags, uint64_t **cellOut) {
  if (!cellOut) return 0;
  const std::string_view known_by(name ? name : "", name ? ::strnlen(name, data_fifo::longest_name) : 0);
  using existing = fifo_table::existing;
  const existing same_name = (flags & LUMRA_FIFO_REUSE) != 0 ? existing::reused : existing::forgotten;
  return fifo_table::instance().create(known_by, capacity, same_name, cellOut);
}

int32_t qsLTEHS_DataFIFODelete(uint64_t handle) {
  fifo_table::instance().remove(handle);
  return LUMRA_SUCCESS;
}

int32_t qsLTEHS_DataFIFOUnreserve(uint64_t **cell) {
  if (!cell || !*cell) return LUMRA_FIFO_UNKNOWN;
  return fifo_table::instance().unreserve(cell);
}

int32_t qsLTEHS_DataFIFO(uint64_t handle, int32_t direction, const void *source, void *destination, uint32_t offset,
                         uint32_t count) {
  constexpr std::uint32_t longest = std::numeric_limits<std::int32_t>::max();
  const bool reads = direction != LUMRA_FIFO_WRITE;
  data_fifo *const fifo = handle == 0 ? nullptr : fifo_table::instance().find(handle);
  if (!fifo || count > longest) return LUMRA_FIFO_UNKNOWN;
  if (count != 0 && !(reads ? destination : source)) return LUMRA_FIFO_UNKNOWN;
  const std::uint32_t first = count == 0 ? 0 : offset;  // without bytes to move the memory may be null
  if (reads) return fifo->read(handle, static_cast<std::byte *>(destination) + first, count);
  return fifo->write(handle, static_cast<const std::byte *>(source) + first, count);
}

int32_t qsLTEHS_DataFIFO_GetStatus(uint64_t handle, uint32_t *capacity, uint32_t *fill) {
  std::uint32_t bytes = 0, held = 0;
  data_fifo *const fifo = handle == 0 ? nullptr : fifo_table::instance().find(handle);
  const std::int32_t status = fifo ? fifo->get_status(handle, bytes, held) : LUMRA_FIFO_UNKNOWN;
  if (capacity) *capacity = bytes;
  if (fill) *fill = held;
  return status;
}

int32_t qsLTEHS_DataFIFO_Flush(uint64_t handle) {
  data_fifo *const fifo = handle == 0 ? nullptr : fifo_table::instance().find(handle);
  return fifo ? fifo->flush(handle) : LUMRA_FIFO_UNKNOWN;
}

int32_t qsLTEHS(void) {
  return LUMRA_NOT_OFFERED;
}
