// The process-wide list of failure codes, and the threads for parallel element loops. SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <list>
#include <mutex>
#include <span>

#include "qsrfhs/util/batch_scheduler.hpp"

namespace qsrfhs {

class Management {
 public:
  static constexpr std::int32_t max_cpus = 32;

  static Management &instance() noexcept;

  /// Records a code in the process's list and returns it, so that exports end in `return Management::addError(code)`.
  static std::int32_t addError(std::int32_t code) noexcept;

  /// Runs task records on the library's own threads; see batch_scheduler.
  std::int32_t RunBatch(batch_scheduler::worker work, void *records, std::uint32_t count, std::size_t record_size,
                        std::int32_t mode, void *own) {
    return scheduler_.RunBatch(work, records, count, record_size, mode, own);
  }

  /// Only instance() makes one.
  Management();
  [[nodiscard]] std::int32_t cpu_count() const noexcept { return cpu_count_; }
  [[nodiscard]] std::uint64_t error_count() const;
  /// Copies all codes, oldest first; false when they do not fit.
  [[nodiscard]] bool copy_errors(std::span<std::int32_t> codes) const;

  /// At the end of the process; see batch_scheduler.
  void stop_threads() noexcept { scheduler_.stop(); }

  void before_fork() noexcept;
  void after_fork_in_parent() noexcept;
  void after_fork_in_child() noexcept;

 private:
  void add(std::int32_t code) noexcept;

  const std::int32_t cpu_count_;
  mutable std::mutex mutex_;
  std::list<std::int32_t> errors_;  // under mutex_; only grows, and takes no memory while empty
  batch_scheduler scheduler_{mutex_, cpu_count_, &addError};
};

}  // namespace qsrfhs
