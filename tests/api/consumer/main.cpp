// A project of a user's, on the C++ layer. SPDX-License-Identifier: MIT
#include <lumra/lumra.hpp>

#include <complex>
#include <iostream>

int main() {
  lumra::session session;
  lumra::host_array<std::complex<float>> samples(256);
  for (auto &s : samples.elements()) s = 1.0F;
  session.initialize_window(lumra::window::none, 256);
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
