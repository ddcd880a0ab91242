// SPDX-License-Identifier: MIT
#include "qsrfhs/vector/fft_resampler.hpp"

#include <lumra/status.h>
#include <mkl_dfti.h>

#include <algorithm>
#include <cmath>
#include <memory>
#include <new>
#include <utility>

#include "platform/fork.hpp"
#include "platform/immortal.hpp"
#include "qsrfhs/math/mkl_memory.hpp"
#include "qsrfhs/math/mkl_runtime.hpp"
#include "qsrfhs/math/mkl_section.hpp"
#include "qsrfhs/math/mkl_status.hpp"
#include "qsrfhs/util/array_store.hpp"
#include "qsrfhs/util/management.hpp"
#include "qsrfhs/vector/kernels/kernels.hpp"
#include "signal/dfti_descriptor.hpp"

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

std::int32_t code_of(dsp::dfti_step failed, direction towards) noexcept {
  switch (failed) {
    case dsp::dfti_step::scale:
      return LUMRA_RESAMPLER_SCALE;
    case dsp::dfti_step::placement:
      return towards == direction::inverse ? LUMRA_RESAMPLER_IN_PLACE : LUMRA_RESAMPLER_OUT_OF_PLACE;
    case dsp::dfti_step::commit:
      return LUMRA_RESAMPLER_COMMIT;
    default:
      return LUMRA_RESAMPLER_CREATE;
  }
}

/// Makes a transform; where it fails, what there is of it has to be freed while `watched` lasts.
std::int32_t set_up(resampler_descriptor &descriptor, std::uint32_t length, direction towards,
                    const mkl_memory::watch &watched) noexcept {
  if (length < 1 || length > dsp::most_fft_points) return LUMRA_RESAMPLER_CREATE;
  const bool inverse = towards == direction::inverse;
  DFTI_DESCRIPTOR_HANDLE made = nullptr;
  const auto failure = dsp::make_descriptor(
      made, {.lengths = {length, 0}, .in_place = inverse, .backward_scale = inverse ? 1.0 / length : 1.0}, watched);
  descriptor.transform = made;
  return failure ? code_of(failure->step, towards) : LUMRA_SUCCESS;
}

