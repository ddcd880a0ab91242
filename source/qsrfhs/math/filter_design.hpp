// The designs behind the registry of filters. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/filter_registry.h>

#include <cstdint>
#include <memory>

#include "qsrfhs/math/filter.hpp"

namespace qsrfhs {

/// The filter of a key, computed in double precision; null where key, input and number of coefficients (0: any) make
/// none. Throws std::bad_alloc.
std::unique_ptr<Filter> design_filter(const lumra_filter_key &key, const void *input, std::uint64_t count);

}  // namespace qsrfhs
