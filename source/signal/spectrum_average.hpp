// Averaged power spectra of streams that are cut and merged anywhere. SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>
#include <vector>

#include "qsrfhs/util/aligned_buffer.hpp"
#include "signal/power_forest.hpp"
#include "signal/segment_plan.hpp"
#include "signal/segment_power.hpp"
#include "signal/window.hpp"

namespace dsp {

/// Furthest position in a stream.
inline constexpr std::uint64_t most_position = std::uint64_t{1} << 62;

enum class extremes { forgotten, held };

struct spectrum_settings {
  std::size_t points;    // at least 2
  std::size_t step;      // from a segment to the next, 1 to points
  window_shape window;   // periodic
  extremes hold;         // of the segments' powers
  std::size_t threads;   // at most; 0 for as many as pay
  std::uint64_t start;   // position of the first sample
  std::uint64_t origin;  // from which segments count, at most start
};

/// The mean over segments of the power |sum over i of w[i] x[s + i] exp(-2 pi j i k / N)|^2 / (sum of w)^2.
///
/// Positions are those of the whole stream. Segments begin at origin + k * step. An average answers for those that
/// begin at its start or later; the samples in front that a neighbour's last segments need are kept as its head, those
/// of its own segments that are not complete as its tail. Throws std::bad_alloc, and then nothing has changed, or
/// dfti_failure, and then it is broken.
template <class Sample>
class spectrum_average {
 public:
  using real = real_of<Sample>;

  explicit spectrum_average(const spectrum_settings &settings);

  [[nodiscard]] const spectrum_settings &settings() const noexcept { return settings_; }
  [[nodiscard]] std::size_t bins() const noexcept { return segment_plan<Sample>::bins(settings_.points); }
  [[nodiscard]] double noise_bandwidth() const noexcept { return noise_bandwidth_; }  // in bins
  [[nodiscard]] std::uint64_t start() const noexcept { return settings_.start; }
  [[nodiscard]] std::uint64_t first_origin() const noexcept { return settings_.origin; }
  [[nodiscard]] std::uint64_t origin() const noexcept { return origin_; }
  [[nodiscard]] std::uint64_t position() const noexcept { return position_; }  // behind the last sample
  [[nodiscard]] std::uint64_t segments() const noexcept { return segments_; }
  [[nodiscard]] bool broken() const noexcept { return broken_; }

  void add(std::span<const Sample> x);
  void gap() noexcept;
  /// One of the same settings but for threads, whose start is this one's position, and whose first origin is this one's
  /// origin or that start.
  void merge(const spectrum_average &next);
  void clear();

  /// Into the order of frequencies, those of real samples with the power of the negative ones; there is at least one
  /// segment. Empty spans are left out.
  void read(std::span<double> mean, std::span<double> maximum, std::span<double> minimum) const;

  /// Gives all that a new one of the same settings does not know to write(span of numbers).
  template <class Writer>
  void save(Writer &to) const;
  /// Takes that into a new one; false where it cannot be.
  template <class Reader>
  [[nodiscard]] bool load(Reader &from);

 private:
  /// What a thread works with.
  struct lane {
    explicit lane(const spectrum_average &owner);

    segment_power<Sample> power;
    power_forest<real> forest;
    // The latest segment's powers, and the extremes, where those are held.
    qsrfhs::aligned_buffer<real> leaf, maximum, minimum;
    bool has_extremes = false;
  };

  segment_plan<Sample> make_plan();
  [[nodiscard]] std::size_t head_size() const noexcept;
  void require_lanes(std::uint64_t segments);
  [[nodiscard]] std::size_t lanes_for(std::uint64_t segments) const noexcept;
  void take(std::span<const Sample> x);
  void run(const Sample *x, std::uint64_t count);
  void run_lane(lane &own, const Sample *x, std::uint64_t position, std::uint64_t count);
  void hold(lane &own, std::span<const real> maximum, std::span<const real> minimum) noexcept;
  void order(std::span<const real> power, double scale, std::span<double> out) const;

