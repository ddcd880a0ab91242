// SPDX-License-Identifier: MIT
#include "signal/recursive_filter.hpp"

#include <algorithm>
#include <cmath>
#include <complex>
#include <utility>

#include "qsrfhs/vector/kernels/kernels.hpp"

namespace dsp {
namespace {

using qsrfhs::kernels::block_recursion;

constexpr std::size_t chunk = 512;  // samples that go through all stages before the next ones; stays in the first cache
constexpr std::size_t block = recursive_filter::block;

/// Room for a stage's history, in whole registers and at least one.
std::size_t width_of(std::size_t order) noexcept {
  return (std::max<std::size_t>(order, 1) + 3) / 4 * 4;
}

std::size_t plan_size(const recursion_coefficients &stage) noexcept {
  return 8 * stage.reverse_order() + block * block;
}

block_recursion plan_at(const recursion_coefficients &stage, const double *memory) noexcept {
  return {stage.reverse_order(), memory, memory + 8 * stage.reverse_order()};
}

/// The next eight outputs of the recursion alone, from the outputs before, newest first, and one first sample.
std::array<double, block> respond(const recursion_coefficients &stage, std::vector<long double> past,
                                  long double sample) {
  std::array<double, block> outputs{};
  for (double &output : outputs) {
    long double y = std::exchange(sample, 0);
    for (std::size_t j = past.size(); j-- > 0;) y -= static_cast<long double>(stage.a[j + 1]) * past[j];
    std::rotate(past.begin(), past.end() - (past.empty() ? 0 : 1), past.end());
    if (!past.empty()) past[0] = y;
    output = static_cast<double>(y);
  }
  return outputs;
}

/// Computes a plan by running the recursion in extended precision.
void fill_plan(const recursion_coefficients &stage, double *memory) {
  const std::size_t order = stage.reverse_order();
  for (std::size_t j = 0; j < order; ++j) {
    std::vector<long double> past(order);
    past[j] = 1;
    memory = std::copy_n(respond(stage, past, 0).begin(), block, memory);
  }
  const auto h = respond(stage, std::vector<long double>(order), 1);
  for (std::size_t i = 0; i < block; ++i)
    for (std::size_t k = 0; k < block; ++k) memory[block * i + k] = k >= i ? h[k - i] : 0.0;
}

using planes = std::array<double *, 2>;

// Samples to their real and imaginary parts in double precision, and back.

void split(const float *in, std::size_t n, const planes &to) noexcept {
  qsrfhs::kernels::exact().widen(in, to[0], n);
}
void split(const double *in, std::size_t n, const planes &to) noexcept {
  std::copy_n(in, n, to[0]);
}
void split(const std::complex<float> *in, std::size_t n, const planes &to) noexcept {
  qsrfhs::kernels::exact().split(reinterpret_cast<const float *>(in), to[0], to[1], n);
}
void split(const std::complex<double> *in, std::size_t n, const planes &to) noexcept {
  qsrfhs::kernels::exact().split_double(reinterpret_cast<const double *>(in), to[0], to[1], n);
}
void join(const planes &from, std::size_t n, float *out) noexcept {
  qsrfhs::kernels::exact().narrow(from[0], out, n);
}
void join(const planes &from, std::size_t n, double *out) noexcept {
  std::copy_n(from[0], n, out);
}
void join(const planes &from, std::size_t n, std::complex<float> *out) noexcept {
  qsrfhs::kernels::exact().join_planes(from[0], from[1], reinterpret_cast<float *>(out), n);
}
void join(const planes &from, std::size_t n, std::complex<double> *out) noexcept {
  qsrfhs::kernels::exact().join_planes_double(from[0], from[1], reinterpret_cast<double *>(out), n);
}

/// The newest of a history and of what came behind it.
void remember(double *history, std::size_t width, const double *newest, std::size_t n) noexcept {
  const std::size_t fresh = std::min(width, n);
  std::copy(history + fresh, history + width, history);
  std::copy_n(newest + n - fresh, fresh, history + width - fresh);
}

/// The recursion sample by sample.
void recurse_in_order(const recursion_coefficients &c, double *y, std::size_t n) noexcept {
  constexpr double least = 1e-290;  // as in the block recursion
  for (std::size_t k = 0; k < n; ++k, ++y) {
    double sum = *y;
    for (std::size_t j = c.reverse_order(); j > 0; --j) sum -= c.a[j] * y[-static_cast<std::ptrdiff_t>(j)];
    *y = std::abs(sum) < least ? 0 : sum;
  }
}

/// One block, which may hold a sample that is not finite: outputs in front of it do not depend on it.
void recurse_carefully(const recursion_coefficients &c, const block_recursion &plan, double *y) noexcept {
  const std::size_t good =
      static_cast<std::size_t>(std::find_if(y, y + block, [](double v) { return !std::isfinite(v); }) - y);
  std::array<double, block> rest{};
  std::copy(y + good, y + block, rest.begin());
  std::fill(y + good, y + block, 0.0);
  qsrfhs::kernels::exact().recursion(plan, 1, &y, 1);
  std::copy_n(rest.begin(), block - good, y + good);
  recurse_in_order(c, y + good, block - good);
}

}  // namespace

/// One stage's coefficients, and where its memory lies: for each stream the newest `width` samples, the `width` outputs
/// in front of the block, what a state that was set adds to the next outputs, and the weighted samples of the block.
struct recursive_filter::stage_view {
  const recursion_coefficients &coefficients;
  const double *plan;
  double *memory;
  std::size_t width;

