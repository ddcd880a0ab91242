// SPDX-License-Identifier: MIT
#include "analysis/level_measurement.hpp"

#include <algorithm>
#include <complex>
#include <lumra/error.hpp>
#include <memory>

#include "analysis/sample_blocks.hpp"
#include "terminal/failure.hpp"
#include "terminal/progress.hpp"

namespace tool {
namespace {

constexpr std::uint64_t most_cells = 1150;  // about as many as a picture has pixels
constexpr double ccdf_step_db = 0.25;

/// Cells of equal length; where the end is not known, of twice the length whenever there are too many.
class envelope {
 public:
  explicit envelope(std::uint64_t samples)
      : cell_(samples == recording::endless ? 1024 : (samples + most_cells - 1) / most_cells) {}

  void add(const sample_block &block, bool is_real) {
    if (is_real)
      add(static_cast<const float *>(block.samples), block.count);
    else
      add(static_cast<const std::complex<float> *>(block.samples), block.count);
  }

  [[nodiscard]] std::uint64_t cell() const noexcept { return cell_; }
  [[nodiscard]] std::vector<envelope_cell> take() {
    for (envelope_cell &each : cells_) each.power /= static_cast<double>(each.samples);
    return std::move(cells_);
  }

 private:
  template <class T>
  void add(const T *x, std::size_t count) {
    for (std::size_t i = 0; i < count;) {
      if (cells_.empty() || cells_.back().samples == cell_) begin_cell();
      envelope_cell &current = cells_.back();
      const auto part = static_cast<std::size_t>(std::min<std::uint64_t>(count - i, cell_ - current.samples));
      double sum = 0, peak = 0;
      for (std::size_t k = i; k < i + part; ++k) {
        const double power = power_of(x[k]);
        sum += power;
        peak = std::max(peak, power);
      }
      current.power += sum;
      current.peak_power = std::max(current.peak_power, peak);
      current.samples += part;
      i += part;
    }
  }

  static double power_of(float x) { return static_cast<double>(x) * static_cast<double>(x); }
  static double power_of(std::complex<float> x) { return power_of(x.real()) + power_of(x.imag()); }

  void begin_cell() {
    if (cells_.size() == 2 * most_cells) {
      for (std::size_t i = 0; i < most_cells; ++i) {
        const envelope_cell &a = cells_[2 * i], &b = cells_[2 * i + 1];
        cells_[i] = {a.power + b.power, std::max(a.peak_power, b.peak_power), a.samples + b.samples};
      }
      cells_.resize(most_cells);
      cell_ *= 2;
    }
    cells_.emplace_back();
  }

  std::uint64_t cell_;
  std::vector<envelope_cell> cells_;  // powers are sums
};

struct freed {
  void operator()(lumra_level *level) const noexcept { lumra_level_free(level); }
};

}  // namespace

measured_level measure_level(const recording::source &source, selection &chosen, bool with_envelope) {
  sample_blocks blocks(source, chosen, sample_blocks::usual_size, true);
  lumra_level_options options = LUMRA_LEVEL_OPTIONS;
  options.type = blocks.is_real() ? LUMRA_TYPE_F32 : LUMRA_TYPE_CF32;
  lumra_level *made = nullptr;
  lumra::check_open(lumra_level_create(&options, &made));
  const std::unique_ptr<lumra_level, freed> level(made);
  envelope cells(chosen.samples);
  progress bar("Measuring");
  std::uint64_t done = 0;
  while (const auto block = blocks.next()) {
    lumra::check_open(lumra_level_add(level.get(), block->samples, block->count));
    if (with_envelope) cells.add(*block, blocks.is_real());
    done += block->count;
    bar.update(done, chosen.samples == recording::endless ? 0 : chosen.samples);
  }
  if (done == 0) throw failure("{}: holds no samples", source.data.string());
  chosen.samples = done;

  measured_level result;
  result.levels.size = sizeof result.levels;
  lumra::check_open(lumra_level_read(level.get(), &result.levels));
  // The largest sample is the crest above the mean.
  const auto steps = result.levels.power > 0 ? static_cast<std::size_t>(result.levels.crest_db / ccdf_step_db) + 2 : 0;
  for (std::size_t i = 0; i < steps; ++i) result.above_db.push_back(static_cast<double>(i) * ccdf_step_db);
  result.probability.resize(steps);
  if (steps > 0)
    lumra::check_open(lumra_level_ccdf(level.get(), result.above_db.data(), result.probability.data(), steps));
  result.clipped = blocks.clipped();
  result.cell = cells.cell();
  result.envelope = cells.take();
  return result;
}

}  // namespace tool
