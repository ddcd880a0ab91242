// Single long calls that a KeyboardInterrupt must not wait for. SPDX-License-Identifier: MIT
#pragma once

#include <pybind11/pybind11.h>

#include <functional>
#include <vector>

namespace binding {

/// Runs work that is one call of the library, without the GIL. Where it may take long and signals come to this thread,
/// another thread does it, so that a signal handler that raises ends the wait at once. The work then goes on to its end
/// unseen: it may use what it holds by value and the memory of the objects `held`, and the process waits for it before
/// it ends. The GIL is held by the caller.
void run_patiently(double expected_seconds, std::vector<pybind11::object> held, std::function<void()> work);

/// Lets the process wait for work that goes on, before it ends.
void add_patience();

}  // namespace binding
