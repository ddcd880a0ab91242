// SPDX-License-Identifier: MIT
#include "signal/evm_search.hpp"

#include <algorithm>
#include <bit>
#include <cmath>
#include <complex>
#include <cstdint>
#include <vector>

#include "qsrfhs/math/mkl_runtime.hpp"
#include "signal/block_transform.hpp"
#include "signal/convolution_method.hpp"
#include "signal/rotation.hpp"

namespace dsp {
namespace {

using narrow = std::complex<float>;
using wide = std::complex<double>;

/// Where between its neighbours a peak lies, from -1/2 to 1/2: the top of the parabola through the three.
double vertex(double before, double peak, double after) noexcept {
  const double curvature = before - 2 * peak + after;
  return curvature < 0 ? std::clamp((before - after) / (2 * curvature), -0.5, 0.5) : 0;
}

template <class Sample>
wide mean(std::span<const Sample> x) noexcept {
  wide sum = 0;
  for (const Sample &v : x) sum += wide(v);
  return sum / static_cast<double>(x.size());
}

/// Both streams around the part: the reference with `reach` samples more on each side, zeros where there are none.
/// Direct parts are taken away where they would count as a correlation, and lengths are near 1.
struct searched_streams {
  std::vector<wide> reference, measured;
};

template <class Sample>
searched_streams take_streams(std::span<const Sample> reference, std::span<const Sample> measured,
                              const alignment &wanted, const stretch &part, std::size_t reach) {
  const stretch around{part.first - std::min(part.first, reach), std::min(part.last + reach, reference.size())};
  const auto from = reference.subspan(around.first, around.count());
  const auto to = measured.subspan(part.first, part.count());
  const wide from_dc = wanted.delay ? mean(from) : 0, to_dc = wanted.delay || wanted.dc ? mean(to) : 0;
  searched_streams streams{std::vector<wide>(part.count() + 2 * reach), std::vector<wide>(part.count())};
  const std::size_t silence = reach - (part.first - around.first);
  double largest_from = 0, largest_to = 0;
  for (std::size_t k = 0; k < from.size(); ++k) {
    streams.reference[silence + k] = wide(from[k]) - from_dc;
    largest_from = std::max(largest_from, std::abs(streams.reference[silence + k]));
  }
  for (std::size_t k = 0; k < to.size(); ++k) {
    streams.measured[k] = wide(to[k]) - to_dc;
    largest_to = std::max(largest_to, std::abs(streams.measured[k]));
  }
  if (!(largest_from > 0 && largest_to > 0)) return streams;  // zeros correlate with nothing
  for (wide &v : streams.reference) v /= largest_from;
  for (wide &v : streams.measured) v /= largest_to;
  return streams;
}

/// Correlations over delays at the frequency 0: [p] belongs to the delay reach - p.
std::vector<wide> correlations(const searched_streams &streams, std::size_t reach) {
  const std::size_t points = fast_length(streams.reference.size());
  const block_transform<wide> transform(points);
  std::vector<wide> record(points), first(points), second(points);
  std::copy(streams.measured.begin(), streams.measured.end(), record.begin());
  transform.forward(record.data(), first.data());
  std::fill(record.begin(), record.end(), wide(0));
  std::copy(streams.reference.begin(), streams.reference.end(), record.begin());
  transform.forward(record.data(), second.data());
  for (std::size_t k = 0; k < points; ++k)
    second[k] = times(first[k], std::conj(second[k])) / static_cast<double>(points);
  // The product of measured and conjugated reference stands at minus p.
  transform.backward(second.data(), record.data());
  std::vector<wide> found(2 * reach + 1);
  for (std::size_t p = 0; p < found.size(); ++p) found[p] = record[p == 0 ? 0 : points - p];
  return found;
}

struct spectral_peak {
  double height = 0, frequency = 0;
};

/// Correlations over frequencies for one delay at a time.
class frequency_search {
 public:
  frequency_search(const searched_streams &streams, std::size_t reach)
      : streams_(streams),
        reach_(reach),
        transform_(std::bit_ceil(2 * streams.measured.size())),
        product_(transform_.length()),
        bins_(transform_.length()) {}

