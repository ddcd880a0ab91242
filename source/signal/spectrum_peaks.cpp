// SPDX-License-Identifier: MIT
#include "signal/spectrum_peaks.hpp"

#include <algorithm>
#include <cmath>
#include <iterator>
#include <limits>
#include <optional>
#include <queue>
#include <set>

namespace dsp {
namespace {

/// How many bins from `bin` on are equal; 0 where it does not begin a local maximum. NaN is not higher than anything.
std::uint64_t top_width(const spectrum_view &s, std::size_t bin) noexcept {
  if (bin >= 2 && bin + 2 < s.power.size()) {  // as below, away from the ends
    const double *const p = s.power.data() + bin;
    if (!(p[-1] < p[0])) return 0;
    if (p[1] < p[0]) return 1;
  }
  const auto k = static_cast<std::int64_t>(bin);
  const double here = s.density(k);
  const bool symmetric = s.one_sided && k == 0;  // what is below is what is above
  if (!symmetric && !(s.density(k - 1) < here)) return 0;
  std::int64_t after = k + 1;
  const auto around = k + static_cast<std::int64_t>(s.points);
  while (after < around && s.density(after) == here) ++after;
  if (!(s.density(after) < here)) return 0;
  return static_cast<std::uint64_t>(after - k);
}

/// A position in the band for one up to N beyond.
double into_band(const spectrum_view &s, double position) noexcept {
  const auto n = static_cast<double>(s.points);
  if (position < s.begin()) return position + n;
  if (position >= s.end()) return s.one_sided ? n - position : position - n;
  return position;
}

/// Finds the peaks one by one from a queue that holds, for every block of bins, its highest maximum that was not looked
/// at. As long as a maximum is known by its bin, it is in the queue by the most that its power can be.
class peak_queue {
 public:
  peak_queue(const spectrum_view &spectrum, const main_lobe &lobe, const peak_search &search)
      : s_(spectrum), lobe_(lobe), search_(search) {
    for (std::uint64_t first = search.first; first < search.end; first += block) add_next(first, std::nullopt);
  }

  std::vector<peak> take() {
    std::vector<peak> peaks;
    while (!queue_.empty() && peaks.size() < search_.most) {
      const candidate best = queue_.top();
      queue_.pop();
      const auto close = close_peak(best.bin);
      if (best.exact && !close) {
        peaks.push_back(best.top);
        if (search_.apart > 1) taken_.insert(best.bin);
      }
      if (best.exact) continue;
      const std::uint64_t first = best.bin - (best.bin - search_.first) % block;
      if (close && is_close(*close, first) && is_close(*close, first + block - 1)) continue;
      if (!close) {
        const peak top = measure(best.bin);
        if (top.power > search_.threshold) queue_.push({top.power, best.bin, true, top});
      }
      add_next(first, best.bin);
    }
    return peaks;
  }

 private:
  static constexpr std::uint64_t block = 256;

  struct candidate {
    double power;  // the most that it can be, or what it is where `exact`
    std::uint64_t bin;
    bool exact;
    peak top;
    friend bool operator<(const candidate &a, const candidate &b) noexcept {
      return a.power < b.power || (a.power == b.power && a.bin > b.bin);
    }
  };

  [[nodiscard]] bool is_close(std::uint64_t a, std::uint64_t b) const noexcept {
    return (a < b ? b - a : a - b) < search_.apart;
  }

  /// A peak that was found and is too close to a bin.
  [[nodiscard]] std::optional<std::uint64_t> close_peak(std::uint64_t bin) const {
    if (search_.apart == 1) return std::nullopt;  // only the bin itself, which is not looked at twice
    const auto above = taken_.lower_bound(bin);
    if (above != taken_.end() && is_close(*above, bin)) return *above;
    if (above != taken_.begin() && is_close(*std::prev(above), bin)) return *std::prev(above);
    return std::nullopt;
  }

  [[nodiscard]] peak measure(std::uint64_t bin) const noexcept {
    const std::uint64_t width = top_width(s_, bin);
    if (width <= 2) return interpolate_peak(s_, lobe_, bin);
    const bool symmetric = s_.one_sided && bin == 0;
    const double middle = symmetric ? 0 : static_cast<double>(bin) + static_cast<double>(width - 1) / 2;
    return {into_band(s_, middle), s_.power[bin]};
  }

  /// Queues the highest maximum of a block that comes after the one at `previous` and is far enough from all peaks.
  void add_next(std::uint64_t first, std::optional<std::uint64_t> previous) {
    const std::uint64_t end = std::min(first + block, search_.end);
    const double before = previous ? s_.power[*previous] : std::numeric_limits<double>::infinity();
    std::optional<std::uint64_t> best;
    double floor = search_.threshold / lobe_.largest_gain();
    for (std::uint64_t k = first; k < end; ++k) {
      const double power = s_.power[k];
      if (!(power > floor) || power > before || (power == before && previous && k <= *previous)) continue;
      if (top_width(s_, k) == 0 || close_peak(k)) continue;
      best = k;
      floor = power;
    }
    if (best) queue_.push({s_.power[*best] * lobe_.largest_gain(), *best, false, {}});
  }

  const spectrum_view &s_;
  const main_lobe &lobe_;
  const peak_search &search_;
  std::priority_queue<candidate> queue_;
  std::set<std::uint64_t> taken_;  // bins of the peaks found
};

}  // namespace

peak interpolate_peak(const spectrum_view &s, const main_lobe &lobe, std::size_t bin) noexcept {
  const auto k = static_cast<std::int64_t>(bin);
  if (s.is_mirror(bin)) return {static_cast<double>(bin), s.power[bin]};
  const auto [offset, gain] = lobe.interpolate(s.density(k - 1), s.power[bin], s.density(k + 1));
  return {into_band(s, static_cast<double>(bin) + offset), s.power[bin] * gain};
}

std::vector<peak> find_peaks(const spectrum_view &spectrum, const main_lobe &lobe, const peak_search &search) {
  return peak_queue(spectrum, lobe, search).take();
}

}  // namespace dsp
