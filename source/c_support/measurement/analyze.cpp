// FFT and window set-up, and the windowed FFT with its averaged power spectrum. SPDX-License-Identifier: MIT
#include <lumra/session.h>

#include <algorithm>
#include <complex>
#include <cstring>
#include <limits>
#include <span>

#include "c_support/base/session.hpp"
#include "host/resize_service.hpp"
#include "platform/process.hpp"
#include "qsrfhs/math/mkl_section.hpp"
#include "qsrfhs/util/aligned_buffer.hpp"
#include "qsrfhs/vector/kernels/kernels.hpp"

using namespace c_support;

namespace {

constexpr const char *analyze_source = R"(.\source\c_support\measurement\analyze)";
constexpr catch_positions initialize_fft_positions{{analyze_source, 61}, {analyze_source, 64}};
constexpr catch_positions initialize_window_positions{{analyze_source, 118}, {analyze_source, 121}};
constexpr catch_positions windowed_fft_positions{{analyze_source, 236}, {analyze_source, 239}};
constexpr qsrfhs::source_position window_length_position{analyze_source, 96};

constexpr std::int32_t min_fft_size = 16;

using sample = std::complex<float>;

/// The coefficients of a window type, odd ones negated, which moves zero frequency into the middle of the spectrum.
/// Null for an unknown type.
LumraAlgoSession::window make_window(std::uint32_t type, std::int32_t size) {
  if (type != LUMRA_WINDOW_NONE && type != LUMRA_WINDOW_FLAT_TOP) return nullptr;
  const auto n = static_cast<std::uint64_t>(size);
  // No transform of such a length could use it.
  if (n > qsrfhs::max_fft_length) throw qsrfhs::invalid_argument(window_length_position);
  const auto window = std::make_shared<qsrfhs::Filter>(type == LUMRA_WINDOW_FLAT_TOP ? qsrfhs::Filter::flat_top(n)
                                                                                     : qsrfhs::Filter(n, 1.0F));
  const std::span<float> coefficients = window->coefficients();
  for (std::size_t k = 1; k < coefficients.size(); k += 2) coefficients[k] = -coefficients[k];
  return window;
}

/// The samples of a record, whose count is unsigned. A count beyond the signed range is as likely a corrupt block as a
/// record of that length: it is believed only when that much memory is there.
std::span<const sample> samples_of(const lumra_waveform &record) noexcept {
  if (!host::has_block(record.y)) return {};
  const auto &block = **record.y;
  const std::size_t count = static_cast<std::uint32_t>(block.count);
  const auto *first = reinterpret_cast<const sample *>(block.elements);
  if (block.count < 0 && !platform::is_readable(first, count * sizeof(sample))) return {};
  return {first, count};
}

/// Sums over all whole segments the power of their transforms, and returns the number of segments.
std::uint64_t sum_segments(std::span<const sample> input, std::size_t step, const qsrfhs::Filter *window,
                           qsrfhs::fft_transform &transform, std::span<sample> work, float *power) {
  const auto &kernels = qsrfhs::kernels::exact();
  const std::size_t n = work.size();
  const std::uint64_t segments = (input.size() - n) / step + 1;
  const float *w = window && window->length() != 0 ? window->coefficients().data() : nullptr;
  const auto *x = reinterpret_cast<const float *>(input.data());
  auto *buffer = reinterpret_cast<float *>(work.data());

  // The section spans all segments: entering it for each would take as long as the shortest transforms.
  qsrfhs::mkl_section section;
  if (w)
    kernels.apply_window(x, w, buffer, n);
  else
    kernels.copy(x, buffer, n);
  for (std::uint64_t segment = 1; segment < segments; ++segment) {
    transform.forward(work.data(), section);
    section.let_forks_pass();
    const float *next = x + 2 * segment * step;
    if (w) {
      // What the segment after this one adds comes into the caches meanwhile.
      const std::size_t ahead_count = segment + 1 < segments ? std::min(step, n) : 0;
      kernels.accumulate_power_then_apply_window(buffer, power, next, w, next + 2 * n, ahead_count, n);
    } else {
      kernels.accumulate_power(buffer, power, n);
      kernels.copy(next, buffer, n);
    }
  }
  transform.forward(work.data(), section);
  kernels.accumulate_power(buffer, power, n);
  kernels.order_power(power, n);
  return segments;
}

std::int32_t windowed_fft(LumraAlgoSession &session, std::int32_t window_type, std::int32_t fft_size,
                          double overlap_percent, const lumra_waveform &in, lumra_spectrum &out) {
  const double overlap = overlap_percent / 100.0 * fft_size;
  if (!(overlap_percent >= 0) || !(overlap < fft_size)) return LUMRA_INVALID_OVERLAP;
  const std::size_t step = static_cast<std::size_t>(fft_size - static_cast<std::int32_t>(overlap));
  const auto n = static_cast<std::size_t>(fft_size);
  const std::span<const sample> input = samples_of(in);
  if (input.size() < n) return LUMRA_INPUT_TOO_SHORT;

  // A refused resize is not reported: what fits into the output is written.
  (void)host::resize_vector(&out.y, fft_size, n * sizeof(float));

  // One block for both, on lines of their own: asking for memory takes as long as a short transform.
  constexpr std::size_t line = 64 / sizeof(sample);
  const std::size_t work_room = (n + line - 1) / line * line;
  const qsrfhs::aligned_buffer<sample> room(work_room + (n + 1) / 2);
  const std::span<sample> work = room.elements().first(n);
  auto *const power = reinterpret_cast<float *>(room.data() + work_room);
  std::fill_n(power, n, 0.0F);
  const qsrfhs::fft_lease transform = session.context.transforms.acquire(n);
  const LumraAlgoSession::window window = session.find_window({fft_size, window_type}).value_or(nullptr);

  const std::uint64_t segments = sum_segments(input, step, window.get(), *transform, work, power);
  if (segments > 1) qsrfhs::kernels::exact().scale(power, static_cast<float>(1.0 / static_cast<double>(segments)), n);

  const std::span<float> result = host::elements(out.y);
  std::copy_n(power, std::min(n, result.size()), result.begin());
  const double sample_rate = 1.0 / in.dt;
  out.f0 = -sample_rate * 0.5;
  out.df = sample_rate / fft_size;
  return LUMRA_SUCCESS;
}

}  // namespace

