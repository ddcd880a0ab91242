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
};

}  // namespace qsrfhs
