// SPDX-License-Identifier: MIT
#include "signal/elementwise.hpp"

#include <mkl_vml.h>

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <type_traits>

#include "qsrfhs/math/mkl_runtime.hpp"
#include "qsrfhs/vector/kernels/kernels.hpp"
#include "signal/shared_loop.hpp"

namespace dsp {
namespace {

using qsrfhs::kernels::exact;
using qsrfhs::kernels::fused;
using cf32 = std::complex<float>;

/// The parts of complex numbers, and real numbers themselves.
template <class T>
const real_of<T> *parts(std::span<const T> x) noexcept {
  return reinterpret_cast<const real_of<T> *>(x.data());
}
template <class T>
real_of<T> *parts(std::span<T> x) noexcept {
  return reinterpret_cast<real_of<T> *>(x.data());
}

/// The quotient of complex numbers a / b by r = 1 / |b|^2, into two reals.
template <class Real>
void divide_one(const Real *a, Real br, Real bi, Real r, Real *out) noexcept {
  const Real ar = a[0], ai = a[1];
  out[0] = (ar * br + ai * bi) * r;
  out[1] = (ai * br - ar * bi) * r;
}

// Loops over complex outputs are told `of` how many elements theirs are a part.

template <class T>
void divide_each(std::span<const T> x, std::span<const T> y, std::span<T> out, std::size_t of) noexcept {
  if constexpr (std::is_same_v<T, cf32>) {
    exact().divide(parts(x), parts(y), parts(out), {out.size(), of});
  } else if constexpr (is_complex<T>) {
    const auto *const a = parts(x), *const b = parts(y);
    auto *const q = parts(out);
    for (std::size_t i = 0; i < 2 * out.size(); i += 2) {
      const real_of<T> br = b[i], bi = b[i + 1];
      divide_one(a + i, br, bi, 1 / (br * br + bi * bi), q + i);
    }
  } else {
    for (std::size_t i = 0; i < out.size(); ++i) out[i] = x[i] / y[i];
  }
}

template <class T>
void divide_by_value_each(std::span<const T> x, T value, std::span<T> out, std::size_t of) noexcept {
  if constexpr (std::is_same_v<T, cf32>) {
    exact().divide_by_value(parts(x), parts(std::span<const T>(&value, 1)), parts(out), {out.size(), of});
  } else if constexpr (is_complex<T>) {
    const real_of<T> br = value.real(), bi = value.imag(), r = 1 / (br * br + bi * bi);
    for (std::size_t i = 0; i < 2 * out.size(); i += 2) divide_one(parts(x) + i, br, bi, r, parts(out) + i);
  } else {
    for (std::size_t i = 0; i < out.size(); ++i) out[i] = x[i] / value;
  }
}

template <class T>
void scale_each(std::span<const T> x, real_of<T> factor, std::span<T> out) noexcept {
  const real_of<T> *const in = parts(x);
  real_of<T> *const product = parts(out);
  const std::size_t count = out.size_bytes() / sizeof(real_of<T>);
  for (std::size_t i = 0; i < count; ++i) product[i] = in[i] * factor;
}

template <class T>
void magnitude_each(std::span<const T> x, std::span<real_of<T>> out) noexcept {
  if constexpr (std::is_same_v<T, cf32>) {
    exact().magnitude(parts(x), out.data(), out.size());
  } else if constexpr (is_complex<T>) {
    const auto *const in = parts(x);
    for (std::size_t i = 0; i < out.size(); ++i)
      out[i] = std::sqrt(in[2 * i] * in[2 * i] + in[2 * i + 1] * in[2 * i + 1]);
  } else {
    for (std::size_t i = 0; i < out.size(); ++i) out[i] = std::abs(x[i]);
  }
}

template <class T>
void power_each(std::span<const T> x, std::span<real_of<T>> out) noexcept {
  if constexpr (std::is_same_v<T, cf32>) {
    exact().magnitude_squared(parts(x), out.data(), out.size());
  } else if constexpr (is_complex<T>) {
    const auto *const in = parts(x);
    for (std::size_t i = 0; i < out.size(); ++i) out[i] = in[2 * i] * in[2 * i] + in[2 * i + 1] * in[2 * i + 1];
  } else {
    for (std::size_t i = 0; i < out.size(); ++i) out[i] = x[i] * x[i];
  }
}

/// x = a log2(x) + b.
template <class Real>
void scale_logarithms(std::span<Real> x, Real a, Real b) noexcept {
  constexpr MKL_INT64 mode = VML_LA | VML_FTZDAZ_OFF | VML_ERRMODE_IGNORE;
  const auto n = static_cast<MKL_INT>(x.size());
  if constexpr (std::is_same_v<Real, float>) {
    vmsLog2(n, x.data(), x.data(), mode);
    exact().scale_and_shift(x.data(), a, b, x.size());
  } else {
    vmdLog2(n, x.data(), x.data(), mode);
    for (Real &v : x) v = a * v + b;
  }
}

/// Runs work(piece of the input, piece of the output) and the logarithms of what it wrote, in pieces that stay in the
/// first cache.
template <class T, class Work>
void log2_in_pieces(std::span<const T> x, real_of<T> a, real_of<T> b, std::span<real_of<T>> out, Work work) noexcept {
  constexpr std::size_t most = 1024;
  const qsrfhs::mkl_runtime::use in_use;
  for (std::size_t first = 0; first < out.size(); first += most) {
    const std::size_t count = std::min(most, out.size() - first);
    const auto piece = out.subspan(first, count);
    work(x.subspan(first, count), piece);
    scale_logarithms(piece, a, b);
  }
}

template <class T>
void log2_each(std::span<const T> x, T a, T b, std::span<T> out) noexcept {
  log2_in_pieces(x, a, b, out, [](std::span<const T> values, std::span<T> piece) {
    if (values.data() != piece.data()) std::copy(values.begin(), values.end(), piece.begin());
  });
}

template <class T>
void log2_power_each(std::span<const T> x, real_of<T> a, real_of<T> b, std::span<real_of<T>> out) noexcept {
  if constexpr (is_complex<T>)
    log2_in_pieces(x, a, b, out, power_each<T>);
  else
    log2_in_pieces(x, 2 * a, b, out, magnitude_each<T>);
}

/// Values that go through Horner's scheme side by side: one alone would wait for each of its operations.
constexpr std::size_t polynomial_block = 32;

template <class T, class C>
void polynomial_of_block(const T *x, std::span<const C> c, C *out, std::size_t n) noexcept {
  using real = real_of<C>;
  real xr[polynomial_block]{}, xi[polynomial_block]{}, re[polynomial_block], im[polynomial_block];
  const real *const in = parts(std::span<const T>(x, n));
  for (std::size_t i = 0; i < n; ++i) {
    xr[i] = in[is_complex<T> ? 2 * i : i];
    if constexpr (is_complex<T>) xi[i] = in[2 * i + 1];
  }
  std::fill_n(re, polynomial_block, std::real(c.back()));
  std::fill_n(im, polynomial_block, std::imag(c.back()));
  for (std::size_t k = c.size() - 1; k-- > 0;) {
    const real cr = std::real(c[k]), ci = std::imag(c[k]);
    for (std::size_t i = 0; i < polynomial_block; ++i) {
      if constexpr (is_complex<T>) {
        const real product = re[i] * xr[i] - im[i] * xi[i];
        im[i] = re[i] * xi[i] + im[i] * xr[i] + ci;
        re[i] = product + cr;
      } else {
        re[i] = re[i] * xr[i] + cr;
        if constexpr (is_complex<C>) im[i] = im[i] * xr[i] + ci;
      }
    }
  }
  real *const result = parts(std::span<C>(out, n));
  for (std::size_t i = 0; i < n; ++i) {
    result[is_complex<C> ? 2 * i : i] = re[i];
    if constexpr (is_complex<C>) result[2 * i + 1] = im[i];
  }
}

template <class T, class C>
void polynomial_each(std::span<const T> x, std::span<const C> c, std::span<C> out, std::size_t of) noexcept {
  if constexpr (std::is_same_v<C, float>) {
    fused().polynomial(parts(x), parts(c), c.size(), parts(out), out.size());
  } else if constexpr (std::is_same_v<T, float>) {
    fused().complex_polynomial(parts(x), parts(c), c.size(), parts(out), {out.size(), of});
  } else {
    for (std::size_t i = 0; i < out.size(); i += polynomial_block)
      polynomial_of_block(x.data() + i, c, out.data() + i, std::min(polynomial_block, out.size() - i));
  }
}

/// Where in a table of m gains the one at t steps from the first lies: at the gain k, and on the way to the next.
template <class Real>
struct gain_place {
  std::size_t k;
  Real fraction;
  bool between;
};

template <class Real>
gain_place<Real> place_of(Real t, std::size_t m) noexcept {
  constexpr auto furthest = static_cast<Real>(2147483648.0);
  if (!(t > -1 && t < furthest)) return {0, 0, false};
  const auto cut = static_cast<std::int64_t>(t);
  const auto k = static_cast<std::size_t>(cut);
  if (k + 1 >= m) return {m - 1, 0, false};
  return {k, t - static_cast<Real>(cut), true};
}

template <class Real>
void look_up_each(std::span<const std::complex<Real>> x, std::span<const Real> keys, const gain_table<Real> &table,
                  std::span<std::complex<Real>> out, std::size_t of) noexcept {
  if constexpr (std::is_same_v<Real, float>) {
    const cf32 alone[] = {table.gains.front(), table.gains.front()};
    const auto gains = table.gains.size() > 1 ? table.gains : std::span<const cf32>(alone);
    exact().lookup_between({parts(gains), static_cast<int>(table.gains.size()), table.start, table.step}, keys.data(),
                           parts(x), parts(out), {out.size(), of});
  } else {
    const Real inverse_step = 1 / table.step;
    const Real *const in = parts(x), *const gains = parts(table.gains);
    Real *const result = parts(out);
    for (std::size_t i = 0; i < out.size(); ++i) {
      const auto place = place_of((keys[i] - table.start) * inverse_step, table.gains.size());
      const Real *const low = gains + 2 * place.k, *const high = low + 2;
      Real g_re = low[0], g_im = low[1];
      if (place.between) {
        g_re = place.fraction * (high[0] - g_re) + g_re;
        g_im = place.fraction * (high[1] - g_im) + g_im;
      }
      const Real re = in[2 * i], im = in[2 * i + 1];
      result[2 * i] = g_re * re - g_im * im;
      result[2 * i + 1] = g_re * im + g_im * re;
    }
  }
}

// Nanoseconds for an element, beside what its bytes take.
constexpr double no_more = 0;
template <class Real>
constexpr double logarithm_cost = std::is_same_v<Real, float> ? 0.4 : 1.2;

}  // namespace

template <class T>
void divide(std::span<const T> x, std::span<const T> y, std::span<T> out, std::size_t threads) noexcept {
  const auto loop = [n = out.size()](auto in, auto by, auto quotients) { divide_each<T>(in, by, quotients, n); };
  share(threads, no_more, loop, x, y, out);
}

template <class T>
void divide_by_value(std::span<const T> x, T value, std::span<T> out, std::size_t threads) noexcept {
  const auto loop = [=, n = out.size()](auto in, auto quotients) { divide_by_value_each<T>(in, value, quotients, n); };
  share(threads, no_more, loop, x, out);
}

template <class T>
void scale(std::span<const T> x, real_of<T> factor, std::span<T> out, std::size_t threads) noexcept {
  const auto loop = [=](auto in, auto products) { scale_each<T>(in, factor, products); };
  share(threads, no_more, loop, x, out);
}

template <class T>
void magnitude(std::span<const T> x, std::span<real_of<T>> out, std::size_t threads) noexcept {
  share(threads, no_more, magnitude_each<T>, x, out);
}

template <class T>
void power(std::span<const T> x, std::span<real_of<T>> out, std::size_t threads) noexcept {
  share(threads, no_more, power_each<T>, x, out);
}

template <class T>
void log2(std::span<const T> x, T a, T b, std::span<T> out, std::size_t threads) noexcept {
  const auto loop = [=](auto in, auto logarithms) { log2_each<T>(in, a, b, logarithms); };
  share(threads, logarithm_cost<T>, loop, x, out);
}

template <class T>
void log2_power(std::span<const T> x, real_of<T> a, real_of<T> b, std::span<real_of<T>> out,
                std::size_t threads) noexcept {
  const auto loop = [=](auto in, auto logarithms) { log2_power_each<T>(in, a, b, logarithms); };
  share(threads, logarithm_cost<real_of<T>>, loop, x, out);
}

template <class T, class C>
void polynomial(std::span<const T> x, std::span<const C> c, std::span<C> out, std::size_t threads) noexcept {
  constexpr bool by_kernel = std::is_same_v<T, float>;
  constexpr double cost_of_coefficient = by_kernel ? 0.012 : is_complex<T> ? 0.48 : 0.18;
  const auto loop = [=, n = out.size()](auto in, auto values) { polynomial_each<T, C>(in, c, values, n); };
  share(threads, cost_of_coefficient * static_cast<double>(c.size()), loop, x, out);
}

template <class Real>
void look_up(std::span<const std::complex<Real>> x, std::span<const Real> keys, const gain_table<Real> &table,
             std::span<std::complex<Real>> out, std::size_t threads) noexcept {
  constexpr double cost = std::is_same_v<Real, float> ? 0.7 : 3;
  const auto loop = [&](auto in, auto at, auto products) { look_up_each<Real>(in, at, table, products, out.size()); };
  share(threads, cost, loop, x, keys, out);
}

#define LUMRA_FOR_TYPE(T)                                                                                            \
  template void divide(std::span<const T>, std::span<const T>, std::span<T>, std::size_t) noexcept;                  \
  template void divide_by_value(std::span<const T>, T, std::span<T>, std::size_t) noexcept;                          \
  template void scale(std::span<const T>, real_of<T>, std::span<T>, std::size_t) noexcept;                           \
  template void magnitude(std::span<const T>, std::span<real_of<T>>, std::size_t) noexcept;                          \
  template void power(std::span<const T>, std::span<real_of<T>>, std::size_t) noexcept;                              \
  template void log2_power(std::span<const T>, real_of<T>, real_of<T>, std::span<real_of<T>>, std::size_t) noexcept; \
  template void polynomial(std::span<const T>, std::span<const T>, std::span<T>, std::size_t) noexcept;
#define LUMRA_FOR_REAL_TYPE(T)                                                                               \
  LUMRA_FOR_TYPE(T)                                                                                          \
  LUMRA_FOR_TYPE(std::complex<T>)                                                                            \
  template void log2(std::span<const T>, T, T, std::span<T>, std::size_t) noexcept;                          \
  template void polynomial(std::span<const T>, std::span<const std::complex<T>>, std::span<std::complex<T>>, \
                           std::size_t) noexcept;                                                            \
  template void look_up(std::span<const std::complex<T>>, std::span<const T>, const gain_table<T> &,         \
                        std::span<std::complex<T>>, std::size_t) noexcept;
LUMRA_FOR_REAL_TYPE(float)
LUMRA_FOR_REAL_TYPE(double)

}  // namespace dsp
