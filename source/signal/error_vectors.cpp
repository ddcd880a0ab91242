// SPDX-License-Identifier: MIT
#include "signal/error_vectors.hpp"

#include <algorithm>
#include <array>
#include <atomic>
#include <cmath>
#include <limits>
#include <vector>

#include "qsrfhs/math/mkl_runtime.hpp"
#include "signal/rotation.hpp"
#include "signal/workers.hpp"

namespace dsp {
namespace {

using wide = std::complex<double>;

/// Calls visit(first, carried) run by run over the part: the reference as the model delays it, on the model's carrier.
template <class Sample, class Visit>
void walk_carried(delayed_reference<Sample> &reference, const stretch &part, const stream_model &model, Visit visit) {
  constexpr std::size_t run = error_sums::longest_run;
  reference.walk(part, model.delay, slopes::left_out, [&](std::size_t first, std::span<const wide> values, auto) {
    std::array<wide, run> room;
    for (std::size_t begin = 0; begin < values.size(); begin += run) {
      const auto delayed = values.subspan(begin, std::min(run, values.size() - begin));
      std::span<const wide> carried = delayed;
      if (model.frequency != 0) {
        rotate(delayed, model.frequency, static_cast<double>(first + begin), 1, room);
        carried = {room.data(), delayed.size()};
      }
      visit(first + begin, carried);
    }
  });
}

/// sum(part) of the pieces of a stretch. The sums stand in the order of the pieces, which lie at fixed places: added in
/// that order, they have the same bits for any number of threads.
template <class Sum>
auto sum_pieces(const stretch &all, std::size_t piece, std::size_t threads, Sum sum) {
  std::vector<decltype(sum(all))> sums((all.count() + piece - 1) / piece);
  std::atomic<std::size_t> next{0};
  run_parts(std::min(threads, sums.size()), [&](std::size_t) {
    const qsrfhs::mkl_runtime::use in_use;
    for (std::size_t k = next++; k < sums.size(); k = next++) {
      const std::size_t first = all.first + k * piece;
      sums[k] = sum(stretch{first, std::min(first + piece, all.last)});
    }
  });
  return sums;
}

/// Samples of a piece of what is compared: a delayed reference is there as a whole.
std::size_t piece_of(const stretch &compared, const alignment &wanted) noexcept {
  constexpr std::size_t usual = 16384;
  return wanted.searched() ? std::max<std::size_t>(compared.count(), 1) : usual;
}

template <class Real>
void fill_ends(const error_traces<Real> &traces, std::size_t n, const stretch &compared) noexcept {
  constexpr Real nan = std::numeric_limits<Real>::quiet_NaN();
  const auto fill = [&](auto *trace, auto value) {
    if (!trace) return;
    std::fill_n(trace, compared.first, value);
    std::fill(trace + compared.last, trace + n, value);
  };
  fill(traces.error, std::complex<Real>(nan, nan));
  fill(traces.magnitude, nan);
  fill(traces.phase, nan);
}

template <class Real>
void measure_model(delayed_reference<std::complex<Real>> &delayed, std::span<const std::complex<Real>> measured,
                   const stretch &compared, std::size_t piece, std::size_t threads, const error_traces<Real> &traces,
                   error_figures &figures) {
  const double scale = 1 / figures.reference_rms;
  const auto pieces = sum_pieces(compared, piece, threads, [&](const stretch &part) {
    error_sums own;
    walk_carried(delayed, part, figures.model, [&](std::size_t first, std::span<const wide> carried) {
      own.add(carried, measured.data() + first, figures.model, first, scale, traces.from(first));
    });
    return own;
  });
  error_sums sums;
  for (const error_sums &own : pieces) sums.add(own);
  const auto count = static_cast<double>(compared.count());
  figures.peak = sums.peak;
  figures.rms = std::sqrt(sums.error / count);
  figures.magnitude_rms = std::sqrt(sums.magnitude / count);
  figures.phase_rms = std::sqrt(sums.phase / count);
  fill_ends(traces, measured.size(), compared);
}

/// Records that delayed_reference takes as a whole, and those that need no search.
template <class Real>
error_outcome measure_whole(std::span<const std::complex<Real>> reference, std::span<const std::complex<Real>> measured,
                            const alignment &wanted, std::size_t threads, const error_traces<Real> &traces,
                            error_figures &figures) {
  delayed_reference<std::complex<Real>> delayed(reference);
  if (wanted.searched()) {
    const alignment_outcome outcome = find_delay_and_frequency(reference, measured, wanted, delayed, figures.model);
    if (outcome == alignment_outcome::unrelated) return error_outcome::unrelated;
    if (outcome == alignment_outcome::undetermined) return error_outcome::undetermined;
  }
  const stretch compared = wanted.delay ? delayed.known(figures.model.delay) : stretch{0, reference.size()};
  figures.compared = {compared.first, compared.last};
  const std::size_t piece = piece_of(compared, wanted);
  const auto pieces = sum_pieces(compared, piece, threads, [&](const stretch &part) {
    stream_moments own;
    walk_carried(delayed, part, figures.model, [&](std::size_t first, std::span<const wide> carried) {
      own.add(carried, {}, measured.data() + first, static_cast<double>(first));
    });
    return own;
  });
  stream_moments all;
  for (const stream_moments &own : pieces) all.add(own);
  const auto count = static_cast<double>(compared.count());
  figures.reference_rms = std::sqrt(all.reference / count);
  model_change change;
  const error_outcome outcome =
      fit_model(all, count, {wanted.gain, false, false, wanted.dc}, wanted.searched(), figures.model, change);
  if (outcome == error_outcome::measured) measure_model(delayed, measured, compared, piece, threads, traces, figures);
  return outcome;
}

/// A part of n samples that is as long as it may be, with this one in its middle.
positions around(const positions &part, double reach, std::uint64_t n) noexcept {
  if (!(reach < static_cast<double>(n))) return {0, n};
  const auto count = static_cast<std::uint64_t>(reach);
  const std::uint64_t middle = part.first + part.count() / 2;
  const std::uint64_t first = std::min(middle - std::min(middle, count / 2), n - count);
  return {first, first + count};
}

/// Longer records, beginning where the reference has the most energy.
template <class Real>
class long_record {
 public:
  using samples = std::span<const std::complex<Real>>;

