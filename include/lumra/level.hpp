// Levels over spans. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/level.h>
#include <lumra/object.hpp>

#include <cstddef>
#include <cstdint>
#include <span>
#include <utility>
#include <vector>

namespace lumra {

/// The levels of a stream of T from a position on; see level.h. One thread at a time; one that is loaded adds by the
/// caller's alone.
template <sample T>
class level_meter {
 public:
  explicit level_meter(std::uint64_t start = 0, std::uint32_t threads = 1)
      : level_(detail::make<owned>([=](lumra_level **out) {
          lumra_level_options how = LUMRA_LEVEL_OPTIONS;
          how.type = detail::type_code<T>;
          how.start = start;
          how.threads = threads;
          return lumra_level_create(&how, out);
        })) {}

  void add(std::span<const T> x) { check_open(lumra_level_add(level_.get(), x.data(), x.size())); }
  /// `next` begins where this one ends.
  void merge(const level_meter &next) { check_open(lumra_level_merge(level_.get(), next.level_.get())); }

  [[nodiscard]] lumra_level_result read() const {
    lumra_level_result result{};
    result.size = sizeof result;
    check_open(lumra_level_read(level_.get(), &result));
    return result;
  }
  /// For each level in decibels, the share of samples whose power is more than that above the mean.
  [[nodiscard]] std::vector<double> ccdf(std::span<const double> above_db) const {
    std::vector<double> share(above_db.size());
    check_open(lumra_level_ccdf(level_.get(), above_db.data(), share.data(), share.size()));
    return share;
  }
  [[nodiscard]] lumra_level_extent where() const { return where(level_.get()); }

  [[nodiscard]] std::vector<std::byte> save() const {
    return detail::save(level_.get(), &lumra_level_state_size, &lumra_level_save);
  }
  /// Replaces the levels by saved ones, which must be of T.
  void load(std::span<const std::byte> bytes) {
    auto loaded =
        detail::make<owned>([&](lumra_level **out) { return lumra_level_load(bytes.data(), bytes.size(), out); });
    if (where(loaded.get()).type != detail::type_code<T>)
      throw error(status(LUMRA_WRONG_TYPE), "the saved levels are of another type");
    level_ = std::move(loaded);
  }

 private:
  using owned = detail::owned<lumra_level, &lumra_level_free>;

  static lumra_level_extent where(const lumra_level *level) {
    lumra_level_extent extent{};
    check_open(lumra_level_where(level, &extent));
    return extent;
  }

  owned level_;
};

/// The same shares of a whole record, exactly.
template <sample T>
[[nodiscard]] std::vector<double> ccdf(std::span<const T> x, std::span<const double> above_db) {
  constexpr auto run = detail::form<T>(&lumra_ccdf_f32, &lumra_ccdf_f64, &lumra_ccdf_cf32, &lumra_ccdf_cf64);
  std::vector<double> share(above_db.size());
  check_open(run(detail::raw(x.data()), x.size(), above_db.data(), share.data(), share.size()));
  return share;
}

}  // namespace lumra
