// A call of a function over host arrays, with arguments made after their types. SPDX-License-Identifier: MIT
#pragma once

#include <string_view>
#include <tuple>
#include <type_traits>

#include "host_arrays.hpp"

namespace fuzz {

/// What the calls of one input share: transforms, and what scalars are read and written.
struct shared_places {
  void *slots[2] = {nullptr, nullptr};
  double scalars[8] = {};
};

/// A function's argument. Arrays are r: read, w: written, x: workspace, most of them of one size; options are below the
/// letter's number; pointers to scalars may be null where the letter is ?.
template <class A>
A host_argument(input &in, call &on, shared_places &places, char letter, int size) {
  const role as = letter == 'r' ? reads : letter == 'w' ? writes : works;
  const auto some = [&] { return in.one_in(4) ? -1 : size; };
  if constexpr (std::is_same_v<A, void **>) {
    const unsigned which = in.choice(4);
    return which == 3 ? nullptr : &places.slots[which % 2];
  } else if constexpr (std::is_same_v<A, std::int32_t>) {
    const std::string_view letters = "234mfl";
    constexpr unsigned limits[] = {2, 3, 4, 13, 40, 300};
    return in.option(limits[letters.find(letter)]);
  } else if constexpr (std::is_floating_point_v<A>) {
    return static_cast<A>(in.real() * (in.flag() ? 1 : 9));
  } else if constexpr (std::is_pointer_v<std::remove_pointer_t<A>>) {
    constexpr bool output = std::is_pointer_v<std::remove_pointer_t<std::remove_pointer_t<A>>>;  // the handle's address
    using handle = std::conditional_t<output, std::remove_pointer_t<A>, A>;
    array &given = on.give<std::remove_pointer_t<std::remove_pointer_t<handle>>>(as, some(), some());
    if constexpr (output)
      return in.one_in(32) ? nullptr : reinterpret_cast<A>(&given.handle);
    else
      return reinterpret_cast<A>(given.handle);
  } else {
    using scalar = std::remove_const_t<std::remove_pointer_t<A>>;
    auto *const place = reinterpret_cast<scalar *>(&places.scalars[in.choice(8)]);
    *place = {};
    return letter == '?' && in.one_in(16) ? nullptr : place;
  }
}

/// Calls a function whose arguments the letters describe.
template <class... A>
std::int32_t call_host(input &in, call &on, shared_places &places, std::int32_t (*function)(A...),
                       std::string_view letters) {
  hold(letters.size() == sizeof...(A), "a letter for every argument");
  const auto size = static_cast<int>(in.choice(24));
  std::size_t next = 0;
  const std::tuple<A...> arguments{host_argument<A>(in, on, places, letters[next++], size)...};
  return std::apply(function, arguments);
}

}  // namespace fuzz
