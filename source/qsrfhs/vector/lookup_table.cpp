// Gains from a table, applied to samples; long inputs are shared between the caller and the library's own threads.
// SPDX-License-Identifier: MIT
#include <lumra/status.h>
#include <lumra/vector_utilities.h>

#include <algorithm>
#include <atomic>
#include <cstddef>

#include "host/host_array.hpp"
#include "host/resize_service.hpp"
#include "platform/fork.hpp"
#include "qsrfhs/util/management.hpp"
#include "qsrfhs/vector/floats.hpp"

using namespace qsrfhs;

namespace {

constexpr std::size_t smallest_shared_count = 65537, samples_per_task = 32768, task_granularity = 32;
constexpr std::uint32_t max_tasks = 4;

struct lookup_batch;

/// What one task works on.
struct lookup_record {
  lookup_batch *batch;
  const float *keys, *in;
  float *out;
  std::size_t count;
};

/// The records of one call. They outlive a call whose batch timed out: it takes its last user to free them.
struct lookup_batch {
  std::atomic<std::uint32_t> users{0};
  kernels::lookup_table table{};
  lookup_record records[max_tasks]{};
};

/// As many as the scheduler has batches; a call that finds none free works by itself.
constinit lookup_batch batches[32];

// Those in use belong to threads that do not exist in the child.
constexpr platform::fork_handlers fork_handlers{[]() noexcept {}, []() noexcept {},
                                                []() noexcept {
                                                  for (lookup_batch &batch : batches) batch.users = 0;
                                                }};
const platform::fork_participation takes_part(platform::fork_rank::lookup_batches, fork_handlers);

lookup_batch *take_batch(std::uint32_t tasks) noexcept {
  for (lookup_batch &batch : batches) {
    std::uint32_t unused = 0;
    if (batch.users.compare_exchange_strong(unused, tasks + 1, std::memory_order_acquire)) return &batch;
  }
  return nullptr;
}

void drop_batch(lookup_batch &batch) noexcept {
  batch.users.fetch_sub(1, std::memory_order_release);
}

void run_task(void *address, void * /*task*/) {
  const auto &record = *static_cast<const lookup_record *>(address);
  kernels::exact().lookup(record.batch->table, record.keys, record.in, record.out, record.count);
  drop_batch(*record.batch);
}

std::uint32_t task_count(std::size_t n) noexcept {
  if (n < smallest_shared_count) return 1;
  return std::min(static_cast<std::uint32_t>(n / samples_per_task), max_tasks);
}

std::int32_t run_shared(const kernels::lookup_table &table, const float *keys, const float *in, float *out,
                        std::size_t n) noexcept {
  const std::uint32_t tasks = task_count(n);
  lookup_batch *batch = tasks == 1 ? nullptr : take_batch(tasks);
  if (!batch) {
    kernels::exact().lookup(table, keys, in, out, n);
    return 0;
  }
  batch->table = table;
  const std::size_t share = n / tasks / task_granularity * task_granularity;
  for (std::uint32_t i = 0; i < tasks; ++i) {
    const std::size_t first = i * share;
    batch->records[i] = {batch, keys + first, in + 2 * first, out + 2 * first, i + 1 == tasks ? n - first : share};
  }
  const std::uint32_t others = tasks - 1;
  const std::int32_t status = Management::instance().RunBatch(&run_task, batch->records, others, sizeof(lookup_record),
                                                              batch_scheduler::shared_mode, batch->records + others);
  drop_batch(*batch);
  return status;
}

}  // namespace

int32_t qsUtilHS_LookupTable(lumra_f32_array keys, lumra_cf32_array in, lumra_cf32_array *out, lumra_cf32_array table,
                             float start, float step) {
  if (host::elements(table).empty() || step == 0.0F) return LUMRA_LOOKUP_TABLE_INVALID;
  if (!out) return LUMRA_REFUSED;
  // Before an output that is the table gets its new count.
  const int entry_count = static_cast<int>(host::elements(table).size() / 2);
  const std::size_t n = host::has_block(in) ? host::elements(keys).size() : 0;
  const auto result = host::size_output(out, n);
  if (entry_count == 0) {
    std::fill(result.begin(), result.end(), lumra_cf32{});
    return 0;
  }
  const float *entries = reinterpret_cast<const float *>((*table)->elements);
  if (result.empty()) return 0;
  return run_shared({entries, entry_count, start, step}, host::elements(keys).data(),
                    reinterpret_cast<const float *>((*in)->elements), floats(result), result.size());
}
