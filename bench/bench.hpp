// What benchmarks share: records, figures, and bare MKL transforms. SPDX-License-Identifier: MIT
#pragma once

#include <benchmark/benchmark.h>
#include <mkl_dfti.h>

#include <cmath>
#include <complex>
#include <cstdint>
#include <cstdlib>
#include <lumra/lumra.hpp>
#include <map>
#include <memory>
#include <span>
#include <type_traits>
#include <vector>

namespace bench {

using cf32 = std::complex<float>;
using cf64 = std::complex<double>;

template <class T>
inline constexpr bool is_complex = !std::is_floating_point_v<T>;
template <class T>
inline constexpr bool is_double = sizeof(T) == (is_complex<T> ? 16 : 8);
template <class T>
inline constexpr std::int32_t type_of = is_complex<T> ? (is_double<T> ? LUMRA_TYPE_CF64 : LUMRA_TYPE_CF32)
                                                      : (is_double<T> ? LUMRA_TYPE_F64 : LUMRA_TYPE_F32);

/// A tone whose phase jumps; long ones repeat its beginning.
template <class T>
void fill(std::span<T> out) {
  constexpr std::size_t period = 16384;
  for (std::size_t i = 0; i < out.size(); ++i) {
    if (i >= period) {
      out[i] = out[i - period];
      continue;
    }
    const double phase = 0.37 * static_cast<double>(i) + 1e-5 * static_cast<double>(i * i % 10007);
    if constexpr (is_complex<T>)
      out[i] = T(std::polar(1.0, phase));
    else
      out[i] = static_cast<T>(std::cos(phase));
  }
}
template <class T>
std::vector<T> record(std::size_t n) {
  std::vector<T> out(n);
  fill(std::span<T>(out));
  return out;
}
/// The same in an array of the older interface.
template <class T>
lumra::host_array<T> host_record(std::size_t n) {
  lumra::host_array<T> out(n);
  fill(out.elements());
  return out;
}

/// Arrays of n elements, filled once: each repetition would spend its time on that.
template <class Arrays>
Arrays &kept(std::size_t n) {
  static std::map<std::size_t, Arrays> made;
  return made.try_emplace(n, n).first->second;
}

template <class T>
struct free_aligned {
  void operator()(T *memory) const { std::free(memory); }
};
/// Elements on lines of the cache, with a line behind them.
template <class T>
std::unique_ptr<T[], free_aligned<T>> aligned(std::size_t n) {
  return std::unique_ptr<T[], free_aligned<T>>(
      static_cast<T *>(std::aligned_alloc(64, (n * sizeof(T) + 127) / 64 * 64)));
}

inline void check(bool good) {
  if (!good) std::abort();
}

/// Samples a second, and bytes where their width is given.
inline void rate(benchmark::State &state, std::size_t samples, std::size_t width = 0) {
  state.SetItemsProcessed(state.iterations() * static_cast<std::int64_t>(samples));
  if (width) state.SetBytesProcessed(state.iterations() * static_cast<std::int64_t>(samples * width));
}

/// A committed transform, as bare as it gets; real spectra are halves.
class mkl_transform {
 public:
  mkl_transform(std::size_t n, bool double_precision, bool complex, bool in_place, double scale = 1) {
    const auto precision = double_precision ? DFTI_DOUBLE : DFTI_SINGLE;
    check(DftiCreateDescriptor(&handle_, precision, complex ? DFTI_COMPLEX : DFTI_REAL, 1, static_cast<MKL_LONG>(n)) ==
          0);
    (void)DftiSetValue(handle_, DFTI_PLACEMENT, in_place ? DFTI_INPLACE : DFTI_NOT_INPLACE);
    if (!complex) (void)DftiSetValue(handle_, DFTI_CONJUGATE_EVEN_STORAGE, DFTI_COMPLEX_COMPLEX);
    if (scale != 1) (void)DftiSetValue(handle_, DFTI_FORWARD_SCALE, scale);
    if (scale != 1) (void)DftiSetValue(handle_, DFTI_BACKWARD_SCALE, scale);
    check(DftiCommitDescriptor(handle_) == 0);
  }
  mkl_transform(const mkl_transform &) = delete;
  mkl_transform &operator=(const mkl_transform &) = delete;
  ~mkl_transform() { (void)DftiFreeDescriptor(&handle_); }
  void forward(void *data) { (void)DftiComputeForward(handle_, data); }
  void forward(void *in, void *out) { (void)DftiComputeForward(handle_, in, out); }
  void backward(void *in, void *out) { (void)DftiComputeBackward(handle_, in, out); }

 private:
  DFTI_DESCRIPTOR_HANDLE handle_ = nullptr;
};

}  // namespace bench
