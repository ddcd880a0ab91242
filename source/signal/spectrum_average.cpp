// SPDX-License-Identifier: MIT
#include "signal/spectrum_average.hpp"

#include <algorithm>
#include <complex>
#include <numeric>
#include <utility>

#include "qsrfhs/math/mkl_runtime.hpp"
#include "qsrfhs/vector/kernels/kernels.hpp"
#include "signal/workers.hpp"

namespace dsp {
namespace {

/// Points to be transformed that are worth a thread: starting one takes as long as some thousands.
constexpr std::uint64_t points_per_thread = std::uint64_t{1} << 15;

struct window_sums {
  double values, squares;
};

/// In eight sums of each side by side, of which none waits for another.
template <class Real>
window_sums sums_of(std::span<const Real> window) noexcept {
  constexpr std::size_t lanes = 8;
  double values[lanes]{}, squares[lanes]{};
  const auto add = [&](std::size_t lane, Real w) {
    values[lane] += static_cast<double>(w);
    squares[lane] += static_cast<double>(w) * static_cast<double>(w);
  };
  const std::size_t whole = window.size() / lanes * lanes;
  for (std::size_t k = 0; k < whole; k += lanes)
    for (std::size_t lane = 0; lane < lanes; ++lane) add(lane, window[k + lane]);
  for (std::size_t k = whole; k < window.size(); ++k) add(k - whole, window[k]);
  return {std::accumulate(values, values + lanes, 0.0), std::accumulate(squares, squares + lanes, 0.0)};
}

template <class Real>
void widen_scaled(std::span<const Real> x, double scale, double *out) noexcept {
  for (std::size_t k = 0; k < x.size(); ++k) out[k] = static_cast<double>(x[k]) * scale;
}

template <class Real>
void add_row(std::span<const Real> x, std::span<Real> sum) noexcept {
  for (std::size_t k = 0; k < x.size(); ++k) sum[k] += x[k];
}

/// Takes what lies beyond, and keeps what is not a number.
template <class Real>
void widen(std::span<const Real> x, std::span<Real> maximum) noexcept {
  for (std::size_t k = 0; k < x.size(); ++k)
    maximum[k] = x[k] > maximum[k] || x[k] != x[k] ? x[k] : maximum[k];  // nothing is above a NaN
}
template <class Real>
void lower(std::span<const Real> x, std::span<Real> minimum) noexcept {
  for (std::size_t k = 0; k < x.size(); ++k) minimum[k] = x[k] < minimum[k] || x[k] != x[k] ? x[k] : minimum[k];
}

}  // namespace

template <class Sample>
spectrum_average<Sample>::lane::lane(const spectrum_average &owner)
    : power(owner.plan_), forest(owner.bins(), owner.settings_.step, owner.settings_.start) {
  if (owner.settings_.hold == extremes::forgotten) return;
  leaf = qsrfhs::aligned_buffer<real>(owner.bins());
  maximum = qsrfhs::aligned_buffer<real>(owner.bins());
  minimum = qsrfhs::aligned_buffer<real>(owner.bins());
}

template <class Sample>
spectrum_average<Sample>::spectrum_average(const spectrum_settings &settings)
    : settings_(settings),
      plan_(make_plan()),
      scratch_(bins()),
      ordered_(bins()),
      origin_(settings.origin),
      position_(settings.start),
      tail_(2 * settings.points) {
  const std::uint64_t done = (settings.start - settings.origin + settings.step - 1) / settings.step;
  next_ = settings.origin + done * settings.step;
  head_.reserve(head_size());
  head_grows_ = head_size() != 0;
  const qsrfhs::mkl_runtime::use in_use;
  lanes_.push_back(std::make_unique<lane>(*this));
}

template <class Sample>
segment_plan<Sample> spectrum_average<Sample>::make_plan() {
  qsrfhs::aligned_buffer<real> window(settings_.points);
  make_window(settings_.window, window_span::periodic, window.elements());
  const window_sums sums = sums_of(std::span<const real>(window.elements()));
  noise_bandwidth_ = static_cast<double>(settings_.points) * sums.squares / (sums.values * sums.values);
  const double scale = 1 / sums.values;
  for (real &w : window.elements()) w = static_cast<real>(static_cast<double>(w) * scale);
  return segment_plan<Sample>(std::move(window));
}

/// Samples from the start on that segments need which begin in front of it.
template <class Sample>
std::size_t spectrum_average<Sample>::head_size() const noexcept {
  const std::uint64_t since = settings_.start - settings_.origin, step = settings_.step;
  if (since == 0) return 0;
  return settings_.points - static_cast<std::size_t>((since - 1) % step + 1);
}

template <class Sample>
std::size_t spectrum_average<Sample>::lanes_for(std::uint64_t segments) const noexcept {
  const std::uint64_t worth = std::min(segments, segments * settings_.points / points_per_thread);
  return std::clamp<std::size_t>(worth, 1, thread_count(settings_.threads));
}

template <class Sample>
void spectrum_average<Sample>::require_lanes(std::uint64_t segments) {
  const std::size_t count = lanes_for(segments);
  const qsrfhs::mkl_runtime::use in_use;
  while (lanes_.size() < count) lanes_.push_back(std::make_unique<lane>(*this));
  const std::uint64_t each = segments / count + 1;
  for (std::size_t k = 1; k < count; ++k) lanes_[k]->forest.reserve(each);
}

template <class Sample>
void spectrum_average<Sample>::add(std::span<const Sample> x) {
  const std::uint64_t segments = (tail_count_ + x.size()) / settings_.step + 1;
  require_lanes(segments);
  lanes_.front()->forest.reserve(segments);
  take(x);
}

template <class Sample>
void spectrum_average<Sample>::take(std::span<const Sample> x) {
  const std::size_t points = settings_.points, step = settings_.step;
  if (head_grows_) {
    const std::size_t count = std::min(head_size() - head_.size(), x.size());
    head_.insert(head_.end(), x.begin(), x.begin() + static_cast<std::ptrdiff_t>(count));
    head_grows_ = head_.size() < head_size();
  }
  if (next_ > position_) {
    const std::size_t skipped = std::min<std::uint64_t>(next_ - position_, x.size());
    position_ += skipped;
    x = x.subspan(skipped);
  }
  if (x.empty()) return;
  broken_ = true;  // until the transforms have worked
  if (tail_count_ != 0) {
    // Segments that begin in the tail, with the samples that complete them behind it.
    const std::size_t added = std::min(x.size(), points - 1);
    std::copy_n(x.data(), added, tail_.data() + tail_count_);
    const std::size_t held = tail_count_ + added;
    const std::size_t complete = held >= points ? (held - points) / step + 1 : 0;
    const std::size_t count = std::min(complete, (tail_count_ + step - 1) / step);
    run(tail_.data(), count);
    const std::size_t used = count * step;
    if (used < tail_count_) {
      std::copy(tail_.data() + used, tail_.data() + held, tail_.data());
      tail_count_ = held - used;
      position_ += added;
      broken_ = false;
      return;
    }
    const std::size_t skipped = std::min(used - tail_count_, x.size());
    position_ += skipped;
    x = x.subspan(skipped);
  }
  const std::size_t count = x.size() >= points ? (x.size() - points) / step + 1 : 0;
  run(x.data(), count);
  position_ += x.size();
  x = x.subspan(std::min(count * step, x.size()));
  std::copy(x.begin(), x.end(), tail_.data());
  tail_count_ = x.size();
  broken_ = false;
}

/// Segments from next_ on.
template <class Sample>
void spectrum_average<Sample>::run(const Sample *x, std::uint64_t count) {
  if (count == 0) return;
  const std::size_t parts = std::min(lanes_for(count), lanes_.size());
  if (parts == 1) {
    run_lane(*lanes_.front(), x, next_, count);
  } else {
    const auto first_of = [&](std::size_t part) { return count * part / parts; };
    for (std::size_t k = 1; k < parts; ++k) {
      lanes_[k]->forest.clear(next_ + first_of(k) * settings_.step);
      lanes_[k]->has_extremes = false;
    }
    run_parts(parts, [&](std::size_t k) {
      const std::uint64_t first = first_of(k);
      run_lane(*lanes_[k], x + first * settings_.step, next_ + first * settings_.step, first_of(k + 1) - first);
    });
    for (std::size_t k = 1; k < parts; ++k) {
      lanes_.front()->forest.take(lanes_[k]->forest);
      hold(*lanes_.front(), lanes_[k]->maximum.elements(), lanes_[k]->minimum.elements());
    }
  }
  segments_ += count;
  next_ += count * settings_.step;
}

template <class Sample>
void spectrum_average<Sample>::run_lane(lane &own, const Sample *x, std::uint64_t position, std::uint64_t count) {
  const std::size_t step = settings_.step;
  const bool held = settings_.hold == extremes::held;
  const qsrfhs::mkl_runtime::use in_use;
  // One for all segments: entering it for each would take as long as the shortest transforms.
  qsrfhs::mkl_section section;
  own.power.begin(x);
  for (std::uint64_t k = 0; k < count; ++k, position += step) {
    x += step;
    const Sample *const next = k + 1 < count ? x : nullptr;
    const std::size_t ahead = k + 2 < count ? step : 0;
    const auto place = own.forest.plant(position, position + step);
    if (held) {
      own.power.finish(own.leaf.data(), row_goes::in, next, ahead, section);
      const std::span<const real> leaf = own.leaf.elements();
      if (place.goes == row_goes::on_top)
        add_row(leaf, std::span(place.row, leaf.size()));
      else
        std::copy(leaf.begin(), leaf.end(), place.row);
      hold(own, leaf, leaf);
    } else {
      own.power.finish(place.row, place.goes, next, ahead, section);
    }
    own.forest.settle(position + step);
    section.let_forks_pass();
  }
}

/// Extremes of one segment or more.
template <class Sample>
void spectrum_average<Sample>::hold(lane &own, std::span<const real> maximum, std::span<const real> minimum) noexcept {
  if (settings_.hold == extremes::forgotten) return;
  if (!std::exchange(own.has_extremes, true)) {
    std::copy(maximum.begin(), maximum.end(), own.maximum.data());
    std::copy(minimum.begin(), minimum.end(), own.minimum.data());
  } else {
    widen(maximum, own.maximum.elements());
    lower(minimum, own.minimum.elements());
  }
}

template <class Sample>
void spectrum_average<Sample>::gap() noexcept {
  head_grows_ = false;
  tail_count_ = 0;
  origin_ = next_ = position_;
}

template <class Sample>
void spectrum_average<Sample>::merge(const spectrum_average &next) {
  const lane &theirs = *next.lanes_.front();
  const std::uint64_t segments = (tail_count_ + next.head_.size()) / settings_.step + 1;
  require_lanes(segments);
  lanes_.front()->forest.reserve(segments, theirs.forest.trees().size());

  if (next.settings_.origin != origin_) gap();
  take(next.head_);
  if (next.head_grows_) return;  // its head is all that it has
  head_grows_ = false;
  lanes_.front()->forest.append(theirs.forest.trees());
  if (next.segments_ != 0) hold(*lanes_.front(), theirs.maximum.elements(), theirs.minimum.elements());
  segments_ += next.segments_;
  origin_ = next.origin_;
  position_ = next.position_;
  next_ = next.next_;
  tail_count_ = next.tail_count_;
  std::copy_n(next.tail_.data(), tail_count_, tail_.data());
}

template <class Sample>
void spectrum_average<Sample>::clear() {
  spectrum_settings settings = settings_;
  settings.start = std::min(next_, position_);
  settings.origin = origin_;
  head_.reserve(settings_.points);
  settings_ = settings;
  head_.assign(tail_.data(), tail_.data() + std::min(tail_count_, head_size()));
  head_grows_ = head_.size() < head_size();
  lanes_.front()->forest.clear(settings.start);
  lanes_.front()->has_extremes = false;
  segments_ = 0;
}

template <class Sample>
void spectrum_average<Sample>::order(std::span<const real> power, double scale, std::span<double> out) const {
  plan_.to_bins(power, ordered_.elements());
  const std::span<const real> row = ordered_.elements();
  const std::size_t points = settings_.points;
  if constexpr (is_complex<Sample>) {
    const std::size_t positive = points - points / 2;  // bins from 0 on
    widen_scaled(row.subspan(positive), scale, out.data());
    widen_scaled(row.first(positive), scale, out.data() + points / 2);
  } else {
    widen_scaled(row, 2 * scale, out.data());
    // These two have no negative frequency.
    for (const std::size_t k : {std::size_t{0}, points / 2})
      if (k == 0 || points % 2 == 0) out[k] = static_cast<double>(row[k]) * scale;
  }
}

template <class Sample>
void spectrum_average<Sample>::read(std::span<double> mean, std::span<double> maximum,
                                    std::span<double> minimum) const {
  const lane &all = *lanes_.front();
  all.forest.sum_into(scratch_.elements());
  order(scratch_.elements(), 1 / static_cast<double>(segments_), mean);
  if (!maximum.empty()) order(all.maximum.elements(), 1, maximum);
  if (!minimum.empty()) order(all.minimum.elements(), 1, minimum);
}

template class spectrum_average<float>;
template class spectrum_average<double>;
template class spectrum_average<std::complex<float>>;
template class spectrum_average<std::complex<double>>;

}  // namespace dsp
