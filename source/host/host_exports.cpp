// SPDX-License-Identifier: MIT
#include <lumra/host_array.h>
#include <lumra/status.h>

#include "host/array_allocator.hpp"
#include "host/resize_service.hpp"

using host::array_allocator;
using host::element_type;

int32_t qsHost_SetArrayResize(lumra_array_resize service) {
  host::set_resize_service(service);
  return LUMRA_SUCCESS;
}

int32_t qsHost_ArrayNew(int32_t typeCode, int32_t dimensions, const int32_t *sizes, void *array) {
  return array_allocator::instance().create(element_type{typeCode}, dimensions, sizes, static_cast<void ***>(array));
}

int32_t qsHost_ArrayFree(void *array) {
  array_allocator::instance().destroy(static_cast<void ***>(array));
  return LUMRA_SUCCESS;
}

int32_t qsHost_ArrayResize(int32_t typeCode, int32_t dimensions, void *array, uint64_t newSize) {
  return array_allocator::instance().resize(element_type{typeCode}, dimensions, static_cast<void ***>(array), newSize);
}