  spectral_peak at(std::ptrdiff_t delay) {
    const wide *reference = streams_.reference.data() + (static_cast<std::ptrdiff_t>(reach_) - delay);
    for (std::size_t k = 0; k < streams_.measured.size(); ++k)
      product_[k] = narrow(times(streams_.measured[k], std::conj(reference[k])));
    transform_.forward(product_.data(), bins_.data());
    const std::size_t points = bins_.size(), mask = points - 1;
    std::size_t top = 0;
    float highest = -1;
    for (std::size_t k = 0; k < points; ++k) {
      const float power = bins_[k].real() * bins_[k].real() + bins_[k].imag() * bins_[k].imag();
      if (power > highest) highest = power, top = k;
    }
    const auto height = [&](std::size_t k) { return std::abs(wide(bins_[k & mask])); };
    const double peak = height(top), offset = vertex(height(top + points - 1), peak, height(top + 1));
    const double bin = static_cast<double>(top) - (2 * top >= points ? static_cast<double>(points) : 0) + offset;
    return {peak, bin / static_cast<double>(points)};
  }

 private:
  const searched_streams &streams_;
  std::size_t reach_;
  block_transform<narrow> transform_;
  std::vector<narrow> product_, bins_;
};

}  // namespace

template <class Sample>
stretch search_stretch(std::span<const Sample> reference, const alignment &wanted) noexcept {
  const std::size_t n = reference.size();
  const std::size_t longest = wanted.delay && wanted.frequency ? 8192 : 131072, count = std::min(n, longest);
  stretch best{0, count};
  double most = -1;
  for (std::size_t first = 0; first + count <= n; first += count) {
    double energy = 0;
    for (const Sample &v : reference.subspan(first, count)) energy += std::norm(wide(v));
    if (energy > most) {
      most = energy;
      best = {first, first + count};
    }
  }
  return best;
}

template <class Sample>
bool search(std::span<const Sample> reference, std::span<const Sample> measured, const alignment &wanted,
            const stretch &part, stream_model &model) {
  const qsrfhs::mkl_runtime::use in_use;
  const std::size_t reach = wanted.delay ? longest_delay(reference.size()) : 0;
  const searched_streams streams = take_streams(reference, measured, wanted, part, reach);
  std::vector<spectral_peak> peaks(2 * reach + 1);  // of delays from -reach to reach
  const auto delay_of = [reach](std::size_t k) {
    return static_cast<std::ptrdiff_t>(k) - static_cast<std::ptrdiff_t>(reach);
  };
  if (wanted.frequency) {
    frequency_search search(streams, reach);
    for (std::size_t k = 0; k < peaks.size(); ++k) peaks[k] = search.at(delay_of(k));
  } else {
    const std::vector<wide> found = correlations(streams, reach);
    for (std::size_t k = 0; k < peaks.size(); ++k) peaks[k] = {std::abs(found[2 * reach - k]), 0};
  }
  std::size_t top = 0;
  for (std::size_t k = 1; k < peaks.size(); ++k)
    if (peaks[k].height > peaks[top].height) top = k;
  if (!(peaks[top].height > 0) || !std::isfinite(peaks[top].height)) return false;
  const bool inside = top > 0 && top + 1 < peaks.size();
  model.delay = static_cast<double>(delay_of(top)) +
                (inside ? vertex(peaks[top - 1].height, peaks[top].height, peaks[top + 1].height) : 0);
  model.frequency = peaks[top].frequency;
  return true;
}

template stretch search_stretch(std::span<const std::complex<float>>, const alignment &) noexcept;
template stretch search_stretch(std::span<const std::complex<double>>, const alignment &) noexcept;
template bool search(std::span<const std::complex<float>>, std::span<const std::complex<float>>, const alignment &,
                     const stretch &, stream_model &);
template bool search(std::span<const std::complex<double>>, std::span<const std::complex<double>>, const alignment &,
                     const stretch &, stream_model &);

}  // namespace dsp
