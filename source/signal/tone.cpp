// SPDX-License-Identifier: MIT
#include "signal/tone.hpp"

#include <algorithm>
#include <array>
#include <cmath>
#include <cstddef>
#include <limits>
#include <vector>

#include "signal/spectrum_peaks.hpp"

namespace dsp {
namespace {

constexpr double none = std::numeric_limits<double>::quiet_NaN();

struct run {
  std::size_t first, end;
};

/// Bins that lines have taken and those that are free.
class line_bins {
 public:
  line_bins(const spectrum_view &spectrum, std::size_t reach) : s_(spectrum), reach_(reach) {}

  /// The sum of a line's free bins.
  [[nodiscard]] double free_sum(std::size_t middle) const noexcept {
    double total = 0;
    for (const run &part : around(middle)) for_each_free(part, [&](run r) { total += sum(bins(r)); });
    return total;
  }

  /// Takes them; their sum.
  double take(std::size_t middle) {
    const double total = free_sum(middle);
    for (const run &part : around(middle))
      if (part.first < part.end) insert(part);
    return total;
  }

  [[nodiscard]] bool is_taken(std::size_t bin) const noexcept {
    return std::any_of(taken_.begin(), taken_.end(), [bin](run r) { return r.first <= bin && bin < r.end; });
  }

  /// The line's bins: one stretch, or one at either end of the spectrum. A mirrored spectrum's line that reaches beyond
  /// an end has its rest on the same bins.
  [[nodiscard]] std::array<run, 2> around(std::size_t middle) const noexcept {
    const std::size_t count = s_.power.size();
    const std::size_t first = middle > reach_ ? middle - reach_ : 0, end = std::min(middle + reach_ + 1, count);
    if (s_.one_sided) return {run{first, end}, run{0, 0}};
    if (2 * reach_ + 1 >= count) return {all(), run{0, 0}};
    if (middle < reach_) return {run{0, end}, run{count + middle - reach_, count}};
    if (middle + reach_ >= count) return {run{first, count}, run{0, middle + reach_ + 1 - count}};
    return {run{first, end}, run{0, 0}};
  }

  /// Calls work(run) for the free stretches of a run.
  template <class Work>
  void for_each_free(run part, Work work) const noexcept {
    for (const run &r : taken_) {
      if (r.end <= part.first) continue;
      if (r.first >= part.end) break;
      if (r.first > part.first) work(run{part.first, r.first});
      part.first = r.end;
    }
    if (part.first < part.end) work(part);
  }

  [[nodiscard]] run all() const noexcept { return {0, s_.power.size()}; }
  [[nodiscard]] std::span<const double> bins(run r) const noexcept {
    return s_.power.subspan(r.first, r.end - r.first);
  }

  /// The sum of the free bins, and their share of the band.
  struct rest {
    double sum, share;
  };
  [[nodiscard]] rest free() const noexcept {
    double total = 0, width = 0;
    for_each_free(all(), [&](run r) {
      total += sum(bins(r));
      width += static_cast<double>(r.end - r.first);
      for (const std::size_t k : {std::size_t{0}, s_.power.size() - 1})
        if (s_.is_mirror(k) && r.first <= k && k < r.end) width -= 0.5;
    });
    return {total, width / (s_.end() - s_.begin())};
  }

 private:
  void insert(run part) {
    const auto from = std::find_if(taken_.begin(), taken_.end(), [&](const run &r) { return r.end >= part.first; });
    auto to = from;
    for (; to != taken_.end() && to->first <= part.end; ++to)
      part = {std::min(part.first, to->first), std::max(part.end, to->end)};
    taken_.insert(taken_.erase(from, to), part);
  }

