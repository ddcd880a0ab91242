// SPDX-License-Identifier: MIT
#include <algorithm>
#include <atomic>
#include <chrono>
#include <limits>
#include <string_view>

#include "platform/process.hpp"
#include "platform/processor.hpp"
#include "qsrfhs/vector/kernels/kernels.hpp"

namespace qsrfhs::kernels {
namespace {

constexpr build all_builds[] = {
    {"baseline", &baseline_kernels, &baseline_kernels},
    {"avx", &avx_kernels, &avx_kernels},
    {"avx2", &avx2_kernels, &avx2_fused_kernels},
    {"avx512", &avx512_kernels, &avx512_fused_kernels},
};

/// The build that the environment asks for, null unless this processor can run it. Read when the library is loaded: at
/// the first use another thread might be changing the environment.
const build *const wanted = [] {
  const char *const name = platform::environment("LUMRA_KERNELS");
  if (!name) return static_cast<const build *>(nullptr);
  for (const build &b : builds())
    if (name == std::string_view(b.name)) return &b;
  return static_cast<const build *>(nullptr);
}();

/// Samples for the loops that are timed, in the first-level cache: on lines of it, wherever the stack begins, and no two
/// arrays a multiple of 4096 bytes apart, which would make loads wait for stores.
struct trial {
  static constexpr std::size_t samples = 512;
  alignas(64) float x[2 * samples + 64], work[2 * samples + 64], power[samples];
  trial() noexcept {
    for (std::size_t i = 0; i < 2 * samples; ++i) x[i] = work[i] = 0.5F;
    for (float &p : power) p = 0;
  }
  void run(const kernel_table &kernels) noexcept {
    constexpr float coefficients[9] = {1, 1, 1, 1, 1, 1, 1, 1, 1};
    kernels.accumulate_power_then_apply_window(work, power, x, x, x, 0, samples);
    kernels.magnitude_squared(x, work, samples);
    kernels.polynomial(x, coefficients, 9, work, samples);
    work[0] = kernels.sum_power(x, samples);
  }
};

/// Whether the wide build is clearly slower than the other one: by a tenth, each at its best of several turns. A processor
/// may take a while until it gives wide registers their power, and slows everything down meanwhile; so the wide build has
/// several trials to show that it is not. One takes some 90 microseconds, and is mostly enough.
bool is_slower(const build &wide, const build &narrow) noexcept {
  using clock = std::chrono::steady_clock;
  constexpr int trials = 8, turns = 12, passes = 4;
  trial room;
  const auto time = [&](const build &b) {
    const auto start = clock::now();
    for (int i = 0; i < passes; ++i) room.run(*b.exact);
    return clock::now() - start;
  };
  for (int t = 0; t < trials; ++t) {
    auto best_wide = clock::duration::max(), best_narrow = best_wide;
    for (int i = 0; i < turns; ++i) {
      best_wide = std::min(best_wide, time(wide));
      best_narrow = std::min(best_narrow, time(narrow));
    }
    if (best_wide <= best_narrow + best_narrow / 10) return false;
  }
  return true;
}

const build *choose() noexcept {
  if (wanted) return wanted;
  const auto possible = builds();
  const build *const widest = &possible.back();
  return widest->exact == &avx512_kernels && is_slower(*widest, widest[-1]) ? widest - 1 : widest;
}

/// Not made once under a lock, in which a fork could find another thread: all may choose, and take what the first chose.
const build &chosen() noexcept {
  static constinit std::atomic<const build *> choice{nullptr};
  const build *found = choice.load(std::memory_order_relaxed);
  if (!found) {
    const build *const mine = choose();
    if (choice.compare_exchange_strong(found, mine, std::memory_order_relaxed)) found = mine;
  }
  return *found;
}

}  // namespace

std::span<const build> builds() noexcept {
  const std::size_t count = platform::has_avx512() ? 4 : platform::has_avx2() ? 3 : platform::has_avx() ? 2 : 1;
  return {all_builds, count};
}

const kernel_table &exact() noexcept {
  return *chosen().exact;
}

const kernel_table &fused() noexcept {
  return *chosen().fused;
}

}  // namespace qsrfhs::kernels
