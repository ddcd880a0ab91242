// Designed filters by key, shared by reference count, least recently used first to go.
// SPDX-License-Identifier: MIT
#pragma once

#include <lumra/filter_registry.h>

#include <cstdint>
#include <list>
#include <memory>
#include <mutex>
#include <unordered_map>

#include "qsrfhs/math/filter.hpp"
#include "qsrfhs/util/aligned_buffer.hpp"

namespace qsrfhs {

class filter_registry {
 public:
  static constexpr std::uint64_t budget = 134'217'728;

  static filter_registry &instance() noexcept;

  std::int32_t register_filter(lumra_filter_record &record, const void *input, const lumra_filter_key &key,
                               std::uint64_t count) noexcept;
  std::int32_t unregister_filter(const lumra_filter_record &record) noexcept;
  std::int32_t match(lumra_filter_record &record, const lumra_filter_key &key) noexcept;
  std::int32_t erase(const lumra_filter_key &key) noexcept;

  /// Bytes that all filters count for, erased ones with references included.
  [[nodiscard]] std::uint64_t total_cost() const noexcept;

  void before_fork() noexcept { mutex_.lock(); }
  void after_fork_in_parent() noexcept { mutex_.unlock(); }
  void after_fork_in_child() noexcept { mutex_.unlock(); }

 private:
  struct entry : lumra_filter_entry {
    std::unique_ptr<Filter> filter;
    aligned_buffer<float> delay_line;
    std::uint32_t references = 0;
    lumra_filter_record record{};
    bool erase_pending = false;

    [[nodiscard]] std::uint64_t cost() const noexcept { return (n + 384) * 32; }
  };
  using entry_list = std::list<entry>;
  struct key_hash {
    std::size_t operator()(const lumra_filter_key &key) const noexcept;
  };
  struct key_equal {
    bool operator()(const lumra_filter_key &a, const lumra_filter_key &b) const noexcept;
  };

  static void refer(entry &shared, lumra_filter_record &record) noexcept;
  entry_list design(const void *input, const lumra_filter_key &key, std::uint64_t count);
  void evict(std::uint64_t room) noexcept;
  void free_entry(entry_list &list, entry_list::iterator freed) noexcept;
  void forget_key(entry_list::iterator cached) noexcept;

  mutable std::mutex mutex_;
  // All under mutex_.
  entry_list cached_;                                                                       // least recently used first
  entry_list erased_;                                                                       // still referenced
  std::unordered_map<lumra_filter_key, entry_list::iterator, key_hash, key_equal> by_key_;  // cached ones
  std::unordered_map<std::uint64_t, entry_list::iterator> by_identifier_;                   // all
  std::uint64_t total_cost_ = 0;
  std::uint64_t next_identifier_ = 1;
};

}  // namespace qsrfhs