int32_t qsLumraAlgo_InitializeFFT(uint64_t session, int32_t fftSize) {
  if (fftSize < min_fft_size) return LUMRA_FFT_SIZE_TOO_SMALL;
  return with_session(session, initialize_fft_positions, [&](LumraAlgoSession &found) {
    found.context.transforms.prefill(static_cast<std::uint64_t>(fftSize));
    return LUMRA_SUCCESS;
  });
}

int32_t qsLumraAlgo_InitializeWindow(uint64_t session, uint32_t windowType, int32_t fftSize) {
  if (fftSize < min_fft_size) return LUMRA_FFT_SIZE_TOO_SMALL;
  return with_session(session, initialize_window_positions, [&](LumraAlgoSession &found) {
    const LumraAlgoSession::window_key key{fftSize, static_cast<std::int32_t>(windowType)};
    if (!found.find_window(key)) found.set_window(key, make_window(windowType, fftSize));
    return LUMRA_SUCCESS;
  });
}

int32_t qsLumraAlgo_PerformWindowingOverlappedSeqFFTAndIQTransform(uint64_t session, int32_t windowType,
                                                                   int32_t fftSize, double overlapPercent,
                                                                   const lumra_waveform *in, lumra_spectrum *out) {
  if (!in || !out) return LUMRA_INVALID_ARGUMENT;
  if (fftSize < min_fft_size) return LUMRA_FFT_SIZE_TOO_SMALL;
  return with_session(session, windowed_fft_positions, [&](LumraAlgoSession &found) {
    return windowed_fft(found, windowType, fftSize, overlapPercent, *in, *out);
  });
}

int32_t qsLumraAlgo_PerformWindowingFFTAndIQTransform(uint64_t session, int32_t windowType, int32_t fftSize,
                                                      const lumra_waveform *in, lumra_spectrum *out) {
  return qsLumraAlgo_PerformWindowingOverlappedSeqFFTAndIQTransform(session, windowType, fftSize, 0.0, in, out);
}
