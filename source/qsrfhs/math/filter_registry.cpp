// SPDX-License-Identifier: MIT
#include "qsrfhs/math/filter_registry.hpp"

#include <lumra/status.h>

#include <algorithm>
#include <functional>

#include "platform/fork.hpp"
#include "platform/immortal.hpp"
#include "qsrfhs/math/filter_design.hpp"
#include "qsrfhs/util/management.hpp"

namespace qsrfhs {
namespace {

const platform::fork_participant<filter_registry> takes_part(platform::fork_rank::filters);

}  // namespace

static_assert(sizeof(lumra_filter_key) == 48 && sizeof(lumra_filter_record) == 32);

std::size_t filter_registry::key_hash::operator()(const lumra_filter_key &key) const noexcept {
  std::size_t hash = std::hash<std::int32_t>{}(key.kind);
  for (const double value : key.values) hash = hash * 31 + std::hash<double>{}(value);  // equal for 0 and -0
  return hash;
}

bool filter_registry::key_equal::operator()(const lumra_filter_key &a, const lumra_filter_key &b) const noexcept {
  return a.kind == b.kind && std::equal(std::begin(a.values), std::end(a.values), std::begin(b.values));
}

filter_registry &filter_registry::instance() noexcept {
  static platform::immortal<filter_registry> registry;
  return registry.get();
}

std::uint64_t filter_registry::total_cost() const noexcept {
  const std::lock_guard lock(mutex_);
  return total_cost_;
}

void filter_registry::refer(entry &shared, lumra_filter_record &record) noexcept {
  ++shared.references;
  record.entry = &shared;
  record.identifier = shared.identifier;
  shared.record = record;
}

/// A list of one new entry, empty where there is no design.
filter_registry::entry_list filter_registry::design(const void *input, const lumra_filter_key &key,
                                                    std::uint64_t count) {
  entry_list made;
  auto filter = design_filter(key, input, count);
  if (!filter) return made;
  entry &added = made.emplace_back();
  const std::size_t n = filter->length();
  added.delay_line = aligned_buffer<float>(2 * n);
  std::fill_n(added.delay_line.data(), 2 * n, 0.F);
  added.coefficients = filter->coefficients().data();
  added.state = added.delay_line.data();
  added.key = key;
  added.n = n;
  added.identifier = next_identifier_;
  added.filter = std::move(filter);
  return made;
}

std::int32_t filter_registry::register_filter(lumra_filter_record &record, const void *input,
                                              const lumra_filter_key &key, std::uint64_t count) noexcept try {
  const std::lock_guard lock(mutex_);
  if (const auto found = by_key_.find(key); found != by_key_.end()) {
    refer(*found->second, record);  // keeps its place in the list
    return LUMRA_SUCCESS;
  }
  entry_list made = design(input, key, count);
  if (made.empty()) return LUMRA_FILTER_NO_DESIGN;
  const auto added = made.begin();
  by_identifier_.emplace(added->identifier, added);
  // A key with a NaN never matches: it has no place among the keys.
  if (key_equal{}(key, key)) {
    try {
      by_key_.emplace(key, added);
    } catch (...) {
      by_identifier_.erase(added->identifier);
      throw;
    }
  }
  ++next_identifier_;
  evict(added->cost());
  total_cost_ += added->cost();
  cached_.splice(cached_.end(), made);
  refer(*added, record);
  return LUMRA_SUCCESS;
} catch (...) {
  return LUMRA_FILTER_NO_DESIGN;
}

std::int32_t filter_registry::match(lumra_filter_record &record, const lumra_filter_key &key) noexcept {
  const std::lock_guard lock(mutex_);
  const auto found = by_key_.find(key);
  if (found == by_key_.end()) return LUMRA_FILTER_MATCH_NONE;
  const auto matched = found->second;
  ++matched->references;
  record = matched->record;
  cached_.splice(cached_.end(), cached_, matched);
  return LUMRA_SUCCESS;
}

std::int32_t filter_registry::erase(const lumra_filter_key &key) noexcept {
  const std::lock_guard lock(mutex_);
  const auto found = by_key_.find(key);
  if (found == by_key_.end()) return LUMRA_FILTER_MATCH_NONE;
  const auto erased = found->second;
  if (erased->references == 0) {
    free_entry(cached_, erased);
  } else {
    forget_key(erased);
    erased->erase_pending = true;
    erased_.splice(erased_.end(), cached_, erased);
  }
  return LUMRA_FILTER_MATCH_ERASED;
}

std::int32_t filter_registry::unregister_filter(const lumra_filter_record &record) noexcept {
  const std::lock_guard lock(mutex_);
  const auto found = by_identifier_.find(record.identifier);
  if (found == by_identifier_.end() || &*found->second != record.entry || found->second->references == 0)
    return LUMRA_FILTER_UNREGISTER_UNKNOWN;
  const auto left = found->second;
  if (--left->references == 0 && left->erase_pending) free_entry(erased_, left);
  return LUMRA_SUCCESS;
}

/// Frees cached entries without references, least recently used first, until there is room for more within the budget.
void filter_registry::evict(std::uint64_t room) noexcept {
  for (auto next = cached_.begin(); next != cached_.end() && total_cost_ + room > budget;) {
    const auto seen = next++;
    if (seen->references == 0) free_entry(cached_, seen);
  }
}

void filter_registry::forget_key(entry_list::iterator cached) noexcept {
  const auto found = by_key_.find(cached->key);
  if (found != by_key_.end() && found->second == cached) by_key_.erase(found);
}

void filter_registry::free_entry(entry_list &list, entry_list::iterator freed) noexcept {
  if (!freed->erase_pending) forget_key(freed);
  by_identifier_.erase(freed->identifier);
  total_cost_ -= freed->cost();
  list.erase(freed);
}

}  // namespace qsrfhs

using namespace qsrfhs;

int32_t qsUtilHS_RegisterFilterSpec(lumra_filter_record *filter, const void *designInput, const lumra_filter_key *key,
                                    uint64_t designArgument) {
  if (!filter) return Management::addError(LUMRA_FILTER_REGISTER_NULL);
  if (!key) return Management::addError(LUMRA_FILTER_NO_DESIGN);
  const std::int32_t status = filter_registry::instance().register_filter(*filter, designInput, *key, designArgument);
  return status == LUMRA_SUCCESS ? LUMRA_SUCCESS : Management::addError(status);
}

int32_t qsUtilHS_UnegisterFilterSpec(lumra_filter_record *filter) {
  if (!filter) return Management::addError(LUMRA_FILTER_UNREGISTER_NULL);
  if (!filter->entry || filter->identifier == 0) return Management::addError(LUMRA_FILTER_UNREGISTER_EMPTY);
  const std::int32_t status = filter_registry::instance().unregister_filter(*filter);
  return status == LUMRA_SUCCESS ? LUMRA_SUCCESS : Management::addError(status);
}

int32_t qsUtilHS_MatchFilterSpecErase(lumra_filter_record *filter, const lumra_filter_key *key, int32_t erase) {
  if (!filter) return Management::addError(LUMRA_FILTER_MATCH_RECORD_NULL);
  if (!key) return Management::addError(LUMRA_FILTER_MATCH_KEY_NULL);
  filter_registry &registry = filter_registry::instance();
  return erase != 0 ? registry.erase(*key) : registry.match(*filter, *key);
}