  const spectrum_view &s_;
  std::size_t reach_;
  std::vector<run> taken_;  // ascending, apart from each other
};

/// The highest bin of the free ones in a run; the run's end where all are 0 or NaN.
std::size_t highest(const spectrum_view &s, const line_bins &lines, run part) noexcept {
  std::size_t best = s.power.size();
  double most = 0;
  lines.for_each_free(part, [&](run r) {
    for (std::size_t k = r.first; k < r.end; ++k) {
      if (!(s.power[k] > most)) continue;
      best = k;
      most = s.power[k];
    }
  });
  return best;
}

/// The mean of the bins that are not lines: those up to 6 dB above it.
double noise_floor(std::span<const double> power) noexcept {
  double limit = std::numeric_limits<double>::infinity(), mean = 0;
  for (int pass = 0; pass < 40; ++pass) {
    constexpr std::size_t lanes = 8;
    std::array<double, lanes> totals{}, counts{};
    const auto add = [&](double p, std::size_t lane) {
      const bool below = p < limit;
      totals[lane] += below ? p : 0;
      counts[lane] += below ? 1 : 0;
    };
    std::size_t k = 0;
    for (; k + lanes <= power.size(); k += lanes)
      for (std::size_t j = 0; j < lanes; ++j) add(power[k + j], j);
    for (; k < power.size(); ++k) add(power[k], 0);
    const double count = sum(counts);
    mean = count > 0 ? sum(totals) / count : 0;
    if (!(4 * mean < limit)) break;
    limit = 4 * mean;
  }
  return mean;
}

/// The top of the line nearest to a bin.
std::size_t nearest_line(const spectrum_view &s, const line_bins &lines, std::size_t bin) noexcept {
  // Noise of a single segment is distributed exponentially: none of the bins is above, but in one spectrum of 1000. The
  // floor of such noise, which leaves out its highest bins, is 10 % below its mean.
  const double enough = 1.1 * (std::log(static_cast<double>(s.power.size())) + 7) * noise_floor(s.power);
  std::size_t start = bin, distance = s.power.size();
  lines.for_each_free(lines.all(), [&](run r) {
    for (std::size_t k = r.first; k < r.end; ++k) {
      const std::size_t apart = k > bin ? k - bin : bin - k;
      if (apart >= distance || !(s.power[k] > enough)) continue;
      start = k;
      distance = apart;
    }
  });
  // Upwards to a bin that is the highest of its main lobe.
  for (;;) {
    std::size_t higher = start;
    for (const run &part : lines.around(start)) {
      const std::size_t top = highest(s, lines, part);
      if (top < s.power.size() && !(s.power[top] <= s.power[higher])) higher = top;
    }
    if (higher == start) return start;
    start = higher;
  }
}

struct line {
  std::size_t bin;
  double sum;
};

/// The strongest line that is the highest of its free bins.
line strongest(const spectrum_view &s, const line_bins &lines, std::size_t reach) noexcept {
  line best{s.power.size(), 0};
  const auto most_bins = static_cast<double>(2 * reach + 1);
  lines.for_each_free(lines.all(), [&](run r) {
    for (std::size_t k = r.first; k < r.end; ++k) {
      const double here = s.power[k];
      if (!(here * most_bins > best.sum)) continue;
      const run near{k - std::min(reach, k - r.first), std::min(k + reach + 1, r.end)};
      const auto values = lines.bins(near);
      if (std::any_of(values.begin(), values.end(), [here](double p) { return p > here; })) continue;
      const double total = lines.free_sum(k);
      if (total > best.sum) best = {k, total};
    }
  });
  return best;
}

}  // namespace

tone_figures measure_tone(const spectrum_view &s, const main_lobe &lobe, std::optional<double> near,
                          std::span<harmonic> harmonics) {
  const auto reach = static_cast<std::size_t>(std::ceil(lobe.half_width()));
  const auto bin_at = [&](double position) { return s.bin(std::llround(position)); };
  const std::size_t dc = s.middle();

  line_bins around_dc(s, reach);
  around_dc.take(dc);
  const auto choose = [&] {
    if (!near) return highest(s, around_dc, around_dc.all());
    const std::size_t wanted = bin_at(std::clamp(s.position(*near), 0.0, s.end()));
    return nearest_line(s, around_dc.is_taken(wanted) ? line_bins(s, reach) : around_dc, wanted);
  };
  const std::size_t carrier_bin = choose();
  std::fill(harmonics.begin(), harmonics.end(), harmonic{none, none});
  if (carrier_bin == s.power.size() || !(s.power[carrier_bin] > 0))
    return {none, near ? s.power[carrier_bin] : 0, none, none, none, none, none, none, none};

  line_bins lines(s, reach);
  tone_figures figures{};
  const double position = interpolate_peak(s, lobe, carrier_bin).position;
  figures.frequency = s.frequency(position);
  figures.carrier = lines.take(carrier_bin) / s.noise_bandwidth;
  const auto is_line = [&](std::size_t bin) { return !lines.is_taken(bin); };
  const auto level = [&](std::size_t bin) { return lines.take(bin) / s.noise_bandwidth; };
  figures.dc = is_line(dc) ? level(dc) : none;
  const auto beside = lines.free();
  const line spur = strongest(s, lines, reach);
  figures.spur = spur.sum / s.noise_bandwidth;
  figures.spur_frequency = spur.bin < s.power.size() ? s.frequency(static_cast<double>(spur.bin)) : none;

  const double middle = static_cast<double>(dc), offset = position - middle, n = static_cast<double>(s.points);
  const auto wrapped = [&](double bins) {
    const double within = std::remainder(bins, n);
    return s.one_sided ? std::abs(within) : within;
  };
  const std::size_t mirrored = bin_at(middle - offset);  // with one side the carrier
  figures.image = !s.one_sided && is_line(mirrored) ? level(mirrored) : none;
  bool told = false;
  for (std::size_t k = 0; k < harmonics.size(); ++k) {
    const double at = middle + wrapped(static_cast<double>(k + 2) * offset);
    harmonics[k].frequency = s.frequency(at);
    if (!is_line(bin_at(at))) continue;
    harmonics[k].power = level(bin_at(at));
    figures.harmonics += harmonics[k].power;
    told = true;
  }
  if (!told) figures.harmonics = none;
  const auto rest = lines.free();
  figures.noise = rest.sum / rest.share / s.noise_bandwidth;
  figures.noise_and_distortion = beside.sum / s.noise_bandwidth + figures.noise * (1 - beside.share);
  return figures;
}

}  // namespace dsp
