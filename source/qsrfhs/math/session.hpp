// A session's processing context. SPDX-License-Identifier: MIT
#pragma once

#include <memory>

#include "qsrfhs/math/fft.hpp"
#include "qsrfhs/util/thread_pool.hpp"

namespace qsrfhs {

struct Session {
  static constexpr std::int32_t worker_count = 8;

  std::shared_ptr<ctpl::thread_pool> workers = std::make_shared<ctpl::thread_pool>(worker_count);
  fft_pool transforms;

  void before_fork() noexcept {
    transforms.before_fork();
    workers->before_fork();
  }
  void after_fork_in_parent() noexcept {
    workers->after_fork_in_parent();
    transforms.after_fork_in_parent();
  }
  void after_fork_in_child() noexcept {
    workers->after_fork_in_child();
    transforms.after_fork_in_child();
  }
};

}  // namespace qsrfhs