  long_record(samples reference, samples measured, const alignment &wanted, std::size_t threads) noexcept
      : reference_(reference), measured_(measured), wanted_(wanted), threads_(threads) {}

  error_outcome align(stream_model &model) const {
    positions part = loudest();
    error_figures begun;
    const error_outcome found =
        measure_whole<Real>(of(reference_, part), of(measured_, part), wanted_, threads_, {}, begun);
    if (found != error_outcome::measured) return found;
    model.delay = begun.model.delay;
    model.frequency = begun.model.frequency;
    constexpr int most_rounds = 24;
    const std::uint64_t n = reference_.size();
    for (int round = 0; round < most_rounds; ++round) {
      const error_totals totals = sum(part, model, wanted_.delay);
      const positions compared = wanted_.delay ? known_positions(part, model.delay) : part;
      model_refinement refined;
      const error_outcome outcome = totals.refine(part, compared, wanted_, model, refined);
      if (outcome != error_outcome::measured) return outcome;
      model = refined.model;
      if (part.count() == n && refined.settled) break;
      part = around(part, refined.reach, n);
    }
    return error_outcome::measured;
  }

  error_outcome measure(const stream_model &model, const error_traces<Real> &traces, error_figures &figures) const {
    const positions all{0, reference_.size()};
    const positions compared = model.delay != 0 ? known_positions(all, model.delay) : all;
    const error_outcome outcome = sum(all, model, false, traces).read(compared, model, figures);
    if (outcome != error_outcome::measured) return outcome;
    const double scale = 1 / figures.reference_rms;
    for (std::size_t k = compared.first; k < compared.last; ++k) {
      if (traces.error) traces.error[k] = std::complex<Real>(wide(traces.error[k]) * scale);
      if (traces.magnitude) traces.magnitude[k] = static_cast<Real>(static_cast<double>(traces.magnitude[k]) * scale);
    }
    fill_ends(traces, reference_.size(), {compared.first, compared.last});
    return outcome;
  }

