// SPDX-License-Identifier: MIT
#include "host/resize_service.hpp"

#include <atomic>

#include "host/array_allocator.hpp"
#include "platform/process.hpp"

namespace host {
namespace {

std::int32_t own_service(std::int32_t type, std::int32_t dimensions, void *handle_address, std::uint64_t count) {
  return array_allocator::instance().resize(element_type{type}, dimensions, static_cast<void ***>(handle_address),
                                            count);
}

// The service in use; null until the process has been searched. Threads that search at once find the same.
std::atomic<lumra_array_resize> service_in_use{nullptr};

lumra_array_resize service() noexcept {
  lumra_array_resize service = service_in_use.load(std::memory_order_acquire);
  if (service) return service;
  const auto found = reinterpret_cast<lumra_array_resize>(platform::find_symbol("HostArrayResize"));
  const lumra_array_resize wanted = found ? found : &own_service;
  // A service handed over meanwhile wins.
  return service_in_use.compare_exchange_strong(service, wanted, std::memory_order_acq_rel) ? wanted : service;
}

}  // namespace

void set_resize_service(lumra_array_resize service) noexcept {
  service_in_use.store(service, std::memory_order_release);
}

bool request_resize(element_type type, std::int32_t dimensions, void *handle_address, std::uint64_t count,
                    std::uint64_t host_size) {
  const lumra_array_resize resize = service();
  const std::uint64_t size = resize == &own_service ? count : host_size;
  return resize(static_cast<std::int32_t>(type), dimensions, handle_address, size) == 0;
}

}  // namespace host
