// The vector utilities, compared bit for bit with their formulas. SPDX-License-Identifier: MIT
#include <lumra/core_services.h>
#include <lumra/vector_utilities.h>

#include <bit>
#include <cmath>

#include "host_arrays.hpp"

namespace fuzz {
namespace {

/// Single precision, every operation rounded by itself.
struct sample {
  float re, im;
};
using samples = std::vector<sample>;
using reals = std::vector<float>;

sample narrow(std::complex<double> v) {
  return {static_cast<float>(v.real()), static_cast<float>(v.imag())};
}
samples narrow(const std::vector<std::complex<double>> &from) {
  samples out;
  for (const auto v : from) out.push_back(narrow(v));
  return out;
}
bool same(float a, float b) {
  return (std::isnan(a) && std::isnan(b)) || std::bit_cast<std::uint32_t>(a) == std::bit_cast<std::uint32_t>(b);
}

/// What an output of a call must hold: the results, or as many as fit where the host refused to make room.
void check_output(const call &on, const array &out, const samples &want, int line = __builtin_LINE()) {
  const samples got = narrow(out.now());
  hold(got.size() == want.size() || !on.plain(), "number of results", line);
  for (std::size_t i = 0; i < std::min(got.size(), want.size()); ++i)
    hold(same(got[i].re, want[i].re) && same(got[i].im, want[i].im), "result", line);
}

sample divide(sample a, sample b) {
  const float r = 1 / (b.re * b.re + b.im * b.im);
  return {(a.re * b.re + a.im * b.im) * r, (a.im * b.re - a.re * b.im) * r};
}

array &complex_array(call &on, role as) {
  return on.give<lumra_cf32_block>(as);
}
array &real_array(call &on, role as) {
  return on.give<lumra_f32_block>(as);
}
auto cvec(array &a) {
  return a.as<lumra_cf32_block>();
}
auto fvec(array &a) {
  return a.as<lumra_f32_block>();
}
/// The address of the handle as an output takes it; null at times.
template <class Block>
Block ***address(input &in, array &a) {
  return in.one_in(32) ? nullptr : reinterpret_cast<Block ***>(&a.handle);
}

void division(input &in, call &on) {
  const bool by_value = in.flag(), assigns = in.flag();
  auto &x = complex_array(on, assigns ? writes : reads), &y = complex_array(on, reads),
       &out = complex_array(on, writes);
  const lumra_cf32 value{static_cast<float>(in.real()), static_cast<float>(in.real())}, *v = &value;
  if (in.one_in(16)) v = nullptr;
  auto *const to = address<lumra_cf32_block>(in, out);
  const samples a = narrow(x.values), b = narrow(y.values);
  if (by_value) {
    const auto code = assigns ? qsRFHS_complex_division_assignment_array_by_value(cvec(x), v)
                              : qsRFHS_complex_division_array_by_value(cvec(x), v, to);
    if (assigns ? check_code(code, {-83951766, -83951769}) : check_code(code, {-83951730, -83951733, -83951736}))
      return;
  } else {
    const auto code = assigns ? qsRFHS_complex_division_assignment_array_by_array(cvec(x), cvec(y))
                              : qsRFHS_complex_division_array_by_array(cvec(x), cvec(y), to);
    if (assigns ? check_code(code, {-83951703, -83951706, -83951711})
                : check_code(code, {-83951665, -83951668, -83951671, -83951676}))
      return;
    hold(a.size() <= b.size(), "a divisor for every dividend");
  }
  samples want;
  for (std::size_t i = 0; i < a.size(); ++i) want.push_back(divide(a[i], by_value ? sample{v->re, v->im} : b[i]));
  check_output(on, assigns ? x : out, want);
}

void magnitude(input &in, call &on) {
  const bool squared = in.flag();
  auto &x = complex_array(on, reads), &out = real_array(on, writes);
  auto *const to = address<lumra_f32_block>(in, out);
  const auto code = squared ? qsRFHS_complex_magnitude_squared(cvec(x), to) : qsRFHS_complex_magnitude(cvec(x), to);
  if (squared ? check_code(code, {-83951822, -83951825}) : check_code(code, {-83951791, -83951794})) return;
  samples want;
  for (const sample v : narrow(x.values)) {
    const float square = v.re * v.re + v.im * v.im;
    want.push_back({squared ? square : std::sqrt(square), 0});
  }
  check_output(on, out, want);
}

/// With many real coefficients only some of the samples are evaluated; those lie in front of the others.
void polynomial(input &in, call &on) {
  const bool is_complex = in.flag();
  auto &x = real_array(on, reads);
  auto &c = is_complex ? complex_array(on, reads) : real_array(on, reads);
  auto &out = is_complex ? complex_array(on, writes) : real_array(on, writes);
  const samples coefficients = narrow(c.values), old = narrow(out.values);
  float time = -1;
  hold((is_complex ? qsRFHS_ApplyPolynomialCplx(fvec(x), cvec(c), cvec(out), in.flag() ? &time : nullptr)
                   : qsRFHS_ApplyPolynomial(fvec(x), fvec(c), fvec(out))) == 0,
       "a polynomial returns 0");
  if (on.host_threw()) return;  // nothing is evaluated then
  samples want;
  for (const sample v : narrow(x.values)) {
    if (coefficients.empty()) break;
    sample acc = coefficients.back();
    for (std::size_t k = coefficients.size() - 1; k-- > 0;)
      acc = {acc.re * v.re + coefficients[k].re, acc.im * v.re + coefficients[k].im};
    want.push_back({acc.re, is_complex ? acc.im : 0});
  }
  if (is_complex || coefficients.size() <= 16) return check_output(on, out, want);
  const samples got = narrow(out.now());
  hold(got.size() == want.size() || !on.plain(), "number of results");
  std::size_t evaluated = 0;
  while (evaluated < std::min(got.size(), want.size()) && same(got[evaluated].re, want[evaluated].re)) ++evaluated;
  for (std::size_t i = evaluated; i < got.size() && old.size() == got.size() && on.plain(); ++i)
    hold(same(got[i].re, old[i].re), "a sample that is not evaluated");
}

void logarithm(input &in, call &on) {
  const unsigned form = in.choice(3);
  auto &x = form == 2 ? complex_array(on, reads) : real_array(on, form == 0 ? writes : reads);
  auto &out = real_array(on, writes);
  auto *const to = address<lumra_f32_block>(in, out);
  const auto a = static_cast<float>(in.real()), b = static_cast<float>(in.real());
  const auto code = form == 0   ? qsRFHS_log2_scaled_SGL(fvec(x), a, b)
                    : form == 1 ? qsUtilHS_aLog2Plusb_SGL(fvec(x), to, a, b)
                                : qsUtilHS_aLog2Plusb_IQ(cvec(x), to, a, b);
  hold(code == 0 || (code == -1 && form != 0 && !to), "code of a logarithm");
  if (code != 0) return;
  const samples got = narrow((form == 0 ? x : out).now());
  hold(got.size() == x.values.size() || !on.plain(), "number of results");
  if (!(std::abs(a) <= 4) || !(std::abs(b) <= 4)) return;
  for (std::size_t i = 0; i < std::min(got.size(), x.values.size()); ++i) {
    const sample v = narrow(x.values[i]);
    const float power = form == 2 ? v.re * v.re + v.im * v.im : v.re;
    if (std::isnormal(power) && power > 0) {
      const double want = static_cast<double>(a) * std::log2(static_cast<double>(power)) + static_cast<double>(b);
      hold(std::abs(static_cast<double>(got[i].re) - want) <= 4 * 6e-5 + 1e-4, "logarithm");
    } else if (form != 2 && (power < 0 || std::isnan(power))) {
      hold(form != 0 || std::isnan(got[i].re), "logarithm of what has none");
    } else if (form == 1 && power == 0) {
      hold(got[i].re == -std::numeric_limits<float>::infinity(), "logarithm of zero");
    }
  }
}

void level(input &in, call &on) {
  auto &x = complex_array(on, reads);
  float rms = 7, peak = 7;
  const bool with_peak = in.flag();
  auto *const to = in.one_in(16) ? nullptr : &rms;
  const auto code = with_peak ? qsUtilHS_RMS_IQ_with_peak_calc(cvec(x), to, &peak) : qsUtilHS_RMS_IQ(cvec(x), to);
  hold(code == 0 || (code == -1 && with_peak && (!to || !x.handle || !*x.handle)), "code of a level");
  if (code != 0 || !to) return;
  hold(!x.values.empty() || std::isnan(rms), "no samples have no level");
  double sum = 0, most = 0;
  for (const auto v : x.values) sum += std::norm(v), most = std::max(most, std::abs(v));
  if (!x.tame || x.values.empty()) return;
  hold(std::abs(static_cast<double>(rms) - std::sqrt(sum / static_cast<double>(x.values.size()))) <= 1e-5, "RMS");
  hold(!with_peak || std::abs(static_cast<double>(peak) - most) <= 1e-6, "peak");
}

void lookup(input &in, call &on) {
  auto &keys = real_array(on, reads), &x = complex_array(on, reads), &table = complex_array(on, reads);
  auto &out = complex_array(on, writes);
  const bool has_samples = x.handle && *x.handle;  // the call may make a block for an output that is x, too
  if (&out == &table || (x.values.size() < keys.values.size() && has_samples)) return;
  auto *const to = address<lumra_cf32_block>(in, out);
  const auto start = static_cast<float>(in.real()), step = static_cast<float>(in.real());
  const auto code = qsUtilHS_LookupTable(fvec(keys), cvec(x), to, cvec(table), start, step);
  check_code(code, {-380127, -1});
  hold(code == 0 || (code == -1 ? !to : table.values.empty() || step == 0), "a table that is valid");
  if (code != 0) return;
  const samples t = narrow(table.values), from = narrow(x.values);
  const std::size_t entries = t.size() / 2;
  samples want;
  for (std::size_t i = 0; i < keys.values.size() && has_samples; ++i) {
    const float place = (narrow(keys.values[i]).re - start) * (1 / step);
    sample g{0, 0};
    if (entries != 0 && !(place >= -2147483648.F && place < 2147483648.F)) {
      g = t[0];
    } else if (entries != 0) {
      const auto k = static_cast<std::int32_t>(place);
      const auto entry = static_cast<std::size_t>(std::max(k, 0));
      const float part = place - static_cast<float>(k);
      const sample v = t[2 * std::min(entry, entries - 1)], slope = t[2 * std::min(entry, entries - 1) + 1];
      g = k < 0 || entry >= entries - 1 ? v : sample{part * slope.re + v.re, part * slope.im + v.im};
    }
    want.push_back(entries == 0 ? g
                                : sample{g.re * from[i].re - g.im * from[i].im, g.re * from[i].im + g.im * from[i].re});
  }
  check_output(on, out, want);
}

}  // namespace

void run(input &in) {
  hosting host(in, hosting::unit::bytes);
  constexpr void (*all[])(input &, call &) = {&division, &magnitude, &polynomial, &logarithm, &level, &lookup};
  for (int calls = 0; in.left() && calls < 6; ++calls) {
    call on(in, host);
    std::uint64_t before = 0, after = 0;
    qsrfhs_getErrorCnt(&before);
    all[in.choice(std::size(all))](in, on);
    qsrfhs_getErrorCnt(&after);
    hold(after - before <= 1, "a code is recorded once");
    on.check_inputs();
  }
}

}  // namespace fuzz