 private:
  static samples of(samples x, const positions &part) noexcept { return x.subspan(part.first, part.count()); }

  [[nodiscard]] positions loudest() const noexcept {
    constexpr std::size_t length = delayed_reference<std::complex<Real>>::longest;
    positions best{0, length};
    double most = -1;
    for (std::size_t first = 0; first < reference_.size(); first += length) {
      const std::size_t begin = std::min(first, reference_.size() - length);
      double energy = 0;
      for (const auto &v : reference_.subspan(begin, length)) energy += std::norm(wide(v));
      if (energy <= most || std::isnan(energy)) continue;
      most = energy;
      best = {begin, begin + length};
    }
    return best;
  }

  [[nodiscard]] error_totals sum(const positions &part, const stream_model &model, bool with_slopes,
                                 const error_traces<Real> &traces = {}) const {
    const std::uint64_t begin = part.first / error_block::length;
    const std::uint64_t blocks = (part.last + error_block::length - 1) / error_block::length - begin;
    std::vector<error_totals> totals(std::min<std::uint64_t>(threads_, blocks));
    std::atomic<std::uint64_t> next{0};
    run_parts(totals.size(), [&](std::size_t thread) {
      block_comparison<Real> comparison(model, with_slopes);
      for (std::uint64_t k = next++; k < blocks; k = next++) {
        const error_block block(begin + k, part);
        totals[thread].add(comparison.compare(of(reference_, block.around), of(measured_, block.around),
                                              block.around.first, block.part(), traces.from(block.around.first)));
      }
    });
    for (std::size_t thread = 1; thread < totals.size(); ++thread) totals.front().add(totals[thread]);
    return totals.front();
  }

  samples reference_, measured_;
  const alignment &wanted_;
  std::size_t threads_;
};

}  // namespace

template <class Real>
error_outcome measure_errors(std::span<const std::complex<Real>> reference,
                             std::span<const std::complex<Real>> measured, const alignment &wanted, std::size_t threads,
                             const error_traces<Real> &traces, error_figures &figures) {
  using sample = std::complex<Real>;
  if (std::all_of(reference.begin(), reference.end(), [](const sample &v) { return v == Real(0); }))
    return error_outcome::silent_reference;
  const qsrfhs::mkl_runtime::use in_use;
  if (!wanted.searched() || reference.size() <= delayed_reference<sample>::longest)
    return measure_whole(reference, measured, wanted, thread_count(threads), traces, figures);
  const long_record<Real> record(reference, measured, wanted, thread_count(threads));
  stream_model model;
  const error_outcome outcome = record.align(model);
  return outcome == error_outcome::measured ? record.measure(model, traces, figures) : outcome;
}

template <class Real>
void trace_errors(std::span<const std::complex<Real>> reference, std::span<const std::complex<Real>> measured,
                  std::uint64_t position, const stream_model &model, const error_traces<Real> &traces) {
  const qsrfhs::mkl_runtime::use in_use;
  block_comparison<Real> comparison(model, false);
  const positions all{0, reference.size()};
  const positions known = comparison.is_delayed() ? known_positions(all, model.delay) : all;
  (void)comparison.compare(reference, measured, position, {0, reference.size()}, traces);
  fill_ends(traces, reference.size(), {known.first, known.last});
}

#define INSTANCES(REAL)                                                                                               \
  template error_outcome measure_errors(std::span<const std::complex<REAL>>, std::span<const std::complex<REAL>>,     \
                                        const alignment &, std::size_t, const error_traces<REAL> &, error_figures &); \
  template void trace_errors(std::span<const std::complex<REAL>>, std::span<const std::complex<REAL>>, std::uint64_t, \
                             const stream_model &, const error_traces<REAL> &);
INSTANCES(float)
INSTANCES(double)
#undef INSTANCES

}  // namespace dsp
