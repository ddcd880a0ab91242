// C++20 on top of the C interface: owning types whose functions throw lumra::error, which carries the status.
// SPDX-License-Identifier: MIT
#pragma once

#include <lumra/lumra.h>

#include <array>
#include <complex>
#include <cstddef>
#include <cstdint>
#include <limits>
#include <new>
#include <span>
#include <stdexcept>
#include <string>
#include <type_traits>
#include <utility>

namespace lumra {

/// A status code with the library's own message.
class status {
 public:
  constexpr status() noexcept = default;
  constexpr explicit status(std::int32_t code) noexcept : code_(code) {}

  [[nodiscard]] constexpr bool ok() const noexcept { return code_ == LUMRA_SUCCESS; }
  [[nodiscard]] constexpr std::int32_t code() const noexcept { return code_; }

  [[nodiscard]] std::string message() const {
    if (ok()) return "Success";
    const std::int32_t length = qsLumraAlgo_GetErrorString(0, code_, 0, nullptr);
    std::string text(static_cast<std::size_t>(length) + 2, '\0');
    if (qsLumraAlgo_GetErrorString(0, code_, length + 2, text.data()) != LUMRA_SUCCESS)
      return "status code " + std::to_string(code_);
    text.resize(static_cast<std::size_t>(length));
    return text;
  }

  friend constexpr bool operator==(status, status) noexcept = default;

 private:
  std::int32_t code_ = LUMRA_SUCCESS;
};

class error : public std::runtime_error {
 public:
  explicit error(lumra::status status) : std::runtime_error(status.message()), status_(status) {}
  [[nodiscard]] lumra::status status() const noexcept { return status_; }

 private:
  lumra::status status_;
};

/// Throws lumra::error for a negative code.
inline void check(std::int32_t code) {
  if (code < 0) throw error(status(code));
}

/// Which library this is.
struct library_info {
  std::string name;
  std::uint32_t version = 0;  // major in the top byte, minor in the next
  std::string version_text;   // "20.6.0f0"
  std::string description;
  bool uses_avx = false;  // the kernels in use, by what processor and operating system support
};

[[nodiscard]] inline library_info library() {
  library_info info;
  std::array<char, 64> name{}, version{}, description{};
  std::uint8_t avx = 0;
  check(qsLumraAlgo_getLibraryFilename(name.data(), name.size()));
  check(qsLumraAlgo_getLibraryInfo(&info.version, version.data(), version.size(), description.data(),
                                   description.size()));
  check(qsLumraAlgo_hasAvxHardwareSupport(&avx));
  info.name = name.data();
  info.version_text = version.data();
  info.description = description.data();
  info.uses_avx = avx != 0;
  return info;
}

namespace detail {
template <class T>
struct element;
template <>
struct element<float> {
  using block = lumra_f32_block;
  static constexpr std::int32_t code = LUMRA_TYPE_F32;
};
template <>
struct element<double> {
  using block = lumra_f64_block;
  static constexpr std::int32_t code = LUMRA_TYPE_F64;
};
template <>
struct element<std::complex<float>> {
  using block = lumra_cf32_block;
  static constexpr std::int32_t code = LUMRA_TYPE_CF32;
};
template <>
struct element<std::complex<double>> {
  using block = lumra_cf64_block;
  static constexpr std::int32_t code = LUMRA_TYPE_CF64;
};
}  // namespace detail

/// An owned vector in the library's own memory; T is float, double or std::complex of one of them.
template <class T>
class host_array {
 public:
  using handle = typename detail::element<T>::block **;

  host_array() = default;
  explicit host_array(std::size_t count) {
    if (count > static_cast<std::size_t>(std::numeric_limits<std::int32_t>::max()))
      throw std::length_error("host_array");
    const auto size = static_cast<std::int32_t>(count);
    check(qsHost_ArrayNew(detail::element<T>::code, 1, &size, &handle_));
  }
  host_array(host_array &&other) noexcept : handle_(std::exchange(other.handle_, nullptr)) {}
  host_array &operator=(host_array &&other) noexcept {
    std::swap(handle_, other.handle_);
    return *this;
  }
  ~host_array() { qsHost_ArrayFree(&handle_); }

  /// The elements; valid until the array is resized, by a call that writes it too.
  [[nodiscard]] std::span<T> elements() noexcept { return {data(), size()}; }
  [[nodiscard]] std::span<const T> elements() const noexcept { return {data(), size()}; }
  [[nodiscard]] std::size_t size() const noexcept {
    return has_block() ? static_cast<std::size_t>((*handle_)->count) : 0;
  }

  /// Keeps the elements up to the smaller of the two counts; new ones are zero.
  void resize(std::size_t count) {
    if (count > static_cast<std::size_t>(std::numeric_limits<std::int32_t>::max()))
      throw std::length_error("host_array");
    const std::size_t before = size();
    check(qsHost_ArrayResize(detail::element<T>::code, 1, &handle_, count));
    (*handle_)->count = static_cast<std::int32_t>(count);
    for (T &fresh : elements().subspan(before < count ? before : count)) fresh = T{};
  }

