// Sessions: averaged power spectra of blocks, with a log. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/session.h>
#include <lumra/host_array.hpp>

#include <array>
#include <complex>
#include <cstddef>
#include <cstdint>
#include <new>
#include <string>
#include <utility>

namespace lumra {

enum class window : std::int32_t { none = LUMRA_WINDOW_NONE, flat_top = LUMRA_WINDOW_FLAT_TOP };

/// A power spectrum; bin k lies at f0 + k * df.
struct spectrum {
  double f0 = 0;
  double df = 0;
  host_array<float> power;
};

/// An owned session. Its functions may be called from several threads at once.
class session {
 public:
  session() { check(qsLumraAlgo_CreateSession(&handle_)); }
  session(session &&other) noexcept : handle_(std::exchange(other.handle_, 0)) {}
  session &operator=(session &&other) noexcept {
    std::swap(handle_, other.handle_);
    return *this;
  }
  ~session() { qsLumraAlgo_CloseSession(handle_); }

  void initialize_fft(std::int32_t fft_size) { check(qsLumraAlgo_InitializeFFT(handle_, fft_size)); }
  void initialize_window(window type, std::int32_t fft_size) {
    check(qsLumraAlgo_InitializeWindow(handle_, static_cast<std::uint32_t>(type), fft_size));
  }
  void reset() { check(qsLumraAlgo_ResetSession(handle_)); }

  /// Averaged power spectrum of samples taken every dt seconds, dt not 0. Window and transform are made by the first
  /// call of their size.
  void power_spectrum(window type, std::int32_t fft_size, double overlap_percent,
                      const host_array<std::complex<float>> &samples, double dt, spectrum &out) {
    if (!(dt != 0)) throw error(status(LUMRA_OUT_OF_RANGE), "the distance of the samples is 0 or not a number");
    initialize_fft(fft_size);
    initialize_window(type, fft_size);
    const lumra_waveform waveform{0.0, dt, samples.get()};
    lumra_spectrum result{0.0, 0.0, out.power.get()};
    const std::int32_t code = qsLumraAlgo_PerformWindowingOverlappedSeqFFTAndIQTransform(
        handle_, static_cast<std::int32_t>(type), fft_size, overlap_percent, &waveform, &result);
    *out.power.address() = result.y;
    check(code);
    // The C function does not report a refused resize.
    if (out.power.size() != static_cast<std::size_t>(fft_size)) throw std::bad_alloc();
    out.f0 = result.f0;
    out.df = result.df;
  }

  /// The oldest entry of the log; waits for one.
  [[nodiscard]] std::string read_log() {
    std::array<char, 1024> text{};
    check(qsLumraAlgo_ReadLog(handle_, 0.0, text.data(), text.size()));
    return text.data();
  }

  [[nodiscard]] std::uint64_t get() const noexcept { return handle_; }

 private:
  std::uint64_t handle_ = 0;
};

}  // namespace lumra
