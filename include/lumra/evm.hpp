// Error vectors over spans. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/evm.h>
#include <lumra/object.hpp>

#include <complex>
#include <cstdint>
#include <span>
#include <type_traits>

namespace lumra {

/// What is aligned; combined by |.
enum class align : std::uint32_t {
  none = LUMRA_ALIGN_NONE,
  gain = LUMRA_ALIGN_GAIN,
  delay = LUMRA_ALIGN_DELAY,
  frequency = LUMRA_ALIGN_FREQUENCY,
  dc = LUMRA_ALIGN_DC
};
constexpr align operator|(align a, align b) noexcept {
  return static_cast<align>(static_cast<std::uint32_t>(a) | static_cast<std::uint32_t>(b));
}

/// One value a sample, as long as the record; empty where not wanted.
template <class T>
struct error_traces {
  std::span<T> error;
  std::span<real_type<T>> magnitude, phase;
};

/// Compares measured samples with a reference as long; see evm.h.
template <sample T>
lumra_evm_result measure_evm(std::span<const T> reference, std::type_identity_t<std::span<const T>> measured,
                             align wanted = align::none, double sample_rate_hz = 1,
                             const error_traces<T> &traces = {}) requires(!std::is_same_v<T, real_type<T>>) {
  constexpr auto run = detail::form<T>(0, 0, &lumra_evm_measure_cf32, &lumra_evm_measure_cf64);
  detail::require_length(measured.size(), reference.size());
  for (const std::size_t length : {traces.error.size(), traces.magnitude.size(), traces.phase.size()})
    if (length != 0) detail::require_length(length, reference.size());
  lumra_evm_options how = LUMRA_EVM_OPTIONS;
  how.align = static_cast<std::uint32_t>(wanted);
  how.sample_rate_hz = sample_rate_hz;
  lumra_evm_result result{};
  result.size = sizeof result;
  check_open(run(detail::raw(reference.data()), detail::raw(measured.data()), reference.size(), &how, &result,
                 detail::raw(traces.error.data()), traces.magnitude.data(), traces.phase.data()));
  return result;
}

}  // namespace lumra
