// Synthesises what a receiver at 3.5 GHz might have recorded, as SigMF (ci16_le): an OFDM carrier beside a weak tone
// and a burst over noise. The library's averaged spectrum sets the carrier's level.
//
//   synthesize_recording NAME       writes NAME.sigmf-data and NAME.sigmf-meta
//
// SPDX-License-Identifier: MIT
#include <algorithm>
#include <cmath>
#include <complex>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <lumra/lumra.hpp>
#include <nlohmann/json.hpp>
#include <numbers>
#include <random>
#include <span>
#include <stdexcept>
#include <string>
#include <vector>

namespace {

using sample = std::complex<float>;

constexpr double sample_rate = 30.72e6;     // Hz
constexpr double centre_frequency = 3.5e9;  // Hz
constexpr std::size_t length = 3'072'000;   // 0.1 s
constexpr double noise_level = -55;         // dBFS in the whole band
constexpr double carrier_level = -18;       // dBFS, mean power
constexpr double carrier_offset = -5.5e6;   // Hz from the centre
constexpr double tone_level = -66, tone_offset = 4.3e6;
constexpr double burst_level = -38, burst_offset = 9.9e6;  // level while it is on
constexpr double burst_symbol_rate = 1.28e6;               // Hz
constexpr auto samples_per_symbol = static_cast<std::size_t>(sample_rate / burst_symbol_rate);
constexpr auto burst_period = static_cast<std::size_t>(sample_rate / 100), burst_length = burst_period / 10;
constexpr double subcarrier_spacing = 15e3;  // Hz
constexpr std::size_t subcarriers = 600;

double power_of(double decibels) {
  return std::pow(10, decibels / 10);
}

/// exp(j 2 pi f t) at sample n; the phase is reduced in double precision so that long records stay coherent.
sample rotation(double frequency, std::size_t n) {
  const double turns = frequency / sample_rate * static_cast<double>(n);
  const double angle = 2 * std::numbers::pi * (turns - std::floor(turns));
  return {static_cast<float>(std::cos(angle)), static_cast<float>(std::sin(angle))};
}

/// 600 subcarriers of 15 kHz with 64-QAM, guard intervals, and symbols that fade into each other.
void add_ofdm(std::span<sample> out, std::mt19937 &random) {
  constexpr std::size_t size = 2048, used = subcarriers, guard = 144, ramp = 64;
  static_assert(size * subcarrier_spacing == sample_rate);
  std::uniform_int_distribution<int> level(0, 7);
  // Two paths 130 ns apart give the carrier the tilt and dip of a real channel.
  const auto channel = [](double frequency) {
    const double angle = -2 * std::numbers::pi * frequency * 130e-9 + 2.1;
    return sample(1.0F + 0.45F * static_cast<float>(std::cos(angle)), 0.45F * static_cast<float>(std::sin(angle)));
  };
  // 42 is the mean power of the levels -7, -5 ... 7 in both components; the inverse transform divides by its size.
  const auto scale = static_cast<float>(size / std::sqrt(42.0 * used));
  std::vector<sample> bins(size);
  lumra::plan<sample> plan;
  for (std::size_t start = 0; start + size + guard + ramp <= out.size(); start += size + guard) {
    std::fill(bins.begin(), bins.end(), sample{});
    for (std::size_t k = 1; k <= used / 2; ++k)
      for (const bool upper : {false, true}) {
        const double frequency = (upper ? 1.0 : -1.0) * static_cast<double>(k) * sample_rate / size;
        const sample point(static_cast<float>(2 * level(random) - 7), static_cast<float>(2 * level(random) - 7));
        bins[upper ? k : size - k] = point * channel(frequency) * scale;
      }
    const std::span<const sample> symbol = lumra::inverse_fft(plan, bins);
    for (std::size_t n = 0; n < size + guard + ramp; ++n) {
      const std::size_t from_edge = std::min(n, size + guard + ramp - 1 - n);
      const double phase = std::numbers::pi / 2 * (static_cast<double>(from_edge) + 0.5) / ramp;
      const auto fade = from_edge < ramp ? static_cast<float>(std::sin(phase) * std::sin(phase)) : 1.0F;
      out[start + n] += fade * symbol[(n + size - guard) % size];
    }
  }
}

/// The first samples of all bursts that end in so many samples.
std::vector<std::size_t> bursts_in(std::size_t samples) {
  std::vector<std::size_t> starts;
  for (std::size_t start = burst_period / 3; start + burst_length + 2 * samples_per_symbol < samples;
       start += burst_period)
    starts.push_back(start);
  return starts;
}

/// QPSK with Hann-shaped pulses, one millisecond in every ten.
void add_bursts(std::span<sample> out, std::mt19937 &random) {
  const auto amplitude = static_cast<float>(std::sqrt(power_of(burst_level)));
  std::uniform_int_distribution<int> quadrant(0, 3);
  for (const std::size_t burst : bursts_in(out.size()))
    for (std::size_t start = burst; start < burst + burst_length; start += samples_per_symbol) {
      const sample point =
          amplitude * std::polar(1.0F, static_cast<float>(std::numbers::pi / 4 * (2 * quadrant(random) + 1)));
      for (std::size_t n = 0; n < 2 * samples_per_symbol; ++n) {
        const double x =
            std::sin(std::numbers::pi * static_cast<double>(n) / static_cast<double>(2 * samples_per_symbol));
        out[start + n] += point * static_cast<float>(x * x) * rotation(burst_offset, start + n);
      }
    }
}

/// Total power in dB of full scale, as the library's spectrum shows it: Parseval's sum over its bins.
double measured_level(lumra::session &session, const lumra::host_array<sample> &samples) {
  constexpr std::int32_t size = 4096;
  session.initialize_window(lumra::window::none, size);
  lumra::spectrum spectrum;
  session.power_spectrum(lumra::window::none, size, 0, samples, 1 / sample_rate, spectrum);
  double sum = 0;
  for (const float power : spectrum.power.elements()) sum += power;
  return 10 * std::log10(sum / (double{size} * size));
}

nlohmann::json annotation(std::size_t start, std::size_t samples, double centre, double width, const char *label) {
  return {{"core:sample_start", start},
          {"core:sample_count", samples},
          {"core:freq_lower_edge", centre_frequency + centre - width / 2},
          {"core:freq_upper_edge", centre_frequency + centre + width / 2},
          {"core:label", label}};
}

/// What is where, in the order of the first samples.
nlohmann::json annotations_of(std::size_t samples) {
  nlohmann::json list = nlohmann::json::array();
  list.push_back(annotation(0, samples, carrier_offset, (subcarriers + 1) * subcarrier_spacing, "OFDM"));
  list.push_back(annotation(0, samples, tone_offset, 20e3, "tone"));
  for (const std::size_t start : bursts_in(samples))
    list.push_back(annotation(start, burst_length, burst_offset, 2 * burst_symbol_rate, "burst"));
  return list;
}

void write_recording(const std::string &name, std::span<const sample> samples) {
  std::ofstream data(name + ".sigmf-data", std::ios::binary);
  for (const sample &x : samples)
    for (const float component : {x.real(), x.imag()}) {
      const auto value = static_cast<std::uint16_t>(std::lround(std::clamp(component, -1.0F, 1.0F) * 32767.0F));
      const char bytes[] = {static_cast<char>(value & 0xFF), static_cast<char>(value >> 8)};
      data.write(bytes, sizeof bytes);
    }
  // The second capture continues the first: its time says so.
  const nlohmann::json captures = {
      {{"core:sample_start", 0}, {"core:frequency", centre_frequency}, {"core:datetime", "2024-05-06T07:08:09.000Z"}},
      {{"core:sample_start", samples.size() / 2},
       {"core:frequency", centre_frequency},
       {"core:datetime", "2024-05-06T07:08:09.050Z"}}};
  const nlohmann::json meta = {{"global",
                                {{"core:datatype", "ci16_le"},
                                 {"core:sample_rate", sample_rate},
                                 {"core:version", "1.2.0"},
                                 {"core:description", "Synthetic: OFDM carrier, weak tone and burst over noise"}}},
                               {"captures", captures},
                               {"annotations", annotations_of(samples.size())}};
  std::ofstream text(name + ".sigmf-meta");
  text << meta.dump(2) << '\n';
  if (!data.flush() || !text.flush()) throw std::runtime_error("cannot write " + name + ".sigmf-data and -meta");
}

void synthesize(const std::string &name) {
  std::mt19937 random(20);  // the same recording every time
  lumra::session session;
  lumra::host_array<sample> samples(length);
  const std::span<sample> x = samples.elements();

  add_ofdm(x, random);
  const auto gain = static_cast<float>(std::sqrt(power_of(carrier_level - measured_level(session, samples))));
  for (std::size_t n = 0; n < x.size(); ++n) x[n] *= gain * rotation(carrier_offset, n);
  add_bursts(x, random);
  const auto tone = static_cast<float>(std::sqrt(power_of(tone_level)));
  std::normal_distribution<float> noise(0.0F, static_cast<float>(std::sqrt(power_of(noise_level) / 2)));
  for (std::size_t n = 0; n < x.size(); ++n)
    x[n] += tone * rotation(tone_offset, n) + sample(noise(random), noise(random));

  write_recording(name, x);
  std::printf("%s.sigmf-meta: %zu samples at %.2f MHz, %.2f dBFS in all\n", name.c_str(), x.size(), sample_rate / 1e6,
              measured_level(session, samples));
}

}  // namespace

int main(int count, char **arguments) {
  if (count != 2) {
    (void)std::fputs("usage: synthesize_recording NAME\n", stderr);
    return 2;
  }
  try {
    synthesize(arguments[1]);
    return EXIT_SUCCESS;
  } catch (const std::exception &error) {
    (void)std::fprintf(stderr, "synthesize_recording: %s\n", error.what());
    return EXIT_FAILURE;
  }
}
