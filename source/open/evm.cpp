// SPDX-License-Identifier: MIT
#include <lumra/evm.h>

#include <cstdint>

#include "open/door.hpp"
#include "open/evm_checks.hpp"
#include "open/option_checks.hpp"
#include "open/result.hpp"
#include "signal/error_vectors.hpp"

namespace doors {
namespace {

constexpr std::uint64_t least_for_search = 64;

lumra_evm_options checked_options(const lumra_evm_options *given) {
  const auto options = read_options(given, lumra_evm_options LUMRA_EVM_OPTIONS);
  (void)checked_alignment(options.align);
  require_rate(options.sample_rate_hz, "options->sample_rate_hz");
  require_threads(options.threads, "options->threads");
  require(options.reserved == 0, LUMRA_OUT_OF_RANGE, "options->reserved is ", options.reserved, "; it is 0");
  return options;
}

template <class Complex, class Real>
lumra_status measure(const char *function, const Complex *reference, const Complex *measured, std::uint64_t n,
                     const lumra_evm_options *given, lumra_evm_result *result, Complex *error, Real *magnitude,
                     Real *phase) noexcept {
  return enter(function, [&] {
    const lumra_evm_options options = checked_options(given);
    const auto from = array(samples(reference), n, "reference"), to = array(samples(measured), n, "measured");
    require_sized(result, "result");
    require_traces_apart(from, to, {reinterpret_cast<const std::byte *>(result), result->size}, error, magnitude,
                         phase);
    const dsp::alignment wanted = checked_alignment(options.align);
    const std::uint64_t least = wanted.searched() ? least_for_search : 1;
    require(n >= least, LUMRA_TOO_FEW_SAMPLES, "n is ", n, "; this alignment takes ", least, " samples or more");
    dsp::error_figures figures;
    require_measured(
        dsp::measure_errors<Real>(from, to, wanted, options.threads, {samples(error), magnitude, phase}, figures));
    give_result(result, result_of(figures, options.sample_rate_hz));
  });
}

}  // namespace
}  // namespace doors

using namespace doors;

lumra_status lumra_evm_measure_cf32(const lumra_cf32 *reference, const lumra_cf32 *measured, uint64_t n,
                                    const lumra_evm_options *options, lumra_evm_result *result, lumra_cf32 *error,
                                    float *magnitude, float *phase) {
  return measure(__func__, reference, measured, n, options, result, error, magnitude, phase);
}

lumra_status lumra_evm_measure_cf64(const lumra_cf64 *reference, const lumra_cf64 *measured, uint64_t n,
                                    const lumra_evm_options *options, lumra_evm_result *result, lumra_cf64 *error,
                                    double *magnitude, double *phase) {
  return measure(__func__, reference, measured, n, options, result, error, magnitude, phase);
}
