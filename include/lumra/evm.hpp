// Error vectors over spans. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/evm.h>
#include <lumra/object.hpp>

#include <complex>
#include <cstddef>
#include <cstdint>
#include <span>
#include <type_traits>
#include <utility>
#include <vector>

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
                             align wanted = align::none, double sample_rate_hz = 1, const error_traces<T> &traces = {},
                             std::uint32_t threads = 1) requires(!std::is_same_v<T, real_type<T>>) {
  constexpr auto run = detail::form<T>(0, 0, &lumra_evm_measure_cf32, &lumra_evm_measure_cf64);
  detail::require_length(measured.size(), reference.size());
  for (const std::size_t length : {traces.error.size(), traces.magnitude.size(), traces.phase.size()})
    if (length != 0) detail::require_length(length, reference.size());
  lumra_evm_options how = LUMRA_EVM_OPTIONS;
  how.align = static_cast<std::uint32_t>(wanted);
  how.sample_rate_hz = sample_rate_hz;
  how.threads = threads;
  lumra_evm_result result{};
  result.size = sizeof result;
  check_open(run(detail::raw(reference.data()), detail::raw(measured.data()), reference.size(), &how, &result,
                 detail::raw(traces.error.data()), traces.magnitude.data(), traces.phase.data()));
  return result;
}

/// Two streams of T beside each other under a model; see evm.h. One thread at a time.
template <sample T>
class evm_meter {
  static_assert(!std::is_same_v<T, real_type<T>>);

 public:
  /// The type of the options is left out.
  explicit evm_meter(lumra_evm_meter_options options = LUMRA_EVM_METER_OPTIONS)
      : meter_(detail::make<owned>([&options](lumra_evm_meter **out) {
          options.type = detail::type_code<T>;
          return lumra_evm_meter_create(&options, out);
        })) {}

  void add(std::span<const T> reference, std::span<const T> measured) {
    detail::require_length(measured.size(), reference.size());
    check_open(lumra_evm_meter_add(meter_.get(), reference.data(), measured.data(), reference.size()));
  }
  /// `next` begins where this one ends.
  void merge(const evm_meter &next) { check_open(lumra_evm_meter_merge(meter_.get(), next.meter_.get())); }

  /// The errors under the model.
  [[nodiscard]] lumra_evm_result read() const {
    lumra_evm_result result{};
    result.size = sizeof result;
    check_open(lumra_evm_meter_read(meter_.get(), &result));
    return result;
  }
  /// A better model.
  [[nodiscard]] lumra_evm_refinement refine() const {
    lumra_evm_refinement refinement{};
    refinement.size = sizeof refinement;
    check_open(lumra_evm_meter_refine(meter_.get(), &refinement));
    return refinement;
  }
  [[nodiscard]] lumra_evm_meter_extent where() const { return where(meter_.get()); }

  [[nodiscard]] std::vector<std::byte> save() const {
    return detail::save(meter_.get(), &lumra_evm_meter_state_size, &lumra_evm_meter_save);
  }
  /// Replaces the meter by a saved one, which must be of T.
  void load(std::span<const std::byte> bytes) {
    auto loaded = detail::make<owned>(
        [&](lumra_evm_meter **out) { return lumra_evm_meter_load(bytes.data(), bytes.size(), out); });
    if (where(loaded.get()).type != detail::type_code<T>)
      throw error(status(LUMRA_WRONG_TYPE), "the saved meter is of another type");
    meter_ = std::move(loaded);
  }

 private:
  using owned = detail::owned<lumra_evm_meter, &lumra_evm_meter_free>;

  static lumra_evm_meter_extent where(const lumra_evm_meter *meter) {
    lumra_evm_meter_extent extent{};
    check_open(lumra_evm_meter_where(meter, &extent));
    return extent;
  }

  owned meter_;
};

/// Errors under a known model in units of the reference; see lumra_evm_errors. The type of the options is left out.
template <sample T>
void trace_evm(lumra_evm_meter_options options, std::span<const T> reference,
               std::type_identity_t<std::span<const T>> measured, const error_traces<T> &traces) {
  detail::require_length(measured.size(), reference.size());
  for (const std::size_t length : {traces.error.size(), traces.magnitude.size(), traces.phase.size()})
    if (length != 0) detail::require_length(length, reference.size());
  options.type = detail::type_code<T>;
  check_open(lumra_evm_errors(&options, reference.data(), measured.data(), reference.size(), traces.error.data(),
                              traces.magnitude.data(), traces.phase.data()));
}

}  // namespace lumra
