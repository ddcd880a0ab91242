// SPDX-License-Identifier: MIT
#include "signal/channelizer.hpp"

#include <algorithm>
#include <array>
#include <cmath>
#include <memory>
#include <utility>

#include "qsrfhs/math/mkl_runtime.hpp"
#include "qsrfhs/vector/kernels/kernels.hpp"
#include "signal/band_filter.hpp"
#include "signal/convolution_method.hpp"
#include "signal/interpolator.hpp"
#include "signal/rotation.hpp"
#include "signal/workers.hpp"

namespace dsp {
namespace {

/// A block's bins in their order, or in rows of which the next begins that far behind.
template <class Bin>
struct block_bins {
  const Bin *first;
  std::size_t stride;  // 0: in their order
};

/// out[k] = bin from + k times gains[k] factor; each gain stands twice.
void weigh_and_rotate(block_bins<std::complex<float>> bins, std::size_t from, const float *gains,
                      std::complex<double> factor, std::complex<float> *out, std::size_t n) noexcept {
  const auto *const x = reinterpret_cast<const float *>(bins.first);
  const auto c = static_cast<float>(factor.real()), s = static_cast<float>(factor.imag());
  auto *const to = reinterpret_cast<float *>(out);
  const auto &kernels = qsrfhs::kernels::exact();
  if (bins.stride == 0)
    kernels.weigh_and_rotate(x + 2 * from, gains, c, s, to, n);
  else
    kernels.weigh_and_rotate_rows(x, bins.stride, from, gains, c, s, to, n);
}
void weigh_and_rotate(block_bins<std::complex<double>> bins, std::size_t from, const double *gains,
                      std::complex<double> factor, std::complex<double> *out, std::size_t n) noexcept {
  constexpr std::size_t rows = qsrfhs::kernels::radix;
  for (std::size_t k = 0, bin = from; k < n; ++k, ++bin) {
    const std::size_t place = bins.stride == 0 ? bin : bin % rows * bins.stride + bin / rows;
    out[k] = times(bins.first[place] * gains[2 * k], factor);
  }
}

/// The rows of a block, still to be transformed.
void split(const std::complex<float> *x, const qsrfhs::kernels::radix_plan<float> &plan,
           std::complex<float> *rows) noexcept {
  qsrfhs::kernels::fused().radix_16(reinterpret_cast<const float *>(x), plan, reinterpret_cast<float *>(rows));
}
void split(const std::complex<double> *x, const qsrfhs::kernels::radix_plan<double> &plan,
           std::complex<double> *rows) noexcept {
  qsrfhs::kernels::fused().radix_16_double(reinterpret_cast<const double *>(x), plan, reinterpret_cast<double *>(rows));
}

/// A run of bins of the stream, and where in the channel's spectrum it goes.
struct bin_run {
  std::size_t from, to, count;
};

/// The bins first to first + count - 1 of two spectra, both of which are periodic. The second one's bin 0 is bin
/// `centre` of the first.
std::vector<bin_run> runs_of(std::int64_t first, std::size_t count, std::int64_t centre, std::size_t points,
                             std::size_t points_out) {
  const auto wrapped = [](std::int64_t bin, std::size_t length) {
    const auto n = static_cast<std::int64_t>(length);
    return static_cast<std::size_t>((bin % n + n) % n);
  };
  std::vector<bin_run> runs;
  while (count > 0) {
    const std::size_t from = wrapped(centre + first, points), to = wrapped(first, points_out);
    const std::size_t length = std::min({count, points - from, points_out - to});
    runs.push_back({from, to, length});
    first += static_cast<std::int64_t>(length);
    count -= length;
  }
  return runs;
}

constexpr double no_turn = 0x1p-60;  // in cycles: off a bin by this or less

}  // namespace

/// What one thread works with: transforms that its channels share, and room for the longest.
template <class Sample>
struct channelizer<Sample>::team {
  std::vector<std::size_t> members;
  std::vector<std::pair<std::size_t, dfti_descriptor>> transforms;
  qsrfhs::aligned_buffer<output> work;

