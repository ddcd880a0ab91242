// SPDX-License-Identifier: MIT
#include "analysis/waterfall_rows.hpp"

#include <algorithm>
#include <cmath>

#include "analysis/spectrum_accumulator.hpp"
#include "terminal/failure.hpp"
#include "terminal/progress.hpp"

namespace tool {
namespace {

/// Rows of sums of powers, joined in pairs whenever there are twice as many as wanted.
class row_store {
 public:
  row_store(std::size_t rows, std::size_t columns, std::uint64_t segments)
      : wanted_(rows), columns_(columns), segments_(segments) {}

  [[nodiscard]] std::uint64_t segments_per_row() const noexcept { return segments_; }

  void add(const lumra::averaged_spectrum &spectrum) {
    const std::size_t bins = spectrum.power.size();
    const auto weight = static_cast<double>(spectrum.info.segments);
    std::vector<float> row(columns_);
    for (std::size_t c = 0; c < columns_; ++c)
      row[c] = static_cast<float>(
          *std::max_element(spectrum.power.begin() + static_cast<std::ptrdiff_t>(c * bins / columns_),
                            spectrum.power.begin() + static_cast<std::ptrdiff_t>((c + 1) * bins / columns_)));
    rows_.push_back(std::move(row));
    if (whole_.power.empty()) {
      whole_ = spectrum;
      for (double &power : whole_.power) power *= weight;
    } else {
      for (std::size_t k = 0; k < bins; ++k) whole_.power[k] += weight * spectrum.power[k];
      whole_.info.segments += spectrum.info.segments;
    }
    if (rows_.size() == 2 * wanted_) join_pairs();
  }

  [[nodiscard]] waterfall_rows take(double step_s) {
    for (double &power : whole_.power) power /= static_cast<double>(whole_.info.segments);
    return {columns_, std::move(rows_), static_cast<double>(segments_) * step_s, std::move(whole_)};
  }

 private:
  void join_pairs() {
    for (std::size_t i = 0; i < wanted_; ++i) {
      std::vector<float> &to = rows_[i];
      const std::vector<float> &a = rows_[2 * i], &b = rows_[2 * i + 1];
      for (std::size_t c = 0; c < columns_; ++c) to[c] = (a[c] + b[c]) / 2;
    }
    rows_.resize(wanted_);
    segments_ *= 2;
  }

  std::size_t wanted_, columns_;
  std::uint64_t segments_;
  std::vector<std::vector<float>> rows_;
  lumra::averaged_spectrum whole_;  // its powers are sums
};

}  // namespace

waterfall_rows make_waterfall(const recording::source &source, selection &chosen,
                              const lumra::spectrum_settings &settings, std::size_t rows, std::size_t columns) {
  const std::uint64_t n = settings.points;
  // Segments begin so far apart; the library truncates in the same way.
  const std::uint64_t step = n - static_cast<std::uint64_t>(settings.overlap * static_cast<double>(n));
  const bool endless = chosen.samples == recording::endless;
  const std::uint64_t segments = endless || chosen.samples < n ? 1 : (chosen.samples - n) / step + 1;
  const std::uint64_t per_row = endless ? 1 : (segments + rows - 1) / rows;

  sample_blocks blocks(source, chosen);
  spectrum_accumulator accumulator(settings, blocks.is_real());
  const std::size_t bins = blocks.is_real() ? static_cast<std::size_t>(n / 2 + 1) : static_cast<std::size_t>(n);
  row_store store(rows, std::min(bins, columns), per_row);
  progress bar("Analysing");
  std::uint64_t done = 0, ends_at = n + (store.segments_per_row() - 1) * step;
  while (const auto block = blocks.next()) {
    for (std::size_t from = 0; from < block->count;) {
      const auto part = static_cast<std::size_t>(std::min<std::uint64_t>(block->count - from, ends_at - done));
      accumulator.add(block->part(from, part));
      from += part;
      done += part;
      if (done < ends_at) continue;
      store.add(accumulator.read());
      accumulator.clear();
      ends_at += store.segments_per_row() * step;
    }
    bar.update(done, endless ? 0 : chosen.samples);
  }
  if (accumulator.segments() > 0) store.add(accumulator.read());
  if (done < n)
    throw failure("{}: {} samples are fewer than N = {}; use a smaller --fft", source.data.string(), done, n);
  chosen.samples = done;
  return store.take(static_cast<double>(step) / source.rate);
}

}  // namespace tool