/// Frees a transform of another length.
std::int32_t make_way(resampler_descriptor &descriptor, std::uint32_t length) noexcept {
  MKL_LONG present = 0;
  if (failed(DftiGetValue(transform_of(descriptor), DFTI_LENGTHS, &present))) return LUMRA_RESAMPLER_LENGTH_QUERY;
  if (present == static_cast<MKL_LONG>(length)) return LUMRA_SUCCESS;
  return free_transform(descriptor) ? LUMRA_SUCCESS : LUMRA_RESAMPLER_FREE_FAILED;
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
    // The stretch begins at end + middle, not at the middle, as callers' weights are made for. The spectrum has none past
    // its end.
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
  const kernels::kernel_table &kernel = kernels::exact();
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

std::int32_t prepare(resampler_descriptor &descriptor, std::uint32_t length, direction towards) noexcept {
  const mkl_runtime::use in_use;
  std::int32_t status = descriptor.transform ? make_way(descriptor, length) : LUMRA_SUCCESS;
  if (status == LUMRA_SUCCESS && descriptor.transform) return status;
  bool freed = true;
  {
    const mkl_section section;
    const mkl_memory::descriptor_watch watched;
    if (status == LUMRA_SUCCESS) status = set_up(descriptor, length, towards, watched);
    if (status != LUMRA_SUCCESS && descriptor.transform) freed = free_transform(descriptor);
  }
  if (status == LUMRA_SUCCESS) return status;
  // Nothing is recorded inside of the section: that takes a lock.
  Management::addError(status);
  if (!freed) Management::addError(LUMRA_RESAMPLER_FREE_FAILED_AGAIN);
  descriptor.transform = nullptr;
  return status;
}

void release(resampler_descriptor &descriptor) noexcept {
  ::operator delete(descriptor.buffer_block);
  descriptor.buffer_block = descriptor.aligned_buffer = nullptr;
  if (descriptor.transform) (void)free_transform(descriptor);
  descriptor.transform = nullptr;
  descriptor.status = Management::addError(LUMRA_RESAMPLER_RELEASED);
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

/// Nothing but an entry's descriptor is registered with it.
void descriptor_cache::give_back(void *descriptor) noexcept {
  auto &returned = static_cast<entry &>(*static_cast<resampler_descriptor *>(descriptor));
  const std::lock_guard lock(instance().mutex_);
  returned.available = true;
}

std::int32_t descriptor_cache::create(resampler_descriptor **out, std::uint32_t length, std::uint32_t buffer_flag,
                                      std::uint32_t inverse_flag, std::uint64_t owner) noexcept {
  *out = nullptr;
  const purpose wanted{length, buffer_flag, inverse_flag};
  std::uint64_t turn_before = 0;
  entry *lent = take(wanted, turn_before);
  std::unique_ptr<entry> made;
  if (!lent) {
    made.reset(new (std::nothrow) entry{});
    if (!made) return Management::addError(LUMRA_RESAMPLER_NO_DESCRIPTOR);
    made->made_for = wanted;
    resampler_descriptor &fresh = *made;
    fresh.length = length;
    fresh.buffer_flag = buffer_flag;
    fresh.inverse_flag = inverse_flag;
    fresh.status = prepare(fresh, length, inverse_flag != 0 ? direction::inverse : direction::forward);
    if (fresh.status == LUMRA_SUCCESS && buffer_flag != 0 && inverse_flag != 0 && !make_buffer(fresh))
      fresh.status = Management::addError(LUMRA_RESAMPLER_NO_BUFFER);
    if (const std::int32_t status = fresh.status; status != LUMRA_SUCCESS) {
      release(fresh);
      return status;
    }
    // In the cache before it is registered: from then on any thread may release the owner.
    lent = made.get();
    add(*lent);
  }
  resampler_descriptor *const descriptor = lent;
  if (const std::int32_t status = cleanup_registry::instance().add(owner, descriptor, &give_back)) {
    if (made)
      remove(*lent);
    else
      put_back(*lent, turn_before);
    Management::addError(status);
    if (made) release(*made);
    return status;
  }
  *out = descriptor;
  (void)made.release();
  return LUMRA_SUCCESS;
}

void process_block(const resampler_plan &plan, resampler_descriptor &forward, resampler_descriptor &inverse,
                   const sample *input, sample *spectrum, std::uint64_t block, bool first,
                   std::span<resampler_channel> channels) noexcept {
  const mkl_runtime::use in_use;
  if (prepare(forward, plan.n, direction::forward) != LUMRA_SUCCESS || !transform_forward(forward, input, spectrum))
    Management::addError(LUMRA_RESAMPLER_FORWARD);
  auto *const bins = static_cast<sample *>(inverse.aligned_buffer);
  const auto start = static_cast<double>(block * plan.hop());
  for (resampler_channel &channel : channels) {
    fill_bins(plan, channel, start * channel.phase_step + channel.phase_start, spectrum, bins);
    if (prepare(inverse, plan.m, direction::inverse) != LUMRA_SUCCESS || !transform_backward(inverse, bins))
      Management::addError(LUMRA_RESAMPLER_BACKWARD);
    put_out(plan, channel, bins, first);
  }
}

}  // namespace qsrfhs

int32_t qsUtilHS_FFTResampler_CSG_CreateDescriptor(lumra_resampler_descriptor **out, uint32_t length,
                                                   uint32_t bufferFlag, uint32_t inverseFlag, uint64_t owner) {
  using namespace qsrfhs;
  if (!out) return Management::addError(LUMRA_RESAMPLER_NO_DESCRIPTOR);
  return descriptor_cache::instance().create(out, length, bufferFlag, inverseFlag, owner);
}
