// SPDX-License-Identifier: MIT
#include "toolkit/frame.hpp"

#include "signal/dfti_descriptor.hpp"

namespace toolkit {

std::int32_t status_of_current_exception() noexcept {
  try {
    throw;
  } catch (const failure &f) {
    return f.code();
  } catch (const dsp::dfti_failure &f) {
    const bool computing = f.step() == dsp::dfti_step::forward || f.step() == dsp::dfti_step::backward;
    return computing ? transform_failed : no_transform;
  } catch (...) {
    return no_memory;
  }
}

}  // namespace toolkit
