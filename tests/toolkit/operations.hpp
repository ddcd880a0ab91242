// Every operation of the toolkit that sizes arrays, with arguments that make it do all it can, so that tests can walk
// over them. SPDX-License-Identifier: MIT
#pragma once

#include <array>
#include <cstring>
#include <tuple>

#include "toolkit/toolkit_test.hpp"

namespace tests {

/// Small coefficients behind a leading 1: the recursion with them is stable.
template <class R>
std::vector<toolkit::value_of<R>> stable_poles(std::size_t n) {
  auto a = noise<R>(n, 7);
  for (auto &v : a) v /= static_cast<toolkit::real_of<R>>(n);
  a[0] = 1;
  return a;
}

/// Arguments for one call, records of n samples; outputs and states hold stale values.
template <class E>
struct arguments {
  using C = toolkit::complex_of<E>;
  using R = toolkit::magnitude_of<E>;
  using real = toolkit::real_of<E>;

  std::size_t n, ny = (2 * n + 1) / 3;
  array_of<E> x = filled<E>(noise<E>(n, 1)), y = filled<E>(noise<E>(ny, 2)), none = array_of<E>(0);
  array_of<C> bins = filled<C>(noise<C>(n, 3));
  matrix_of<E> mx = filled<E>(static_cast<std::int32_t>(ny), 6, noise<E>(6 * ny, 4)),
               my = filled<E>(6, 5, noise<E>(30, 6));
  array_of<R> numbers = filled<R>(noise<R>(n, 5)), poles = filled<R>(stable_poles<R>(1 + n % 19));

  array_of<E> out = array_of<E>(3), history = array_of<E>(5), output_history = array_of<E>(5);
  array_of<C> bins_out = array_of<C>(3);
  array_of<R> real_out = array_of<R>(3), tap_history = array_of<R>(5);
  matrix_of<E> matrix_out = matrix_of<E>(1, 3), matrix_history = matrix_of<E>(1, 5);
  real slope = 7, intercept = 7, residue = 7;
  std::int32_t iterations = 7;
  float time = 7;
  bool once = false;  // streams are not continued with a second block
  std::array<unsigned char, LUMRA_RESAMPLER_STATE_SIZE> state;

  array_of<E> scratch = array_of<E>(0), room = array_of<E>(0), more_room = array_of<E>(0);
  array_of<C> bins_scratch = array_of<C>(0);
  array_of<R> numbers_scratch = array_of<R>(0), more_numbers = array_of<R>(0);
  f64_array tables = f64_array(0);
  void *slot = nullptr;

  explicit arguments(std::size_t size = 40) : n(size) { state.fill(0xA5); }
  arguments(const arguments &) = delete;
  arguments &operator=(const arguments &) = delete;
  ~arguments() { qsHost_ReleaseTransform(&slot); }

  /// All workspace; then what an operation keeps between calls; then all other arrays.
  auto workspace() { return std::tie(scratch, room, more_room, bins_scratch, numbers_scratch, more_numbers, tables); }
  auto states() { return std::tie(history, output_history, tap_history, matrix_history); }
  auto records() { return std::tie(x, y, bins, mx, my, numbers, poles, out, bins_out, real_out, matrix_out); }

