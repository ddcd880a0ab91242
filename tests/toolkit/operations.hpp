// Every operation of the transform, convolution, window and power-spectrum families with arguments that make it do all
// it can, so that tests can walk over them. SPDX-License-Identifier: MIT
#pragma once

#include <cstring>

#include "toolkit/families.hpp"
#include "toolkit/toolkit_test.hpp"

namespace tests {

/// Arguments for one call; outputs hold stale elements.
template <class E>
struct arguments {
  array_of<E> x = filled<E>(noise<E>(40, 1)), y = filled<E>(noise<E>(27, 2));
  array_of<toolkit::complex_of<E>> bins = filled<toolkit::complex_of<E>>(noise<toolkit::complex_of<E>>(40, 3));
  matrix_of<E> mx = matrix_of<E>(4, 6), my = matrix_of<E>(3, 5);

  array_of<E> out = array_of<E>(3);
  array_of<toolkit::complex_of<E>> bins_out = array_of<toolkit::complex_of<E>>(3);
  array_of<toolkit::magnitude_of<E>> power_out = array_of<toolkit::magnitude_of<E>>(3);
  matrix_of<E> matrix_out = matrix_of<E>(1, 3);

  array_of<E> scratch = array_of<E>(0), room = array_of<E>(0);
  array_of<toolkit::complex_of<E>> bins_scratch = array_of<toolkit::complex_of<E>>(0);
  f64_array tables = f64_array(0);
  void *slot = nullptr;

  arguments() {
    const auto values = noise<E>(24, 4);
    std::memcpy(mx.block()->elements, values.data(), 24 * sizeof values[0]);
    std::memcpy(my.block()->elements, values.data(), 15 * sizeof values[0]);
  }
  arguments(const arguments &) = delete;
  ~arguments() { qsHost_ReleaseTransform(&slot); }

  [[nodiscard]] bool scratch_is_empty() {
    return scratch.block()->count == 0 && room.block()->count == 0 && bins_scratch.block()->count == 0 &&
           tables.block()->count == 0;
  }
  /// Leaves a transform that no operation can use.
  void fill_slot() {
    array_of<E> record = filled<E>(noise<E>(7)), unused;
    array_of<toolkit::complex_of<E>> spectrum;
    family<E>::fft(record.handle(), spectrum.handle(), 0, 0, unused.handle(), &slot);
  }
};

template <class E>
struct operation {
  const char *name;
  std::int32_t (*run)(arguments<E> &);
  std::vector<unsigned char> (*result)(arguments<E> &);  // bytes of the output's elements
};

template <auto member, class E>
std::vector<unsigned char> bytes_of(arguments<E> &a) {
  auto &block = *(a.*member).block();
  std::size_t count = 0;
  if constexpr (requires { block.rows; }) {
    count = static_cast<std::size_t>(block.rows) * static_cast<std::size_t>(block.columns);
    EXPECT_EQ(block.rows == 0, block.columns == 0);
  } else {
    count = static_cast<std::size_t>(block.count);
  }
  const auto *first = reinterpret_cast<const unsigned char *>(block.elements);
  return {first, first + count * sizeof block.elements[0]};
}

template <class E>
const std::vector<operation<E>> &operations() {
  using A = arguments<E>;
  using F = family<E>;
  constexpr auto out = &bytes_of<&A::out, E>;
  constexpr auto matrix_out = &bytes_of<&A::matrix_out, E>;
  static const std::vector<operation<E>> all = {
      {"fft", [](A &a) { return F::fft(a.x.handle(), a.bins_out.handle(), 48, 1, a.scratch.handle(), &a.slot); },
       &bytes_of<&A::bins_out, E>},
      {"inverse fft",
       [](A &a) { return F::inverse_fft(a.bins.handle(), a.out.handle(), 1, a.bins_scratch.handle(), &a.slot); }, out},
      {"direct convolution",
       [](A &a) {
         return F::convolution(a.x.handle(), a.y.handle(), a.out.handle(), 2, 0, 0, a.scratch.handle(), a.room.handle(),
                               &a.slot);
       },
       out},
      {"fourier convolution",
       [](A &a) {
         return F::convolution(a.x.handle(), a.y.handle(), a.out.handle(), 1, 1, 0, a.scratch.handle(), a.room.handle(),
                               &a.slot);
       },
       out},
      {"convolution onto an input",
       [](A &a) {
         return F::convolution(a.x.handle(), a.out.handle(), a.out.handle(), 0, 1, 0, a.scratch.handle(),
                               a.room.handle(), &a.slot);
       },
       out},
      {"direct correlation",
       [](A &a) {
         return correlation_pair<E, E>::correlate(a.x.handle(), a.y.handle(), a.out.handle(), 0, 1, 0,
                                                  a.scratch.handle(), a.room.handle(), &a.slot);
       },
       out},
      {"fourier correlation",
       [](A &a) {
         return correlation_pair<E, E>::correlate(a.x.handle(), a.y.handle(), a.out.handle(), 1, 2, 0,
                                                  a.scratch.handle(), a.room.handle(), &a.slot);
       },
       out},
      {"direct matrix correlation",
       [](A &a) {
         return F::matrix_correlation(a.mx.handle(), a.my.handle(), a.matrix_out.handle(), 0, a.scratch.handle(),
                                      a.room.handle(), &a.slot);
       },
       matrix_out},
      {"fourier matrix correlation",
       [](A &a) {
         return F::matrix_correlation(a.mx.handle(), a.my.handle(), a.matrix_out.handle(), 1, a.scratch.handle(),
                                      a.room.handle(), &a.slot);
       },
       matrix_out},
      {"window", [](A &a) { return F::window(a.x.handle(), 6, 1, a.tables.handle()); }, &bytes_of<&A::x, E>},
      {"power spectrum",
       [](A &a) { return F::power_spectrum(a.x.handle(), a.power_out.handle(), a.scratch.handle(), &a.slot); },
       &bytes_of<&A::power_out, E>},
  };
  return all;
}

}  // namespace tests
