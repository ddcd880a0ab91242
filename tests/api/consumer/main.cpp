// A project of a user's, on the C++ layer. SPDX-License-Identifier: MIT
#include <lumra/lumra.hpp>

#include <complex>
#include <iostream>
#include <span>
#include <vector>

namespace {

/// The open interface over vectors, with results that are known.
bool open_interface_is_right() {
  using cf32 = std::complex<float>;
  const std::vector<float> ramp{1, 2, 3, 4}, two{1, 1};
  lumra::fourier_transform<float> transform(4);
  const auto bins = transform.forward(ramp);
  const bool transforms = bins.size() == 3 && bins[0] == cf32(10) && transform.backward(bins) == ramp;
  lumra::fir_filter<cf32> fir(two);
  const std::vector<cf32> ones(4, 1.0F);
  const auto first = fir(ones);
  const auto saved = fir.save();
  const auto second = fir(ones);
  fir = lumra::fir_filter<cf32>::load(saved);
  const bool streams = first[0] == cf32(1) && first[3] == cf32(2) && second[0] == cf32(2) && fir(ones) == second;
  const std::vector<double> b{1}, a{1, -0.5}, step(3, 1.0);
  lumra::recursive_filter<double> iir(b, a);
  const bool recurs = iir(step) == std::vector<double>{1, 1.5, 1.75} && iir.state() == std::vector<double>{0.875};
  std::vector<float> levels(4);
  lumra::decibels<cf32>(first, levels);
  const bool levelled = levels[0] == 0 && lumra::convolve<float>(ramp, two, lumra::mode::valid)[2] == 7;
  lumra::least_squares_solver<double> solver(3, 2);
  const std::vector<double> matrix{1, 0, 0, 1, 0, 0};
  const auto solution = solver(matrix, step);
  const bool figures = lumra::make_window("hann", 4)[2] == 1 && lumra::window_figures("hann", 64).coherent_gain == 0.5;
  std::vector<double> power(16);
  power[12] = 1;
  lumra_spectrum_info info{};
  info.size = sizeof info;
  info.sides = 2;
  info.points = 16;
  info.sample_rate_hz = info.noise_bandwidth_bins = 1;
  const std::vector<double> beside{0.25};
  const bool measures =
      lumra::channel_power(power, info, 0.25, 0.125) == 1 && lumra::occupied_bandwidth(power, info).low_hz > 0.2 &&
      lumra::adjacent_power(power, info, 0.25, 0.125, beside)[0].lower_dbc < -300 &&
      lumra::find_peaks(power, info, 5).size() == 1 && lumra::measure_tone(power, info, 0.2).frequency_hz == 0.25;
  try {
    fir(ones, std::span<cf32>());
    return false;
  } catch (const lumra::error &e) {
    return transforms && streams && recurs && levelled && figures && measures && solution.rank == 2 &&
           e.status().code() == LUMRA_TOO_LITTLE_ROOM;
  }
}

}  // namespace

int main() {
  if (!open_interface_is_right()) return 1;
  lumra::session session;
  lumra::host_array<std::complex<float>> samples(256);
  for (auto &s : samples.elements()) s = 1.0F;
  lumra::spectrum spectrum;
  session.power_spectrum(lumra::window::none, 256, 50, samples, 1e-6, spectrum);
  samples.resize(300);
  const bool resized = samples.elements()[255] == 1.0F && samples.elements()[299] == 0.0F;
  try {
    session.power_spectrum(lumra::window::none, 4096, 0, samples, 1e-6, spectrum);
  } catch (const lumra::error &e) {
    const bool right =
        resized && spectrum.power.elements()[128] == 65536.0F && e.status().code() == LUMRA_INPUT_TOO_SHORT;
    std::cout << e.what() << '\n';
    return right ? 0 : 1;
  }
  return 1;
}
