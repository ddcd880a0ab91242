// Fourier transforms along an axis. SPDX-License-Identifier: MIT
#include <lumra/transform.hpp>
#include <optional>
#include <thread>

#include "arrays.hpp"
#include "axis.hpp"
#include "module.hpp"
#include "patience.hpp"
#include "recent.hpp"

namespace binding {
namespace {

constexpr std::int64_t most_points = std::int64_t{1} << 27;
/// Transforms of more points are not kept: making one takes little beside using it, and it holds much memory.
constexpr std::uint64_t most_kept = std::uint64_t{1} << 20;
constexpr std::int64_t most_workers = 256;
/// Points of one call without the GIL in between.
constexpr std::uint64_t points_at_once = std::uint64_t{1} << 22;

struct transform {
  element type = element::cf64;  // of records
  std::uint64_t points = 0;
  std::int32_t scaling = LUMRA_FFT_SCALE_BACKWARD;
  bool forward = true;

  [[nodiscard]] bool same_plan(const transform &other) const noexcept {
    return type == other.type && points == other.points && scaling == other.scaling;
  }
};

struct plan_key {
  transform of;
  bool operator==(const plan_key &other) const noexcept { return of.same_plan(other.of); }
};

using plan = lumra::detail::owned<lumra_fft, &lumra_fft_free>;

plan make_plan(const transform &of) {
  lumra_fft_options how = LUMRA_FFT_OPTIONS;
  how.type = static_cast<std::int32_t>(of.type);
  how.points = of.points;
  how.scaling = of.scaling;
  return lumra::detail::make<plan>([&](lumra_fft **out) { return lumra_fft_create(&how, out); });
}

/// Runs rows; `in` and `out` are those of the first row. The addresses' roles follow the direction.
void run_rows(const transform &of, const char *in, char *out, std::uint64_t rows, const lumra_fft_layout *layout) {
  thread_local recent<plan_key, plan> kept(16);
  plan fft = kept.take({of}, [&] { return make_plan(of); });
  lumra::check_open(of.forward ? lumra_fft_forward(fft.get(), in, out, rows, layout)
                               : lumra_fft_backward(fft.get(), in, out, rows, layout));
  if (of.points <= most_kept) kept.keep({of}, std::move(fft));
}

/// Rows of which each lies behind the one before by a distance in bytes.
struct row_set {
  const char *in;
  char *out;
  std::uint64_t rows;
  std::ptrdiff_t in_distance, out_distance;
  lumra_fft_layout layout;
};

/// In parts, by several threads where they are wanted.
void run(const transform &of, const row_set &set, std::size_t workers, interruptions &signals) {
  const std::uint64_t at_once = std::max<std::uint64_t>(1, points_at_once / of.points) * workers;
  for (std::uint64_t done = 0; done < set.rows; done += at_once) {
    const std::uint64_t count = std::min(at_once, set.rows - done);
    const std::size_t parts = static_cast<std::size_t>(std::min<std::uint64_t>(workers, count));
    const auto part = [&](std::size_t k) {
      const std::uint64_t first = done + count * k / parts, end = done + count * (k + 1) / parts;
      const auto at = static_cast<std::ptrdiff_t>(first);
      run_rows(of, set.in + at * set.in_distance, set.out + at * set.out_distance, end - first, &set.layout);
    };
    std::vector<std::exception_ptr> failed(parts);
    std::vector<std::thread> others;
    for (std::size_t k = 1; k < parts; ++k)
      others.emplace_back([&, k] {
        try {
          part(k);
        } catch (...) {
          failed[k] = std::current_exception();
        }
      });
    try {
      part(0);
    } catch (...) {
      failed[0] = std::current_exception();
    }
    for (std::thread &each : others) each.join();
    for (const std::exception_ptr &each : failed)
      if (each) std::rethrow_exception(each);
    signals.poll();
  }
}

/// The half of a real record's bins that are the conjugates of the others. `bins` is the row's bin 0.
template <class C>
void complete(C *bins, std::ptrdiff_t step, std::uint64_t points) noexcept {
  for (std::uint64_t k = points / 2 + 1; k < points; ++k)
    bins[static_cast<std::ptrdiff_t>(k) * step] = std::conj(bins[static_cast<std::ptrdiff_t>(points - k) * step]);
}

std::int32_t scaling_of(py::handle norm) {
  if (norm.is_none()) return LUMRA_FFT_SCALE_BACKWARD;
  if (py::isinstance<py::str>(norm)) {
    if (norm.equal(py::str("backward"))) return LUMRA_FFT_SCALE_BACKWARD;
    if (norm.equal(py::str("ortho"))) return LUMRA_FFT_SCALE_BOTH;
    if (norm.equal(py::str("forward"))) return LUMRA_FFT_SCALE_FORWARD;
  }
  refuse_value("norm", text_of(norm), "give \"backward\", \"ortho\", \"forward\" or None");
}

/// Negative numbers count from the number of processors, as in SciPy.
std::size_t workers_of(py::handle workers) {
  if (workers.is_none()) return 1;
  const std::int64_t processors = std::max(1U, std::thread::hardware_concurrency());
  std::int64_t count = whole_number(workers, "workers", -processors);
  if (count < 0) count += processors + 1;
  if (count == 0) refuse_value("workers", text_of(workers), "give 1 or more, or None");
  return static_cast<std::size_t>(std::min(count, most_workers));
}

/// x with zeros behind its samples along the axis.
py::array padded(const py::array &x, py::ssize_t axis, py::ssize_t length) {
  std::vector<py::ssize_t> shape(x.shape(), x.shape() + x.ndim());
  shape[static_cast<std::size_t>(axis)] = length;
  const py::object zeros = py::module_::import("numpy").attr("zeros")(shape_tuple(shape), x.dtype());
  py::tuple part(static_cast<std::size_t>(x.ndim()));
  for (py::ssize_t i = 0; i < x.ndim(); ++i) part[static_cast<std::size_t>(i)] = py::slice(0, x.shape(i), 1);
  zeros[part] = x;
  return zeros.cast<py::array>();
}

enum class kind { complex, real };

/// kind::real: the other side's records are real ones, of half the spectrum.
py::array execute(kind with, bool forward, py::handle of, py::handle n, py::handle axis_given, py::handle norm,
                  py::handle out, py::handle workers_given) {
  const numbers given(of, "x");
  transform wanted;
  wanted.forward = forward;
  wanted.scaling = scaling_of(norm);
  const std::size_t workers = workers_of(workers_given);
  const std::size_t axis = axis_of(given, axis_given);
  if (with == kind::real && forward && is_complex(given.type))
    refuse_type("x", std::string("of dtype ") + name_of(given.type), "give real samples");
  // The full spectrum of real samples comes from the half one.
  const bool fills = with == kind::complex && forward && !is_complex(given.type);
  const element in_type = forward ? given.type : complex_of(given.type);
  const element out_type = with == kind::real && !forward ? real_of(given.type) : complex_of(given.type);
  wanted.type = with == kind::real || fills ? real_of(given.type) : complex_of(given.type);

  py::array x = given.as(in_type);
  const py::ssize_t there = x.shape(static_cast<py::ssize_t>(axis));
  const bool halves = with == kind::real && !forward;
  std::int64_t points = halves ? 2 * (there - 1) : there;
  if (!n.is_none()) points = whole_number(n, "n", std::numeric_limits<std::int32_t>::min());
  if (points < 1 || points > most_points)
    refuse_value("n", n.is_none() ? std::to_string(points) : text_of(n), "the points are 1 to 2^27");
  wanted.points = static_cast<std::uint64_t>(points);
  const py::ssize_t needed = halves ? points / 2 + 1 : points;
  if (there < needed) x = padded(x, static_cast<py::ssize_t>(axis), needed);
  if (!has_whole_strides(x)) x = x.attr("copy")().cast<py::array>();

  std::vector<py::ssize_t> shape(x.shape(), x.shape() + x.ndim());
  shape[axis] = with == kind::real && forward ? points / 2 + 1 : points;
  target result(out, out_type, shape, {&x});
  const axis_rows rows(x, result.array(), axis);
  row_set set{};
  set.layout = forward ? lumra_fft_layout{rows.in_step, rows.in_distance, rows.out_step, rows.out_distance}
                       : lumra_fft_layout{rows.out_step, rows.out_distance, rows.in_step, rows.in_distance};
  set.rows = rows.rows;
  set.in_distance = rows.in_distance * bytes_of(in_type);
  set.out_distance = rows.out_distance * bytes_of(out_type);
  const auto *const from = static_cast<const char *>(x.data());
  char *const into = result.first<char>();
  const auto transform_all = [=, bytes_in = bytes_of(in_type), bytes_out = bytes_of(out_type)]() mutable {
    interruptions signals;
    rows.each([&](std::ptrdiff_t in_at, std::ptrdiff_t out_at) {
      set.in = from + in_at * bytes_in;
      set.out = into + out_at * bytes_out;
      run(wanted, set, workers, signals);
      if (!fills) return;
      for (std::uint64_t row = 0; row < set.rows; ++row) {
        char *const bins = set.out + static_cast<std::ptrdiff_t>(row) * set.out_distance;
        if (is_single(out_type))
          complete(reinterpret_cast<std::complex<float> *>(bins), rows.out_step, wanted.points);
        else
          complete(reinterpret_cast<std::complex<double> *>(bins), rows.out_step, wanted.points);
      }
    });
  };
  if (wanted.points > points_at_once) {
    run_patiently(1e-7 * static_cast<double>(wanted.points), {x, result.array()}, transform_all);
  } else {
    const py::gil_scoped_release released;
    auto work = transform_all;
    work();
  }
  return result.finish();
}

template <kind with, bool forward>
py::array entry(py::handle x, py::handle n, py::handle axis, py::handle norm, py::handle out, py::handle workers) {
  return execute(with, forward, x, n, axis, norm, out, workers);
}

}  // namespace

void add_transforms(py::module_ &module) {
  module.def("fft", &entry<kind::complex, true>);
  module.def("ifft", &entry<kind::complex, false>);
  module.def("rfft", &entry<kind::real, true>);
  module.def("irfft", &entry<kind::real, false>);
}

}  // namespace binding
