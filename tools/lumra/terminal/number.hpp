// Numbers as people write them: 10M, 2.4G, 500k, 1e3, 20ms. SPDX-License-Identifier: MIT
#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace tool {

/// A decimal number with one of the prefixes T G M k m u n behind it or none, and one of the units Hz and s or none.
/// Gives nothing for any other text, infinity and NaN among them.
std::optional<double> parse_number(std::string_view text);

/// The same number for a reader that knows no prefix: whole ones without exponent, others with all their digits.
std::string plain_number(double value);

}  // namespace tool
