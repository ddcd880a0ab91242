// SPDX-License-Identifier: MIT
#include "signal/recursive_filter.hpp"

#include <algorithm>
#include <cmath>
#include <complex>
#include <limits>
#include <numeric>
#include <utility>

namespace dsp {
namespace {

using qsrfhs::kernels::block_recursion;

/// Samples that go through all stages before the next ones; they stay in the first cache.
constexpr std::size_t chunk = 1024;
constexpr std::size_t block = recursive_filter::block;

/// Room for a history, in whole registers and at least one.
std::size_t width_of(std::size_t order) noexcept {
  return (std::max<std::size_t>(order, 1) + 3) / 4 * 4;
}

/// Whether the blocks of a stage make its sums over samples, too: that costs nothing but a state as large as the sums
/// are long. Others are made in front of the recursion.
bool sums_in_blocks(const recursion_coefficients &stage) noexcept {
  return stage.reverse_order() > 0 && stage.forward_order() <= std::max<std::size_t>(stage.reverse_order(), 4);
}

/// The part of a stage that goes by blocks.
recursion_coefficients block_part(const recursion_coefficients &stage) {
  return sums_in_blocks(stage) ? stage : recursion_coefficients{{1}, stage.a};
}

/// Where the tables of a stage's blocks lie in its plan.
struct plan_places {
  std::size_t order, width;  // of the state
  std::size_t responses, gathering, transition;
  std::size_t from_direct;  // order x order: what each value of the transposed direct form II leaves in the state
  std::size_t to_direct;    // order x order: and back
  std::size_t size;