  [[nodiscard]] const dfti_descriptor &transform(std::size_t points) const noexcept {
    return std::find_if(transforms.begin(), transforms.end(), [=](const auto &t) { return t.first == points; })->second;
  }
};

template <class Sample>
class channelizer<Sample>::channel {
 public:
  channel(const channel_request &request, const channel_step &step, const channel_plan &plan, double rejection)
      : way_(step.way), points_(step.points) {
    if (way_ == channel_way::whole) return;
    const auto length = static_cast<std::int64_t>(plan.points);
    const auto points = static_cast<double>(plan.points), points_out = static_cast<double>(points_);
    lead_ = plan.overlap / 2 * points_ / plan.points;
    kept_ = plan.hop() * points_ / plan.points;
    hop_ = static_cast<std::int64_t>(plan.hop());
    first_ = -static_cast<std::int64_t>(plan.overlap / 2);

    const bool is_coarse = way_ == channel_way::coarse;
    const exact_cycles off = request.centre * length;  // of a bin
    const auto centre = std::llround(request.centre.value() * points - off.value());
    shift_ = is_coarse ? request.centre - off / length : request.centre;
    const double turn = is_coarse ? 0 : off.value(), ratio = request.ratio.value();
    const band_edges edges = is_coarse ? band_edges{ratio / 2 + 0.5 / points, points_out / points / 2}
                                       : band_edges{request.passband * ratio / 2, ratio / 2};
    make_gains(edges, rejection, turn, centre, plan.points);
    if (std::abs(turn) > no_turn) {
      turns_ = qsrfhs::aligned_buffer<output>(kept_);
      for (std::size_t k = 0; k < kept_; ++k)
        turns_.data()[k] = output(on_circle(-turn * static_cast<double>(lead_ + k) / points_out));
    }
    const rate_ratio rest = request.ratio.times(plan.points, points_);
    if (way_ == channel_way::interpolated) {
      interpolator_.emplace(rest, rejection);
      past_ = qsrfhs::aligned_buffer<output>(interpolator_->past().size());
    }
    if (is_coarse) {
      const channel_request narrow{off / static_cast<std::int64_t>(points_), rest, request.passband};
      narrow_ = std::make_unique<channelizer<output>>(std::span(&narrow, 1), rejection, 1);
    }
  }

  [[nodiscard]] channel_way way() const noexcept { return way_; }
  [[nodiscard]] std::size_t points() const noexcept { return points_; }
  [[nodiscard]] std::uint64_t outputs(std::uint64_t blocks) const noexcept {
    const std::uint64_t samples = blocks * kept_;
    if (interpolator_) return static_cast<std::uint64_t>(interpolator_->outputs(samples));
    return narrow_ ? narrow_->outputs(0, samples) : samples;
  }
  /// In samples of the backward transform.
  [[nodiscard]] double latency() const noexcept {
    if (interpolator_) return static_cast<double>(interpolator_->latency());
    return narrow_ ? narrow_->latency(0) : 0;
  }

  [[nodiscard]] std::size_t filters() const noexcept {
    if (way_ == channel_way::whole) return 0;
    return narrow_ ? 1 + narrow_->filters(0) : interpolator_ ? 2 : 1;
  }

  void run(block_bins<output> bins, std::int64_t block, team &with, std::span<output> &room) {
    if (block < 0 && way_ == channel_way::exact) return;
    output *const work = with.work.data();
    const auto begin = first_ + block * hop_;
    const std::complex<double> phase = on_circle(-(shift_ * begin).value());
    const real_of<Sample> *gains = gains_.data();
    for (const bin_run &run : runs_) {
      weigh_and_rotate(bins, run.from, gains, phase, work + run.to, run.count);
      gains += 2 * run.count;
    }
    std::fill(work + empty_first_, work + empty_first_ + empty_count_, output{});
    with.transform(points_).backward(work);

    if (way_ == channel_way::exact) {
      const std::size_t count = std::min(kept_, room.size());
      if (turns_.size() != 0)
        multiply_bins(work + lead_, turns_.data(), room.data(), count);
      else
        std::copy_n(work + lead_, count, room.data());
      room = room.subspan(count);
      return;
    }
    const std::span<output> samples(work + lead_, kept_);
    if (turns_.size() != 0) multiply_bins(samples.data(), turns_.data(), kept_);
    if (block < 0) {
      lead_in(samples);
    } else if (narrow_) {
      narrow_->process(samples, &room);
    } else {
      const wide_unsigned given = interpolator_->next_outputs(kept_);
      const auto count = static_cast<std::size_t>(std::min<wide_unsigned>(given, room.size()));
      interpolator_->process(samples, room.first(count));
      room = room.subspan(count);
    }
  }

