// Polynomials over host arrays. SPDX-License-Identifier: MIT
#include <lumra/vector_utilities.h>

#include <algorithm>
#include <chrono>
#include <exception>
#include <vector>

#include "host/host_array.hpp"
#include "host/resize_service.hpp"
#include "qsrfhs/vector/floats.hpp"

using namespace qsrfhs;

namespace {

/// Writes as many of the n results as the output has room for.
void evaluate(const float *x, std::size_t n, std::span<lumra_cf32> c, std::span<lumra_cf32> out) noexcept {
  if (static_cast<const void *>(x) == out.data()) return;  // real values that are in the way of complex ones
  kernels::exact().complex_polynomial(x, floats(c), c.size(), floats(out), std::min(n, out.size()));
}

void evaluate(const float *x, std::size_t n, std::span<float> c, std::span<float> out) noexcept {
  const std::size_t reach = kernels::exact().polynomial_reach(out.data(), n, c.size());
  kernels::exact().polynomial(x, c.data(), c.size(), out.data(), std::min(reach, out.size()));
}

/// False when there was nothing to evaluate and the output was emptied. Throws what a host's resize service throws.
template <class Block>
bool apply(lumra_f32_array x, Block **coefficients, Block **output) {
  using element = host::element_of<Block>;
  const std::size_t n = host::elements(x).size();
  std::span<element> c = host::elements(coefficients);
  if (!output) return n != 0 && !c.empty();  // nobody could free what a resize would make
  if (n == 0 || c.empty()) {
    (void)host::resize_vector(&output, 0, 0);
    return false;
  }
  // An output that holds the coefficients would lose them.
  std::vector<element> kept;
  if (host::has_block(output) && *output == *coefficients) {
    kept.assign(c.begin(), c.end());
    c = kept;
  }
  (void)host::resize_vector(&output, static_cast<std::int32_t>(n), n * sizeof(element));
  evaluate(host::elements(x).data(), n, c, host::elements(output));
  return true;
}

}  // namespace

int32_t qsRFHS_ApplyPolynomial(lumra_f32_array x, lumra_f32_array coefficients, lumra_f32_array output) try {
  (void)apply(x, coefficients, output);
  return 0;
} catch (...) {
  return 0;
}

int32_t qsRFHS_ApplyPolynomialCplx(lumra_f32_array x, lumra_cf32_array coefficients, lumra_cf32_array output,
                                   float *elapsedSeconds) try {
  using clock = std::chrono::steady_clock;
  const auto begin = clock::now();
  if (!apply(x, coefficients, output)) return 0;
  const std::chrono::duration<double> elapsed = clock::now() - begin;
  if (elapsedSeconds) *elapsedSeconds = static_cast<float>(elapsed.count());
  return 0;
} catch (...) {
  return 0;
}