  plan_places(const recursion_coefficients &stage, std::size_t parts) noexcept
      : order(sums_in_blocks(stage) ? stage.order() : stage.reverse_order()),
        width(block_recursion::width_of(order, parts)) {
    constexpr std::size_t boundary = 64 / sizeof(double);
    const std::size_t even = (order + 1) / 2 * 2;
    responses = parts * block * block;
    gathering = responses + parts * block * even;
    transition = gathering + block * width;
    from_direct = transition + even * width;
    to_direct = from_direct + order * order;
    size = (to_direct + order * order + boundary - 1) / boundary * boundary;
  }
  [[nodiscard]] block_recursion blocks(const double *plan) const noexcept {
    return {order, plan, plan + responses, plan + gathering, plan + transition};
  }
};

/// The next output of the transposed direct form II, whose state is what the samples so far add to the next outputs
/// before those recur, and a 0 at the end.
template <class Real>
Real next_output(const recursion_coefficients &c, std::vector<Real> &z, Real x) {
  const Real y = static_cast<Real>(c.b[0]) * x + z[0];
  for (std::size_t j = 1; j < z.size(); ++j) {
    z[j - 1] = z[j];
    if (j <= c.forward_order()) z[j - 1] += static_cast<Real>(c.b[j]) * x;
    if (j <= c.reverse_order()) z[j - 1] -= static_cast<Real>(c.a[j]) * y;
  }
  return y;
}

using column = std::vector<long double>;

/// Makes columns orthogonal and of length 1. Entry [m][j], j <= m, says how much of column j there was in column m.
std::vector<column> orthogonalise(std::vector<column> &columns) {
  std::vector<column> mixed;
  const auto product = [](const column &a, const column &b) {
    return std::inner_product(a.begin(), a.end(), b.begin(), 0.0L);
  };
  for (std::size_t m = 0; m < columns.size(); ++m) {
    column &v = columns[m], part(columns.size());
    for (std::size_t j = 0; j < m; ++j) {
      part[j] = product(columns[j], v);
      for (std::size_t k = 0; k < v.size(); ++k) v[k] -= part[j] * columns[j][k];
    }
    part[m] = std::sqrt(product(v, v));
    for (long double &value : v) value /= part[m];
    mixed.push_back(std::move(part));
  }
  return mixed;
}

/// Computes a plan in extended precision.
///
/// Outputs in front of a block, or the values of a direct form, are a bad state: where poles lie close together, large
/// parts of what they leave cancel. The state of a plan is by how much the orthogonal parts of that have to be
/// multiplied, so it is as large as the outputs that it leaves.
void fill_plan(const recursion_coefficients &stage, std::size_t parts, double *memory) {
  constexpr std::size_t horizon = 64;          // outputs that are looked at
  constexpr long double negligible = 1e-150L;  // beside the largest of a table; its products could be subnormal
  const recursion_coefficients c = block_part(stage);
  const plan_places at(stage, parts);
  const std::size_t order = at.order;
  std::fill_n(memory, at.size, 0.0);
  const auto put = [memory](std::size_t table, std::size_t k, std::size_t times, long double value, long double scale) {
    if (!(std::abs(value) < negligible * scale))
      std::fill_n(memory + table + times * k, times, static_cast<double>(value));
  };

  std::vector<column> outputs;
  for (std::size_t m = 0; m < order; ++m) {
    column z(order + 1), free;
    z[m] = 1;
    for (std::size_t k = 0; k < horizon; ++k) free.push_back(next_output(c, z, 0.0L));
    outputs.push_back(std::move(free));
  }
  const std::vector<column> mixed = orthogonalise(outputs);
  const auto put_state = [&](std::size_t table, std::size_t times, const column &z, long double scale) {
    for (std::size_t j = 0; j < order; ++j) {
      long double value = 0;
      for (std::size_t m = j; m < order; ++m) value += mixed[m][j] * z[m];
      put(table, j, times, value, scale);
    }
  };

  long double scale = 0;
  for (const double b : c.b) scale = std::max(scale, std::abs(static_cast<long double>(b)));
  column z(order + 1);
  for (std::size_t k = 0; k < block; ++k) {
    const long double y = next_output(c, z, k == 0 ? 1.0L : 0.0L);
    for (std::size_t i = 0; i + k < block; ++i) put(0, block * i + i + k, parts, y, scale);
    put_state(at.gathering + at.width * (block - 1 - k), parts, z, scale);
  }
  for (std::size_t m = 0; m < order; ++m) {
    column unit(order + 1);
    unit[m] = 1;
    put_state(at.from_direct + order * m, 1, unit, 0);
    // The direct form that state m stands for.
    std::fill(z.begin(), z.end(), 0.0L);
    for (std::size_t j = m + 1; j-- > 0;) {
      long double rest = j == m ? 1 : 0;
      for (std::size_t k = j + 1; k <= m; ++k) rest -= mixed[k][j] * z[k];
      z[j] = rest / mixed[j][j];
      put(at.to_direct + order * m, j, 1, z[j], 0);
    }
    for (std::size_t k = 0; k < block; ++k) put(at.responses, block * m + k, parts, next_output(c, z, 0.0L), 1);
    put_state(at.transition + at.width * m, parts, z, 1);
  }
}

// Samples to doubles and back; of complex ones real and imaginary parts in turn.

void widen(const float *in, std::size_t n, double *to) noexcept {
  qsrfhs::kernels::exact().widen(in, to, n);
}
void widen(const double *in, std::size_t n, double *to) noexcept {
  std::copy_n(in, n, to);
}
template <class Real>
void widen(const std::complex<Real> *in, std::size_t n, double *to) noexcept {
  widen(reinterpret_cast<const Real *>(in), 2 * n, to);
}
void narrow(const double *from, std::size_t n, float *out) noexcept {
  qsrfhs::kernels::exact().narrow(from, out, n);
}
void narrow(const double *from, std::size_t n, double *out) noexcept {
  std::copy_n(from, n, out);
}
template <class Real>
void narrow(const double *from, std::size_t n, std::complex<Real> *out) noexcept {
  narrow(from, 2 * n, reinterpret_cast<Real *>(out));
}

/// The newest of a history and of what came behind it.
void remember(double *history, std::size_t width, const double *newest, std::size_t n) noexcept {
  const std::size_t fresh = std::min(width, n);
  std::copy(history + fresh, history + width, history);
  std::copy_n(newest + n - fresh, fresh, history + width - fresh);
}

/// The recursion value by value; n in all.
void recurse_in_order(const recursion_coefficients &c, std::size_t parts, double *y, std::size_t n) noexcept {
  constexpr double least = 1e-290;  // as in the block recursion
  for (std::size_t k = 0; k < n; ++k, ++y) {
    double sum = *y;
    for (std::size_t j = c.reverse_order(); j > 0; --j) sum -= c.a[j] * y[-static_cast<std::ptrdiff_t>(parts * j)];
    *y = std::abs(sum) < least ? 0 : sum;
  }
}

void recurse_by_blocks(const block_recursion &plan, std::size_t parts, std::size_t n, double *data,
                       double *state) noexcept {
  const auto &kernels = qsrfhs::kernels::fused();
  (parts == 1 ? kernels.recursion : kernels.complex_recursion)(plan, n, data, state);
}

/// Blocks that hold a sample which is not finite: no output in front of it depends on it, and all others are spoilt.
void recurse_carefully(const block_recursion &plan, std::size_t parts, std::size_t n, double *data,
                       double *state) noexcept {
  constexpr double spoilt = std::numeric_limits<double>::quiet_NaN();
  for (std::size_t k = 0; k < n; k += block) {
    const std::size_t count = std::min(block, n - k);
    double *const x = data + parts * k, *const end = x + parts * count;
    const auto first_bad =
        static_cast<std::size_t>(std::find_if(x, end, [](double v) { return !std::isfinite(v); }) - x);
    const std::size_t good = first_bad / parts;
    std::fill(x + parts * good, x + parts * block, 0.0);
    recurse_by_blocks(plan, parts, good, x, state);
    if (good == count) continue;
    std::fill(x + parts * good, end, spoilt);
    if (count == block) std::fill_n(state, parts * plan.order, spoilt);
  }
}

}  // namespace

/// One stage's coefficients, and where its memory lies: the newest samples, what a state that was set adds to the next
/// sums, the newest outputs, the samples of a block that has begun, and the state in front of it.
struct recursive_filter::stage_view {
  const recursion_coefficients &coefficients;
  plan_places places;
  const double *plan;
  std::size_t width, block_size;  // values
  double *samples, *preset, *outputs, *begun, *state, *end;
  bool sums;  // are made in front of the recursion

