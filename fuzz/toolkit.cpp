// The typed toolkit: calls in sequence that share two slots for transforms. SPDX-License-Identifier: MIT
#include <array>
#include <cmath>
#include <numbers>

#include "host_arrays.hpp"
#include "support/letters.hpp"

namespace fuzz {
namespace {

using tests::correlation_pair;
using tests::family;
using tests::partial_family;
using toolkit::c;
using toolkit::complex_of;
using toolkit::d;
using toolkit::is_complex;
using toolkit::magnitude_of;
using toolkit::real_of;
using toolkit::s;
using toolkit::z;
using wide = std::complex<double>;
using record = std::vector<wide>;

/// Longer results are not compared with their definitions, which take a time that grows with the square.
constexpr std::size_t small = 96;

template <class E>
constexpr double epsilon = static_cast<double>(std::numeric_limits<real_of<E>>::epsilon());

/// What all operations of one input share.
struct bench {
  input &in;
  hosting &host;
  void *slots[2] = {nullptr, nullptr};

  bench(input &from, hosting &service) : in(from), host(service) {}
  bench(const bench &) = delete;
  bench &operator=(const bench &) = delete;
  ~bench() {
    for (void *&slot : slots) hold(qsHost_ReleaseTransform(&slot) == 0 && !slot, "a slot is released");
  }
  void **slot() {
    const unsigned which = in.choice(4);
    return which == 3 ? nullptr : &slots[which % 2];
  }
};

template <class Letter>
array &vector_for(call &on, role as, int count = -1) {
  return on.give<typename Letter::block>(as, count);
}
template <class Letter>
array &matrix_for(call &on, role as, int rows = -1, int columns = -1) {
  return on.give<typename Letter::matrix_block>(as, rows, columns);
}
template <class Letter>
auto vec(array &a) {
  return a.as<typename Letter::block>();
}
template <class Letter>
auto mat(array &a) {
  return a.as<typename Letter::matrix_block>();
}

double norm(const record &x) {
  double sum = 0;
  for (const wide v : x) sum += std::norm(v);
  return std::sqrt(sum);
}
/// No result is NaN or larger; for records too long to be compared.
void check_bound(const record &got, double most, int line = __builtin_LINE()) {
  hold(std::all_of(got.begin(), got.end(), [&](wide v) { return std::abs(v) <= most; }), "bound of the results", line);
}

record dft(const record &x, int sign) {
  record out(x.size());
  for (std::size_t k = 0; k < x.size(); ++k)
    for (std::size_t i = 0; i < x.size(); ++i)
      out[k] += x[i] * std::polar(1.0, sign * 2 * std::numbers::pi * static_cast<double>(k * i % x.size()) /
                                           static_cast<double>(x.size()));
  return out;
}

template <class E>
void forward(bench &b) {
  using C = complex_of<E>;
  call on(b.in, b.host);
  auto &x = vector_for<E>(on, reads), &out = vector_for<C>(on, writes), &scratch = vector_for<E>(on, works);
  const std::int32_t size = b.in.flag() ? b.in.option(300) : 0, shift = b.in.option(2);
  const auto code = family<E>::fft(vec<E>(x), vec<C>(out), size, shift, vec<E>(scratch), b.slot());
  if (!on.check(code, {-20003, -359502, -20061, -20001, -20999})) {
    hold(!on.plain() || x.values.empty() || size > 1 << 27, "a transform that can be made");
    return;
  }
  record want = x.values;
  want.resize(size < 1 ? want.size() : static_cast<std::size_t>(size));
  hold(out.count() == want.size(), "number of bins");
  if (!x.tame) return;
  const double scale = norm(want);
  if (want.size() > small) return check_bound(out.now(), scale * std::sqrt(static_cast<double>(want.size())) * 1.01);
  want = dft(want, -1);
  if (shift) std::rotate(want.begin(), want.begin() + static_cast<std::ptrdiff_t>((want.size() + 1) / 2), want.end());
  check_near(out.now(), want, 32 * epsilon<E> * scale * std::sqrt(static_cast<double>(want.size())));
}

template <class E>
void inverse(bench &b) {
  using C = complex_of<E>;
  call on(b.in, b.host);
  auto &x = vector_for<C>(on, reads), &out = vector_for<E>(on, writes), &scratch = vector_for<C>(on, works);
  const std::int32_t shift = b.in.option(2);
  const auto code = family<E>::inverse_fft(vec<C>(x), vec<E>(out), shift, vec<C>(scratch), b.slot());
  if (!on.check(code, {-20003, -359502, -20061, -20001, -20999})) {
    hold(!on.plain() || x.values.empty(), "a transform that can be made");
    return;
  }
  record want = x.values;
  const std::size_t n = want.size();
  hold(out.count() == n, "number of samples");
  if (!x.tame) return;
  const double scale = norm(want);
  if (n > small) return check_bound(out.now(), scale * 2);
  if (shift) std::rotate(want.begin(), want.begin() + static_cast<std::ptrdiff_t>(n / 2), want.end());
  if (!is_complex<E>) {
    want[0] = want[0].real();
    if (n % 2 == 0) want[n / 2] = want[n / 2].real();
    for (std::size_t k = n / 2 + 1; k < n; ++k) want[k] = std::conj(want[n - k]);
  }
  want = dft(want, 1);
  for (wide &v : want) v /= static_cast<double>(n);
  check_near(out.now(), want, 32 * epsilon<E> * (scale + 1));
}

/// A rectangle of products; vectors have one row.
struct shape {
  std::size_t rows, columns;
};
/// sum over k, l of x[k, l] y[i - k, j - l]; conjugated and reversed it is the correlation, too.
record convolve(const record &x, shape sx, const record &y, shape sy) {
  const std::size_t columns = sx.columns + sy.columns - 1;
  record out((sx.rows + sy.rows - 1) * columns);
  for (std::size_t i = 0; i < x.size(); ++i)
    for (std::size_t j = 0; j < y.size(); ++j)
      out[(i / sx.columns + j / sy.columns) * columns + i % sx.columns + j % sy.columns] += x[i] * y[j];
  return out;
}
record conjugate_reverse(record x) {
  std::reverse(x.begin(), x.end());
  for (wide &v : x) v = std::conj(v);
  return x;
}
template <class E>
double product_tolerance(const record &x, const record &y) {
  return 4 * epsilon<E> * (16 + std::sqrt(static_cast<double>(x.size() + y.size()))) * norm(x) * norm(y);
}

template <class E>
void convolution(bench &b) {
  call on(b.in, b.host);
  auto &x = vector_for<E>(on, reads), &y = vector_for<E>(on, reads), &out = vector_for<E>(on, writes);
  auto &scratch = vector_for<E>(on, works), &room = vector_for<E>(on, works);
  const std::int32_t mode = b.in.option(3), method = b.in.option(2), block = b.in.option(40);
  const auto code = family<E>::convolution(vec<E>(x), vec<E>(y), vec<E>(out), mode, method, block, vec<E>(scratch),
                                           vec<E>(room), b.slot());
  const std::size_t nx = x.values.size(), ny = y.values.size();
  const bool valid = nx > 0 && ny > 0 && mode >= 0 && mode < 3 && method >= 0 && method < 2 && (mode != 2 || nx >= ny);
  hold(code != 0 || valid, "arguments that are not valid");
  if (!on.check(code, {-20003, -20061, -20008, -20001, -20999})) return hold(!on.plain() || !valid, "valid arguments");
  const std::size_t first = mode == 0 ? 0 : mode == 1 ? ny / 2 : ny - 1;
  const std::size_t kept = mode == 0 ? nx + ny - 1 : mode == 1 ? nx : nx - ny + 1;
  hold(out.count() == kept, "number of samples");
  if (!x.tame || !y.tame) return;
  if (nx * ny > small * small) return check_bound(out.now(), 1.01 * norm(x.values) * norm(y.values) + 1);
  const record all = convolve(x.values, {1, nx}, y.values, {1, ny});
  const auto from = all.begin() + static_cast<std::ptrdiff_t>(first);
  check_near(out.now(), record(from, from + static_cast<std::ptrdiff_t>(kept)),
             product_tolerance<E>(x.values, y.values));
}

template <class X, class Y>
void correlation(bench &b) {
  using E = toolkit::common_of<X, Y>;
  call on(b.in, b.host);
  auto &x = vector_for<X>(on, reads), &y = vector_for<Y>(on, reads);
  auto &out = vector_for<E>(on, writes), &scratch = vector_for<E>(on, works), &room = vector_for<E>(on, works);
  const std::int32_t method = b.in.option(2), normalisation = b.in.option(3), block = b.in.option(40);
  const auto code = correlation_pair<X, Y>::correlate(vec<X>(x), vec<Y>(y), vec<E>(out), method, normalisation, block,
                                                      vec<E>(scratch), vec<E>(room), b.slot());
  const std::size_t nx = x.values.size(), ny = y.values.size();
  const bool valid = nx > 0 && ny > 0 && method >= 0 && method < 2 && normalisation >= 0 && normalisation < 3;
  hold(code != 0 || valid, "arguments that are not valid");
  if (!on.check(code, {-20003, -20061, -20001, -20999})) return hold(!on.plain() || !valid, "valid arguments");
  hold(out.count() == nx + ny - 1, "number of lags");
  if (!x.tame || !y.tame) return;
  if (nx * ny > small * small) return check_bound(out.now(), 1.01 * norm(x.values) * norm(y.values) + 1);
  record want = convolve(conjugate_reverse(x.values), {1, nx}, y.values, {1, ny});
  for (std::size_t i = 0; i < want.size() && normalisation; ++i)
    want[i] /= static_cast<double>(normalisation == 2 ? std::max(nx, ny) : std::min({i + 1, want.size() - i, nx, ny}));
  check_near(out.now(), want, product_tolerance<E>(x.values, y.values));
}

template <class E>
void matrix_correlation(bench &b) {
  call on(b.in, b.host);
  auto &x = matrix_for<E>(on, reads), &y = matrix_for<E>(on, reads), &out = matrix_for<E>(on, writes);
  auto &scratch = vector_for<E>(on, works), &room = vector_for<E>(on, works);
  const std::int32_t method = b.in.option(2);
  const auto sides = [](const array &a) {
    return shape{static_cast<std::size_t>(std::max(a.size(0), 0)), static_cast<std::size_t>(std::max(a.size(1), 0))};
  };
  const shape sx = sides(x), sy = sides(y);
  const auto code =
      family<E>::matrix_correlation(mat<E>(x), mat<E>(y), mat<E>(out), method, vec<E>(scratch), vec<E>(room), b.slot());
  const bool valid = !x.values.empty() && !y.values.empty() && method >= 0 && method < 2;
  hold(code != 0 || valid, "arguments that are not valid");
  if (!on.check(code, {-20003, -20061, -20001, -20999})) return hold(!on.plain() || !valid, "valid arguments");
  hold(static_cast<std::size_t>(out.size(0)) == sx.rows + sy.rows - 1 &&
           static_cast<std::size_t>(out.size(1)) == sx.columns + sy.columns - 1,
       "sizes of the result");
  if (x.tame && y.tame)
    check_near(out.now(), convolve(conjugate_reverse(x.values), sx, y.values, sy),
               product_tolerance<E>(x.values, y.values));
}

template <class E>
void window(bench &b) {
  call on(b.in, b.host);
  auto &x = vector_for<E>(on, writes);
  auto &scratch = vector_for<d>(on, works);
  const std::int32_t type = b.in.option(13), normalise = b.in.option(2);
  const auto code = family<E>::window(vec<E>(x), type, normalise, vec<d>(scratch));
  const bool valid = (type >= 0 && type < 12 && type != 10) || x.values.size() == 1;
  hold(code != 0 || (valid && !x.values.empty()), "arguments that are not valid");
  if (!on.check(code, {-20003, -20061, -20001, -20999}))
    return hold(!on.plain() || !valid || x.values.empty(), "valid arguments");
  const record got = x.now();
  hold(got.size() == x.values.size(), "number of samples");
  if (!x.tame) return;
  const auto n = static_cast<double>(got.size());
  for (std::size_t i = 0; i < got.size(); ++i) {
    hold(std::abs(got[i]) <= (normalise ? 4.7 : 1.001) * std::abs(x.values[i]), "bound of a window");
    const long double turn = 2 * std::numbers::pi_v<long double> * static_cast<long double>(i) / got.size();
    const auto w = static_cast<double>((normalise ? 2 : 1) * (0.5L - 0.5L * std::cos(turn)));
    // Nine rotations make a sine, whose errors leave some 5 epsilons in the window, twice that where it is normalised.
    if (type == 1 && n > 1) hold(std::abs(got[i] - w * x.values[i]) <= 16 * epsilon<E>, "Hann window");
  }
}

template <class E>
void power_spectrum(bench &b) {
  using R = magnitude_of<E>;
  call on(b.in, b.host);
  auto &x = vector_for<E>(on, reads), &out = vector_for<R>(on, writes), &scratch = vector_for<E>(on, works);
  const auto code = family<E>::power_spectrum(vec<E>(x), vec<R>(out), vec<E>(scratch), b.slot());
  if (!on.check(code, {-20003, -20061, -20001, -20999}))
    return hold(!on.plain() || x.values.empty(), "valid arguments");
  const record got = out.now();
  hold(got.size() == x.values.size(), "number of bins");
  if (!x.tame) return;
  const auto n = static_cast<double>(got.size());
  double sum = 0, power = norm(x.values) * norm(x.values) / n;
  for (const wide p : got) sum += p.real();
  hold(std::abs(sum - power) <= 64 * epsilon<E> * (power + 1), "mean power");
  if (got.size() > small) return;
  record want = dft(x.values, -1);
  for (wide &v : want) v = std::norm(v) / (n * n);
  check_near(got, want, 64 * epsilon<E> * (power + 1));
}

template <class E>
void decimate(bench &b) {
  call on(b.in, b.host);
  auto &x = vector_for<E>(on, reads), &out = vector_for<E>(on, writes);
  const std::int32_t factor = b.in.option(40), average = b.in.option(2);
  const auto code = family<E>::decimate(vec<E>(x), vec<E>(out), factor, average);
  const auto n = static_cast<std::int64_t>(x.values.size());
  const bool valid = factor >= 1 && factor <= n;
  hold(code != 0 || valid, "arguments that are not valid");
  if (!on.check(code, {-20003, -20022, -20001})) return hold(!on.plain() || !valid, "valid arguments");
  hold(static_cast<std::int64_t>(out.count()) == n / factor, "number of samples");
  if (!x.tame) return;
  record want(out.count());
  for (std::size_t k = 0; k < want.size(); ++k) {
    const auto *const group = &x.values[k * static_cast<std::size_t>(factor)];
    for (int j = 0; j < (average ? factor : 1); ++j) want[k] += group[j] / (average ? double{1} * factor : 1.0);
  }
  check_near(out.now(), want, average ? 2 * epsilon<E> * factor : 0);
}

/// One stream in up to three blocks, compared with its definition, and the state that it leaves.
template <class E, bool channels>
void resample(bench &b) {
  using R = magnitude_of<E>;
  call on(b.in, b.host);
  const auto data = [&](role as) -> array & {
    if constexpr (channels) return matrix_for<E>(on, as);
    return vector_for<E>(on, as);
  };
  const auto handle = [](array &a) {
    if constexpr (channels)
      return mat<E>(a);
    else
      return vec<E>(a);
  };
  auto &h = vector_for<R>(on, reads, b.in.flag() ? b.in.count() : 33);
  auto &out = data(writes), &history = data(writes), &taps = vector_for<R>(on, writes);
  const lumra_resampler_parameters parameters{static_cast<float>(b.in.one_in(3) ? b.in.real() * 4 : b.in.byte() / 32.),
                                              static_cast<float>(b.in.one_in(3) ? b.in.real() * 40 : 0),
                                              b.in.option(2)};
  const std::int32_t phases = b.in.option(20), stretched = b.in.option(2);
  std::array<unsigned char, LUMRA_RESAMPLER_STATE_SIZE> state;
  state.fill(0xA5);
  if (b.in.one_in(8))  // a state that was corrupted
    for (auto &byte : state) byte = static_cast<unsigned char>(b.in.byte());
  const double ratio = static_cast<double>(parameters.ratio), delay = static_cast<double>(parameters.delay);
  const double last = static_cast<double>(h.values.size()) - 1, step = phases / (stretched ? std::max(ratio, 1.0) : 1);
  record stream, results;
  bool tame = h.tame;
  const auto rows = [](const array &a) { return channels ? a.size(0) : 1; };
  std::int32_t stream_rows = -1;
  for (unsigned block = 0; block <= 2; ++block) {
    auto &x = data(reads);
    float time = 7;
    const bool reset = block == 0 && !b.in.one_in(16);
    if (reset == (block == 0) && b.in.one_in(32)) state[b.in.choice(LUMRA_RESAMPLER_STATE_SIZE)] ^= 1, tame = false;
    const auto call_it = [&](auto export_function) {
      return export_function(handle(x), vec<R>(h), phases, reset && !b.in.one_in(64) ? &parameters : nullptr, reset,
                             stretched, handle(out), &time, handle(history), vec<R>(taps),
                             b.in.one_in(64) ? nullptr : state.data());
    };
    const auto code = call_it([] {
      if constexpr (channels)
        return family<E>::resample_channels;
      else
        return family<E>::resample;
    }());
    if (!on.check(code, {-20003, -20061, -20016, -20059, -20001, -20075})) return hold(time == 0, "no time");
    if (stream_rows < 0) stream_rows = rows(x);
    tame = tame && x.tame && ratio > 0.05 && rows(x) == 1 && stream_rows == 1 && on.plain();
    if (!tame) continue;
    stream.insert(stream.end(), x.values.begin(), x.values.end());
    const auto got = out.now();
    results.insert(results.end(), got.begin(), got.end());
  }
  if (!tame || stream.size() > 4 * small || parameters.interpolation == 1) return;
  const double outputs = (static_cast<double>(stream.size()) - last / 2 / step - delay) / ratio;
  hold(std::abs(static_cast<double>(results.size()) - std::max(0.0, std::ceil(outputs))) <= (results.empty() ? 0 : 1),
       "number of outputs");
  for (std::size_t k = 0; k < results.size() && k < small; ++k) {
    wide want = 0;
    for (std::size_t j = 0; j < stream.size(); ++j) {
      const double t = last / 2 + step * (static_cast<double>(j) - delay - static_cast<double>(k) * ratio);
      const double margin = 1e-5;  // the ends of the prototype, to which rounding may bring a tap or take it from
      if (std::abs(t) < margin || std::abs(t - last) < margin) return;
      if (t < 0 || t > last) continue;
      const auto i = static_cast<std::size_t>(t);
      const wide next = h.values[std::min(i + 1, h.values.size() - 1)];
      want += step * stream[j] * (h.values[i] + (t - static_cast<double>(i)) * (next - h.values[i]));
    }
    hold(std::abs(results[k] - want) <= 1e-3 * step * (last + 2), "resampled sample");
  }
}

/// One stream in two blocks, compared with the difference equation.
template <class E, class F>
void iir(bench &b) {
  call on(b.in, b.host);
  auto &reverse = vector_for<F>(on, reads, static_cast<int>(b.in.choice(20)));
  auto &forward_part = vector_for<F>(on, reads, static_cast<int>(b.in.choice(20)));
  auto &inputs = vector_for<E>(on, writes), &outputs = vector_for<E>(on, writes);
  auto &room = vector_for<F>(on, works), &saved = vector_for<E>(on, works);
  auto &more = std::is_same_v<E, z> ? room : vector_for<F>(on, works);  // one for both
  const record &a = reverse.values, &f = forward_part.values;
  double rest = 0;
  for (std::size_t j = 1; j < a.size(); ++j) rest += std::abs(a[j]);
  const double gain = a.empty() ? 1 : 1 / std::abs(a[0]);
  bool tame = reverse.tame && forward_part.tame && (a.empty() || rest <= 0.9 * std::abs(a[0])) && gain < 1e3;
  record x, y;
  for (unsigned block = 0; block < 2; ++block) {
    auto &data = vector_for<E>(on, writes);
    const std::int32_t reset = block == 0 ? b.in.option(4) : 0;
    // As they are now: the first block may have emptied what is workspace, too.
    const bool idle = data.count() == 0 || (forward_part.count() == 0 && reverse.count() == 0);
    on.set_idle(idle);
    std::int32_t code = 0;
    if constexpr (std::is_same_v<E, z>)
      code = partial_family<E>::filter(vec<E>(data), vec<F>(reverse), vec<F>(forward_part), vec<E>(inputs),
                                       vec<E>(outputs), reset, vec<F>(room), vec<E>(saved));
    else
      code = partial_family<E>::filter(vec<E>(data), vec<F>(reverse), vec<F>(forward_part), vec<E>(inputs),
                                       vec<E>(outputs), reset, vec<F>(room), vec<F>(more), vec<E>(saved));
    if (!on.check(code, {-20008, -20061, -20001, -20999}))
      return hold(!on.plain() || (f.empty() && !a.empty()), "valid arguments");
    if (idle && !on.plain()) return;
    hold(data.count() == data.values.size(), "number of samples");
    if (f.empty() || data.values.empty()) return;
    hold(inputs.count() == f.size() - 1 && (a.empty() || outputs.count() == a.size() - 1), "sizes of the states");
    data.roles = 0;  // a failure of the next block does not reach it
    tame = tame && data.tame && on.plain() && (block != 0 || reset);
    x.insert(x.end(), data.values.begin(), data.values.end());
    const auto got = data.now();
    y.insert(y.end(), got.begin(), got.end());
  }
  if (!tame) return;
  record want(x.size());
  for (std::size_t i = 0; i < x.size(); ++i) {
    for (std::size_t j = 0; j < std::min(i + 1, f.size()); ++j) want[i] += f[j] * x[i - j];
    for (std::size_t j = 1; j < std::min(i + 1, a.size()); ++j) want[i] -= a[j] * want[i - j];
    if (!a.empty()) want[i] /= a[0];
  }
  const double terms = static_cast<double>(f.size() + a.size());
  check_near(y, want, 40 * epsilon<E> * terms * gain * std::max(1.0, norm(f) * std::sqrt(terms)));
}

template <class E>
void rms(bench &b) {
  call on(b.in, b.host);
  auto &x = vector_for<E>(on, reads);
  real_of<E> result = 7;
  const auto code = family<E>::rms(vec<E>(x), b.in.one_in(16) ? nullptr : &result);
  if (!on.check(code, {-20003})) return hold(x.values.empty() && (result == 7 || std::isnan(result)), "no result");
  const auto n = static_cast<double>(x.values.size());
  if (x.tame && result != 7)
    hold(std::abs(static_cast<double>(result) - norm(x.values) / std::sqrt(n)) <= epsilon<E> * (n + 4), "RMS");
}

template <class E>
void linear_fit(bench &b) {
  using real = real_of<E>;
  call on(b.in, b.host);
  auto &y = vector_for<E>(on, writes, b.in.count());
  const int n = static_cast<int>(y.values.size());
  auto &x = vector_for<E>(on, reads, b.in.one_in(16) ? -1 : n);
  auto &weights = vector_for<E>(on, reads, b.in.one_in(3) ? n : b.in.one_in(16) ? -1 : 0);
  auto &scratch = vector_for<E>(on, works);
  real slope = 7, intercept = 7, residue = 7;
  std::int32_t iterations = 7;
  const std::int32_t method = b.in.option(3);
  const auto code = partial_family<E>::linear_fit(vec<E>(y), vec<E>(x), vec<E>(weights), &slope, &intercept, &residue,
                                                  method, static_cast<float>(b.in.real()),
                                                  static_cast<float>(b.in.byte()), &iterations, vec<E>(scratch));
  if (!on.check(code, {-20061, -20002, -20006, -20068, -20999, -20001}))
    return hold(std::isnan(slope) && std::isnan(intercept) && std::isnan(residue) && iterations == 0, "no line");
  hold(y.count() == static_cast<std::size_t>(n) && iterations >= 0, "number of values");
  if (x.tame && y.tame) hold(std::isfinite(slope) && std::isfinite(intercept) && residue >= 0, "a line");
  if (!on.plain() || !x.tame || !y.tame || method != 0 || !weights.values.empty()) return;
  double mx = 0, my = 0, xx = 0, xy = 0;
  for (std::size_t i = 0; i < y.values.size(); ++i) mx += x.values[i].real() / n, my += y.values[i].real() / n;
  for (std::size_t i = 0; i < y.values.size(); ++i) {
    const double dx = x.values[i].real() - mx;
    xx += dx * dx;
    xy += dx * (y.values[i].real() - my);
  }
  if (xx < 1e-6) return;
  const double want = xy / xx, tolerance = 64 * epsilon<E> * (1 + std::abs(want));
  hold(std::abs(static_cast<double>(slope) - want) <= tolerance, "slope");
  hold(std::abs(static_cast<double>(intercept) - (my - want * mx)) <= tolerance, "intercept");
}

int side(bench &b) {
  return static_cast<int>(b.in.choice(24));
}

template <class E, bool by_vector>
void multiply(bench &b) {
  call on(b.in, b.host);
  const int k = side(b), other = b.in.one_in(8) ? side(b) : k;
  // Without elements, and where the host limits memory, any number of rows and columns will do.
  const bool vast = k == 0 && other == 0 && !b.host.is_own_allocator() && b.in.flag();
  const auto free_side = [&] { return vast ? std::max(0, b.in.option(70) << 20) : side(b); };
  auto &a = matrix_for<E>(on, reads, free_side(), k);
  auto &x = by_vector ? vector_for<E>(on, reads, other) : matrix_for<E>(on, reads, other, free_side());
  auto &out = by_vector ? vector_for<E>(on, writes) : matrix_for<E>(on, writes);
  std::int32_t sizes[3] = {a.size(0), a.size(1), by_vector ? 1 : x.size(1)};
  std::int32_t code = 0;
  if constexpr (by_vector)
    code = partial_family<E>::multiply_vector(mat<E>(a), vec<E>(x), vec<E>(out));
  else
    code = partial_family<E>::multiply(mat<E>(a), mat<E>(x), mat<E>(out));
  if (!on.check(code, {-20003, -20004, -20039, -20001}))
    return hold(!on.plain() || k != other || vast, "valid arguments");
  const bool none = by_vector && sizes[1] == 0;
  hold(out.size(0) == (none ? 0 : sizes[0]) && (by_vector || out.size(1) == sizes[2]), "sizes of the product");
  if (!a.tame || !x.tame || sizes[1] == 0) return;
  const auto inner = static_cast<std::size_t>(sizes[1]), columns = static_cast<std::size_t>(sizes[2]);
  record want(out.count());
  for (std::size_t i = 0; i < want.size(); ++i)
    for (std::size_t j = 0; j < inner; ++j)
      want[i] += a.values[i / columns * inner + j] * x.values[j * columns + i % columns];
  check_near(out.now(), want, 8 * epsilon<E> * static_cast<double>(inner + 1));
}

template <class E>
void least_squares(bench &b) {
  call on(b.in, b.host);
  const int m = side(b), n = side(b);
  auto &a = matrix_for<E>(on, reads, m, n);
  auto &rhs = vector_for<E>(on, reads, b.in.one_in(16) ? -1 : m);
  auto &x = vector_for<E>(on, writes);
  auto &scratch = vector_for<E>(on, works), &room = vector_for<E>(on, works), &more = vector_for<E>(on, works);
  const float tolerance = b.in.flag() ? 0 : static_cast<float>(b.in.real() / 100);
  const auto code = partial_family<E>::least_squares(mat<E>(a), vec<E>(rhs), tolerance, vec<E>(x), vec<E>(scratch),
                                                     vec<E>(room), vec<E>(more));
  if (!on.check(code, {-20003, -20002, -20061, -20068, -20001, -20999})) return;
  hold(static_cast<int>(x.count()) == n, "number of unknowns");
  if (!on.plain() || !a.tame || !rhs.tame) return;
  // At the minimum A^H (A x - b) is 0, but for what the cut-off leaves out.
  record residual = rhs.values;
  const record got = x.now();
  const auto columns = static_cast<std::size_t>(n);
  for (std::size_t i = 0; i < a.values.size(); ++i) residual[i / columns] -= a.values[i] * got[i % columns];
  record gradient(columns);
  for (std::size_t i = 0; i < a.values.size(); ++i)
    gradient[i % columns] += std::conj(a.values[i]) * residual[i / columns];
  const double size = norm(a.values), cut = std::max(static_cast<double>(tolerance), 64 * epsilon<E>);
  hold(norm(gradient) <= 16 * cut * size * (norm(rhs.values) + size * norm(got)) + 1e-6, "least squares");
}

template <class E>
void any_letter(bench &b) {
  constexpr void (*all[])(bench &) = {&forward<E>,         &inverse<E>,        &convolution<E>,
                                      &correlation<E, E>,  &decimate<E>,       &matrix_correlation<E>,
                                      &window<E>,          &power_spectrum<E>, &rms<E>,
                                      &resample<E, false>, &resample<E, true>, &iir<E, magnitude_of<E>>};
  all[b.in.choice(std::size(all))](b);
}

}  // namespace

void run(input &in) {
  hosting host(in, hosting::unit::elements);
  bench b(in, host);
  constexpr void (*all[])(bench &) = {&any_letter<s>,     &any_letter<d>,     &any_letter<c>,      &any_letter<z>,
                                      &correlation<s, c>, &correlation<c, s>, &correlation<d, z>,  &correlation<z, d>,
                                      &linear_fit<s>,     &linear_fit<d>,     &multiply<s, false>, &multiply<c, false>,
                                      &multiply<s, true>, &multiply<c, true>, &least_squares<s>,   &least_squares<c>};
  for (int calls = 0; in.left() && calls < 6; ++calls) all[in.choice(std::size(all))](b);
}

}  // namespace fuzz
