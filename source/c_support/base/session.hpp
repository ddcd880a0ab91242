// Sessions of the C interface and their registry. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/status.h>

#include <cstdint>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <utility>

#include "c_support/base/boundary.hpp"
#include "qsrfhs/math/filter.hpp"
#include "qsrfhs/math/session.hpp"
#include "qsrfhs/util/log.hpp"

namespace c_support {

/// What a caller's handle stands for. No two of its locks (windows, transforms, log) are ever held together.
class LumraAlgoSession {
 public:
  /// FFT size, window type.
  using window_key = std::pair<std::int32_t, std::int32_t>;
  using window = std::shared_ptr<const qsrfhs::Filter>;

  LumraAlgoSession();
  LumraAlgoSession(const LumraAlgoSession &) = delete;
  LumraAlgoSession &operator=(const LumraAlgoSession &) = delete;
  ~LumraAlgoSession();

  /// What is cached, if anything.
  [[nodiscard]] std::optional<window> find_window(window_key key) const;
  /// Caches a window; null stands for a type without coefficients. Replaces what another thread cached meanwhile.
  void set_window(window_key key, window coefficients);
  void clear_windows();

  void before_fork() noexcept;
  void after_fork_in_parent() noexcept;
  void after_fork_in_child() noexcept;

  qsrfhs::log::Logger log;
  qsrfhs::Session context;

 private:
  friend class SessionManager;
  mutable std::mutex window_mutex_;
  std::map<window_key, window> windows_;                  // under window_mutex_
  LumraAlgoSession *older_ = nullptr, *newer_ = nullptr;  // the manager's, under its lock
};

/// All open sessions by handle. Handles count from 1 and are never reused.
class SessionManager {
 public:
  using session = std::shared_ptr<LumraAlgoSession>;

  static SessionManager &instance() noexcept;

  std::uint64_t add(session added);
  /// Null for an unknown handle.
  [[nodiscard]] session get(std::uint64_t handle) const;
  /// Takes a session out; null for an unknown handle. It is released by the caller, outside the lock.
  session remove(std::uint64_t handle);

  void before_fork() noexcept;
  void after_fork_in_parent() noexcept;
  void after_fork_in_child() noexcept;

 private:
  friend class LumraAlgoSession;

  void link(LumraAlgoSession &made) noexcept;
  void unlink(LumraAlgoSession &gone) noexcept;
  /// Calls the function on all sessions that exist. Under mutex_.
  void for_each(void (LumraAlgoSession::*function)() noexcept) noexcept;

  mutable std::mutex mutex_;
  std::uint64_t next_handle_ = 1;              // under mutex_
  std::map<std::uint64_t, session> sessions_;  // under mutex_
  LumraAlgoSession *newest_ = nullptr;         // under mutex_; of all that exist: calls hold closed ones for a while
};

/// Runs work(session) for a handle; whatever it throws becomes a status code and an entry in the session's log.
template <class Work>
std::int32_t with_session(std::uint64_t handle, const catch_positions &at, Work &&work) noexcept {
  SessionManager::session session;
  try {
    session = SessionManager::instance().get(handle);
    if (!session) return LUMRA_INVALID_SESSION;
    return std::forward<Work>(work)(*session);
  } catch (...) {
    return translate_current_exception(session ? &session->log : nullptr, &at);
  }
}

}  // namespace c_support
