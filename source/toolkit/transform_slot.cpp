// SPDX-License-Identifier: MIT
#include "toolkit/transform_slot.hpp"

#include <lumra/host_array.h>

#include <algorithm>
#include <memory>
#include <utility>

#include "toolkit/frame.hpp"

namespace toolkit {
namespace {

/// What a slot points to.
struct kept_transform {
  explicit kept_transform(const dsp::dfti_settings &wanted) : settings(wanted), descriptor(wanted) {}

  /// The lengths are read back from MKL.
  [[nodiscard]] bool fits(const dsp::dfti_settings &wanted) const {
    const auto lengths = descriptor.lengths();
    return std::equal(lengths.begin(), lengths.end(), wanted.lengths) && settings == wanted;
  }

  dsp::dfti_settings settings;
  dsp::dfti_descriptor descriptor;
};

}  // namespace

void check_transform_size(std::int64_t points) {
  require(points <= static_cast<std::int64_t>(dsp::most_fft_points), no_transform);
}

transform_slot::~transform_slot() {
  (void)release(&own_);
}

const dsp::dfti_descriptor &transform_slot::get(const dsp::dfti_settings &wanted) {
  taken_ = true;
  const auto *held = static_cast<const kept_transform *>(*slot_);
  if (!held || !held->fits(wanted)) {
    require(release(slot_), transform_not_freed);
    *slot_ = new kept_transform(wanted);
  }
  return static_cast<const kept_transform *>(*slot_)->descriptor;
}

void transform_slot::clear() noexcept {
  if (taken_) (void)release(slot_);
}

bool release(void **slot) noexcept {
  if (!slot || !*slot) return true;
  const std::unique_ptr<kept_transform> held(static_cast<kept_transform *>(std::exchange(*slot, nullptr)));
  return held->descriptor.free();
}

}  // namespace toolkit

int32_t qsHost_ReleaseTransform(void **slot) {
  return toolkit::release(slot) ? toolkit::success : toolkit::transform_not_freed;
}
