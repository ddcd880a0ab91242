// What options of several objects have in common. SPDX-License-Identifier: MIT
#pragma once

#include <cmath>
#include <cstdint>
#include <string_view>

#include "open/door.hpp"
#include "open/element.hpp"

namespace doors {

inline void require_rate(double rate, std::string_view name) {
  require(rate > 0 && std::isfinite(rate), LUMRA_OUT_OF_RANGE, name, " is ", rate, "; it is a number of hertz above 0");
}

inline void require_threads(std::uint32_t threads, std::string_view name) {
  constexpr std::uint32_t most = 1024;
  require(threads <= most, LUMRA_OUT_OF_RANGE, name, " is ", threads, "; it is 0 to ", most);
}

/// Of half the rate at which a band ends.
template <class... Name>
void require_passband(double passband, const Name &...name) {
  constexpr double most = 0.99;
  require(passband > 0 && passband <= most, LUMRA_OUT_OF_RANGE, name..., " is ", passband, "; it is above 0 to ", most,
          ", the part of half the lower rate that is kept");
}

/// Of what changes rates. Single precision ends where its rounding begins.
inline void require_rejection(double rejection_db, std::int32_t type) {
  constexpr double least = 40, most_single = 120, most_double = 150;
  const double most = is_single(type) ? most_single : most_double;
  require(rejection_db >= least && rejection_db <= most, LUMRA_OUT_OF_RANGE, "options->rejection_db is ", rejection_db,
          "; it is ", least, " to ", most, is_single(type) ? " in single precision" : "");
}

}  // namespace doors
