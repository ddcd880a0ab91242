// Error vectors of matrices. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/error_vector.h>
#include <lumra/host_array.hpp>

#include <complex>
#include <cstdint>

namespace lumra {

// Error vectors, as their C functions document them: b is compared with the reference a. The matrices must agree in the
// number of elements; e is not resized.

enum class accuracy : std::int32_t {
  low = LUMRA_ACCURACY_LOW,
  high = LUMRA_ACCURACY_HIGH,
  enhanced_performance = LUMRA_ACCURACY_ENHANCED_PERFORMANCE
};

/// e[i] = |b[i] - a[i]|.
inline void error_magnitude(const host_matrix<std::complex<float>> &a, const host_matrix<std::complex<float>> &b,
                            host_matrix<float> &e, accuracy mode = accuracy::high) {
  check(qsLumraAlgo_CalculateEVM2D(a.get(), b.get(), e.get(), static_cast<std::int32_t>(mode)));
}

/// e[i] = |b[i]| - |a[i]|.
inline void magnitude_error(const host_matrix<std::complex<float>> &a, const host_matrix<std::complex<float>> &b,
                            host_matrix<float> &e, accuracy mode = accuracy::high) {
  check(qsLumraAlgo_CalculateMagnitudeError2D(a.get(), b.get(), e.get(), static_cast<std::int32_t>(mode)));
}

/// e[i] = arg(b[i] * conj(a[i])) in radians.
inline void phase_error(const host_matrix<std::complex<float>> &a, const host_matrix<std::complex<float>> &b,
                        host_matrix<float> &e, accuracy mode = accuracy::high) {
  check(qsLumraAlgo_CalculatePhaseError2D(a.get(), b.get(), e.get(), static_cast<std::int32_t>(mode)));
}

}  // namespace lumra