  /// Fills the room with what silence gives; there is reset only behind that.
  void end_in_silence(std::span<output> &room) {
    if (narrow_) return narrow_->flush(&room);
    if (!interpolator_) {
      std::fill(room.begin(), room.end(), output{});
      return;
    }
    static constexpr std::array<output, 64> silence{};
    while (!room.empty()) {
      const wide_unsigned given = interpolator_->next_outputs(silence.size());
      const auto count = static_cast<std::size_t>(std::min<wide_unsigned>(given, room.size()));
      interpolator_->process(silence, room.first(count));
      room = room.subspan(count);
    }
  }
  void reset() noexcept {
    if (interpolator_) interpolator_->reset();
    if (narrow_) narrow_->reset();
  }
  void save(const std::function<void(std::span<const std::byte>)> &put) const {
    if (interpolator_) put(std::as_bytes(interpolator_->past()));
    if (narrow_) narrow_->save(put);
  }
  void load(std::uint64_t blocks, const std::function<void(std::span<std::byte>)> &take) {
    if (interpolator_) {
      std::vector<output> past(interpolator_->past().size());
      take(std::as_writable_bytes(std::span(past)));
      interpolator_->set_past(blocks * kept_, past);
    }
    if (narrow_) narrow_->load(blocks * kept_, take);
  }

 private:
  /// Of block -1.
  void lead_in(std::span<const output> samples) {
    if (narrow_) return narrow_->lead_in(samples);
    const auto last = samples.last(std::min(samples.size(), past_.size()));
    std::copy(last.begin(), last.end(), past_.elements().last(last.size()).begin());
    interpolator_->set_past(0, past_.elements());
  }
  void make_gains(const band_edges &edges, double rejection, double turn, std::int64_t centre, std::size_t points) {
    const auto length = static_cast<double>(points);
    const auto first = static_cast<std::int64_t>(std::ceil(turn - edges.stop * length));
    const auto last = static_cast<std::int64_t>(std::floor(turn + edges.stop * length));
    const std::size_t count = std::min({static_cast<std::size_t>(last - first + 1), points, points_});
    std::vector<double> gains(count);
    band_filter(edges, rejection).make_gains((static_cast<double>(first) - turn) / length, 1 / length, gains);
    gains_ = qsrfhs::aligned_buffer<real_of<Sample>>(2 * count);
    for (std::size_t k = 0; k < count; ++k)
      gains_.data()[2 * k] = gains_.data()[2 * k + 1] = static_cast<real_of<Sample>>(gains[k] / length);
    runs_ = runs_of(first, count, centre, points, points_);
    empty_first_ = static_cast<std::size_t>(first + static_cast<std::int64_t>(count));
    empty_count_ = points_ - count;
  }

