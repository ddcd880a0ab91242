// Filters over spans. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/filter_recursive.h>
#include <lumra/object.hpp>

#include <array>
#include <cstddef>
#include <cstdint>
#include <span>
#include <utility>
#include <vector>

namespace lumra {

enum class recursion : std::int32_t {
  automatic = LUMRA_IIR_AUTO,
  in_order = LUMRA_IIR_IN_ORDER,
  blocks = LUMRA_IIR_BLOCKS
};

/// A recursive filter over a stream of T; see filter_recursive.h. One thread at a time.
template <sample T>
class recursive_filter {
 public:
  using section = std::array<double, 6>;  // b[0], b[1], b[2], a[0], a[1], a[2]
  /// A state has its values in double precision, real or complex as the samples are.
  using state_value = std::conditional_t<std::is_floating_point_v<T>, double, std::complex<double>>;

  recursive_filter(std::span<const double> b, std::span<const double> a, recursion method = recursion::automatic)
      : filter_(detail::make<owned>([&](lumra_iir **out) {
          const lumra_iir_options how = options(method);
          return lumra_iir_create(&how, b.data(), b.size(), a.data(), a.size(), out);
        })) {}
  explicit recursive_filter(std::span<const section> sections, recursion method = recursion::automatic)
      : filter_(detail::make<owned>([&](lumra_iir **out) {
          const lumra_iir_options how = options(method);
          return lumra_iir_create_sections(&how, sections.empty() ? nullptr : sections.front().data(), sections.size(),
                                           out);
        })) {}

  /// Filters the stream's next samples; out has as many, and may be in.
  void operator()(std::span<const T> in, std::span<T> out) {
    if (in.size() != out.size()) throw error(status(LUMRA_TOO_LITTLE_ROOM), "in and out differ in length");
    check_open(lumra_iir_process(filter_.get(), in.data(), out.data(), in.size()));
  }
  [[nodiscard]] std::vector<T> operator()(std::span<const T> in) {
    std::vector<T> out(in.size());
    (*this)(in, out);
    return out;
  }

  void reset() { check_open(lumra_iir_reset(filter_.get())); }
  [[nodiscard]] recursion method() const {
    std::int32_t method = 0;
    check_open(lumra_iir_get_method(filter_.get(), &method));
    return static_cast<recursion>(method);
  }

  [[nodiscard]] std::vector<state_value> state() const {
    std::vector<state_value> values(static_cast<std::size_t>(lumra_iir_order(filter_.get())));
    check_open(lumra_iir_get_state(filter_.get(), values.data(), values.size()));
    return values;
  }
  void set_state(std::span<const state_value> values) {
    check_open(lumra_iir_set_state(filter_.get(), values.data(), values.size()));
  }

  [[nodiscard]] std::vector<std::byte> save() const {
    return detail::save(filter_.get(), &lumra_iir_state_size, &lumra_iir_save);
  }
  /// Replaces the filter by a saved one, which must be of T.
  void load(std::span<const std::byte> bytes) {
    auto loaded = detail::make<owned>([&](lumra_iir **out) { return lumra_iir_load(bytes.data(), bytes.size(), out); });
    std::int32_t type = 0;
    check_open(lumra_iir_get_type(loaded.get(), &type));
    if (type != detail::type_code<T>) throw error(status(LUMRA_WRONG_TYPE), "the saved filter is of another type");
    filter_ = std::move(loaded);
  }

 private:
  using owned = detail::owned<lumra_iir, &lumra_iir_free>;

  static lumra_iir_options options(recursion method) noexcept {
    lumra_iir_options how = LUMRA_IIR_OPTIONS;
    how.type = detail::type_code<T>;
    how.method = static_cast<std::int32_t>(method);
    return how;
  }

  owned filter_;
};

}  // namespace lumra