  /// The handle that C functions take; `address` where they may make a new one.
  [[nodiscard]] handle get() const noexcept { return handle_; }
  [[nodiscard]] handle *address() noexcept { return &handle_; }
  [[nodiscard]] handle release() noexcept { return std::exchange(handle_, nullptr); }

 private:
  [[nodiscard]] bool has_block() const noexcept { return handle_ && *handle_; }
  [[nodiscard]] T *data() const noexcept { return has_block() ? reinterpret_cast<T *>((*handle_)->elements) : nullptr; }

  handle handle_ = nullptr;
};

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

  /// Averaged power spectrum of samples taken every dt seconds; the window must have been initialised for fft_size.
  void power_spectrum(window type, std::int32_t fft_size, double overlap_percent,
                      const host_array<std::complex<float>> &samples, double dt, spectrum &out) {
    const lumra_waveform waveform{0.0, dt, samples.get()};
    lumra_spectrum result{0.0, 0.0, out.power.get()};
    const std::int32_t code = qsLumraAlgo_PerformWindowingOverlappedSeqFFTAndIQTransform(
        handle_, static_cast<std::int32_t>(type), fft_size, overlap_percent, &waveform, &result);
    *out.power.address() = result.y;
    check(code);
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

// Vector utilities, as their C functions document them. Outputs are sized by the call.

namespace detail {
/// Throws where a resize was refused, which the C functions do not report.
template <class T>
void sized(const host_array<T> &out, std::size_t count) {
  if (out.size() != count) throw std::bad_alloc();
}
}  // namespace detail

/// out[i] = x[i] / y[i].
inline void divide(const host_array<std::complex<float>> &x, const host_array<std::complex<float>> &y,
                   host_array<std::complex<float>> &out) {
  check(qsRFHS_complex_division_array_by_array(x.get(), y.get(), out.address()));
  detail::sized(out, x.size());
}

/// out[i] = x[i] / v.
inline void divide(const host_array<std::complex<float>> &x, std::complex<float> v,
                   host_array<std::complex<float>> &out) {
  const lumra_cf32 value{v.real(), v.imag()};
  check(qsRFHS_complex_division_array_by_value(x.get(), &value, out.address()));
  detail::sized(out, x.size());
}

inline void magnitude(const host_array<std::complex<float>> &x, host_array<float> &out) {
  check(qsRFHS_complex_magnitude(x.get(), out.address()));
  detail::sized(out, x.size());
}

inline void magnitude_squared(const host_array<std::complex<float>> &x, host_array<float> &out) {
  check(qsRFHS_complex_magnitude_squared(x.get(), out.address()));
  detail::sized(out, x.size());
}

/// out[i] = c[0] + c[1] x[i] + c[2] x[i]^2 ...; with more than 16 real coefficients only part of it, see
/// qsRFHS_ApplyPolynomial.
template <class T>
void polynomial(const host_array<float> &x, const host_array<T> &c, host_array<T> &out) {
  if (!out.get()) out = host_array<T>(0);
  if constexpr (std::is_same_v<T, float>)
    check(qsRFHS_ApplyPolynomial(x.get(), c.get(), out.get()));
  else
    check(qsRFHS_ApplyPolynomialCplx(x.get(), c.get(), out.get(), nullptr));
  detail::sized(out, c.size() == 0 ? 0 : x.size());
}

/// out[i] = a * log2(x[i]) + b, of |x[i]|^2 where x is complex.
template <class T>
void scaled_log2(const host_array<T> &x, host_array<float> &out, float a, float b) {
  if constexpr (std::is_same_v<T, float>)
    check(qsUtilHS_aLog2Plusb_SGL(x.get(), out.address(), a, b));
  else
    check(qsUtilHS_aLog2Plusb_IQ(x.get(), out.address(), a, b));
  detail::sized(out, x.size());
}

struct level {
  float rms;
  float peak;
};

/// NaN for no samples.
[[nodiscard]] inline float rms(const host_array<std::complex<float>> &x) {
  float result = 0;
  check(qsUtilHS_RMS_IQ(x.get(), &result));
  return result;
}

[[nodiscard]] inline level rms_and_peak(const host_array<std::complex<float>> &x) {
  level result{};
  check(qsUtilHS_RMS_IQ_with_peak_calc(x.get(), &result.rms, &result.peak));
  return result;
}

/// out[i] = in[i] * (gain at keys[i]); the table holds a value and a slope for each entry.
inline void lookup(const host_array<float> &keys, const host_array<std::complex<float>> &in,
                   host_array<std::complex<float>> &out, const host_array<std::complex<float>> &table, float start,
                   float step) {
  if (in.size() < keys.size()) throw std::length_error("lookup");
  check(qsUtilHS_LookupTable(keys.get(), in.get(), out.address(), table.get(), start, step));
  detail::sized(out, keys.size());
}

/// Multiplies by a real factor, in place.
inline void scale(std::span<std::complex<float>> x, float factor) {
  check(qsLumraAlgo_scale_cf(reinterpret_cast<lumra_cf32 *>(x.data()), x.size(), factor));
}

}  // namespace lumra
