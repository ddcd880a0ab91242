// SPDX-License-Identifier: MIT
#include "qsrfhs/vector/fft_resampler.hpp"

#include <mkl_dfti.h>

#include <algorithm>
#include <cmath>
#include <exception>
#include <memory>
#include <new>
#include <utility>

#include "platform/fork.hpp"
#include "platform/immortal.hpp"
#include "qsrfhs/math/fft.hpp"
#include "qsrfhs/math/mkl_memory.hpp"
#include "qsrfhs/math/mkl_runtime.hpp"
#include "qsrfhs/math/mkl_section.hpp"
#include "qsrfhs/math/mkl_status.hpp"
#include "qsrfhs/util/array_store.hpp"
#include "qsrfhs/util/management.hpp"
#include "qsrfhs/vector/kernels/kernels.hpp"

namespace qsrfhs {
namespace {

using sample = std::complex<float>;

static_assert(sizeof(resampler_descriptor) == 40);

DFTI_DESCRIPTOR_HANDLE transform_of(const resampler_descriptor &descriptor) noexcept {
  return static_cast<DFTI_DESCRIPTOR_HANDLE>(descriptor.transform);
}

bool free_transform(resampler_descriptor &descriptor) noexcept {
  const mkl_section section;
  DFTI_DESCRIPTOR_HANDLE transform = transform_of(descriptor);
  const bool freed = !failed(DftiFreeDescriptor(&transform));
  descriptor.transform = transform;
  return freed;
}

std::int32_t set_up(resampler_descriptor &descriptor, std::uint32_t length, bool inverse,
                    const mkl_memory::watch &watched) noexcept {
  if (descriptor.transform) {
    MKL_LONG present = 0;
    if (failed(DftiGetValue(transform_of(descriptor), DFTI_LENGTHS, &present))) return resampler_length_query;
    if (present == static_cast<MKL_LONG>(length)) return resampler_ok;
    if (!free_transform(descriptor)) return resampler_free_failed;
  }
  if (length < 1 || length > max_fft_length) return resampler_create;
  const mkl_section section;
  DFTI_DESCRIPTOR_HANDLE made = nullptr;
  const MKL_LONG created = DftiCreateDescriptor(&made, DFTI_SINGLE, DFTI_COMPLEX, 1, static_cast<MKL_LONG>(length));
  descriptor.transform = made;
  if (failed(watched.status(created))) return resampler_create;
  if (inverse) {
    if (failed(DftiSetValue(made, DFTI_BACKWARD_SCALE, 1.0 / length))) return resampler_scale;
    if (failed(DftiSetValue(made, DFTI_PLACEMENT, DFTI_INPLACE))) return resampler_in_place;
  } else if (failed(DftiSetValue(made, DFTI_PLACEMENT, DFTI_NOT_INPLACE))) {
    return resampler_out_of_place;
  }
  return failed(watched.status(DftiCommitDescriptor(made))) ? resampler_commit : resampler_ok;
}

bool transform_forward(const resampler_descriptor &descriptor, const sample *in, sample *out) noexcept {
  const mkl_section section;
  const auto compute = [&] { return DftiComputeForward(transform_of(descriptor), const_cast<sample *>(in), out); };
  return !failed(mkl_memory::watched_status(compute));
}

bool transform_backward(const resampler_descriptor &descriptor, sample *data) noexcept {
  const mkl_section section;
  return !failed(mkl_memory::watched_status([&] { return DftiComputeBackward(transform_of(descriptor), data); }));
}

bool make_buffer(resampler_descriptor &descriptor) noexcept {
  constexpr std::uintptr_t page = 4096;
  descriptor.buffer_block = ::operator new (std::size_t{descriptor.length} * sizeof(sample) + 2 * page, std::nothrow);
  if (!descriptor.buffer_block) return false;
  auto *const start = static_cast<char *>(descriptor.buffer_block);
  descriptor.aligned_buffer = start + (page - reinterpret_cast<std::uintptr_t>(start) % page);
  return true;
}

/// Calls put(bin, source, count) for the stretches of a channel's m bins that the spectrum of n bins has.
template <class Put>
void for_each_run(std::int64_t n, std::int64_t m, std::int64_t centre, Put put) {
  const std::int64_t middle = n / 2, start = centre - m / 2, end = centre + m / 2;
  if (start < 0) {
    // From end + middle, not from the middle on: what callers' weights are made for. Past the spectrum there is none.
    const std::int64_t source = end + middle, count = std::min(m + start, n - source);
    if (count > 0) put(-start, source, count);
    return;
  }
  const std::int64_t count = std::min(m, n - start);
  const std::int64_t below = std::clamp<std::int64_t>(middle - start, 0, std::max<std::int64_t>(count, 0));
  if (below > 0) put(0, start + (n - middle), below);
  if (count > below) put(below, start + below - middle, count - below);
}

/// The channel's bins, weighed, rotated and with their halves swapped: 0 Hz first, as the backward transform wants it.
void fill_bins(const resampler_plan &plan, const resampler_channel &channel, double phase, const sample *spectrum,
               sample *bins) noexcept {
  const kernels::kernel_table &kernel = kernels::active();
  const auto cosine = static_cast<float>(std::cos(phase)), sine = static_cast<float>(std::sin(phase));
  const std::int64_t m = plan.m, half = m / 2;

  std::int64_t covered = 0;
  for_each_run(plan.n, m, channel.centre, [&](std::int64_t, std::int64_t, std::int64_t count) { covered += count; });
  if (covered < m) std::fill_n(bins, m, sample(0));

  for_each_run(plan.n, m, channel.centre, [&](std::int64_t bin, std::int64_t source, std::int64_t count) {
    while (count > 0) {
      // The lower half goes up, the upper half down; the last bin of an odd number stays.
      const std::int64_t part_end = bin < half ? half : bin < 2 * half ? 2 * half : m;
      const std::int64_t target = bin < half ? bin + half : bin < 2 * half ? bin - half : bin;
      const std::int64_t length = std::min(count, part_end - bin);
      const auto *const x = reinterpret_cast<const float *>(spectrum + source);
      auto *const out = reinterpret_cast<float *>(bins + target);
      const float *const weights = channel.weights + 2 * bin;
      if (phase == 0)
        kernel.weigh(x, weights, out, static_cast<std::size_t>(length));
      else
        kernel.weigh_and_rotate(x, weights, cosine, sine, out, static_cast<std::size_t>(length));
      bin += length;
      source += length;
      count -= length;
    }
  });
}

/// Writes every stride-th sample of a block's kept run to the channel's output.
void put_out(const resampler_plan &plan, resampler_channel &channel, const sample *block, bool first) noexcept {
  const std::size_t from = first ? 0 : plan.overlap, to = plan.m - plan.overlap, stride = plan.m / channel.divisor;
  const std::uint64_t place = channel.output_offset + channel.produced / stride;
  channel.produced += to - from;
  if (place >= channel.output.size()) return;
  const std::size_t count = std::min<std::size_t>((to - from + stride - 1) / stride, channel.output.size() - place);
  const auto out = channel.output.subspan(place, count);
  if (stride == 1) {
    std::copy_n(block + from, count, out.begin());
    return;
  }
  for (std::size_t k = 0; k < count; ++k) out[k] = block[from + k * stride];
}

const platform::fork_participant<descriptor_cache> takes_part(platform::fork_rank::resampler_descriptors);

}  // namespace

std::int32_t prepare(resampler_descriptor &descriptor, std::uint32_t length, bool inverse) noexcept {
  const mkl_runtime::use in_use;
  const mkl_memory::descriptor_watch watched;
  const std::int32_t status = set_up(descriptor, length, inverse, watched);
  if (status == resampler_ok) return status;
  Management::addError(status);
  if (descriptor.transform && !free_transform(descriptor)) Management::addError(resampler_free_failed_again);
  descriptor.transform = nullptr;
  return status;
}

void release(resampler_descriptor &descriptor) noexcept {
  ::operator delete(descriptor.buffer_block);
  descriptor.buffer_block = descriptor.aligned_buffer = nullptr;
  if (descriptor.transform) (void)free_transform(descriptor);
  descriptor.transform = nullptr;
  descriptor.status = Management::addError(resampler_released);
}

descriptor_cache &descriptor_cache::instance() noexcept {
  static platform::immortal<descriptor_cache> cache;
  return cache.get();
}

descriptor_cache::entry *descriptor_cache::take(const purpose &wanted, std::uint64_t &turn_before) noexcept {
  const std::lock_guard lock(mutex_);
  entry *newest = nullptr;
  for (entry *seen = first_; seen; seen = seen->next)
    if (seen->available && seen->made_for == wanted && (!newest || seen->turn > newest->turn)) newest = seen;
  if (!newest) return nullptr;
  newest->available = false;
  turn_before = std::exchange(newest->turn, ++turns_);
  return newest;
}

void descriptor_cache::add(entry &made) noexcept {
  const std::lock_guard lock(mutex_);
  made.turn = ++turns_;
  made.next = std::exchange(first_, &made);
}

void descriptor_cache::remove(entry &made) noexcept {
  const std::lock_guard lock(mutex_);
  entry **link = &first_;
  while (*link != &made) link = &(*link)->next;
  *link = made.next;
}

/// Undoes a take.
void descriptor_cache::put_back(entry &taken, std::uint64_t turn_before) noexcept {
  const std::lock_guard lock(mutex_);
  taken.turn = turn_before;
  taken.available = true;
}

/// One without an entry is beyond repair: it was never handed out.
void descriptor_cache::give_back(std::uint64_t, void *descriptor) noexcept {
  descriptor_cache &cache = instance();
  const std::lock_guard lock(cache.mutex_);
  entry *seen = cache.first_;
  while (seen && &seen->descriptor != descriptor) seen = seen->next;
  if (!seen) std::terminate();
  seen->available = true;
}

std::int32_t descriptor_cache::create(resampler_descriptor **out, std::uint32_t length, std::uint32_t buffer_flag,
                                      std::uint32_t inverse_flag, std::uint64_t owner) noexcept {
  *out = nullptr;
  const purpose wanted{length, buffer_flag, inverse_flag};
  std::uint64_t turn_before = 0;
  entry *lent = take(wanted, turn_before);
  std::unique_ptr<entry> made;
  if (!lent) {
    made.reset(new (std::nothrow) entry);
    if (!made) return Management::addError(resampler_no_descriptor);
    made->made_for = wanted;
    resampler_descriptor &fresh = made->descriptor;
    fresh.length = length;
    fresh.buffer_flag = buffer_flag;
    fresh.inverse_flag = inverse_flag;
    fresh.status = prepare(fresh, length, inverse_flag != 0);
    if (fresh.status == resampler_ok && buffer_flag != 0 && inverse_flag != 0 && !make_buffer(fresh))
      fresh.status = Management::addError(resampler_no_buffer);
    if (const std::int32_t status = fresh.status; status != resampler_ok) {
      release(fresh);
      return status;
    }
    // In the cache before it is registered: from then on any thread may release the owner.
    lent = made.get();
    add(*lent);
  }
  if (const std::int32_t status = cleanup_registry::instance().add(owner, &lent->descriptor, &give_back)) {
    if (!made) put_back(*lent, turn_before);
    if (made) remove(*lent);
    Management::addError(status);
    if (made) release(made->descriptor);
    return status;
  }
  *out = &lent->descriptor;
  (void)made.release();
  return resampler_ok;
}

void process_block(const resampler_plan &plan, resampler_descriptor &forward, resampler_descriptor &inverse,
                   const sample *input, sample *spectrum, std::uint64_t block, bool first,
                   std::span<resampler_channel> channels) noexcept {
  const mkl_runtime::use in_use;
  if (prepare(forward, plan.n, false) != resampler_ok || !transform_forward(forward, input, spectrum))
    Management::addError(resampler_forward);
  auto *const bins = static_cast<sample *>(inverse.aligned_buffer);
  const auto start = static_cast<double>(block * plan.hop());
  for (resampler_channel &channel : channels) {
    fill_bins(plan, channel, start * channel.phase_step + channel.phase_start, spectrum, bins);
    if (prepare(inverse, plan.m, true) != resampler_ok || !transform_backward(inverse, bins))
      Management::addError(resampler_backward);
    put_out(plan, channel, bins, first);
  }
}

}  // namespace qsrfhs

int32_t qsUtilHS_FFTResampler_CSG_CreateDescriptor(lumra_resampler_descriptor **out, uint32_t length,
                                                   uint32_t bufferFlag, uint32_t inverseFlag, uint64_t owner) {
  using namespace qsrfhs;
  if (!out) return Management::addError(resampler_no_descriptor);
  return descriptor_cache::instance().create(out, length, bufferFlag, inverseFlag, owner);
}
