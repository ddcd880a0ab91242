// Element by element. Complex single precision goes through the kernels, whose order of operations is the one of all
// types here. Outputs have the size of the inputs, and may be one of those that have their type.
//
// Arrays that are long enough are shared among `threads`: 1 is the caller's alone, 0 as many as pay, and more at most so
// many. An element's result does not depend on its place, and so not on their number.
// SPDX-License-Identifier: MIT
#pragma once

#include <complex>
#include <cstddef>
#include <span>

#include "signal/sample_type.hpp"

namespace dsp {

// T: float, double and complex numbers of them.

template <class T>
void divide(std::span<const T> x, std::span<const T> y, std::span<T> out, std::size_t threads) noexcept;
template <class T>
void divide_by_value(std::span<const T> x, T value, std::span<T> out, std::size_t threads) noexcept;
template <class T>
void scale(std::span<const T> x, real_of<T> factor, std::span<T> out, std::size_t threads) noexcept;
template <class T>
void magnitude(std::span<const T> x, std::span<real_of<T>> out, std::size_t threads) noexcept;
template <class T>
void power(std::span<const T> x, std::span<real_of<T>> out, std::size_t threads) noexcept;

/// out = a log2(x) + b for real T.
template <class T>
void log2(std::span<const T> x, T a, T b, std::span<T> out, std::size_t threads) noexcept;
/// out = a log2(|x|^2) + b.
template <class T>
void log2_power(std::span<const T> x, real_of<T> a, real_of<T> b, std::span<real_of<T>> out,
                std::size_t threads) noexcept;

/// The polynomial of at least one coefficient, c[0] first; x is of the type of C or of its real parts.
template <class T, class C>
void polynomial(std::span<const T> x, std::span<const C> c, std::span<C> out, std::size_t threads) noexcept;

/// Gains at keys start + k * step; 1 to 2^31 - 1 of them.
template <class Real>
struct gain_table {
  std::span<const std::complex<Real>> gains;
  Real start, step;
};

/// out = x times the gain at its key, interpolated.
template <class Real>
void look_up(std::span<const std::complex<Real>> x, std::span<const Real> keys, const gain_table<Real> &table,
             std::span<std::complex<Real>> out, std::size_t threads) noexcept;

}  // namespace dsp
