// Objects that are slow to make, kept for the next call. SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <cstddef>
#include <utility>
#include <vector>

namespace binding {

/// The objects used latest, by key. For one thread. An object in use is not among them, so that a signal handler in the
/// middle of the use gets another one.
template <class Key, class Object>
class recent {
 public:
  explicit recent(std::size_t most) noexcept : most_(most) {}

  /// The object for the key, which make() makes where there is none.
  template <class Make>
  Object take(const Key &key, Make make) {
    const auto found = std::find_if(kept_.begin(), kept_.end(), [&](const auto &each) { return each.first == key; });
    if (found == kept_.end()) return make();
    Object taken = std::move(found->second);
    kept_.erase(found);
    return taken;
  }
  void keep(const Key &key, Object object) {
    if (kept_.size() == most_) kept_.erase(kept_.begin());
    kept_.emplace_back(key, std::move(object));
  }

 private:
  std::size_t most_;
  std::vector<std::pair<Key, Object>> kept_;  // the latest last
};

}  // namespace binding
