// SPDX-License-Identifier: MIT
#include "analysis/spectrum_pieces.hpp"

#include <algorithm>
#include <complex>
#include <span>
#include <utility>

#include "recording/sample_reader.hpp"
#include "terminal/interruption.hpp"

namespace tool {
namespace {

/// What is added at once stays in the second-level cache, unless segments are longer.
std::size_t samples_at_once(const lumra::spectrum_settings &settings) noexcept {
  return static_cast<std::size_t>(std::max(std::uint64_t{1} << 15, 4 * settings.points));
}

std::uint64_t threads_for(const lumra::spectrum_settings &settings) noexcept {
  return settings.threads != 0 ? settings.threads : std::thread::hardware_concurrency();
}

/// Reads and averages pieces one after the other.
template <class Sample>
class piece_reader {
 public:
  piece_reader(const recording::source &source, std::size_t at_once)
      : reader_(source, 0, source.samples), samples_(at_once) {}

  /// Of one stretch, whose samples are there: the reader throws where the file became shorter.
  void add(std::uint64_t first, std::uint64_t count, spectrum_accumulator &average) {
    reader_.seek(first);
    for (std::uint64_t done = 0; done < count; done += samples_.size()) {
      const auto wanted = static_cast<std::size_t>(std::min<std::uint64_t>(count - done, samples_.size()));
      const std::size_t got = reader_.read(std::span(samples_).first(wanted));
      average.add({samples_.data(), got, sizeof(Sample), first + done, false});
    }
  }

 private:
  recording::sample_reader reader_;
  std::vector<Sample> samples_;
};

}  // namespace

bool spectrum_pieces::pay(const recording::source &source, const selection &chosen,
                          const lumra::spectrum_settings &settings) {
  constexpr std::uint64_t each = 2;  // fewer end too far apart
  const std::uint64_t threads = threads_for(settings);
  return threads > 1 && source.ranged && chosen.samples / usual_size(settings) >= each * threads;
}

spectrum_pieces::spectrum_pieces(const recording::source &source, const selection &chosen,
                                 const lumra::spectrum_settings &settings, std::uint64_t size)
    : source_(source), stretches_(chosen.stretches), settings_(settings) {
  const std::uint64_t threads = threads_for(settings);
  settings_.threads = 1;
  std::size_t stretch = 0;
  for (std::uint64_t start = 0, origin = 0; start < chosen.samples; start += size) {
    while (start - origin >= stretches_[stretch].samples) origin += stretches_[stretch++].samples;
    pieces_.push_back({stretch, start, origin, std::min(size, chosen.samples - start)});
  }
  results_.resize(static_cast<std::size_t>(2 * threads));
  const held_signals for_the_other_threads;  // which inherit them: handlers run in this one
  for (std::uint64_t k = 0; k < threads; ++k)
    threads_.emplace_back([this](const std::stop_token &stopped) { work(stopped); });
}

template <class Reader>
spectrum_accumulator spectrum_pieces::average_of(const piece &of, Reader &reader) const {
  lumra::spectrum_settings settings = settings_;
  settings.start = of.start;
  settings.origin = of.origin;
  spectrum_accumulator average(settings, !source_.format.is_complex);
  std::uint64_t skipped = of.start - of.origin;
  auto over = stretches_.begin() + static_cast<std::ptrdiff_t>(of.stretch);
  for (std::uint64_t left = of.samples; left > 0; ++over, skipped = 0) {
    if (left < of.samples) average.gap();
    const std::uint64_t count = std::min(over->samples - skipped, left);
    reader.add(over->first + skipped, count, average);
    left -= count;
  }
  return average;
}

void spectrum_pieces::work(const std::stop_token &stopped) {
  const auto average_pieces = [&](auto sample) {
    std::optional<piece_reader<decltype(sample)>> reader;
    for (;;) {
      std::unique_lock lock(mutex_);
      const auto has_room = [&] { return taken_ == pieces_.size() || taken_ < given_ + results_.size(); };
      if (!changed_.wait(lock, stopped, has_room) || taken_ == pieces_.size()) return;
      const std::size_t k = taken_++;
      lock.unlock();

      result made;
      try {
        if (!reader) reader.emplace(source_, samples_at_once(settings_));
        made.average = average_of(pieces_[k], *reader);
      } catch (...) {
        made.failure = std::current_exception();
      }
      lock.lock();
      results_[k % results_.size()] = std::move(made);
      changed_.notify_all();
    }
  };
  if (source_.format.is_complex)
    average_pieces(std::complex<float>());
  else
    average_pieces(float());
}

std::optional<spectrum_pieces::averaged_piece> spectrum_pieces::next() {
  if (given_ == pieces_.size()) return std::nullopt;
  std::unique_lock lock(mutex_);
  result &expected = results_[given_ % results_.size()];
  changed_.wait(lock, [&] { return expected.is_there(); });
  result got = std::exchange(expected, {});
  if (got.failure) std::rethrow_exception(got.failure);
  const std::uint64_t samples = pieces_[given_++].samples;
  changed_.notify_all();
  return averaged_piece{std::move(*got.average), samples};
}

}  // namespace tool
