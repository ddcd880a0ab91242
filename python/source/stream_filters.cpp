// SPDX-License-Identifier: MIT
#include "stream_filters.hpp"

#include <lumra/filter.hpp>
#include <optional>

#include "accumulators.hpp"
#include "arrays.hpp"
#include "coefficients.hpp"

namespace binding {
namespace {

struct recursive {
  using object = lumra_iir;
  using owned = lumra::detail::owned<lumra_iir, &lumra_iir_free>;
  static constexpr auto process = &lumra_iir_process;
  static constexpr auto reset = &lumra_iir_reset;
  static constexpr auto state_size = &lumra_iir_state_size;
  static constexpr auto save = &lumra_iir_save;
  static constexpr auto load = &lumra_iir_load;
  static constexpr auto get_type = &lumra_iir_get_type;

  recursive(py::handle b_given, py::handle a_given)
      : b(real_coefficients(b_given, "b")), a(real_coefficients(a_given, "a")) {
    static_cast<void>(make(element::cf32));  // refuses coefficients before the first block does
  }

  [[nodiscard]] element type_for(element x) const noexcept { return x; }
  [[nodiscard]] owned make(element type) const {
    lumra_iir_options how = LUMRA_IIR_OPTIONS;
    how.type = static_cast<std::int32_t>(type);
    return lumra::detail::make<owned>(
        [&](lumra_iir **out) { return lumra_iir_create(&how, b.data(), b.size(), a.data(), a.size(), out); });
  }

  [[nodiscard]] std::size_t piece() const noexcept { return filtered_at_once(a.size() + b.size()); }

  std::vector<double> b, a;
};

struct finite {
  using object = lumra_fir;
  using owned = lumra::detail::owned<lumra_fir, &lumra_fir_free>;
  static constexpr auto process = &lumra_fir_process;
  static constexpr auto reset = &lumra_fir_reset;
  static constexpr auto state_size = &lumra_fir_state_size;
  static constexpr auto save = &lumra_fir_save;
  static constexpr auto load = &lumra_fir_load;
  static constexpr auto get_type = &lumra_fir_get_type;

  explicit finite(py::handle h_given) {
    const numbers h(h_given, "h");
    complex = is_complex(h.type);
    samples values(h, of(complex, false));
    if (values.size() == 0) refuse_value("h", "empty", "give one tap or more");
    values.gather();
    const auto *const first = values.first<double>();
    taps.assign(first, first + values.size() * (complex ? 2 : 1));
    static_cast<void>(make(element::cf32));
  }

  [[nodiscard]] element type_for(element x) const noexcept { return complex ? complex_of(x) : x; }
  [[nodiscard]] owned make(element type) const {
    lumra_fir_options how = LUMRA_FIR_OPTIONS;
    how.type = static_cast<std::int32_t>(type);
    how.taps_type = static_cast<std::int32_t>(of(complex, is_single(type)));
    const std::vector<float> narrow(taps.begin(), taps.end());
    const void *const first = is_single(type) ? static_cast<const void *>(narrow.data()) : taps.data();
    return lumra::detail::make<owned>(
        [&](lumra_fir **out) { return lumra_fir_create(&how, first, taps.size() / (complex ? 2 : 1), out); });
  }

  /// Long filters go through transforms.
  [[nodiscard]] std::size_t piece() const noexcept { return filtered_at_once(std::min(taps.size(), std::size_t{100})); }

  bool complex = false;
  std::vector<double> taps;  // pairs where they are complex
};

/// The first block that is not empty chooses the type of the stream.
template <class Kind>
class stream {
 public:
  template <class... Given>
  explicit stream(Given... given) : kind_(given...) {}

  py::array call(py::handle block) {
    const numbers given(block, "x");
    const element type = kind_.type_for(given.type);
    const samples x(given, type);
    py::array result = new_array(type, x.size());
    if (x.size() == 0) return result;
    void *const to = result.mutable_data();
    std::optional<element> other;
    {
      const turn mine(turnstile_);
      if (!filter_ || (fresh_ && type_ != type)) filter_ = kind_.make(type);
      if (!fresh_ && type_ != type) {
        other = type_;
      } else {
        type_ = type;
        fresh_ = false;
        with_type(type, [&]<class T>(std::type_identity<T>) {
          auto *out = static_cast<T *>(to);
          in_pieces<T>(x, kind_.piece(), [&](const T *from, std::size_t count) {
            lumra::check_open(Kind::process(filter_.get(), from, out, count));
            out += count;
          });
        });
      }
    }
    if (other)
      refuse_type("x", std::string("of dtype ") + name_of(given.type),
                  std::string("the stream is of ") + name_of(*other) + ": give that, or call reset()");
    return result;
  }

  void reset() {
    const turn mine(turnstile_);
    if (filter_) lumra::check_open(Kind::reset(filter_.get()));
    fresh_ = true;
  }

  /// Empty where nothing was filtered.
  py::bytes save() {
    std::vector<std::byte> state;
    {
      const turn mine(turnstile_);
      if (!fresh_)
        state = lumra::detail::save(static_cast<const typename Kind::object *>(filter_.get()), Kind::state_size,
                                    Kind::save);
    }
    return {reinterpret_cast<const char *>(state.data()), state.size()};
  }

  void load(const py::bytes &saved) {
    const std::string_view bytes = saved;
    const turn mine(turnstile_);
    fresh_ = true;
    if (bytes.empty()) return;
    auto loaded = lumra::detail::make<typename Kind::owned>(
        [&](typename Kind::object **out) { return Kind::load(bytes.data(), bytes.size(), out); });
    std::int32_t code = 0;
    lumra::check_open(Kind::get_type(loaded.get(), &code));
    type_ = checked_type(code);
    filter_ = std::move(loaded);
    fresh_ = false;
  }

 private:
  Kind kind_;
  turnstile turnstile_;
  typename Kind::owned filter_;
  element type_ = element::cf32;
  bool fresh_ = true;  // no sample was filtered since the beginning of the stream
};

template <class Kind>
py::class_<stream<Kind>> add(py::module_ &module, const char *name) {
  return py::class_<stream<Kind>>(module, name)
      .def("__call__", &stream<Kind>::call)
      .def("reset", &stream<Kind>::reset)
      .def("save", &stream<Kind>::save)
      .def("load", &stream<Kind>::load);
}

}  // namespace

void add_stream_filters(py::module_ &module) {
  add<recursive>(module, "Iir").def(py::init<py::handle, py::handle>());
  add<finite>(module, "Fir").def(py::init<py::handle>());
}

}  // namespace binding