  channel_way way_;
  std::size_t points_;
  std::size_t lead_ = 0, kept_ = 0;  // of a block's outputs, dropped at either end, and between
  std::int64_t first_ = 0, hop_ = 0;
  exact_cycles shift_;
  qsrfhs::aligned_buffer<real_of<Sample>> gains_;
  std::vector<bin_run> runs_;
  std::size_t empty_first_ = 0, empty_count_ = 0;
  qsrfhs::aligned_buffer<output> turns_;
  std::optional<interpolator<output>> interpolator_;
  qsrfhs::aligned_buffer<output> past_;  // for the interpolator, in front of the stream
  std::unique_ptr<channelizer<output>> narrow_;
};

template <class Sample>
channelizer<Sample>::channelizer(std::span<const channel_request> channels, double rejection, std::size_t threads)
    : plan_(plan_channels(channels, rejection)) {
  const qsrfhs::mkl_runtime::use in_use;
  channels_.reserve(channels.size());
  std::vector<std::size_t> through_blocks;
  for (std::size_t k = 0; k < channels.size(); ++k) {
    channels_.emplace_back(channels[k], plan_.steps[k], plan_, rejection);
    const channel_way way = channels_.back().way();
    if (way != channel_way::whole) through_blocks.push_back(k);
    if (way == channel_way::interpolated || way == channel_way::coarse) first_block_ = -1;
  }
  if (through_blocks.empty()) return;

  dfti_settings settings;
  settings.precision = sizeof(real_of<Sample>) == sizeof(double) ? DFTI_DOUBLE : DFTI_SINGLE;
  settings.in_place = true;
  const auto make = [&](std::size_t points) {
    settings.lengths[0] = static_cast<MKL_LONG>(points);
    return dfti_descriptor(settings);
  };
  std::size_t room = plan_.points;
  if (is_complex<Sample> && is_split<Sample>(plan_.points)) {
    split_.emplace(plan_.points);
    in_place_ = make(split_->row());
    room = split_->radix * split_->stride();
  } else if constexpr (is_complex<Sample>) {
    in_place_ = make(plan_.points);
  } else {
    apart_.emplace(plan_.points);
    block_ = qsrfhs::aligned_buffer<Sample>(plan_.points);
  }
  held_ = qsrfhs::aligned_buffer<Sample>(plan_.points);
  bins_ = qsrfhs::aligned_buffer<output>(room);
  teams_.resize(std::min(threads, through_blocks.size()));
  for (std::size_t k = 0; k < through_blocks.size(); ++k)
    teams_[k % teams_.size()].members.push_back(through_blocks[k]);
  for (team &each : teams_) {
    std::size_t most = 0;
    for (const std::size_t member : each.members) {
      const std::size_t points = channels_[member].points();
      most = std::max(most, points);
      const auto is_it = [=](const auto &t) { return t.first == points; };
      if (std::none_of(each.transforms.begin(), each.transforms.end(), is_it))
        each.transforms.emplace_back(points, make(points));
    }
    each.work = qsrfhs::aligned_buffer<output>(most);
  }
  begin();
}

template <class Sample>
channelizer<Sample>::~channelizer() = default;

/// Nothing is held where no channel goes through blocks, otherwise the first block's silence.
template <class Sample>
void channelizer<Sample>::begin() noexcept {
  next_block_ = first_block_;
  held_count_ = held_of(0);
  std::fill_n(held_.data(), held_.size(), Sample{});
  inputs_ = 0;
}

/// Of the stream's first n samples and the silence in front of them, what lies in the next block.
template <class Sample>
std::size_t channelizer<Sample>::held_of(std::uint64_t n) const noexcept {
  return teams_.empty() ? 0 : static_cast<std::size_t>(static_cast<std::int64_t>(n) - begin_of_next());
}

template <class Sample>
std::int64_t channelizer<Sample>::begin_of_next() const noexcept {
  return next_block_ * static_cast<std::int64_t>(plan_.hop()) - static_cast<std::int64_t>(plan_.overlap / 2);
}

template <class Sample>
void channelizer<Sample>::lead_in(std::span<const Sample> x) noexcept {
  x = x.last(std::min(x.size(), held_count_));
  std::copy(x.begin(), x.end(), held_.elements().first(held_count_).last(x.size()).begin());
}

template <class Sample>
std::uint64_t channelizer<Sample>::blocks(std::uint64_t n) const noexcept {
  if (teams_.empty()) return 0;
  const std::uint64_t behind = plan_.overlap / 2;
  return n < behind ? 0 : (n - behind) / plan_.hop();
}

template <class Sample>
std::uint64_t channelizer<Sample>::outputs(std::size_t index, std::uint64_t n) const noexcept {
  const channel &of = channels_[index];
  return of.way() == channel_way::whole ? n : of.outputs(blocks(n));
}

template <class Sample>
double channelizer<Sample>::latency(std::size_t index) const noexcept {
  const channel &of = channels_[index];
  if (of.way() == channel_way::whole) return 0;
  const auto points = static_cast<double>(plan_.points);
  return points - static_cast<double>(plan_.overlap) / 2 + of.latency() * points / static_cast<double>(of.points());
}

template <class Sample>
std::size_t channelizer<Sample>::filters(std::size_t index) const noexcept {
  return channels_[index].filters();
}

template <class Sample>
void channelizer<Sample>::process(std::span<const Sample> in, std::span<output> *rooms) {
  const qsrfhs::mkl_runtime::use in_use;
  for (std::size_t k = 0; k < channels_.size(); ++k) {
    if (channels_[k].way() != channel_way::whole) continue;
    const std::size_t count = std::min(in.size(), rooms[k].size());
    std::copy_n(in.begin(), count, rooms[k].begin());
    rooms[k] = rooms[k].subspan(count);
  }
  inputs_ += in.size();
  if (teams_.empty()) return;
  while (in.size() >= plan_.points - held_count_) {
    if (held_count_ == 0) {
      run_block(in.data(), rooms);
      in = in.subspan(plan_.hop());
      continue;
    }
    const std::size_t taken = plan_.points - held_count_;
    std::copy_n(in.data(), taken, held_.data() + held_count_);
    run_block(held_.data(), rooms);
    // The next block lies in these samples alone, where they reach as far back as it does.
    const bool is_behind = taken >= plan_.overlap;
    in = in.subspan(is_behind ? taken - plan_.overlap : taken);
    if (is_behind)
      held_count_ = 0;
    else
      hold_overlap();
  }
  std::copy(in.begin(), in.end(), held_.data() + held_count_);
  held_count_ += in.size();
}

template <class Sample>
void channelizer<Sample>::flush(std::span<output> *rooms) {
  const qsrfhs::mkl_runtime::use in_use;
  // Blocks that begin behind the stream's last sample are silent, however long a narrow channel's filter is.
  while (!teams_.empty() && begin_of_next() < static_cast<std::int64_t>(inputs_)) {
    const std::span<Sample> silence = held_.elements().subspan(held_count_);
    std::fill(silence.begin(), silence.end(), Sample{});
    run_block(held_.data(), rooms);
    hold_overlap();
  }
  for (std::size_t k = 0; k < channels_.size(); ++k) channels_[k].end_in_silence(rooms[k]);
  reset();
}

/// Of the block that is held in full, what the next one begins with.
template <class Sample>
void channelizer<Sample>::hold_overlap() noexcept {
  std::copy_n(held_.data() + plan_.hop(), plan_.overlap, held_.data());
  held_count_ = plan_.overlap;
}

/// A block to bins of the whole band.
template <class Sample>
void channelizer<Sample>::transform(const Sample *samples) {
  if constexpr (is_complex<Sample>) {
    if (split_) {
      split(samples, split_->with(nullptr), bins_.data());
      qsrfhs::mkl_section around;
      for (std::size_t r = 0; r < split_->radix; ++r) {
        in_place_.forward(bins_.data() + r * split_->stride(), around);
        around.let_forks_pass();
      }
      return;
    }
    std::copy_n(samples, plan_.points, bins_.data());
    in_place_.forward(bins_.data());
  } else {
    std::copy_n(samples, plan_.points, block_.data());
    apart_->forward(block_.data(), bins_.data());
    for (std::size_t k = 1; k < plan_.points - plan_.points / 2; ++k)
      bins_.data()[plan_.points - k] = std::conj(bins_.data()[k]);
  }
}

template <class Sample>
void channelizer<Sample>::run_block(const Sample *samples, std::span<output> *rooms) {
  transform(samples);
  const std::int64_t block = next_block_++;
  const block_bins<output> bins{bins_.data(), split_ ? split_->stride() : 0};
  const auto run_team = [&](std::size_t index) {
    const qsrfhs::mkl_runtime::use in_use;
    team &with = teams_[index];
    for (const std::size_t member : with.members) channels_[member].run(bins, block, with, rooms[member]);
  };
  if (teams_.size() == 1)
    run_team(0);
  else
    run_parts(teams_.size(), run_team);
}

template <class Sample>
void channelizer<Sample>::reset() noexcept {
  begin();
  for (channel &each : channels_) each.reset();
}

template <class Sample>
void channelizer<Sample>::save(const std::function<void(std::span<const std::byte>)> &put) const {
  put(std::as_bytes(held_.elements().first(held_count_)));
  for (const channel &each : channels_) each.save(put);
}

template <class Sample>
void channelizer<Sample>::load(std::uint64_t inputs, const std::function<void(std::span<std::byte>)> &take) {
  begin();
  inputs_ = inputs;
  if (inputs >= plan_.overlap / 2) next_block_ = static_cast<std::int64_t>(blocks(inputs));
  held_count_ = held_of(inputs);
  take(std::as_writable_bytes(held_.elements().first(held_count_)));
  for (channel &each : channels_) each.load(blocks(inputs), take);
}

template class channelizer<float>;
template class channelizer<double>;
template class channelizer<std::complex<float>>;
template class channelizer<std::complex<double>>;

}  // namespace dsp
