// Error vectors, and meters of streams of them. SPDX-License-Identifier: MIT
#include <lumra/evm.hpp>

#include <string_view>

#include "arrays.hpp"
#include "module.hpp"

namespace binding {
namespace {

/// Single precision where both records have it.
element type_of(const numbers &reference, const numbers &measured) noexcept {
  return of(true, is_single(reference.type) && is_single(measured.type));
}

/// rms, peak, rms of magnitudes and phases, gain, delay, frequency, dc, samples.
py::tuple figures(const lumra_evm_result &found) {
  return py::make_tuple(found.rms, found.peak, found.magnitude_rms, found.phase_rms,
                        std::complex<double>(found.gain_re, found.gain_im), found.delay_samples, found.frequency_hz,
                        std::complex<double>(found.dc_re, found.dc_im), found.samples);
}

/// The figures of whole records.
py::tuple evm(py::handle reference_given, py::handle measured_given, std::uint32_t align, py::handle sample_rate,
              std::uint32_t threads) {
  const numbers reference(reference_given, "reference"), measured(measured_given, "measured");
  const double rate = number(sample_rate, "sample_rate");
  const element type = type_of(reference, measured);
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
                                    static_cast<lumra::align>(align), rate, {}, threads);
    }
  });
  return figures(found);
}

/// The sums of one stretch of two streams under a model. Its first samples fix the precision.
class meter {
 public:
  meter(std::uint32_t align, double sample_rate, std::uint64_t start, std::complex<double> gain, double delay,
        double frequency, std::complex<double> dc)
      : options_{sizeof options_, LUMRA_TYPE_CF32, align, 0,         start,     sample_rate,
                 gain.real(),     gain.imag(),     delay, frequency, dc.real(), dc.imag()},
        object_(make()) {}
  explicit meter(const py::bytes &saved) {
    const std::string_view bytes = saved;
    object_ = lumra::detail::make<owned>(
        [&](lumra_evm_meter **out) { return lumra_evm_meter_load(bytes.data(), bytes.size(), out); });
  }

  void add(py::handle reference_given, py::handle measured_given) {
    const numbers reference(reference_given, "reference"), measured(measured_given, "measured");
    const element type = type_of(reference, measured);
    samples r(reference, type), m(measured, type);
    if (m.size() != r.size()) throw py::value_error("reference and measured differ in length");
    r.gather();
    m.gather();
    const py::gil_scoped_release released;
    if (static_cast<element>(where().type) != type) {
      if (where().samples != 0) throw lumra::error(lumra::status(LUMRA_WRONG_TYPE), "the stream is of another type");
      options_.type = static_cast<std::int32_t>(type);
      object_ = make();
    }
    with_type(type, [&]<class T>(std::type_identity<T>) {
      lumra::check_open(lumra_evm_meter_add(object_.get(), r.first<T>(), m.first<T>(), r.size()));
    });
  }
  void merge(const meter &next) {
    const py::gil_scoped_release released;
    lumra::check_open(lumra_evm_meter_merge(object_.get(), next.object_.get()));
  }

  [[nodiscard]] py::tuple read() const {
    lumra_evm_result result{};
    result.size = sizeof result;
    lumra::check_open(lumra_evm_meter_read(object_.get(), &result));
    return figures(result);
  }
  /// gain, delay, frequency and dc of a better model; whether it is settled; how many samples the next meter may have.
  [[nodiscard]] py::tuple refine() const {
    lumra_evm_refinement better{};
    better.size = sizeof better;
    lumra::check_open(lumra_evm_meter_refine(object_.get(), &better));
    return py::make_tuple(std::complex<double>(better.gain_re, better.gain_im), better.delay_samples,
                          better.frequency_hz, std::complex<double>(better.dc_re, better.dc_im), better.settled != 0,
                          better.reach);
  }
  [[nodiscard]] lumra_evm_meter_extent where() const {
    lumra_evm_meter_extent extent{};
    lumra::check_open(lumra_evm_meter_where(object_.get(), &extent));
    return extent;
  }
  [[nodiscard]] py::bytes save() const {
    const auto state = lumra::detail::save(object_.get(), &lumra_evm_meter_state_size, &lumra_evm_meter_save);
    return {reinterpret_cast<const char *>(state.data()), state.size()};
  }

 private:
  using owned = lumra::detail::owned<lumra_evm_meter, &lumra_evm_meter_free>;

  [[nodiscard]] owned make() const {
    return lumra::detail::make<owned>([this](lumra_evm_meter **out) { return lumra_evm_meter_create(&options_, out); });
  }

  lumra_evm_meter_options options_ = LUMRA_EVM_METER_OPTIONS;
  owned object_;
};

}  // namespace

void add_error_vectors(py::module_ &module) {
  module.def("evm", &evm);
  module.attr("evm_window") = LUMRA_EVM_WINDOW;
  py::class_<meter>(module, "EvmMeter")
      .def(py::init<std::uint32_t, double, std::uint64_t, std::complex<double>, double, double, std::complex<double>>())
      .def("add", &meter::add)
      .def("merge", &meter::merge)
      .def("read", &meter::read)
      .def("refine", &meter::refine)
      .def_property_readonly("samples", [](const meter &of) { return of.where().samples; })
      .def(py::pickle([](const meter &of) { return of.save(); }, [](const py::bytes &saved) { return meter(saved); }));
}

}  // namespace binding
