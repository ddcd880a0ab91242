// All builds of the element loops against their formulas, bit for bit. SPDX-License-Identifier: MIT
#include "qsrfhs/vector/kernels/kernels.hpp"

#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <bit>
#include <cmath>
#include <cstdint>
#include <functional>
#include <limits>
#include <memory>
#include <random>
#include <set>
#include <span>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "support/guarded.hpp"

namespace {

using qsrfhs::kernels::kernel_table;

using qsrfhs::kernels::builds;

/// How products are rounded that something is added to.
enum class products { separate, fused };

/// The tables of this processor that round products so.
std::vector<std::pair<std::string, const kernel_table *>> tables(products how) {
  std::vector<std::pair<std::string, const kernel_table *>> all;
  for (const auto &b : builds()) {
    if (how == products::separate) all.emplace_back(b.name, b.exact);
    if (how == products::fused && b.fused != b.exact) all.emplace_back(std::string(b.name) + " fused", b.fused);
  }
  return all;
}

/// a b + c.
float multiply_add(products how, float a, float b, float c) {
  return how == products::fused ? std::fma(a, b, c) : a * b + c;
}

/// Where the arrays of a call lie: behind a page that faults, in front of one, or at an odd float.
enum class place { front, back, odd };

constexpr float inf = std::numeric_limits<float>::infinity();
constexpr float nan = std::numeric_limits<float>::quiet_NaN();
constexpr float tiny = std::numeric_limits<float>::denorm_min();
constexpr float largest = std::numeric_limits<float>::max();

/// Memory for one array, between two pages that fault.
class room {
 public:
  explicit room(std::size_t floats) : floats_(floats / page * page + page), memory_(4 * floats_, tests::edge::front) {}
  float *put(std::span<const float> values, place at) const {
    const std::size_t offset = at == place::back ? floats_ - values.size() : at == place::odd ? 1 : 0;
    std::copy(values.begin(), values.end(), memory_.as<float>() + offset);
    return memory_.as<float>() + offset;
  }