  stage_view(const recursion_coefficients &stage, std::size_t parts, recursion_method method, const double *tables,
             double *memory) noexcept
      : coefficients(stage),
        places(stage, parts),
        plan(tables),
        width(parts * width_of(stage.order())),
        block_size(parts * block),
        samples(memory),
        preset(samples + width),
        outputs(preset + width),
        begun(outputs + width),
        state(begun + block_size),
        end(state + places.width),
        sums(method == recursion_method::in_order || !sums_in_blocks(stage)) {}

  static std::size_t size(const recursion_coefficients &stage, std::size_t parts) noexcept {
    return parts * (3 * width_of(stage.order()) + block) + plan_places(stage, parts).width;
  }
};

recursion_coefficients normalised(std::span<const double> b, std::span<const double> a) {
  while (a.size() > 1 && a.back() == 0) a = a.first(a.size() - 1);
  const auto divide = [first = a[0]](std::span<const double> values) {
    std::vector<double> quotients(values.begin(), values.end());
    for (double &v : quotients) v /= first;
    return quotients;
  };
  return {divide(b), divide(a)};
}

recursive_filter::recursive_filter(std::vector<recursion_coefficients> stages, std::size_t parts,
                                   recursion_method method)
    : stages_(std::move(stages)), parts_(parts), method_(method) {
  std::size_t plans = 0, memory = 0;
  for (const recursion_coefficients &stage : stages_) {
    total_order_ += stage.order();
    most_order_ = std::max(most_order_, stage.order());
    plans += plan_places(stage, parts).size;
    memory += stage_view::size(stage, parts);
  }
  if (method_ == recursion_method::blocks) {
    plans_ = qsrfhs::aligned_buffer<double>(plans);
    double *plan = plans_.data();
    for (const recursion_coefficients &stage : stages_) {
      fill_plan(stage, parts, plan);
      plan += plan_places(stage, parts).size;
    }
    if (!std::all_of(plans_.data(), plan, [](double v) { return std::isfinite(v); }))
      method_ = recursion_method::in_order;
  }
  memory_ = qsrfhs::aligned_buffer<double>(memory);
  room_ = qsrfhs::aligned_buffer<double>(2 * (room_in_front() + parts_ * (chunk + 2 * block)));
  std::fill_n(room_.data(), room_.size(), 0.0);  // sums read beyond the samples
  reset();
}

void recursive_filter::reset() noexcept {
  std::fill_n(memory_.data(), memory_.size(), 0.0);
  at_ = {0, static_cast<std::uint32_t>(most_order_)};
}

template <class Visit>
void recursive_filter::for_each_stage(Visit visit) const {
  const double *plan = plans_.data();
  double *memory = memory_.data();
  for (const recursion_coefficients &stage : stages_) {
    const stage_view view(stage, parts_, method_, plan, memory);
    visit(view);
    if (plan) plan += view.places.size;
    memory = view.end;
  }
}

/// Of the newest samples and those behind them. The next ones of a state that was set are more by what it holds.
void recursive_filter::sum_samples(const stage_view &stage, double *in, double *out, std::size_t n) noexcept {
  const recursion_coefficients &c = stage.coefficients;
  std::copy_n(stage.samples, stage.width, in - stage.width);
  qsrfhs::kernels::fused().fir_double(in, c.b.data(), c.b.size(), parts_, out, parts_ * n);
  remember(stage.samples, stage.width, in, parts_ * n);
  for (std::size_t k = 0, at = parts_ * at_.preset; k < parts_ * n && at < parts_ * c.order(); ++k, ++at)
    out[k] += stage.preset[at];
}

void recursive_filter::recur_in_order(const stage_view &stage, double *data, std::size_t n) noexcept {
  std::copy_n(stage.outputs, stage.width, data - stage.width);
  recurse_in_order(stage.coefficients, parts_, data, parts_ * n);
  remember(stage.outputs, stage.width, data, parts_ * n);
}

/// A block that has begun is computed from its start, with what there is of it.
void recursive_filter::recur_by_blocks(const stage_view &stage, double *data, std::size_t n) noexcept {
  const std::size_t begun = parts_ * at_.in_block, all = begun + parts_ * n, left = all % stage.block_size;
  double *const first = data - begun;
  std::copy_n(stage.begun, begun, first);
  std::copy_n(first + all - left, left, stage.begun);
  if (left > 0) std::fill_n(first + all, stage.block_size - left, 0.0);
  const bool finite = qsrfhs::kernels::exact().is_finite(first, all);
  (finite ? recurse_by_blocks : recurse_carefully)(stage.places.blocks(stage.plan), parts_, all / parts_, first,
                                                   stage.state);
}

/// Puts the outputs into the place of the samples, or into the other one, and says which.
double *recursive_filter::run_chunk(double *data, double *other, std::size_t n) noexcept {
  for_each_stage([&](const stage_view &stage) {
    if (stage.sums) {
      sum_samples(stage, data, other, n);
      std::swap(data, other);
    }
    if (stage.coefficients.reverse_order() == 0) return;
    if (method_ == recursion_method::blocks)
      recur_by_blocks(stage, data, n);
    else
      recur_in_order(stage, data, n);
  });
  if (method_ == recursion_method::blocks) at_.in_block = static_cast<std::uint32_t>((at_.in_block + n) % block);
  at_.preset = static_cast<std::uint32_t>(std::min(at_.preset + n, most_order_));
  return data;
}

std::size_t recursive_filter::room_in_front() const noexcept {
  return parts_ * ((width_of(most_order_) + block - 1) / block * block);
}

template <class Sample>
void recursive_filter::run(const Sample *in, Sample *out, std::uint64_t n) noexcept {
  while (n > 0) {
    const auto count = static_cast<std::size_t>(std::min<std::uint64_t>(n, chunk));
    // Samples lie where their block begins on a boundary.
    double *const data = room_.data() + room_in_front() + parts_ * at_.in_block;
    widen(in, count, data);
    narrow(run_chunk(data, data + room_.size() / 2, count), count, out);
    in += count;
    out += count;
    n -= count;
  }
}
template void recursive_filter::run(const float *, float *, std::uint64_t) noexcept;
template void recursive_filter::run(const double *, double *, std::uint64_t) noexcept;
template void recursive_filter::run(const std::complex<float> *, std::complex<float> *, std::uint64_t) noexcept;
template void recursive_filter::run(const std::complex<double> *, std::complex<double> *, std::uint64_t) noexcept;

void recursive_filter::read_state(std::span<double> out) const {
  for_each_stage([&](const stage_view &stage) {
    const recursion_coefficients &c = stage.coefficients;
    const std::size_t order = c.order(), values = stage.places.order;
    const bool by_blocks = method_ == recursion_method::blocks && c.reverse_order() > 0;
    for (std::size_t part = 0; part < parts_; ++part) {
      std::vector<double> z(order + 1);
      if (by_blocks) {
        for (std::size_t m = 0; m < values; ++m)
          for (std::size_t j = 0; j < values; ++j)
            z[j] += stage.plan[stage.places.to_direct + values * m + j] * stage.state[parts_ * m + part];
        const recursion_coefficients recursion = block_part(c);
        for (std::size_t k = 0; k < at_.in_block; ++k) next_output(recursion, z, stage.begun[parts_ * k + part]);
      }
      for (std::size_t j = 0; stage.sums && j < order; ++j) {
        if (at_.preset + j < order) z[j] += stage.preset[parts_ * (at_.preset + j) + part];
        for (std::size_t i = j + 1; i <= order; ++i) {
          const std::size_t back = stage.width - parts_ * (i - j) + part;
          if (i <= c.forward_order()) z[j] += c.b[i] * stage.samples[back];
          if (i <= c.reverse_order() && !by_blocks) z[j] -= c.a[i] * stage.outputs[back];
        }
      }
      for (std::size_t j = 0; j < order; ++j) out[parts_ * j + part] = z[j];
    }
    out = out.subspan(parts_ * order);
  });
}

void recursive_filter::set_state(std::span<const double> state) noexcept {
  reset();
  at_.preset = 0;
  for_each_stage([&](const stage_view &stage) {
    const std::size_t order = stage.coefficients.order();
    if (stage.sums)
      std::copy_n(state.begin(), parts_ * order, stage.preset);
    else
      for (std::size_t m = 0; m < order; ++m)
        for (std::size_t k = 0; k < parts_ * order; ++k)
          stage.state[k] +=
              stage.plan[stage.places.from_direct + order * m + k / parts_] * state[parts_ * m + k % parts_];
    state = state.subspan(parts_ * order);
  });
}

bool recursive_filter::restore(const place &at) noexcept {
  if (at.preset > most_order_ || at.in_block >= (method_ == recursion_method::blocks ? block : 1)) return false;
  at_ = at;
  return true;
}

recursion_method recursive_filter::choose(const std::vector<recursion_coefficients> &stages, precision of_samples) {
  constexpr std::size_t samples = 2048;
  for (const recursion_coefficients &stage : stages)
    if (stage.reverse_order() > most_block_order) return recursion_method::in_order;
  std::vector<double> ordered(samples);
  std::uint64_t noise = 1;
  for (double &x : ordered) {
    noise = noise * 6364136223846793005U + 1442695040888963407U;  // Knuth's linear congruential generator
    x = static_cast<double>(static_cast<std::int64_t>(noise)) * 0x1p-63;
  }
  std::vector<double> blocked = ordered;
  std::vector<long double> exact(ordered.begin(), ordered.end());
  for (const recursion_coefficients &stage : stages) {
    std::vector<long double> z(stage.order() + 1);
    for (long double &x : exact) x = next_output(stage, z, x);
  }
  recursive_filter(stages, 1, recursion_method::in_order).run(ordered.data(), ordered.data(), samples);
  recursive_filter(stages, 1, recursion_method::blocks).run(blocked.data(), blocked.data(), samples);
  long double power = 0, error_ordered = 0, error_blocked = 0;
  for (std::size_t k = 0; k < samples; ++k) {
    power += exact[k] * exact[k];
    error_ordered += (ordered[k] - exact[k]) * (ordered[k] - exact[k]);
    error_blocked += (blocked[k] - exact[k]) * (blocked[k] - exact[k]);
  }
  const long double allowed =
      std::max(16 * error_ordered, power * (of_samples == precision::single_precision ? 0x1p-60L : 0x1p-104L));
  // In order where the trial leaves all numbers, too.
  return std::isfinite(error_blocked) && error_blocked <= allowed ? recursion_method::blocks
                                                                  : recursion_method::in_order;
}

}  // namespace dsp
