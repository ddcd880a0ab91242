// SPDX-License-Identifier: MIT
#include "toolkit/position.hpp"

#include <algorithm>
#include <array>
#include <deque>

#include "toolkit/families.hpp"
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
    return out.elements().empty() && history.elements().empty() && taps.elements().empty() && time == 0 &&
           std::all_of(memory.begin() + 1, memory.end(), [](unsigned char byte) { return byte == 0; });
  }
};

/// A low-pass with a Kaiser window, its cutoff as a part of the input's Nyquist frequency; sums to 1.
std::vector<double> kaiser(int length, int phases, double cutoff, double beta) {
  const auto bessel = [](double x) {
    double sum = 1, term = 1;
    for (int k = 1; k < 60; ++k) sum += term *= x * x / (4.0 * k * k);
    return sum;
  };
  std::vector<double> h(static_cast<std::size_t>(length));
  double sum = 0;
  for (int i = 0; i < length; ++i) {
    const double r = 2.0 * i / (length - 1) - 1, t = (i - (length - 1) / 2.0) / phases * cutoff * std::numbers::pi;
    h[static_cast<std::size_t>(i)] = (t == 0 ? 1 : std::sin(t) / t) * bessel(beta * std::sqrt(1 - r * r));
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
class Resample : public testing::Test {
 protected:
  fake_host host{fake_host::unit::elements};

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

TYPED_TEST(Resample, ConstantsPassWithUnitGain) {
  using E = TypeParam;
  for (const float ratio : {0.4F, 1.37F, 3.3F}) {
    stream<E> s({ratio, 0, 0, 64, 1}, kaiser(32 * 64 + 1, 64, 0.8, 8));
    array_of<E> in = filled<E>(std::vector<toolkit::value_of<E>>(1000, 1));
    ASSERT_EQ(0, s.run(in, true));
    const auto got = values<E>(s.out);
    const auto skip = static_cast<std::size_t>(64 / ratio);
    for (std::size_t k = skip; k + skip < got.size(); ++k) EXPECT_NEAR(1, std::abs(got[k]), 2e-4);
  }
}

TYPED_TEST(Resample, RefusesAndClears) {
  using E = TypeParam;
  constexpr float nan = std::numeric_limits<float>::quiet_NaN(), inf = std::numeric_limits<float>::infinity();
  const auto h = kaiser(64, 16, 0.8, 6);
  struct refusal {
    const char *why;
    std::int32_t code;
    setting how;
  };
  const refusal resets[] = {
      {"ratio 0", -20016, {0, -1}},           {"ratio negative", -20016, {-1}},
      {"ratio not a number", -20016, {nan}},  {"ratio infinite", -20016, {inf}},
      {"delay negative", -20059, {1, -0.5F}}, {"delay not a number", -20059, {1, nan}},
      {"delay too long", -20059, {1, 3e9F}},  {"no phases", -20061, {0, 0, 0, 0}},
      {"tiny ratio", -20001, {1e-44F}},
  };
  array_of<E> in = filled<E>(noise<E>(40)), none(std::size_t{0});
  for (const refusal &r : resets) {
    SCOPED_TRACE(r.why);
    stream<E> s(r.how, h);
    EXPECT_EQ(r.code, s.run(in, true));
    EXPECT_TRUE(s.cleared());
    EXPECT_LT(s.run(in, false), 0);  // must reset first
  }
  stream<E> empty({}, h), no_coefficients({}, {});
  EXPECT_EQ(-20003, empty.run(none, true));
  EXPECT_EQ(-20003, no_coefficients.run(in, true));
  stream<E> never({}, h);
  EXPECT_EQ(-20016, never.run(in, false));

  constexpr double not_a_number = std::numeric_limits<double>::quiet_NaN();
  const std::pair<const char *, void (*)(stream<E> &)> corruptions[] = {
      {"carried", [](stream<E> &s) { s.corrupt(0, 1000); }},
      {"carried, most", [](stream<E> &s) { s.corrupt(0, std::numeric_limits<std::int32_t>::max()); }},
      {"position words", [](stream<E> &s) { s.corrupt(4, 0x123456789abcdef0ULL); }},
      {"position", [](stream<E> &s) { s.corrupt(16, not_a_number); }},
      {"position 1e300", [](stream<E> &s) { s.corrupt(16, 1e300); }},
      {"position negative", [](stream<E> &s) { s.corrupt(16, -0.25); }},
      {"consumed", [](stream<E> &s) { s.corrupt(32, not_a_number); }},
      {"consumed negative", [](stream<E> &s) { s.corrupt(32, -1.0); }},
      {"delay", [](stream<E> &s) { s.corrupt(40, not_a_number); }},
      {"delay negative", [](stream<E> &s) { s.corrupt(48, -3); }},
      {"history short", [](stream<E> &s) { s.history.block()->count = 1; }},
      {"history negative", [](stream<E> &s) { s.history.block()->count = -5; }},
  };
  for (const auto &[why, corrupt] : corruptions) {
    SCOPED_TRACE(why);
    stream<E> s({1.25F}, h);
    ASSERT_EQ(0, s.run(in, true));
    corrupt(s);
    EXPECT_EQ(-20059, s.run(in, false));
    EXPECT_TRUE(s.cleared());
  }
  for (const double ratio : {0.0, -1.0, not_a_number, 1e300}) {
    stream<E> s({1.25F}, h);
    ASSERT_EQ(0, s.run(in, true));
    s.corrupt(24, ratio);
    EXPECT_EQ(-20016, s.run(in, false));
    EXPECT_TRUE(s.cleared());
  }
  stream<E> skipping({1.25F}, h);  // far behind: nothing to give yet
  ASSERT_EQ(0, skipping.run(in, true));
  skipping.corrupt(0, std::numeric_limits<std::int32_t>::min());
  EXPECT_EQ(0, skipping.run(in, false));
  EXPECT_EQ(0, skipping.out.block()->count);
  stream<E> longer({1.25F}, h), other({1.25F}, kaiser(512, 16, 0.8, 6));
  ASSERT_EQ(0, longer.run(in, true));
  std::swap(*longer.h.handle(), *other.h.handle());
  EXPECT_EQ(-20075, longer.run(in, false));
  EXPECT_TRUE(longer.cleared());

  for (int n = 0;; ++n) {
    stream<E> s({0.5F}, h);
    this->host.calls.clear();
    this->host.refuse_from = n;
    this->host.refuse_until = n + 1;
    const std::int32_t code = s.run(in, true);
    this->host.refuse_from = -1;
    if (static_cast<int>(this->host.calls.size()) <= n) {
      EXPECT_EQ(3, n);
      break;
    }
    EXPECT_EQ(-20001, code);
    EXPECT_TRUE(s.cleared());
  }
}

/// What is left of a resampled tone besides the tone itself, relative to it in decibels.
template <class E>
double impurity(const setting &how, const std::vector<double> &h, double frequency) {
  std::vector<toolkit::value_of<E>> tone(4000);
  for (std::size_t i = 0; i < tone.size(); ++i)
    tone[i] = toolkit::value_of<E>(std::polar(1.0, 2 * std::numbers::pi * frequency * static_cast<double>(i)));
  stream<E> s(how, h);
  array_of<E> in = filled<E>(tone);
  EXPECT_EQ(0, s.run(in, true));
  const auto y = values<E>(s.out);
  std::complex<double> amplitude = 0;
  const std::size_t skip = 200, n = y.size() - 2 * skip;
  const auto expected = [&](std::size_t k) {
    return std::polar(1.0,
                      2 * std::numbers::pi *
                          std::fmod(frequency * static_cast<double>(how.ratio) * static_cast<double>(k + skip), 1.0));
  };
  for (std::size_t k = 0; k < n; ++k)
    amplitude += std::complex<double>(y[k + skip]) * std::conj(expected(k)) / static_cast<double>(n);
  double rest = 0;
  for (std::size_t k = 0; k < n; ++k)
    rest += std::norm(std::complex<double>(y[k + skip]) - amplitude * expected(k)) / static_cast<double>(n);
  return 10 * std::log10(rest / (frequency * static_cast<double>(how.ratio) < 0.5 ? std::norm(amplitude) : 1.0));
}

TEST(ResampleQuality, RejectsImagesAndAliases) {
  fake_host host(fake_host::unit::elements);
  const auto h = kaiser(32 * 64 + 1, 64, 0.8, 9);  // 90 dB; passes up to 0.31 of the rate
  double image = -200, single = -200, nearest = -200;
  for (const double f : {0.013, 0.1, 0.2, -0.25, 0.3}) {
    image = std::max(image, impurity<toolkit::z>({0.731F, 0, 0, 64, 0}, h, f));
    single = std::max(single, impurity<toolkit::c>({0.731F, 0, 0, 64, 0}, h, f));
    nearest = std::max(nearest, impurity<toolkit::z>({0.731F, 0, 1, 64, 0}, h, f));
  }
  EXPECT_LT(image, -70);
  EXPECT_LT(single, -70);
  EXPECT_LT(nearest, -35);
  EXPECT_GT(nearest, image);
  // With interpolation out of the way, what the prototype itself lets through.
  const double fine = impurity<toolkit::z>({0.731F, 0, 0, 4096, 0}, kaiser(32 * 4096 + 1, 4096, 0.8, 9), 0.3);
  EXPECT_LT(fine, -88);
  // Above the new Nyquist frequency, by bandwidth scaling: what is left of a tone of amplitude 1.
  double alias = -200;
  for (const double f : {0.29, 0.4, 0.45}) alias = std::max(alias, impurity<toolkit::z>({2.1F, 0, 0, 64, 1}, h, f));
  EXPECT_LT(alias, -70);
  RecordProperty("image_dB", std::to_string(image));
  RecordProperty("nearest_dB", std::to_string(nearest));
  RecordProperty("fine_dB", std::to_string(fine));
  RecordProperty("alias_dB", std::to_string(alias));
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
