// SPDX-License-Identifier: MIT
#include "signal/convolution.hpp"

#include <algorithm>
#include <optional>

#include "qsrfhs/math/mkl_runtime.hpp"
#include "qsrfhs/util/aligned_buffer.hpp"
#include "signal/fir.hpp"

namespace dsp {
namespace {

/// Copies x[first] to x[first + count - 1], where there is silence around x.
template <class From, class Sample>
void copy_with_silence(std::span<const From> x, std::ptrdiff_t first, std::size_t count, Sample *to) noexcept {
  const auto n = static_cast<std::ptrdiff_t>(x.size());
  const std::ptrdiff_t last = first + static_cast<std::ptrdiff_t>(count);
  const std::ptrdiff_t begin = std::clamp(first, std::ptrdiff_t{0}, n), end = std::clamp(last, begin, n);
  const std::ptrdiff_t before = std::min(begin - first, static_cast<std::ptrdiff_t>(count));
  to = std::fill_n(to, before, Sample{});
  to = std::copy(x.data() + begin, x.data() + end, to);
  std::fill_n(to, static_cast<std::ptrdiff_t>(count) - before - (end - begin), Sample{});
}

/// Each output from the taps that meet samples. Outputs whose samples are all there need no copy of them.
template <class Sample, class Tap>
void convolve_directly(std::span<const Sample> x, std::span<const Tap> taps, const convolution_part &part,
                       Sample *out) {
  constexpr std::size_t behind = readable / sizeof(Sample), at_ends = 256, inside = 1024;
  const std::size_t last = part.first + part.count;
  qsrfhs::aligned_buffer<Sample> window(taps.size() - 1 + at_ends + behind);
  std::fill_n(window.data(), window.size(), Sample{});
  for (std::size_t k = part.first, n = 0; k < last; k += n, out += n) {
    const bool within = k + 1 >= taps.size() && k + behind < x.size();
    n = std::min({last - k, within ? inside : at_ends, within ? x.size() - behind - k : at_ends});
    const std::size_t low = k < x.size() ? 0 : k - (x.size() - 1);
    const std::size_t count = std::min(taps.size() - 1, k + n - 1) - low + 1;
    const Sample *first = x.data() + k;
    if (!within) {
      const auto begin = static_cast<std::ptrdiff_t>(k - low) - static_cast<std::ptrdiff_t>(count - 1);
      copy_with_silence(x, begin, count - 1 + n, window.data());
      first = window.data() + count - 1;
    }
    apply_taps(first, taps.data() + low, count, out, n);
  }
}

/// In overlapping blocks of one transform length.
template <class Sample, class Tap>
void convolve_in_blocks(std::span<const Sample> x, std::span<const Tap> taps, const convolution_part &part,
                        Sample *out) {
  overlap_save<Sample, Tap> blocks(taps, best_block<Sample>(taps.size()));
  const auto window = blocks.window();
  for (std::size_t done = 0, n = 0; done < part.count; done += n) {
    n = std::min(part.count - done, blocks.step());
    const auto begin = static_cast<std::ptrdiff_t>(part.first + done) - static_cast<std::ptrdiff_t>(taps.size() - 1);
    copy_with_silence(x, begin, window.size(), window.data());
    std::copy_n(blocks.run(), n, out + done);
  }
}

/// Points of one transform for all: what wraps around must not reach the part.
std::size_t whole_length(std::size_t nx, std::size_t ny, const convolution_part &part) noexcept {
  return fast_length(std::max({nx + ny - 1 - part.first, part.first + part.count, nx}));
}

template <class Sample, class Tap>
void convolve_in_one(std::span<const Sample> x, std::span<const Tap> y, const convolution_part &part,
                     std::size_t length, Sample *out) {
  const qsrfhs::mkl_runtime::use in_use;
  const block_transform<Sample> transform(length);
  const qsrfhs::aligned_buffer<Sample> record(length);
  using bin = typename block_transform<Sample>::bin;
  const qsrfhs::aligned_buffer<bin> first(transform.bins()), second(transform.bins());
  copy_with_silence(y, 0, length, record.data());
  const auto scale = static_cast<real_of<Sample>>(1.0 / static_cast<double>(length));
  std::for_each_n(record.data(), y.size(), [=](Sample &v) { v *= scale; });
  transform.forward(record.data(), first.data());
  copy_with_silence(x, 0, length, record.data());
  transform.forward(record.data(), second.data());
  multiply_bins(first.data(), second.data(), first.size());
  transform.backward(first.data(), record.data());
  std::copy_n(record.data() + part.first, part.count, out);
}

}  // namespace

convolution_part kept_part(std::size_t nx, std::size_t ny, convolution_mode mode) noexcept {
  const auto [shorter, longer] = std::minmax(nx, ny);
  if (mode == convolution_mode::same) return {(ny - 1) / 2, nx};
  if (mode == convolution_mode::valid) return {shorter - 1, longer - shorter + 1};
  return {0, nx + ny - 1};
}

template <class Sample, class Tap>
void convolve(std::span<const Sample> x, std::span<const Tap> y, const convolution_part &part,
              convolution_method method, Sample *out) {
  if (x.size() < y.size()) {  // the shorter record is the taps
    if constexpr (std::is_same_v<Sample, Tap>) {
      std::swap(x, y);
    } else {
      const qsrfhs::aligned_buffer<Sample> wide(y.size());
      std::copy(y.begin(), y.end(), wide.data());
      return convolve<Sample, Sample>(wide.elements(), x, part, method, out);
    }
  }
  const double direct = static_cast<double>(part.count) * static_cast<double>(y.size()) * tap_cost<Sample, Tap>;
  if (method == convolution_method::direct || y.size() > longest_in_blocks) return convolve_directly(x, y, part, out);
  const std::size_t block = best_block<Sample>(y.size()), step = block - y.size() + 1;
  // Beside the blocks there are the taps to transform; in one piece, three transforms instead of a block's two.
  const std::size_t transforms = 1 + (part.count + step - 1) / step;
  const double blocks = block_cost<Sample>(block) * static_cast<double>(transforms);
  const std::size_t whole = x.size() <= most_fft_points / 4 ? whole_length(x.size(), y.size(), part) : 0;
  const double one = whole == 0 ? blocks : 1.5 * block_cost<Sample>(whole);
  if (method == convolution_method::automatic && direct <= std::min(blocks, one))
    return convolve_directly(x, y, part, out);
  if (one < blocks) return convolve_in_one(x, y, part, whole, out);
  convolve_in_blocks(x, y, part, out);
}

template <class Sample>
void correlate(std::span<const Sample> x, std::span<const Sample> y, const convolution_part &part,
               convolution_method method, Sample *out) {
  const qsrfhs::aligned_buffer<Sample> reversed(y.size());
  std::reverse_copy(y.begin(), y.end(), reversed.data());
  if constexpr (is_complex<Sample>)
    std::for_each_n(reversed.data(), reversed.size(), [](Sample &v) { v = std::conj(v); });
  convolve<Sample, Sample>(x, reversed.elements(), part, method, out);
}

#define INSTANTIATE(OPERATION, SAMPLE, TAP)                                                                            \
  template void OPERATION(std::span<const SAMPLE>, std::span<const TAP>, const convolution_part &, convolution_method, \
                          SAMPLE *)
INSTANTIATE(convolve, float, float);
INSTANTIATE(convolve, double, double);
INSTANTIATE(convolve, std::complex<float>, float);
INSTANTIATE(convolve, std::complex<double>, double);
INSTANTIATE(convolve, std::complex<float>, std::complex<float>);
INSTANTIATE(convolve, std::complex<double>, std::complex<double>);
INSTANTIATE(correlate, float, float);
INSTANTIATE(correlate, double, double);
INSTANTIATE(correlate, std::complex<float>, std::complex<float>);
INSTANTIATE(correlate, std::complex<double>, std::complex<double>);
#undef INSTANTIATE

}  // namespace dsp
