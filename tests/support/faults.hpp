// The kinds of calls that can be made to fail. Only for executables that are linked with faults.cpp, with the calls of
// the libraries wrapped by the linker. SPDX-License-Identifier: MIT
#pragma once

#include "support/fault_counter.hpp"

namespace tests {

/// DFTI calls; DFTI_MEMORY_ERROR. A call to free a descriptor that fails has freed it nevertheless.
extern fault_counter transforms;
extern fault_counter lapack;  // a call that fails does nothing but tell its status as `info`

}  // namespace tests