 private:
  static constexpr std::size_t page = 1024;
  std::size_t floats_;
  tests::guarded memory_;
};

/// For both inputs and the output of a call.
struct rooms {
  explicit rooms(std::size_t floats) : x(floats), y(floats), out(floats) {}
  room x, y, out;
};

/// Ordinary values of all magnitudes, among them every kind of special one.
std::vector<float> filled(std::size_t n, unsigned seed) {
  std::vector<float> values(n);
  constexpr float special[] = {0,   -0.0F, 1,   -1,   2,       0.5F,     tiny, -tiny,  1.17549435e-38F,
                               inf, -inf,  nan, -nan, largest, -largest, 3,    1e-30F, -1e25F};
  std::mt19937 random(seed);
  std::uniform_real_distribution<float> mantissa(-2, 2);
  std::uniform_int_distribution<int> kind(0, 99), exponent(-140, 126);
  constexpr std::size_t period = 5003;
  for (std::size_t i = 0; i < n; ++i) {
    const int k = i < period ? kind(random) : 0;
    values[i] = i >= period ? values[i - period]
                : k < 12    ? special[random() % std::size(special)]
                : k < 40    ? std::ldexp(mantissa(random), exponent(random))
                            : mantissa(random) * 8;
  }
  return values;
}

bool same(float a, float b) {
  return std::bit_cast<std::uint32_t>(a) == std::bit_cast<std::uint32_t>(b) || (std::isnan(a) && std::isnan(b));
}

::testing::AssertionResult same(std::span<const float> expected, std::span<const float> actual) {
  for (std::size_t i = 0; i < expected.size(); ++i)
    if (!same(expected[i], actual[i]))
      return ::testing::AssertionFailure() << "float " << i << ": " << actual[i] << " instead of " << expected[i];
  return ::testing::AssertionSuccess();
}

struct operation {
  const char *name;
  std::size_t x_width, y_width, out_width;  // floats an element
  std::function<void(const kernel_table &, const float *x, const float *y, float *out, std::size_t n)> run;
  std::function<void(const float *x, const float *y, float *out)> define;  // one element
  bool in_place = true;                                                    // the output may be an input
};

/// Values that end at a page that faults, for as long as the process runs.
const float *at_a_page(const std::vector<float> &values) {
  static std::vector<tests::guarded> all;
  return all.emplace_back(values, tests::edge::back).as<float>();
}

void define_division(const float *a, const float *b, float *out) {
  const float d = b[0] * b[0] + b[1] * b[1];
  const float r = 1.0F / d;
  const float re = (a[0] * b[0] + a[1] * b[1]) * r, im = (a[1] * b[0] - a[0] * b[1]) * r;
  out[0] = re;
  out[1] = im;
}

float define_power(const float *x) {
  return x[0] * x[0] + x[1] * x[1];
}

float define_log2(float v) {
  const auto bits = std::bit_cast<std::uint32_t>(v) & 0x7FFFFFFF;
  const auto coefficient = [](std::uint32_t pattern) { return std::bit_cast<float>(pattern); };
  const float m = std::bit_cast<float>((bits & 0x7FFFFF) | 0x3F800000);
  const auto e = static_cast<float>(bits >> 23);
  float p = coefficient(0x3D31E3A8) * m;
  p = p - coefficient(0x3ECF4B84);
  p = p * m;
  p = p + coefficient(0x3FCC0592);
  p = p * m;
  p = p - coefficient(0x405F858C);
  p = p * m;
  p = p + coefficient(0x40A18039);
  p = p * m;
  const float l = p - coefficient(0x40325B46);
  return l - 127.0F + e;
}

/// The element (k, width) of an array of coefficients, by Horner's scheme in x.
float define_polynomial(products how, const std::vector<float> &c, std::size_t part, std::size_t width, float x) {
  const std::size_t m = c.size() / width;
  float acc = c[(m - 1) * width + part];
  for (std::size_t k = m - 1; k-- > 0;) acc = multiply_add(how, acc, x, c[k * width + part]);
  return acc;
}

std::int32_t define_truncation(float t) {
  return t >= -2147483648.0F && t < 2147483648.0F ? static_cast<std::int32_t>(t)
                                                  : std::numeric_limits<std::int32_t>::min();
}

void define_lookup(const qsrfhs::kernels::lookup_table &table, float key, const float *in, float *out) {
  const float inverse = 1.0F / table.step;
  const float t = (key - table.start) * inverse;
  const std::int32_t k = define_truncation(t);
  float g[2];
  for (int part = 0; part < 2; ++part) {
    const auto entry = [&](std::int32_t index) { return table.entries + 4 * static_cast<std::size_t>(index) + part; };
    if (k < 0)
      g[part] = *entry(0);
    else if (k < table.count - 1)
      g[part] = (t - static_cast<float>(k)) * entry(k)[2] + *entry(k);
    else
      g[part] = *entry(table.count - 1);
  }
  const float re = g[0] * in[0] - g[1] * in[1], im = g[0] * in[1] + g[1] * in[0];
  out[0] = re;
  out[1] = im;
}

/// The gains of a table alone, as floats; one gain stands there twice.
std::vector<float> gains_of(const qsrfhs::kernels::lookup_table &table) {
  std::vector<float> gains;
  for (int k = 0; k < std::max(table.count, 2); ++k) {
    const float *const entry = table.entries + 4 * std::min(k, table.count - 1);
    gains.insert(gains.end(), entry, entry + 2);
  }
  return gains;
}

/// The same table with the differences of its gains for slopes.
std::vector<float> slopes_of(const qsrfhs::kernels::lookup_table &table) {
  const std::vector<float> gains = gains_of(table);
  std::vector<float> entries;
  for (std::size_t k = 0; k < 2 * static_cast<std::size_t>(table.count); k += 2) {
    const bool between = k + 2 < gains.size();
    for (const std::size_t part : {k, k + 1}) entries.push_back(gains[part]);
    for (const std::size_t part : {k, k + 1}) entries.push_back(between ? gains[part + 2] - gains[part] : 0);
  }
  return entries;
}

/// The loops around transforms. Those that work on their output itself find x there.
void add_transform_loops(std::vector<operation> &all, products how) {
  const auto window = [](auto x, auto w, auto out) { out[0] = x[0] * *w, out[1] = x[1] * *w; };
  const auto twice_the_power = [](auto x, auto, auto out) { *out = define_power(x) + define_power(x); };
  all.push_back({"copy", 2, 0, 2, [](auto &t, auto x, auto, auto out, auto n) { t.copy(x, out, n); },
                 [](auto x, auto, auto out) { std::copy_n(x, 2, out); }});
  all.push_back({"apply_window", 2, 1, 2,
                 [](auto &t, auto x, auto w, auto out, auto n) { t.apply_window(x, w, out, n); }, window});
  all.push_back({"scale", 1, 0, 1,
                 [](auto &t, auto x, auto, auto out, auto n) {
                   std::copy_n(x, n, out);
                   t.scale(out, 0.3F, n);
                 },
                 [](auto x, auto, auto out) { *out = *x * 0.3F; }});
  all.push_back({"scale_and_shift", 1, 0, 1,
                 [](auto &t, auto x, auto, auto out, auto n) {
                   std::copy_n(x, n, out);
                   t.scale_and_shift(out, 0.3F, 7, n);
                 },
                 [](auto x, auto, auto out) { *out = *x * 0.3F + 7; }});
  all.push_back({"multiply", 2, 2, 2, [](auto &t, auto x, auto y, auto out, auto n) { t.multiply(x, y, out, n); },
                 [how](auto x, auto y, auto out) {
                   out[0] = multiply_add(how, x[0], y[0], -(x[1] * y[1]));
                   out[1] = multiply_add(how, x[1], y[0], x[0] * y[1]);
                 },
                 false});
  // Two segments into zeros: the order of the powers is the build's own until they are put into theirs.
  all.push_back({"accumulate_power", 2, 0, 1,
                 [](auto &t, auto x, auto, auto out, auto n) {
                   std::fill_n(out, n, 0.0F);
                   for (int segment = 0; segment < 2; ++segment) t.accumulate_power(x, out, n);
                   t.order_power(out, n);
                 },
                 twice_the_power, false});
  // The order of the powers is its own inverse, so that sums can be taken out of memory and put back.
  all.push_back({"power of the passes with apply_window", 2, 1, 1,
                 [](auto &t, auto x, auto w, auto out, auto n) {
                   std::vector<float> work(x, x + 2 * n), stored(n);
                   t.store_power_then_apply_window(work.data(), out, x, w, x, n, n);
                   t.store_power(x, stored.data(), n);
                   t.order_power(stored.data(), n);
                   t.order_power(stored.data(), n);
                   t.add(stored.data(), out, n);
                   t.order_power(out, n);
                 },
                 twice_the_power, false});
  all.push_back({"power of accumulate_power_then_apply_window", 2, 1, 1,
                 [](auto &t, auto x, auto w, auto out, auto n) {
                   std::vector<float> work(x, x + 2 * n);
                   std::fill_n(out, n, 0.0F);
                   t.accumulate_power_then_apply_window(work.data(), out, x, w, x, n, n);
                   t.accumulate_power(x, out, n);
                   t.order_power(out, n);
                 },
                 twice_the_power, false});
  all.push_back({"window of accumulate_power_then_apply_window", 2, 1, 2,
                 [](auto &t, auto x, auto w, auto out, auto n) {
                   std::vector<float> power(n);
                   t.accumulate_power_then_apply_window(out, power.data(), x, w, x, n, n);
                 },
                 window, false});
  all.push_back({"reverse_conjugate", 2, 0, 2,
                 [](auto &t, auto x, auto, auto out, auto n) {
                   t.reverse_conjugate(x, out, n);
                   for (std::size_t k = 0; k < n / 2; ++k)
                     std::swap_ranges(out + 2 * k, out + 2 * k + 2, out + 2 * (n - 1 - k));
                 },
                 [](auto x, auto, auto out) { out[0] = x[0], out[1] = -x[1]; }, false});
  for (const double factor : {1.0 / 1024, 1.0 / 3})
    for (const bool mirrored : {false, true})
      all.push_back(
          {mirrored ? "mirror of scaled_power" : "scaled_power", 2, 0, 1,
           [=](auto &t, auto x, auto, auto out, auto n) {
             std::vector<float> other(n);
             t.scaled_power(x, mirrored ? other.data() : out, mirrored ? out : nullptr, factor, n);
             if (mirrored) std::reverse(out, out + n);
           },
           [=](auto x, auto, auto out) { *out = static_cast<float>(static_cast<double>(define_power(x)) * factor); },
           false});
  all.push_back({"weigh", 2, 2, 2, [](auto &t, auto x, auto w, auto out, auto n) { t.weigh(x, w, out, n); },
                 [](auto x, auto w, auto out) { out[0] = x[0] * w[0], out[1] = x[1] * w[1]; }});
  all.push_back({"weigh_and_rotate", 2, 2, 2,
                 [](auto &t, auto x, auto w, auto out, auto n) { t.weigh_and_rotate(x, w, 0.6F, -0.8F, out, n); },
                 [how](auto x, auto w, auto out) {
                   const float re = x[0] * w[0], im = x[1] * w[1];
                   out[0] = multiply_add(how, re, 0.6F, im * 0.8F);
                   out[1] = multiply_add(how, im, 0.6F, re * -0.8F);
                 }});
}

/// Elements of which those that are tested are a part: outputs go past the caches, but for those that are inputs.
constexpr std::size_t many = std::size_t{1} << 30;

std::vector<operation> operations(products how) {
  std::vector<operation> all;
  all.push_back({"divide", 2, 2, 2,
                 [](auto &t, auto x, auto y, auto out, auto n) {
                   t.divide(x, y, out, {n, many});
                 },
                 define_division});
  for (const auto *v :
       {at_a_page({0, 1}), at_a_page({3, -4}), at_a_page({0, 0}), at_a_page({1e30F, 1}), at_a_page({nan, 1})})
    all.push_back({"divide_by_value", 2, 0, 2,
                   [v](auto &t, auto x, auto, auto out, auto n) {
                     t.divide_by_value(x, v, out, {n, many});
                   },
                   [v](auto x, auto, auto out) { define_division(x, v, out); }});
  all.push_back({"magnitude", 2, 0, 1, [](auto &t, auto x, auto, auto out, auto n) { t.magnitude(x, out, n); },
                 [](auto x, auto, auto out) { *out = std::sqrt(define_power(x)); }});
  all.push_back({"magnitude_squared", 2, 0, 1,
                 [](auto &t, auto x, auto, auto out, auto n) { t.magnitude_squared(x, out, n); },
                 [](auto x, auto, auto out) { *out = define_power(x); }});
  for (const auto &factors : {std::pair{1.0F, 0.0F}, {10.0F, 5.0F}, {-3.0103F, 1e-3F}, {0.0F, inf}}) {
    const float a = factors.first, b = factors.second;
    all.push_back({"log2_scaled", 1, 0, 1,
                   [a, b](auto &t, auto x, auto, auto out, auto n) { t.log2_scaled(x, a, b, out, n); },
                   [a, b](auto x, auto, auto out) {
                     const float l = *x >= 0 ? define_log2(*x) : nan;
                     *out = a * l + b;
                   }});
    all.push_back({"log2_scaled_or_infinity", 1, 0, 1,
                   [a, b](auto &t, auto x, auto, auto out, auto n) { t.log2_scaled_or_infinity(x, a, b, out, n); },
                   [a, b](auto x, auto, auto out) {
                     const float l = *x >= 0 ? define_log2(*x) : nan;
                     *out = *x == 0 ? -inf : a * l + b;
                   }});
    all.push_back({"log2_scaled_power", 2, 0, 1,
                   [a, b](auto &t, auto x, auto, auto out, auto n) { t.log2_scaled_power(x, a, b, out, n); },
                   [a, b](auto x, auto, auto out) { *out = a * define_log2(define_power(x)) + b; }});
  }
  for (const std::size_t m : {1U, 2U, 9U, 33U}) {
    std::vector<float> c = filled(2 * m, static_cast<unsigned>(m));
    std::replace_if(
        c.begin(), c.end(), [](float v) { return !(std::abs(v) < 100); }, 0.75F);
    const std::vector<float> real(c.begin(), c.begin() + static_cast<std::ptrdiff_t>(m));
    all.push_back({"polynomial", 1, 0, 1,
                   [m, p = at_a_page(real)](auto &t, auto x, auto, auto out, auto n) { t.polynomial(x, p, m, out, n); },
                   [how, real](auto x, auto, auto out) { *out = define_polynomial(how, real, 0, 1, *x); }});
    all.push_back({"complex_polynomial", 1, 0, 2,
                   [m, p = at_a_page(c)](auto &t, auto x, auto, auto out, auto n) {
                     t.complex_polynomial(x, p, m, out, {n, many});
                   },
                   [how, c](auto x, auto, auto out) {
                     out[0] = define_polynomial(how, c, 0, 2, *x);
                     out[1] = define_polynomial(how, c, 1, 2, *x);
                   }});
  }
  // Keys reach below, into and beyond the tables; an infinite and a negative zero value must come out as they are.
  static const std::vector<float> entries{-0.0F, 1,  2, 3,     0.5F, -1, inf, nan, 2, -0.0F,
                                          -1,    -2, 7, 0.25F, 1,    1,  inf, 1,   5, -6};
  for (qsrfhs::kernels::lookup_table table : {qsrfhs::kernels::lookup_table{nullptr, 5, 0, 1},
                                              {nullptr, 5, -3.5F, 0.75F},
                                              {nullptr, 5, 2, -0.5F},
                                              {nullptr, 5, 0, nan},
                                              {nullptr, 4, 0, tiny},
                                              {nullptr, 1, 0, 1}}) {
    table.entries = at_a_page({entries.begin(), entries.begin() + 4 * table.count});
    all.push_back({"lookup", 1, 2, 2,
                   [=](auto &t, auto x, auto y, auto out, auto n) {
                     t.lookup(table, x, y, out, {n, many});
                   },
                   [=](auto x, auto y, auto out) { define_lookup(table, *x, y, out); }});
    all.push_back({"lookup_between", 1, 2, 2,
                   [=, p = at_a_page(gains_of(table))](auto &t, auto x, auto y, auto out, auto n) {
                     t.lookup_between({p, table.count, table.start, table.step}, x, y, out, {n, many});
                   },
                   [=, with_slopes = at_a_page(slopes_of(table))](auto x, auto y, auto out) {
                     define_lookup({with_slopes, table.count, table.start, table.step}, *x, y, out);
                   }});
  }
  add_transform_loops(all, how);
  return all;
}

std::vector<float> define(const operation &op, std::span<const float> x, std::span<const float> y, std::size_t n) {
  std::vector<float> out(n * op.out_width);
  for (std::size_t i = 0; i < n; ++i)
    op.define(x.data() + i * op.x_width, y.data() + i * op.y_width, out.data() + i * op.out_width);
  return out;
}

/// Which input the output is, too.
enum class output { apart, over_x, over_y };

void check(const rooms &in, products how, const operation &op, std::size_t n, place at) {
  const auto first = filled(n * op.x_width, static_cast<unsigned>(n));
  const auto second = filled(n * op.y_width, static_cast<unsigned>(n + 1));
  const std::vector<float> expected = define(op, first, second, n), before(expected.size(), -77.0F);
  for (const auto &[name, table] : tables(how))
    for (const output where : {output::apart, output::over_x, output::over_y}) {
      const std::size_t width = where == output::over_x ? op.x_width : op.y_width;
      if (where != output::apart && (!op.in_place || op.out_width > width)) continue;
      float *const x = in.x.put(first, at), *const y = in.y.put(second, at);
      float *const out = where == output::over_x ? x : where == output::over_y ? y : in.out.put(before, at);
      op.run(*table, x, y, out, n);
      EXPECT_TRUE(same(expected, {out, expected.size()}))
          << name << ' ' << op.name << " n " << n << " place " << static_cast<int>(at) << " output "
          << static_cast<int>(where);
    }
}

std::vector<std::size_t> lengths() {
  std::vector<std::size_t> all = {63, 64, 65, 127, 1031};  // the last begins at a boundary of the output
  for (std::size_t n = 0; n <= 3 * 16 + 1; ++n) all.push_back(n);
  return all;
}
constexpr place places[] = {place::front, place::back, place::odd};

TEST(VectorKernels, AllBuildsFollowTheFormulasAndTouchNothingElse) {
  const rooms in(2048);
  for (const products how : {products::separate, products::fused})
    for (const operation &op : operations(how))
      for (const std::size_t n : lengths())
        for (const place at : places) check(in, how, op, n, at);
}

// Horner's scheme with m coefficients is within 2 m units of rounding of the sum of the terms' sizes.
TEST(VectorKernels, PolynomialsAreNearThoseInDoublePrecision) {
  constexpr std::size_t m = 9, n = 100;
  const auto x = filled(n, 1), c = std::vector<float>{3, -1, 0.3F, 7, -2.7F, 0.01F, 5, -0.6F, 0.1F};
  for (const products how : {products::separate, products::fused})
    for (const auto &[name, table] : tables(how)) {
      std::vector<float> out(n);
      table->polynomial(x.data(), c.data(), m, out.data(), n);
      for (std::size_t i = 0; i < n; ++i) {
        if (!(std::abs(x[i]) < 1e3F)) continue;
        double sum = 0, sizes = 0;
        for (std::size_t k = 0; k < m; ++k) {
          const double term = static_cast<double>(c[k]) * std::pow(static_cast<double>(x[i]), static_cast<double>(k));
          sum += term;
          sizes += std::abs(term);
        }
        EXPECT_NEAR(sum, static_cast<double>(out[i]), 2 * m * sizes * 0x1p-24) << name << " x " << x[i];
      }
    }
}

// Complex outputs that bypass the caches; how they are stored depends on the shape of the operation only.
TEST(VectorKernels, LongArraysComeOutTheSame) {
  constexpr std::size_t floats = std::size_t{24} << 18;
  const rooms in(floats);
  std::set<std::array<std::size_t, 2>> shapes;
  for (operation op : operations(products::separate)) {
    if (op.out_width != 2 || !shapes.insert({op.x_width, op.y_width}).second) continue;
    op.in_place = false;
    for (const place at : {place::back, place::odd})
      check(in, products::separate, op, floats / (op.x_width + op.y_width + op.out_width) + 1003, at);
  }
}

// Powers with a mirror image, in pieces.
TEST(VectorKernels, LongPowersComeOutTheSame) {
  constexpr std::size_t n = 6007;
  const rooms in(2 * n);
  for (const operation &op : operations(products::separate))
    if (std::string_view(op.name).ends_with("scaled_power"))
      for (const place at : places) check(in, products::separate, op, n, at);
}

TEST(VectorKernels, LookupIndicesBeyondTheExactFloats) {
  constexpr int last = (1 << 24) + 1;  // no float
  const std::unique_ptr<float, void (*)(void *)> entries(
      static_cast<float *>(std::calloc(static_cast<std::size_t>(last) + 1, 16)), &std::free);
  ASSERT_TRUE(entries);
  for (const int k : {last - 1, last})
    entries.get()[4 * static_cast<std::size_t>(k)] = static_cast<float>(k - last + 3);
  for (const auto &b : builds()) {
    const float keys[] = {16777215, 16777216, 16777218, 2147483520.0F, 2147483648.0F, -1};
    const float expected[] = {0, 2, 3, 3, 0, 0};
    const float in[12] = {1, 0, 1, 0, 1, 0, 1, 0, 1, 0, 1, 0};
    float out[12];
    b.exact->lookup({entries.get(), last + 1, 0, 1}, keys, in, out, 6);
    for (int i = 0; i < 6; ++i) EXPECT_EQ(expected[i], out[2 * i]) << b.name << " key " << keys[i];
  }
}

float define_sum(std::span<const float> x) {
  float sums[32] = {}, sum = 0;
  const std::size_t whole = x.size() / 32 * 32;
  for (std::size_t i = 0; i < whole; ++i) sums[i % 32] += x[i] * x[i];
  // Groups of four lanes: 6 + 4 + (2 + 0), then 7 + 5 + (3 + 1).
  for (std::size_t j = 0; j < 8; ++j) sum += (sums[24 + j] + sums[16 + j]) + (sums[8 + j] + sums[j]);
  for (std::size_t i = whole; i < x.size(); i += 2) sum += x[i] * x[i] + x[i + 1] * x[i + 1];
  return sum;
}

TEST(VectorKernels, SumsKeepTheirOrder) {
  const rooms in(2048);
  for (const std::size_t n : lengths())
    for (const place at : places)
      for (const bool with_specials : {false, true}) {
        auto values = filled(2 * n, static_cast<unsigned>(n));
        if (!with_specials)
          for (float &v : values) v = std::isfinite(v) && std::abs(v) < 1e15F ? v : 0.1F;
        float sequential = 0, peak = -largest;
        for (std::size_t i = 0; i < n; ++i) {
          const float power = define_power(&values[2 * i]);
          sequential += power;
          if (power > peak) peak = power;
        }
        const float *const x = in.x.put(values, at);
        float *const sum = in.y.put(std::array{0.0F}, at), *const highest = in.out.put(std::array{0.0F}, at);
        for (const auto &b : builds()) {
          SCOPED_TRACE(testing::Message() << b.name << " n " << n << " place " << static_cast<int>(at));
          EXPECT_TRUE(same(define_sum(values), b.exact->sum_power(x, n)));
          b.exact->sum_power_and_peak(x, n, sum, highest);
          EXPECT_TRUE(same(peak, *highest));
          const bool in_lanes = b.exact != &qsrfhs::kernels::baseline_kernels;
          EXPECT_TRUE(same(in_lanes ? define_sum(values) : sequential, *sum));
        }
      }
}

TEST(VectorKernels, PolynomialsReachAsFarAsTheirBuildGoes) {
  alignas(32) static float out[64];
  struct reach {
    std::size_t offset, n, m, baseline, others;
  };
  constexpr reach reaches[] = {{0, 40, 16, 40, 40}, {0, 40, 17, 8, 40}, {1, 40, 32, 8, 40}, {0, 40, 33, 8, 8},
                               {1, 40, 33, 8, 8},   {2, 40, 33, 8, 8},  {1, 7, 33, 7, 7},   {7, 40, 33, 8, 8},
                               {5, 19, 33, 3, 3},   {5, 35, 33, 3, 3},  {1, 32, 33, 0, 16}, {3, 36, 33, 4, 20},
                               {0, 48, 33, 0, 0}};
  for (const reach &r : reaches) {
    SCOPED_TRACE(testing::Message() << "offset " << r.offset << " n " << r.n << " m " << r.m);
    for (const auto &b : builds())
      EXPECT_EQ(b.exact == &qsrfhs::kernels::baseline_kernels ? r.baseline : r.others,
                b.exact->polynomial_reach(out + r.offset, r.n, r.m))
          << b.name;
  }
}

}  // namespace
