// Levels and power statistics. SPDX-License-Identifier: MIT
#include <lumra/level.hpp>

#include "accumulators.hpp"
#include "module.hpp"
#include "patience.hpp"

namespace binding {
namespace {

struct levelling {
  using object = lumra_level;
  using owned = lumra::detail::owned<lumra_level, &lumra_level_free>;
  static constexpr auto add = &lumra_level_add;
  static constexpr auto merge = &lumra_level_merge;
  static constexpr auto state_size = &lumra_level_state_size;
  static constexpr auto save = &lumra_level_save;

  struct extent {
    std::uint64_t start, samples, origin;
  };
  static lumra_level_extent extent_of(const object *of) {
    lumra_level_extent found{};
    lumra::check_open(lumra_level_where(of, &found));
    return found;
  }
  static extent where(const object *of) {
    const lumra_level_extent found = extent_of(of);
    return {found.start, found.samples, 0};
  }
  static element type_of(const object *of) { return static_cast<element>(extent_of(of).type); }

  [[nodiscard]] static element usual() noexcept { return element::f32; }
  [[nodiscard]] static element type_for(element block) noexcept { return block; }
  [[nodiscard]] static std::size_t piece() noexcept { return std::size_t{1} << 20; }
  [[nodiscard]] owned make(element type, std::uint64_t first, std::uint64_t) const {
    lumra_level_options how = LUMRA_LEVEL_OPTIONS;
    how.type = static_cast<std::int32_t>(type);
    how.start = first;
    how.threads = threads;
    return lumra::detail::make<owned>([&](object **out) { return lumra_level_create(&how, out); });
  }
  [[nodiscard]] owned load(std::string_view bytes) const {
    const auto saved =
        lumra::detail::make<owned>([&](object **out) { return lumra_level_load(bytes.data(), bytes.size(), out); });
    // What is saved says nothing of threads: its neighbour, which has no samples yet, has as many as this kind.
    auto loaded = make(type_of(saved.get()), where(saved.get()).start, 0);
    lumra::check_open(merge(loaded.get(), saved.get()));
    return loaded;
  }
  static void adopt(const object *) noexcept {}

  std::uint64_t start = 0, origin = 0;
  std::uint32_t threads = 0;
};

using meter = accumulator<levelling>;

/// samples, power, rms, peak, its position, crest in dB, dc, levels of rms and peak in dB.
py::tuple read(meter &of) {
  lumra_level_result found{};
  found.size = sizeof found;
  const element type = of.with_object([&](const auto *object) {
    lumra::check_open(lumra_level_read(object, &found));
    return levelling::type_of(object);
  });
  const py::object dc =
      is_complex(type) ? py::cast(std::complex<double>(found.dc_re, found.dc_im)) : py::float_(found.dc_re);
  return py::make_tuple(found.samples, found.rms, found.peak, found.peak_index, found.crest_db, dc, found.rms_db,
                        found.peak_db);
}

/// Levels in dB that were asked for, and room for the share of samples above each.
struct levels_asked {
  explicit levels_asked(py::handle above) {
    const numbers given(above, "above_db");
    if (is_complex(given.type))
      refuse_type("above_db", std::string("of dtype ") + name_of(given.type), "give levels in dB");
    levels = given.as(element::f64).attr("copy")("C").cast<py::array>();
    shares = new_array(element::f64, std::vector<py::ssize_t>(levels.shape(), levels.shape() + levels.ndim()));
    from = static_cast<const double *>(levels.data());
    to = static_cast<double *>(shares.mutable_data());
    count = static_cast<std::uint64_t>(levels.size());
  }

  py::array levels, shares;
  const double *from;
  double *to;
  std::uint64_t count;
};

py::array ccdf_so_far(meter &of, py::handle above) {
  levels_asked asked(above);
  of.with_object(
      [&](const auto *object) { lumra::check_open(lumra_level_ccdf(object, asked.from, asked.to, asked.count)); });
  return std::move(asked.shares);
}

py::array ccdf(py::handle of, py::handle above) {
  samples x(of, "x");
  if (x.size() == 0) refuse_value("x", "empty", "give one sample or more");
  x.gather();
  levels_asked asked(above);
  with_type(x.type(), [&]<class T>(std::type_identity<T>) {
    constexpr auto run = lumra::detail::form<T>(&lumra_ccdf_f32, &lumra_ccdf_f64, &lumra_ccdf_cf32, &lumra_ccdf_cf64);
    const auto *const in = lumra::detail::raw(x.first<T>());
    const std::size_t n = x.size();
    run_patiently(
        1e-8 * static_cast<double>(n), {x.array(), asked.levels, asked.shares},
        [=, from = asked.from, to = asked.to, count = asked.count] { lumra::check_open(run(in, n, from, to, count)); });
  });
  return std::move(asked.shares);
}

}  // namespace

element checked_type(std::int32_t code) {
  for (const element type : {element::f32, element::f64, element::cf32, element::cf64})
    if (static_cast<std::int32_t>(type) == code) return type;
  throw lumra::error(lumra::status(LUMRA_BAD_STATE), "what was saved has no type of samples");
}

void add_levels(py::module_ &module) {
  py::class_<meter>(module, "Meter")
      .def(py::init([](py::handle start, py::handle threads) {
        levelling kind;
        kind.start = static_cast<std::uint64_t>(whole_number(start, "start", 0));
        kind.threads = number_of_threads(threads);
        return std::make_unique<meter>(kind);
      }))
      .def("add", &meter::add)
      .def("add_recording", &meter::add_recording)
      .def("merge", &meter::merge)
      .def("read", &read)
      .def("ccdf", &ccdf_so_far)
      .def("save", &meter::save)
      .def("load", &meter::load)
      .def("where", [](meter &of) {
        const auto extent = of.where();
        return py::make_tuple(extent.start, extent.samples);
      });
  module.def("ccdf", &ccdf);
}

}  // namespace binding