  static std::size_t stream_size(std::size_t width) noexcept { return 3 * width + block; }
  [[nodiscard]] double *samples(std::size_t s) const noexcept { return memory + s * stream_size(width); }
  [[nodiscard]] double *outputs(std::size_t s) const noexcept { return samples(s) + width; }
  [[nodiscard]] double *preset(std::size_t s) const noexcept { return samples(s) + 2 * width; }
  [[nodiscard]] double *begun(std::size_t s) const noexcept { return samples(s) + 3 * width; }
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

recursive_filter::recursive_filter(std::vector<recursion_coefficients> stages, std::size_t streams,
                                   recursion_method method)
    : stages_(std::move(stages)), streams_(streams), method_(method) {
  std::size_t plans = 0, memory = 0;
  for (const recursion_coefficients &stage : stages_) {
    total_order_ += stage.order();
    most_order_ = std::max(most_order_, stage.order());
    plans += plan_size(stage);
    memory += streams_ * stage_view::stream_size(width_of(stage.order()));
  }
  if (method_ == recursion_method::blocks) {
    plans_ = qsrfhs::aligned_buffer<double>(plans);
    double *plan = plans_.data();
    for (const recursion_coefficients &stage : stages_) {
      fill_plan(stage, plan);
      plan += plan_size(stage);
    }
  }
  memory_ = qsrfhs::aligned_buffer<double>(memory);
  room_ = qsrfhs::aligned_buffer<double>(2 * streams_ * plane_size());
  std::fill_n(room_.data(), room_.size(), 0.0);  // blocks read beyond the samples
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
    const stage_view view{stage, plan, memory, width_of(stage.order())};
    visit(view);
    if (plan) plan += plan_size(stage);
    memory += streams_ * stage_view::stream_size(view.width);
  }
}

/// The next outputs of the state that was set are more by what it holds.
void recursive_filter::add_preset(const stage_view &stage, const planes &data, std::size_t n) const noexcept {
  const std::size_t order = stage.coefficients.order();
  for (std::size_t s = 0; s < streams_; ++s)
    for (std::size_t k = 0; k < n && at_.preset + k < order; ++k) data[s][k] += stage.preset(s)[at_.preset + k];
}

/// n samples, which lie in one block or begin with one, from `in` to `out`; both have room for histories in front.
void recursive_filter::run_stage(const stage_view &stage, const planes &in, const planes &out, std::size_t n) noexcept {
  const auto &kernels = qsrfhs::kernels::exact();
  const recursion_coefficients &c = stage.coefficients;
  const std::size_t width = stage.width, order = c.order();
  for (std::size_t s = 0; s < streams_; ++s) {
    std::copy_n(stage.samples(s), width, in[s] - width);
    kernels.fir_double(in[s], c.b.data(), c.b.size(), 1, out[s], n);
    remember(stage.samples(s), width, in[s], n);
  }
  if (at_.preset < order) add_preset(stage, out, n);
  if (c.reverse_order() == 0) return;

  if (method_ == recursion_method::in_order) {
    for (std::size_t s = 0; s < streams_; ++s) {
      double *const y = out[s];
      std::copy_n(stage.outputs(s), width, y - width);
      recurse_in_order(c, y, n);
      remember(stage.outputs(s), width, y, n);
    }
    return;
  }

  const std::size_t whole = (at_.in_block + n) / block * block, left = at_.in_block + n - whole;
  for (std::size_t s = 0; s < streams_; ++s) {
    // A block that has begun is computed from its start, with what there is of it.
    double *const y = out[s], *const begun = stage.begun(s);
    if (at_.in_block > 0) std::copy_backward(y, y + n, y + at_.in_block + n);
    std::copy_n(begun, at_.in_block, y);
    std::copy_n(y + whole, left, begun);
    std::fill_n(y + whole + left, left > 0 ? block - left : 0, 0.0);
    std::copy_n(stage.outputs(s), width, y - width);
  }
  const bool finite =
      kernels.is_finite(out[0], whole + left) && (streams_ == 1 || kernels.is_finite(out[1], whole + left));
  const block_recursion plan = plan_at(c, stage.plan);
  const std::size_t blocks = (whole + left + block - 1) / block;
  if (finite) {
    kernels.recursion(plan, blocks, out.data(), streams_);
  } else {
    for (std::size_t s = 0; s < streams_; ++s)
      for (std::size_t b = 0; b < blocks; ++b) recurse_carefully(c, plan, out[s] + block * b);
  }
  for (std::size_t s = 0; s < streams_; ++s) {
    remember(stage.outputs(s), width, out[s], whole);
    if (at_.in_block > 0) std::copy_n(out[s] + at_.in_block, n, out[s]);
  }
}

void recursive_filter::run_chunk(planes &in, planes &out, std::size_t n) noexcept {
  for_each_stage([&](const stage_view &stage) {
    run_stage(stage, in, out, n);
    std::swap(in, out);
  });
  if (method_ == recursion_method::blocks) at_.in_block = static_cast<std::uint32_t>((at_.in_block + n) % block);
  at_.preset = static_cast<std::uint32_t>(std::min(at_.preset + n, most_order_));
}

std::size_t recursive_filter::plane_size() const noexcept {
  return width_of(most_order_) + chunk + block;
}

template <class Sample>
void recursive_filter::run(const Sample *in, Sample *out, std::uint64_t n) noexcept {
  const auto plane = [this](std::size_t k) { return room_.data() + k * plane_size() + width_of(most_order_); };
  while (n > 0) {
    const std::size_t most = at_.in_block != 0 ? block - at_.in_block : chunk;
    const auto count = static_cast<std::size_t>(std::min<std::uint64_t>(n, most));
    planes from{plane(0), plane(streams_ - 1)}, to{plane(streams_), plane(2 * streams_ - 1)};
    split(in, count, from);
    run_chunk(from, to, count);
    join(from, count, out);
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
    const std::size_t order = c.order(), width = stage.width;
    for (std::size_t s = 0; s < streams_; ++s) {
      // The outputs up to here, those of a block that has begun computed once more.
      std::vector<double> y(width + at_.in_block);
      std::copy_n(stage.outputs(s), width, y.begin());
      std::copy_n(stage.begun(s), at_.in_block, y.begin() + static_cast<std::ptrdiff_t>(width));
      recurse_in_order(c, y.data() + width, at_.in_block);
      const double *const x_end = stage.samples(s) + width, *const y_end = y.data() + y.size();
      for (std::size_t j = 0; j < order; ++j) {
        double z = at_.preset + j < order ? stage.preset(s)[at_.preset + j] : 0;
        for (std::size_t i = j + 1; i <= order; ++i) {
          const auto back = static_cast<std::ptrdiff_t>(i - j);
          if (i <= c.forward_order()) z += c.b[i] * x_end[-back];
          if (i <= c.reverse_order()) z -= c.a[i] * y_end[-back];
        }
        out[j] = z;
      }
      out = out.subspan(order);
    }
  });
}

void recursive_filter::set_state(std::span<const double> state) noexcept {
  reset();
  at_.preset = 0;
  for_each_stage([&](const stage_view &stage) {
    for (std::size_t s = 0; s < streams_; ++s) {
      const std::size_t order = stage.coefficients.order();
      std::copy_n(state.begin(), order, stage.preset(s));
      state = state.subspan(order);
    }
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
    for (long double &x : exact) {
      const long double y = static_cast<long double>(stage.b[0]) * x + z[0];
      for (std::size_t j = 1; j <= stage.order(); ++j) {
        z[j - 1] = z[j];
        if (j <= stage.forward_order()) z[j - 1] += static_cast<long double>(stage.b[j]) * x;
        if (j <= stage.reverse_order()) z[j - 1] -= static_cast<long double>(stage.a[j]) * y;
      }
      x = y;
    }
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
  return error_blocked <= allowed ? recursion_method::blocks : recursion_method::in_order;  // in order for NaN, too
}

}  // namespace dsp
