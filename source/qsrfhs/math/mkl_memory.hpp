// MKL's allocations while memory runs out. Some refusals make MKL use null pointers, lose memory, or compute something
// else and report success: calls that may allocate are watched. The shared libmkl_rt and OpenMP's threads allocate
// unseen; there MKL's own status is all there is. SPDX-License-Identifier: MIT
#pragma once

#include <mkl_dfti.h>

#include <cstddef>
#include <cstdint>

namespace qsrfhs::mkl_memory {

/// Before MKL's first allocation: all of them come here from now on.
void attach() noexcept;

/// What lies before each of MKL's blocks, in a ring with the others that the same scope has made.
struct alignas(16) block {
  block *previous, *next;  // null outside of such a scope
  std::size_t size;
  bool reserved;  // lies in the scope's reserve
};

/// Of the thread; those that a watch has seen are taken back when it ends.
[[gnu::tls_model("initial-exec")]] extern constinit thread_local std::uint64_t refusals;

/// Held by one thread around calls to MKL; of nested ones the innermost sees a refusal.
class watch {
 public:
  watch() noexcept = default;
  watch(const watch &) = delete;
  watch &operator=(const watch &) = delete;
  ~watch() {
    if (refused()) refusals = before_;
  }

  /// True when MKL was refused memory: its results are undefined.
  [[nodiscard]] bool refused() const noexcept { return refusals != before_; }
  /// MKL's status, or DFTI_MEMORY_ERROR where it was refused memory.
  [[nodiscard]] MKL_LONG status(MKL_LONG of_call) const noexcept { return refused() ? DFTI_MEMORY_ERROR : of_call; }

 private:
  const std::uint64_t before_ = refusals;
};

/// The status of one call that may allocate.
template <class Call>
MKL_LONG watched_status(Call call) {
  const watch watched;
  return watched.status(call());
}

/// Held while a descriptor is made, from creation to commitment. After a refusal every `status` is a failure, and the
/// descriptor has to be freed before the scope ends; what MKL has lost of its memory is freed then.
class descriptor_watch : public watch {
 public:
  descriptor_watch() noexcept;
  ~descriptor_watch();

 private:
  friend struct hooks;
  // MKL cannot do without blocks as small as these. After a refusal everything else is refused, too, so that it gives
  // up after a few more of them.
  static constexpr std::size_t vital_size = 192, reserve_count = 32;

  block made_{&made_, &made_, 0, false};
  std::size_t reserve_used_ = 0;
  struct {
    alignas(block) std::byte memory[sizeof(block) + vital_size];
  } reserve_[reserve_count];
};

}  // namespace qsrfhs::mkl_memory
