// Builds whose widest registers are those of the bodies that need eight lanes. SPDX-License-Identifier: MIT

using wide = f8;
using wide_mask = f8;
using wide_double = d4;

static constexpr bool loads_lines = false;
template <class Lanes>
struct across_lines;
