// SPDX-License-Identifier: MIT
#include "host/resize_service.hpp"

#include <atomic>
#include <mutex>

#include "host/array_allocator.hpp"
#include "platform/fork.hpp"
#include "platform/process.hpp"

namespace host {
namespace {

std::int32_t own_service(std::int32_t type, std::int32_t dimensions, void *handle_address, std::uint64_t count) {
  return array_allocator::instance().resize(element_type{type}, dimensions, static_cast<void ***>(handle_address),
                                            count);
}

// The service in use; null until the process has been searched.
std::atomic<lumra_array_resize> service_in_use{nullptr};

// Held for the search: no fork may find another thread in it, as the system's loader has a lock of its own.
constinit std::mutex search_mutex;

constexpr platform::fork_handlers fork_handlers{[]() noexcept { search_mutex.lock(); },
                                                []() noexcept { search_mutex.unlock(); },
                                                []() noexcept { search_mutex.unlock(); }};
const platform::fork_participation takes_part(platform::fork_rank::resize_service, fork_handlers);

lumra_array_resize service() noexcept {
  lumra_array_resize service = service_in_use.load(std::memory_order_acquire);
  if (service) return service;
  const std::lock_guard lock(search_mutex);
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