  spectrum_settings settings_;
  double noise_bandwidth_;
  segment_plan<Sample> plan_;
  std::vector<std::unique_ptr<lane>> lanes_;  // the first is the caller's, with what all have gathered
  qsrfhs::aligned_buffer<real> scratch_;      // a row of powers
  qsrfhs::aligned_buffer<real> ordered_;      // one as it is read or saved
  std::uint64_t origin_, position_, next_;    // next_: where the next segment begins
  std::uint64_t segments_ = 0;
  std::vector<Sample> head_;
  bool head_grows_;
  qsrfhs::aligned_buffer<Sample> tail_;  // room for what two segments need
  std::size_t tail_count_ = 0;           // samples from next_ on
  bool broken_ = false;
};

template <class Sample>
template <class Writer>
void spectrum_average<Sample>::save(Writer &to) const {
  const lane &all = *lanes_.front();
  for (const std::uint64_t number :
       {origin_, position_, next_, segments_, std::uint64_t{head_grows_}, std::uint64_t{head_.size()},
        std::uint64_t{tail_count_}, std::uint64_t{all.forest.trees().size()}})
    to.add(number);
  to.add_all(std::span<const Sample>(head_));
  to.add_all(std::span<const Sample>(tail_.data(), tail_count_));
  const auto add_row = [&](std::span<const real> row) {
    if (!to.only_counts()) plan_.to_state(row, ordered_.elements());
    to.add_all(std::span<const real>(ordered_.elements()));
  };
  for (const auto &tree : all.forest.trees()) {
    to.add(tree.first);
    to.add(tree.last);
    add_row(tree.sum.elements());
  }
  if (settings_.hold == extremes::held && segments_ != 0) {
    add_row(all.maximum.elements());
    add_row(all.minimum.elements());
  }
}

template <class Sample>
template <class Reader>
bool spectrum_average<Sample>::load(Reader &from) {
  lane &all = *lanes_.front();
  const auto origin = from.template take<std::uint64_t>(), position = from.template take<std::uint64_t>();
  const auto next = from.template take<std::uint64_t>(), segments = from.template take<std::uint64_t>();
  const auto head_grows = from.template take<std::uint64_t>(), head = from.template take<std::uint64_t>();
  const auto tail = from.template take<std::uint64_t>(), trees = from.template take<std::uint64_t>();
  const std::uint64_t points = settings_.points, samples = position - settings_.start;
  if (position < settings_.start || position > most_position || origin > position || origin < settings_.origin)
    return false;
  if (next < origin || (next - origin) % settings_.step != 0 || next > position + settings_.step) return false;
  if (head_grows > 1 || head > head_size() || head > samples || (head_grows == 1 && head != samples)) return false;
  if (tail != (next < position ? position - next : 0) || tail >= points || tail > samples) return false;
  if (trees > power_forest<real>::most_trees || (trees == 0) != (segments == 0) || trees > segments) return false;
  head_.resize(static_cast<std::size_t>(head));
  from.take_all(std::span<Sample>(head_));
  from.take_all(std::span<Sample>(tail_.data(), static_cast<std::size_t>(tail)));
  const auto take_row = [&] {
    from.take_all(ordered_.elements());
    plan_.from_state(ordered_.elements(), scratch_.elements());
  };
  std::uint64_t behind = settings_.start;
  for (std::uint64_t k = 0; k < trees; ++k) {
    const auto first = from.template take<std::uint64_t>(), last = from.template take<std::uint64_t>();
    if (first < behind || last < first || last >= next) return false;
    behind = last + 1;
    take_row();
    all.forest.add_tree(first, last, scratch_.elements());
  }
  if (settings_.hold == extremes::held && segments != 0) {
    take_row();
    std::copy_n(scratch_.data(), bins(), all.maximum.data());
    take_row();
    std::copy_n(scratch_.data(), bins(), all.minimum.data());
  }
  all.has_extremes = segments != 0;
  segments_ = segments;
  origin_ = origin, position_ = position, next_ = next;
  head_grows_ = head_grows == 1;
  tail_count_ = static_cast<std::size_t>(tail);
  return true;
}

}  // namespace dsp
