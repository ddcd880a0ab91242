// SPDX-License-Identifier: MIT
#include "signal/resampler.hpp"

#include <algorithm>
#include <array>
#include <cmath>
#include <complex>
#include <utility>

namespace dsp {
namespace {

template <class Sample>
constexpr std::array<Sample, 1024> silence{};

}  // namespace

template <class Sample>
rate_change<Sample>::rate_change(const rate_ratio &output_to_input, double passband, double rejection)
    : ratio(output_to_input), plan(plan_resampling(ratio, passband, rejection)) {
  using response = qsrfhs::aligned_buffer<typename block_resampler<Sample>::bin>;
  for (const block_design &block : plan.blocks)
    responses.push_back(std::make_shared<const response>(make_response<Sample>(block)));
}

template <class Sample>
resampler<Sample>::resampler(std::shared_ptr<const rate_change<Sample>> change) : change_(std::move(change)) {
  const resampling_plan &plan = change_->plan;
  std::int64_t first = 0;
  blocks_.reserve(plan.blocks.size());
  for (std::size_t k = 0; k < plan.blocks.size(); ++k) {
    // Only what is asked for comes out of the last one.
    const bool is_last = k + 1 == plan.blocks.size() && !plan.rest;
    const std::size_t lead = is_last ? 0 : block_resampler<Sample>::lead_of(plan.blocks[k], first);
    first = blocks_.emplace_back(plan.blocks[k], change_->responses[k], first, lead).outputs_end(first);
  }
  if (plan.rest) interpolator_.emplace(*plan.rest, plan.rejection);
  if (interpolator_) past_ = qsrfhs::aligned_buffer<Sample>(interpolator_->past().size());
  reset();
}

template <class Sample>
std::int64_t resampler<Sample>::blocks_end(std::uint64_t n) const noexcept {
  auto end = static_cast<std::int64_t>(n);
  for (const auto &block : blocks_) end = block.outputs_end(end);
  return end;
}

template <class Sample>
std::uint64_t resampler<Sample>::outputs(std::uint64_t n) const noexcept {
  const auto end = static_cast<std::uint64_t>(std::max<std::int64_t>(0, blocks_end(n)));
  return interpolator_ ? static_cast<std::uint64_t>(interpolator_->outputs(end)) : end;
}

template <class Sample>
std::uint64_t resampler<Sample>::latency() const noexcept {
  double held = 0, rate = 1;  // of the samples there, relative to the input's
  for (const auto &block : blocks_) {
    const block_design &design = block.design();
    held += static_cast<double>(design.inputs() - design.guard - 1) / rate;
    rate *= static_cast<double>(design.up) / static_cast<double>(design.down);
  }
  if (interpolator_) held += static_cast<double>(interpolator_->latency()) / rate;
  return static_cast<std::uint64_t>(std::ceil(held));
}

template <class Sample>
void resampler<Sample>::process(std::span<const Sample> in, std::span<Sample> out) {
  out_ = out;
  inputs_ += in.size();
  pass(0, in);
}

template <class Sample>
void resampler<Sample>::flush(std::span<Sample> out) {
  out_ = out;
  auto end = static_cast<std::int64_t>(inputs_);
  // Behind what the stream's end reaches, every block's outputs are silence.
  for (std::size_t k = 0; k < blocks_.size(); ++k) {
    const block_resampler<Sample> &block = blocks_[k];
    for (const std::int64_t reached = block.reach(end); !out_.empty() && block.outputs_end(end) < reached;
         end += static_cast<std::int64_t>(silence<Sample>.size()))
      pass(k, silence<Sample>);
    end = block.outputs_end(end);
  }
  while (!out_.empty()) deliver(silence<Sample>);
  reset();
}

template <class Sample>
void resampler<Sample>::reset() noexcept {
  inputs_ = 0;
  for (auto &block : blocks_) block.reset();
  if (!interpolator_) return;
  interpolator_->reset();
  early_ = static_cast<std::size_t>(-blocks_end(0));
}

template <class Sample>
void resampler<Sample>::pass(std::size_t k, std::span<const Sample> x) {
  if (k == blocks_.size()) return deliver(x);
  blocks_[k].feed(x, [&](std::span<const Sample> outputs) { pass(k + 1, outputs); });
}

template <class Sample>
void resampler<Sample>::deliver(std::span<const Sample> x) {
  std::size_t count = std::min(x.size(), out_.size());
  if (interpolator_) {
    const std::size_t early = std::min(early_, x.size());
    precede(x.first(early));
    x = x.subspan(early);
    count = static_cast<std::size_t>(std::min<wide_unsigned>(interpolator_->next_outputs(x.size()), out_.size()));
    interpolator_->process(x, out_.first(count));
  } else {
    std::copy_n(x.begin(), count, out_.begin());
  }
  out_ = out_.subspan(count);
}

template <class Sample>
void resampler<Sample>::precede(std::span<const Sample> x) noexcept {
  if (x.empty()) return;
  early_ -= x.size();
  x = x.last(std::min(x.size(), past_.size()));
  const auto kept = interpolator_->past().last(past_.size() - x.size());
  std::copy(x.begin(), x.end(), std::copy(kept.begin(), kept.end(), past_.data()));
  interpolator_->set_past(0, past_.elements());
}

#define INSTANTIATE(SAMPLE)            \
  template struct rate_change<SAMPLE>; \
  template class resampler<SAMPLE>
INSTANTIATE(float);
INSTANTIATE(double);
INSTANTIATE(std::complex<float>);
INSTANTIATE(std::complex<double>);
#undef INSTANTIATE

}  // namespace dsp
