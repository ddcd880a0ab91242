// SPDX-License-Identifier: MIT
#include "signal/fir.hpp"

#include <algorithm>
#include <cmath>
#include <utility>

#include "qsrfhs/math/mkl_runtime.hpp"

namespace dsp {
namespace {

constexpr std::size_t direct_block = 1024;  // which stays in the first-level cache

template <class Sample, class Tap>
bool takes_blocks(std::size_t taps, convolution_method method) noexcept {
  if (method != convolution_method::automatic) return method == convolution_method::fourier;
  if (taps <= most_exact_taps) return false;
  const std::size_t length = best_block<Sample>(taps);
  const double outputs = static_cast<double>(length - taps + 1);
  return block_cost<Sample>(length) < outputs * static_cast<double>(taps) * tap_cost<Sample, Tap>;
}

}  // namespace

template <class Sample, class Tap>
overlap_save<Sample, Tap>::overlap_save(std::span<const Tap> taps, std::size_t length)
    : past_(taps.size() - 1),
      transform_(length),
      window_(length),
      result_(length),
      response_(transform_.bins()),
      spectrum_(transform_.bins()) {
  const qsrfhs::mkl_runtime::use in_use;
  const auto scale = static_cast<real_of<Sample>>(1.0 / static_cast<double>(length));
  Sample *const rest = std::transform(taps.begin(), taps.end(), window_.data(), [=](Tap h) { return h * scale; });
  std::fill(rest, window_.data() + length, Sample{});
  transform_.forward(window_.data(), response_.data());
}

template <class Sample, class Tap>
Sample *overlap_save<Sample, Tap>::run() {
  const qsrfhs::mkl_runtime::use in_use;
  transform_.forward(window_.data(), spectrum_.data());
  multiply_bins(spectrum_.data(), response_.data(), spectrum_.size());
  transform_.backward(spectrum_.data(), result_.data());
  return result_.data() + past_;
}

template <class Sample, class Tap>
fir_filter<Sample, Tap>::by_blocks::by_blocks(std::span<const Tap> taps)
    : blocks(taps, best_block<Sample>(taps.size())) {
  std::size_t shortest = fast_length(2 * taps.size());
  if (4 * shortest <= 3 * blocks.length())
    short_blocks.emplace(taps, shortest);
  else
    shortest = blocks.length();
  const double worth = std::sqrt(block_cost<Sample>(shortest) / tap_cost<Sample, Tap>);
  most_recent = std::min(shortest - taps.size() + 1, static_cast<std::size_t>(worth));
  recent = qsrfhs::aligned_buffer<Sample>(2 * most_recent + readable / sizeof(Sample));
  std::fill_n(recent.data(), recent.size(), Sample{});
}

template <class Sample, class Tap>
fir_filter<Sample, Tap>::fir_filter(std::span<const Tap> taps, convolution_method method)
    : taps_(taps.size()),
      fourier_(takes_blocks<Sample, Tap>(taps.size(), method) ? std::optional<by_blocks>(std::in_place, taps)
                                                              : std::nullopt),
      block_(fourier_ ? fourier_->blocks.step() : direct_block),
      line_(taps.size() - 1, block_) {
  std::copy(taps.begin(), taps.end(), taps_.data());
}

template <class Sample, class Tap>
void fir_filter<Sample, Tap>::process(std::span<const Sample> in, Sample *out) {
  while (!in.empty()) {
    const auto piece = in.first(std::min(in.size(), block_));
    if (fourier_)
      process_block(*fourier_, piece, out);
    else
      apply_taps(line_.append(piece), taps_.data(), taps_.size(), out, piece.size());
    in = in.subspan(piece.size());
    out += piece.size();
  }
}

template <class Sample, class Tap>
void fir_filter<Sample, Tap>::process_block(by_blocks &fourier, std::span<const Sample> in, Sample *out) {
  const std::size_t n = in.size(), recent = fourier.recent_count + n;
  const Sample *const first = line_.append(in);
  if (recent <= fourier.most_recent && n <= fourier.ahead_count) {
    Sample *const added = fourier.recent.data() + fourier.most_recent + fourier.recent_count;
    std::copy_n(first, n, added);
    apply_taps(added, taps_.data(), std::min(taps_.size(), recent), out, n);
    for (std::size_t k = 0; k < n; ++k) out[k] += fourier.ahead[k];
    fourier.recent_count = recent;
    fourier.ahead += n;
    fourier.ahead_count -= n;
    return;
  }
  const bool is_short = fourier.short_blocks && n <= fourier.short_blocks->step();
  overlap_save<Sample, Tap> &blocks = is_short ? *fourier.short_blocks : fourier.blocks;
  const std::size_t past = taps_.size() - 1;
  const auto window = blocks.window();
  const auto rest = std::copy_n(first - past, past + n, window.begin());
  std::fill(rest, window.end(), Sample{});
  fourier.recent_count = fourier.ahead_count = 0;  // until the block is there
  const Sample *const results = blocks.run();
  std::copy_n(results, n, out);
  fourier.ahead = results + n;
  fourier.ahead_count = blocks.step() - n;
}

template <class Sample, class Tap>
void fir_filter<Sample, Tap>::reset() noexcept {
  line_.clear();
  if (fourier_) fourier_->recent_count = fourier_->ahead_count = 0;
}

template <class Sample, class Tap>
void fir_filter<Sample, Tap>::set_past(std::span<const Sample> samples) noexcept {
  reset();
  line_.set_past(samples);
}

#define INSTANTIATE(SAMPLE, TAP)            \
  template class overlap_save<SAMPLE, TAP>; \
  template class fir_filter<SAMPLE, TAP>
INSTANTIATE(float, float);
INSTANTIATE(double, double);
INSTANTIATE(std::complex<float>, float);
INSTANTIATE(std::complex<float>, std::complex<float>);
INSTANTIATE(std::complex<double>, double);
INSTANTIATE(std::complex<double>, std::complex<double>);
#undef INSTANTIATE

}  // namespace dsp
