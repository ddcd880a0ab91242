// What a type letter of the toolkit means; the only place that knows. SPDX-License-Identifier: MIT
#pragma once

#include <complex>
#include <cstdint>
#include <type_traits>

#include "host/host_array.hpp"

namespace toolkit {

struct s {
  using value = float;
  using real = float;
  using block = lumra_f32_block;
  using matrix_block = lumra_f32_matrix_block;
};

struct d {
  using value = double;
  using real = double;
  using block = lumra_f64_block;
  using matrix_block = lumra_f64_matrix_block;
};

struct c {
  using value = std::complex<float>;
  using real = float;
  using block = lumra_cf32_block;
  using matrix_block = lumra_cf32_matrix_block;
};

struct z {
  using value = std::complex<double>;
  using real = double;
  using block = lumra_cf64_block;
  using matrix_block = lumra_cf64_matrix_block;
};

template <class E>
using value_of = typename E::value;
template <class E>
using real_of = typename E::real;

template <class E>
inline constexpr bool is_complex = !std::is_same_v<value_of<E>, real_of<E>>;
template <class E>
inline constexpr bool is_double = std::is_same_v<real_of<E>, double>;

/// The complex letter of a letter's precision, and the real one.
template <class E>
using complex_of = std::conditional_t<is_double<E>, z, c>;
template <class E>
using magnitude_of = std::conditional_t<is_double<E>, d, s>;

/// The letter of sums and products of two letters of one precision.
template <class E, class F>
using common_of = std::conditional_t<is_complex<E> || is_complex<F>, complex_of<E>, E>;

template <class E>
using handle = typename E::block **;
template <class E>
using matrix_handle = typename E::matrix_block **;

}  // namespace toolkit
