// SPDX-License-Identifier: MIT
#include "c_support/base/session.hpp"

#include <lumra/session.h>

#include <algorithm>
#include <charconv>
#include <cstring>
#include <string_view>

#include "platform/fork.hpp"
#include "platform/immortal.hpp"

namespace c_support {
namespace {

constexpr const char *session_source = R"(.\source\c_support\base\session)";
constexpr catch_positions read_log_positions{{session_source, 120}, {session_source, 123}};

/// Writes "file:line message", cut to what the buffer holds.
void write_entry(const qsrfhs::log::entry &entry, char *buffer, std::uint64_t size) noexcept {
  if (size == 0) return;
  std::uint64_t room = size - 1;
  const auto append = [&](std::string_view text) {
    const std::size_t n = std::min<std::uint64_t>(text.size(), room);
    std::memcpy(buffer, text.data(), n);
    buffer += n;
    room -= n;
  };
  char line[12];
  const char *line_end = std::to_chars(line, line + sizeof line, entry.line).ptr;
  append(entry.file);
  append(":");
  append({line, static_cast<std::size_t>(line_end - line)});
  append(" ");
  append(entry.message);
  *buffer = '\0';
}

const platform::fork_participant<SessionManager> takes_part(platform::fork_rank::sessions);

}  // namespace

LumraAlgoSession::LumraAlgoSession() {
  SessionManager::instance().link(*this);
}

LumraAlgoSession::~LumraAlgoSession() {
  SessionManager::instance().unlink(*this);
}

void LumraAlgoSession::before_fork() noexcept {
  window_mutex_.lock();
  context.before_fork();
  log.before_fork();
}

void LumraAlgoSession::after_fork_in_parent() noexcept {
  log.after_fork_in_parent();
  context.after_fork_in_parent();
  window_mutex_.unlock();
}

void LumraAlgoSession::after_fork_in_child() noexcept {
  log.after_fork_in_child();
  context.after_fork_in_child();
  window_mutex_.unlock();
}

std::optional<LumraAlgoSession::window> LumraAlgoSession::find_window(window_key key) const {
  const std::lock_guard lock(window_mutex_);
  const auto found = windows_.find(key);
  if (found == windows_.end()) return std::nullopt;
  return found->second;
}

void LumraAlgoSession::set_window(window_key key, window coefficients) {
  const std::lock_guard lock(window_mutex_);
  windows_[key].swap(coefficients);  // a replaced window is released after the lock
}

void LumraAlgoSession::clear_windows() {
  std::map<window_key, window> dropped;  // freed outside the lock
  const std::lock_guard lock(window_mutex_);
  windows_.swap(dropped);
}

SessionManager &SessionManager::instance() noexcept {
  static platform::immortal<SessionManager> manager;
  return manager.get();
}

std::uint64_t SessionManager::add(session added) {
  const std::lock_guard lock(mutex_);
  sessions_.emplace(next_handle_, std::move(added));
  return next_handle_++;
}

SessionManager::session SessionManager::get(std::uint64_t handle) const {
  const std::lock_guard lock(mutex_);
  const auto found = sessions_.find(handle);
  return found == sessions_.end() ? nullptr : found->second;
}

SessionManager::session SessionManager::remove(std::uint64_t handle) {
  session removed;
  const std::lock_guard lock(mutex_);
  if (const auto found = sessions_.find(handle); found != sessions_.end()) {
    removed = std::move(found->second);
    sessions_.erase(found);
  }
  return removed;
}

void SessionManager::link(LumraAlgoSession &made) noexcept {
  const std::lock_guard lock(mutex_);
  made.older_ = newest_;
  if (newest_) newest_->newer_ = &made;
  newest_ = &made;
}

void SessionManager::unlink(LumraAlgoSession &gone) noexcept {
  const std::lock_guard lock(mutex_);
  (gone.newer_ ? gone.newer_->older_ : newest_) = gone.older_;
  if (gone.older_) gone.older_->newer_ = gone.newer_;
}

void SessionManager::for_each(void (LumraAlgoSession::*function)() noexcept) noexcept {
  for (LumraAlgoSession *each = newest_; each; each = each->older_) (each->*function)();
}

void SessionManager::before_fork() noexcept {
  mutex_.lock();
  for_each(&LumraAlgoSession::before_fork);
}

void SessionManager::after_fork_in_parent() noexcept {
  for_each(&LumraAlgoSession::after_fork_in_parent);
  mutex_.unlock();
}

void SessionManager::after_fork_in_child() noexcept {
  for_each(&LumraAlgoSession::after_fork_in_child);
  mutex_.unlock();
}

}  // namespace c_support

using namespace c_support;

int32_t qsLumraAlgo_CreateSession(uint64_t *session) {
  if (!session) return LUMRA_INVALID_ARGUMENT;
  return at_boundary([&] {
    auto created = std::make_shared<LumraAlgoSession>();
    // A transform of a size that was never initialised stays in the pool after its first use.
    created->context.transforms.set_reserve_slots(1);
    *session = SessionManager::instance().add(std::move(created));
    return LUMRA_SUCCESS;
  });
}

int32_t qsLumraAlgo_CloseSession(uint64_t session) {
  return at_boundary([&] {
    // Readers that wait in the log hold a reference of their own: closing it is what lets them go.
    if (const auto removed = SessionManager::instance().remove(session)) removed->log.close();
    return LUMRA_SUCCESS;
  });
}

int32_t qsLumraAlgo_ResetSession(uint64_t session) {
  return at_boundary([&]() -> std::int32_t {
    const auto found = SessionManager::instance().get(session);
    if (!found) return LUMRA_INVALID_SESSION;
    found->context.transforms.clear();
    found->clear_windows();
    return LUMRA_SUCCESS;
  });
}

int32_t qsLumraAlgo_ReadLog(uint64_t session, double timeout, char *buffer, uint64_t bufferSize) {
  if (!buffer) return LUMRA_INVALID_ARGUMENT;
  return with_session(session, read_log_positions, [&](LumraAlgoSession &found) -> std::int32_t {
    if (timeout != 0.0) return LUMRA_INTERNAL_ERROR;
    const auto entry = found.log.pop();
    if (!entry) return LUMRA_INTERNAL_ERROR;
    write_entry(*entry, buffer, bufferSize);
    return LUMRA_SUCCESS;
  });
}
