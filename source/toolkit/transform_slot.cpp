// SPDX-License-Identifier: MIT
#include "toolkit/transform_slot.hpp"

#include <lumra/host_array.h>

#include <memory>
#include <utility>

namespace toolkit {

int release(void **slot) noexcept {
  if (!slot || !*slot) return transform_ok;
  const std::unique_ptr<cached_transform> transform(static_cast<cached_transform *>(std::exchange(*slot, nullptr)));
  const MKL_LONG status = DftiFreeDescriptor(&transform->descriptor);
  return status == 0 || DftiErrorClass(status, DFTI_NO_ERROR) ? transform_ok : transform_free_failed;
}

}  // namespace toolkit

int32_t qsHost_ReleaseTransform(void **slot) {
  return toolkit::release(slot);
}
