// LAPACK's routines by element type. SPDX-License-Identifier: MIT
#pragma once

#include <mkl_lapack.h>

#include <complex>

namespace dsp {

template <class T>
struct lapack;

template <>
struct lapack<float> {
  using element = float;
  static constexpr auto geqrf = &sgeqrf;
  static constexpr auto multiply_by_q = &sormqr;
  static constexpr auto trtrs = &strtrs;
  static constexpr auto trcon = &strcon;
  static constexpr auto gelsd = &sgelsd;
};
template <>
struct lapack<double> {
  using element = double;
  static constexpr auto geqrf = &dgeqrf;
  static constexpr auto multiply_by_q = &dormqr;
  static constexpr auto trtrs = &dtrtrs;
  static constexpr auto trcon = &dtrcon;
  static constexpr auto gelsd = &dgelsd;
};
template <>
struct lapack<std::complex<float>> {
  using element = MKL_Complex8;
  static constexpr auto geqrf = &cgeqrf;
  static constexpr auto multiply_by_q = &cunmqr;
  static constexpr auto trtrs = &ctrtrs;
  static constexpr auto trcon = &ctrcon;
  static constexpr auto gelsd = &cgelsd;
};
template <>
struct lapack<std::complex<double>> {
  using element = MKL_Complex16;
  static constexpr auto geqrf = &zgeqrf;
  static constexpr auto multiply_by_q = &zunmqr;
  static constexpr auto trtrs = &ztrtrs;
  static constexpr auto trcon = &ztrcon;
  static constexpr auto gelsd = &zgelsd;
};

}  // namespace dsp
