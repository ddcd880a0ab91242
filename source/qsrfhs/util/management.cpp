// SPDX-License-Identifier: MIT
#include "qsrfhs/util/management.hpp"

#include <lumra/core_services.h>
#include <lumra/status.h>

#include <algorithm>
#include <cstdio>
#include <exception>

#include "platform/fork.hpp"
#include "platform/immortal.hpp"
#include "platform/processor.hpp"

namespace qsrfhs {
namespace {

const platform::fork_participant<Management> takes_part(platform::fork_rank::error_list);

/// Behind the handlers and destructors of those who use the library, which may still call it.
[[gnu::destructor]] void stop_threads() {
  Management::instance().stop_threads();
}

}  // namespace

Management &Management::instance() noexcept {
  static platform::immortal<Management> management;
  return management.get();
}

Management::Management() : cpu_count_(std::min(platform::processor_count(), max_cpus)) {}

void Management::before_fork() noexcept {
  mutex_.lock();
}

void Management::after_fork_in_parent() noexcept {
  mutex_.unlock();
}

void Management::after_fork_in_child() noexcept {
  scheduler_.forget_threads();
  mutex_.unlock();
}

std::int32_t Management::addError(std::int32_t code) noexcept {
  instance().add(code);
  return code;
}

void Management::add(std::int32_t code) noexcept try {
  const std::lock_guard lock(mutex_);
  std::printf("\t>>> Management::addError(%x)##################################################\n",
              static_cast<unsigned>(code));
  std::fflush(stdout);
  errors_.push_back(code);
} catch (const std::exception &) {
  // Without memory the code is still returned to the caller; it is missing from the list only.
}

std::uint64_t Management::error_count() const {
  const std::lock_guard lock(mutex_);
  return errors_.size();
}

bool Management::copy_errors(std::span<std::int32_t> codes) const {
  const std::lock_guard lock(mutex_);
  if (codes.size() < errors_.size()) return false;
  std::copy(errors_.begin(), errors_.end(), codes.begin());
  return true;
}

}  // namespace qsrfhs

using qsrfhs::Management;

int32_t qsrfhs_getErrorCnt(uint64_t *count) {
  if (!count) return Management::addError(LUMRA_ERRORS_COUNT_NULL);
  *count = Management::instance().error_count();
  return 0;
}

int32_t qsrfhs_getErrors(int32_t *codes, uint64_t capacity) {
  if (!codes) return Management::addError(LUMRA_ERRORS_CODES_NULL);
  if (!Management::instance().copy_errors({codes, capacity})) return Management::addError(LUMRA_ERRORS_CAPACITY);
  return 0;
}

int32_t qsUtilHS_NumCPUs(void) {
  return Management::instance().cpu_count();
}
