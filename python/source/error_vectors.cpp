// Error vectors. SPDX-License-Identifier: MIT
#include <lumra/evm.hpp>

#include "arrays.hpp"
#include "module.hpp"

namespace binding {
namespace {

/// rms, peak, rms of magnitudes and phases, gain, delay, frequency, dc, samples.
py::tuple evm(py::handle reference_given, py::handle measured_given, std::uint32_t align, py::handle sample_rate) {
  const numbers reference(reference_given, "reference"), measured(measured_given, "measured");
  const double rate = number(sample_rate, "sample_rate");
  const element type = of(true, is_single(reference.type) && is_single(measured.type));
  samples r(reference, type), m(measured, type);
  if (m.size() != r.size())
    refuse_value("measured", "of " + std::to_string(m.size()) + " samples",
                 "give as many as the reference has, " + std::to_string(r.size()));
  r.gather();
  m.gather();
  lumra_evm_result found{};
  with_type(type, [&]<class T>(std::type_identity<T>) {
    if constexpr (!std::is_floating_point_v<T>) {
      const py::gil_scoped_release released;
      found = lumra::measure_evm<T>({r.first<T>(), r.size()}, {m.first<T>(), m.size()},
                                    static_cast<lumra::align>(align), rate);
    }
  });
  return py::make_tuple(found.rms, found.peak, found.magnitude_rms, found.phase_rms,
                        std::complex<double>(found.gain_re, found.gain_im), found.delay_samples, found.frequency_hz,
                        std::complex<double>(found.dc_re, found.dc_im), found.samples);
}

}  // namespace

void add_error_vectors(py::module_ &module) {
  module.def("evm", &evm);
}

}  // namespace binding
