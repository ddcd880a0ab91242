// Level of a block of samples. Nothing here is recorded in the error list. SPDX-License-Identifier: MIT
#include <lumra/status.h>
#include <lumra/vector_utilities.h>

#include <cmath>

#include "host/host_array.hpp"
#include "qsrfhs/vector/floats.hpp"

using namespace qsrfhs;

namespace {

float root_mean(float sum, std::size_t n) noexcept {
  return std::sqrt(sum / static_cast<float>(n));
}

}  // namespace

int32_t qsUtilHS_RMS_IQ(lumra_cf32_array x, float *rms) {
  if (!rms) return 0;
  const auto samples = host::elements(x);
  *rms = root_mean(kernels::exact().sum_power(floats(samples), samples.size()), samples.size());
  return 0;
}

int32_t qsUtilHS_RMS_IQ_with_peak_calc(lumra_cf32_array x, float *rms, float *peak) {
  if (!host::has_block(x) || !rms || !peak) return LUMRA_REFUSED;
  const auto samples = host::elements(x);
  float sum = 0, highest = 0;
  kernels::exact().sum_power_and_peak(floats(samples), samples.size(), &sum, &highest);
  *rms = root_mean(sum, samples.size());
  *peak = std::sqrt(highest);
  return 0;
}
