// SPDX-License-Identifier: MIT
#include "toolkit/position.hpp"

#include <algorithm>
#include <array>
#include <deque>

#include "toolkit/toolkit_test.hpp"

namespace {

using namespace tests;

struct setting {
  float ratio = 1;
  float delay = 0;
  int interpolation = 0;
  int phases = 16;
  int stretched = 0;
};

/// A resampler with its arrays.
template <class E>
struct stream {
  using F = toolkit::magnitude_of<E>;

  setting how;
  array_of<F> h, taps;
  array_of<E> history, out;
  float time = -1;
  std::array<unsigned char, LUMRA_RESAMPLER_STATE_SIZE + 1> memory{};
  void *state = memory.data() + 1;  // at an odd address

  stream(const setting &s, const std::vector<double> &prototype)
      : how(s), h(filled<F>({prototype.begin(), prototype.end()})) {}

  std::int32_t run(array_of<E> &in, bool reset) {
    const lumra_resampler_parameters parameters{how.ratio, how.delay, how.interpolation};
    return family<E>::resample(in.handle(), h.handle(), how.phases, reset ? &parameters : nullptr, reset, how.stretched,
                               out.handle(), &time, history.handle(), taps.handle(), state);
  }
  template <class T>
  [[nodiscard]] T field(std::size_t offset) const {
    T value;
    std::memcpy(&value, static_cast<unsigned char *>(state) + offset, sizeof value);
    return value;
  }
  template <class T>
  void corrupt(std::size_t offset, T value) {
    std::memcpy(static_cast<unsigned char *>(state) + offset, &value, sizeof value);
  }
  [[nodiscard]] bool cleared() {
    return history.elements().empty() && taps.elements().empty() && time == 0 &&
           std::all_of(memory.begin() + 1, memory.end(), [](unsigned char byte) { return byte == 0; });
  }
};

/// A low-pass with a Kaiser window, its cutoff as a part of the input's Nyquist frequency; sums to 1.
std::vector<double> kaiser(int length, int phases, double cutoff, double beta) {
  std::vector<double> h(static_cast<std::size_t>(length));
  double sum = 0;
  for (int i = 0; i < length; ++i) {
    const double r = 2.0 * i / (length - 1) - 1, t = (i - (length - 1) / 2.0) / phases * cutoff * std::numbers::pi;
    h[static_cast<std::size_t>(i)] =
        (t == 0 ? 1 : std::sin(t) / t) * std::cyl_bessel_i(0.0, beta * std::sqrt(1 - r * r));
    sum += h[static_cast<std::size_t>(i)];
  }
  for (double &c : h) c /= sum;
  return h;
}

/// The outputs by their definition, with all positions from the beginning.
reference definition(const setting &s, const std::vector<double> &h, const reference &x) {
  const double ratio = static_cast<double>(s.ratio), last = static_cast<double>(h.size() - 1);
  const double step = s.phases / (s.stretched ? std::max(ratio, 1.0) : 1.0);
  const double outputs =
      std::ceil((static_cast<double>(x.size()) - last / 2 / step - static_cast<double>(s.delay)) / ratio);
  reference y(outputs > 0 ? static_cast<std::size_t>(outputs) : 0);
  for (std::size_t k = 0; k < y.size(); ++k) {
    const double p = static_cast<double>(s.delay) + static_cast<double>(k) * ratio;
    for (std::size_t j = 0; j < x.size(); ++j) {
      const double t = last / 2 + step * (static_cast<double>(j) - p);
      if (t < 0 || t > last) continue;
      const auto i = static_cast<std::size_t>(t);
      const double between = h[i] + (t - static_cast<double>(i)) * (h[std::min(i + 1, h.size() - 1)] - h[i]);
      y[k] += step * x[j] * (s.interpolation == 1 ? h[static_cast<std::size_t>(t + 0.5)] : between);
    }
  }
  return y;
}

template <class E>
class Resample : public toolkit_test<E> {
 protected:
  static std::vector<toolkit::value_of<E>> in_blocks(stream<E> &s, const std::vector<toolkit::value_of<E>> &record,
                                                     std::size_t block) {
    std::vector<toolkit::value_of<E>> all;
    for (std::size_t first = 0; first < record.size(); first += block) {
      const auto begin = record.begin() + static_cast<std::ptrdiff_t>(first);
      array_of<E> in = filled<E>({begin, begin + static_cast<std::ptrdiff_t>(std::min(block, record.size() - first))});
      EXPECT_EQ(0, s.run(in, first == 0));
      const double time =
          static_cast<double>(s.how.delay) + static_cast<double>(s.how.ratio) * static_cast<double>(all.size());
      EXPECT_FLOAT_EQ(static_cast<float>(time), s.time);
      const auto got = values<E>(s.out);
      all.insert(all.end(), got.begin(), got.end());
    }
    return all;
  }
};
TYPED_TEST_SUITE(Resample, all_letters);

TYPED_TEST(Resample, AgreesWithTheDefinitionHoweverTheStreamIsCut) {
  using E = TypeParam;
  std::vector<double> lopsided(33);
  for (std::size_t i = 0; i < lopsided.size(); ++i) lopsided[i] = static_cast<double>((i * 7 + 3) % 16) / 64;
  const std::vector<std::vector<double>> prototypes = {
      kaiser(128, 16, 0.8, 6), kaiser(129, 16, 0.8, 6), lopsided, {0.5}};
  const auto record = noise<E>(200);
  for (const auto &h : prototypes) {
    for (const float ratio : {1.F, 0.5F, 0.731F, 1.37F, 2.F, 17.3F, 250.F}) {
      for (const float delay : {0.F, 0.25F, 13.7F, 230.F}) {
        for (const int mode : {0, 1, 2}) {
          for (const int stretched : {0, 1}) {
            SCOPED_TRACE(testing::Message() << h.size() << " coefficients, ratio " << ratio << ", delay " << delay
                                            << ", mode " << mode << ", stretched " << stretched);
            const setting how{ratio, delay, mode, 16, stretched};
            stream<E> whole(how, h);
            const auto all = this->in_blocks(whole, record, record.size());
            std::vector<double> rounded(h.size());
            for (std::size_t i = 0; i < h.size(); ++i)
              rounded[i] = static_cast<double>(values<typename stream<E>::F>(whole.h)[i]);
            const auto want = definition(how, rounded, wide(record));
            ASSERT_EQ(want.size(), all.size());
            if (mode != 1 || ratio == 1.F || ratio == 0.5F || ratio == 2.F) {  // otherwise "nearest" hangs on last bits
              EXPECT_LT(error_in_epsilons<E>(all, want), 40);
            }
            for (const std::size_t block : {1U, 3U, 16U, 150U}) {
              stream<E> cut(how, h);
              const auto parts = this->in_blocks(cut, record, block);
              ASSERT_EQ(all.size(), parts.size());
              EXPECT_TRUE(all == parts) << "block " << block;
              EXPECT_EQ(whole.template field<std::int32_t>(0), cut.template field<std::int32_t>(0));
              EXPECT_EQ(whole.template field<double>(16), cut.template field<double>(16));
              EXPECT_EQ(200, cut.template field<double>(32));
            }
          }
        }
      }
    }
  }
}

TYPED_TEST(Resample, TakesHundredsOfTaps) {
  using E = TypeParam;
  const auto h = kaiser(600 * 4 + 1, 4, 0.8, 6);
  const auto record = noise<E>(900);
  for (const setting &how : {setting{0.731F, 0, 0, 4, 0}, setting{1, 0, 1, 4, 0}, setting{1.37F, 0.3F, 0, 4, 1}}) {
    // Where the step is not whole, places of taps are rounded, here and in the definition: 1e-13 of a coefficient.
    const double bound = how.stretched ? 250 : 100;
    stream<E> whole(how, h), cut(how, h);
    const auto all = this->in_blocks(whole, record, record.size());
    std::vector<double> rounded;
    for (const auto c : values<typename stream<E>::F>(whole.h)) rounded.push_back(static_cast<double>(c));
    const auto want = definition(how, rounded, wide(record));
    ASSERT_EQ(want.size(), all.size());
    EXPECT_LT(error_in_epsilons<E>(all, want), bound);
    EXPECT_TRUE(all == this->in_blocks(cut, record, 3));
  }
}

TYPED_TEST(Resample, ChannelsAreThoseOfSingleStreams) {
  using E = TypeParam;
  constexpr std::int32_t rows = 3, columns = 40;
  const setting how{1.37F, 0.3F, 0, 16, 0};
  const auto h = kaiser(128, 16, 0.8, 6);
  const auto record = noise<E>(rows * columns);
  matrix_of<E> in(rows, columns), out, history;
  std::memcpy(in.block()->elements, record.data(), record.size() * sizeof record[0]);
  stream<E> shared(how, h);
  std::deque<stream<E>> singles;
  for (int r = 0; r < rows; ++r) singles.emplace_back(how, h);
  for (const bool reset : {true, false, false}) {
    const lumra_resampler_parameters parameters{how.ratio, how.delay, how.interpolation};
    ASSERT_EQ(
        0, family<E>::resample_channels(in.handle(), shared.h.handle(), how.phases, &parameters, reset, 0, out.handle(),
                                        &shared.time, history.handle(), shared.taps.handle(), shared.state));
    ASSERT_EQ(rows, out.block()->rows);
    for (std::int32_t r = 0; r < rows; ++r) {
      const auto begin = record.begin() + r * columns;
      array_of<E> row = filled<E>({begin, begin + columns});
      auto &single = singles[static_cast<std::size_t>(r)];
      ASSERT_EQ(0, single.run(row, reset));
      ASSERT_EQ(out.block()->columns, single.out.block()->count);
      EXPECT_EQ(0, std::memcmp(out.block()->elements + r * out.block()->columns, single.out.elements().data(),
                               single.out.elements().size_bytes()));
    }
  }
}

TYPED_TEST(Resample, RefusesStatesThatNoCallHasLeft) {
  using E = TypeParam;
  constexpr double nan = std::numeric_limits<double>::quiet_NaN();
  const auto h = kaiser(64, 16, 0.8, 6);
  struct corruption {
    const char *why;
    std::int32_t code;
    void (*apply)(stream<E> &);
  };
  const corruption corruptions[] = {
      {"carried", -20059, [](stream<E> &s) { s.corrupt(0, 1000); }},
      {"carried, most", -20059, [](stream<E> &s) { s.corrupt(0, std::numeric_limits<std::int32_t>::max()); }},
      {"far behind", 0, [](stream<E> &s) { s.corrupt(0, std::numeric_limits<std::int32_t>::min()); }},
      {"position words", -20059, [](stream<E> &s) { s.corrupt(4, 0x123456789abcdef0ULL); }},
      {"position", -20059, [](stream<E> &s) { s.corrupt(16, nan); }},
      {"position 1e300", -20059, [](stream<E> &s) { s.corrupt(16, 1e300); }},
      {"position negative", -20059, [](stream<E> &s) { s.corrupt(16, -0.25); }},
      {"ratio 0", -20016, [](stream<E> &s) { s.corrupt(24, 0.0); }},
      {"ratio", -20016, [](stream<E> &s) { s.corrupt(24, nan); }},
      {"ratio 1e300", -20016, [](stream<E> &s) { s.corrupt(24, 1e300); }},
      {"consumed", -20059, [](stream<E> &s) { s.corrupt(32, nan); }},
      {"consumed negative", -20059, [](stream<E> &s) { s.corrupt(32, -1.0); }},
      {"delay", -20059, [](stream<E> &s) { s.corrupt(40, nan); }},
      {"delay negative", -20059, [](stream<E> &s) { s.corrupt(48, -3); }},
      {"history short", -20059, [](stream<E> &s) { s.history.block()->count = 1; }},
      {"history negative", -20059, [](stream<E> &s) { s.history.block()->count = -5; }},
      {"longer filter", -20075,
       [](stream<E> &s) {
         stream<E> other({1.25F}, kaiser(512, 16, 0.8, 6));
         std::swap(*s.h.handle(), *other.h.handle());
       }},
  };
  array_of<E> in = filled<E>(noise<E>(40));
  for (const corruption &c : corruptions) {
    SCOPED_TRACE(c.why);
    stream<E> s({1.25F}, h);
    ASSERT_EQ(0, s.run(in, true));
    c.apply(s);
    EXPECT_EQ(c.code, s.run(in, false));
    EXPECT_TRUE(s.out.elements().empty());
    if (c.code == 0) continue;
    EXPECT_TRUE(s.cleared());
    EXPECT_EQ(-20016, s.run(in, false));  // must reset first
  }
}

TEST(ResamplePosition, IsExactBehindManySamples) {
  using toolkit::position;
  // Advanced block by block over more than 10^9 samples it is where one multiplication puts it.
  for (const float ratio : {1.37F, 0.731F, 3.14159274F, 1e-3F}) {
    const position step = position::of(static_cast<double>(ratio));
    EXPECT_EQ(static_cast<double>(ratio), static_cast<double>(step.whole()) + step.fraction());
    position p = position::of(0.3F);
    std::int64_t whole = 0, outputs = 0;
    while (whole < 1'000'000'000) {
      const std::int64_t count = 12'345 + outputs % 1000;
      p = p + step * count;
      outputs += count;
      whole += p.whole();
      p = p - position::of_whole(p.whole());
    }
    const position at_once = position::of(0.3F) + step * outputs;
    EXPECT_EQ(at_once.whole(), whole);
    EXPECT_EQ(at_once.fraction_units(), p.fraction_units());
  }
}

}  // namespace