  [[nodiscard]] bool scratch_is_empty() {
    const auto is_empty = [](auto &array) { return !array.block() || array.block()->count == 0; };
    return std::apply([&](auto &...arrays) { return (is_empty(arrays) && ...); }, workspace());
  }
  /// Leaves a transform that no operation can use.
  void fill_slot() {
    array_of<E> record = filled<E>(noise<E>(7)), unused;
    array_of<C> spectrum;
    family<E>::fft(record, spectrum, 0, 0, unused, &slot);
  }
};

/// `result` gives the bytes of all outputs and states; those that are as a failure leaves them add none.
template <class E>
struct operation {
  const char *name;
  std::int32_t (*run)(arguments<E> &);
  std::vector<unsigned char> (*result)(arguments<E> &);
};

template <class E, auto... members>
std::vector<unsigned char> bytes_of(arguments<E> &a) {
  std::vector<unsigned char> bytes;
  const auto add = [&bytes](const auto *first, std::size_t count) {
    const auto *const raw = reinterpret_cast<const unsigned char *>(first);
    bytes.insert(bytes.end(), raw, raw + count * sizeof *first);
  };
  const auto add_output = [&](auto &output) {
    if constexpr (requires { output.block()->rows; }) {
      if (!output.block()) return;
      EXPECT_EQ(output.block()->rows == 0, output.block()->columns == 0);
    }
    if constexpr (requires { output.elements(); }) {
      add(output.elements().data(), output.elements().size());
    } else if (output == output && output != std::remove_reference_t<decltype(output)>{}) {  // not NaN, not 0
      add(&output, 1);
    }
  };
  (add_output(a.*members), ...);
  return bytes;
}

template <class E>
const std::vector<operation<E>> &operations() {
  using A = arguments<E>;
  using F = family<E>;
  using P = partial_family<E>;
  constexpr auto correlate = correlation_pair<E, E>::correlate;
  constexpr auto x = &bytes_of<E, &A::x>, out = &bytes_of<E, &A::out>, matrix_out = &bytes_of<E, &A::matrix_out>;
  static const std::vector<operation<E>> all = [] {
    std::vector<operation<E>> list = {
        {"fft", [](A &a) { return F::fft(a.x, a.bins_out, static_cast<std::int32_t>(a.n) + 8, 1, a.scratch, &a.slot); },
         &bytes_of<E, &A::bins_out>},
        {"inverse fft", [](A &a) { return F::inverse_fft(a.bins, a.out, 1, a.bins_scratch, &a.slot); }, out},
        {"direct convolution",
         [](A &a) { return F::convolution(a.x, a.y, a.out, 2, 0, 0, a.scratch, a.room, &a.slot); }, out},
        {"fourier convolution",
         [](A &a) { return F::convolution(a.x, a.y, a.out, 1, 1, 0, a.scratch, a.room, &a.slot); }, out},
        {"convolution onto an input",
         [](A &a) { return F::convolution(a.x, a.out, a.out, 0, 1, 0, a.scratch, a.room, &a.slot); }, out},
        {"direct correlation", [](A &a) { return correlate(a.x, a.y, a.out, 0, 1, 0, a.scratch, a.room, &a.slot); },
         out},
        {"fourier correlation", [](A &a) { return correlate(a.x, a.y, a.out, 1, 2, 0, a.scratch, a.room, &a.slot); },
         out},
        {"direct matrix correlation",
         [](A &a) { return F::matrix_correlation(a.mx, a.my, a.matrix_out, 0, a.scratch, a.room, &a.slot); },
         matrix_out},
        {"fourier matrix correlation",
         [](A &a) { return F::matrix_correlation(a.mx, a.my, a.matrix_out, 1, a.scratch, a.room, &a.slot); },
         matrix_out},
        {"window", [](A &a) { return F::window(a.x, 6, 1, a.tables); }, x},
        {"power spectrum", [](A &a) { return F::power_spectrum(a.x, a.real_out, a.scratch, &a.slot); },
         &bytes_of<E, &A::real_out>},
        {"decimation", [](A &a) { return F::decimate(a.x, a.out, 3, 1); }, out},
        {"decimation of a record in place", [](A &a) { return F::decimate(a.x, a.x, 3, 0); }, x},
        // A new stream, whose second block is what the first one gave, in place.
        {"resampling",
         [](A &a) {
           const lumra_resampler_parameters parameters{0.75F, 1.5F, 0};
           const auto run = [&](auto &in, const lumra_resampler_parameters *reset) {
             return F::resample(in, a.numbers, 4, reset, reset != nullptr, 1, a.out, &a.time, a.history, a.tap_history,
                                a.state.data());
           };
           const std::int32_t first = run(a.x, &parameters);
           return first < 0 || a.once ? first : run(a.out, nullptr);
         },
         &bytes_of<E, &A::out, &A::history, &A::tap_history, &A::time, &A::state>},
        {"resampling of channels",
         [](A &a) {
           const lumra_resampler_parameters parameters{0.25F, 0.5F, 1};
           const auto run = [&](auto &in, const lumra_resampler_parameters *reset) {
             return F::resample_channels(in, a.numbers, 16, reset, reset != nullptr, 0, a.matrix_out, &a.time,
                                         a.matrix_history, a.tap_history, a.state.data());
           };
           const std::int32_t first = run(a.mx, &parameters);
           return first < 0 || a.once ? first : run(a.matrix_out, nullptr);
         },
         &bytes_of<E, &A::matrix_out, &A::matrix_history, &A::tap_history, &A::time, &A::state>},
        {"recursive filter",
         [](A &a) {
           const auto run = [&](bool reset) {
             return filter<E>(a.x, a.poles, a.numbers, a.history, a.output_history, reset, a.numbers_scratch,
                              a.more_numbers, a.scratch);
           };
           const std::int32_t first = run(true);
           return first < 0 || a.once ? first : run(false);
         },
         &bytes_of<E, &A::x, &A::history, &A::output_history>},
    };
    if constexpr (requires { P::linear_fit; }) {
      list.push_back({"linear fit",
                      [](A &a) {
                        return P::linear_fit(a.x, a.numbers, nullptr, &a.slope, &a.intercept, &a.residue, 2, 0, 0,
                                             &a.iterations, a.scratch);
                      },
                      &bytes_of<E, &A::x, &A::slope, &A::intercept, &A::residue, &A::iterations>});
    }
    if constexpr (requires { P::multiply; }) {
      list.insert(
          list.end(),
          {{"matrix product", [](A &a) { return P::multiply(a.mx, a.my, a.matrix_out); }, matrix_out},
           {"matrix product onto a factor", [](A &a) { return P::multiply(a.mx, a.my, a.my); }, &bytes_of<E, &A::my>},
           {"matrix times vector",
            [](A &a) {
              if (a.mx.block()) std::swap(a.mx.block()->rows, a.mx.block()->columns);
              return P::multiply_vector(a.mx, a.y, a.y);
            },
            &bytes_of<E, &A::y>},
           {"least squares by singular values",
            [](A &a) { return P::least_squares(a.mx, a.y, 0, a.out, a.scratch, a.room, a.more_room); }, out},
           {"least squares with a tolerance",
            [](A &a) { return P::least_squares(a.mx, a.y, 1e-6F, a.y, a.scratch, a.room, a.more_room); },
            &bytes_of<E, &A::y>}});
    }
    return list;
  }();
  return all;
}

}  // namespace tests
