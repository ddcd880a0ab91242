// Records and streams at other sample rates, channels out of wideband streams. SPDX-License-Identifier: MIT
#include <lumra/channelizer.hpp>
#include <lumra/resampler.hpp>

#include "accumulators.hpp"
#include "axis.hpp"
#include "module.hpp"
#include "recent.hpp"

namespace binding {
namespace {

/// Samples of one call without the GIL in between.
constexpr std::size_t piece = std::size_t{1} << 18;

struct ratio {
  element type;
  std::uint64_t up, down;  // 0 where the rates are given
  double rate_in, rate_out, passband, rejection;

  bool operator==(const ratio &) const noexcept = default;
};

using resampler = lumra::detail::owned<lumra_resampler, &lumra_resampler_free>;

resampler make_resampler(const ratio &of) {
  lumra_resampler_options how = LUMRA_RESAMPLER_OPTIONS;
  how.type = static_cast<std::int32_t>(of.type);
  how.up = of.up;
  how.down = of.down;
  how.input_rate_hz = of.rate_in;
  how.output_rate_hz = of.rate_out;
  how.passband = of.passband;
  how.rejection_db = of.rejection;
  return lumra::detail::make<resampler>([&](lumra_resampler **out) { return lumra_resampler_create(&how, out); });
}

ratio ratio_of(element type, std::uint64_t up, std::uint64_t down, double rate_in, double rate_out, py::handle passband,
               py::handle rejection) {
  return {type, up, down, rate_in, rate_out, number(passband, "passband"), number(rejection, "rejection")};
}

/// The row at another rate, `room` samples of it.
template <class T>
void resample_row(lumra_resampler *through, const T *in, std::ptrdiff_t step, std::size_t n, T *out, std::size_t room,
                  interruptions &signals) {
  const std::size_t at_once = step == 1 ? piece : std::min(gathered, n);
  std::vector<T> buffer(step == 1 ? 0 : at_once);
  std::uint64_t written = 0;
  for (std::size_t done = 0; done < n;) {
    const std::size_t count = std::min(at_once, n - done);
    const T *from = in + static_cast<std::ptrdiff_t>(done) * step;
    if (step != 1) {
      gather(from, step, buffer.data(), count);
      from = buffer.data();
    }
    lumra::check_open(lumra_resampler_process(through, from, count, count, out, room, room, &written));
    out += written;
    room -= static_cast<std::size_t>(written);
    done += count;
    signals.poll();
  }
  lumra::check_open(lumra_resampler_flush(through, out, room, room, &written));
}

/// Rows along the axis become rows of `count` samples, along the last axis.
py::array resample(py::handle of, py::handle axis_given, py::handle count_given, std::uint64_t up, std::uint64_t down,
                   double rate_in, double rate_out, py::handle passband, py::handle rejection) {
  const numbers given(of, "x");
  const std::size_t axis = axis_of(given, axis_given);
  const ratio wanted = ratio_of(given.type, up, down, rate_in, rate_out, passband, rejection);
  const std::int64_t count = whole_number(count_given, "the number of results", 0);
  py::array x = given.as(given.type);
  if (!has_whole_strides(x)) x = x.attr("copy")().cast<py::array>();
  x = x.attr("swapaxes")(axis, -1).cast<py::array>();
  std::vector<py::ssize_t> shape(x.shape(), x.shape() + x.ndim());
  const auto n = static_cast<std::size_t>(shape.back());
  shape.back() = count;
  py::array y = new_array(given.type, shape);
  with_type(given.type, [&]<class T>(std::type_identity<T>) {
    thread_local recent<ratio, resampler> kept(4);
    const axis_rows rows(x, y, shape.size() - 1);
    const auto *const from = static_cast<const T *>(x.data());
    auto *const to = static_cast<T *>(y.mutable_data());
    const py::gil_scoped_release released;
    interruptions signals;
    resampler through = kept.take(wanted, [&] { return make_resampler(wanted); });
    rows.each([&](std::ptrdiff_t in, std::ptrdiff_t out) {
      for (std::uint64_t row = 0; row < rows.rows; ++row) {
        const auto k = static_cast<std::ptrdiff_t>(row);
        resample_row(through.get(), from + in + k * rows.in_distance, rows.in_step, n, to + out + k * rows.out_distance,
                     static_cast<std::size_t>(count), signals);
      }
    });
    kept.keep(wanted, std::move(through));
  });
  return y.attr("swapaxes")(axis, -1).cast<py::array>();
}

/// Resamples a stream of one type, which is fixed.
class stream_resampler {
 public:
  explicit stream_resampler(const ratio &of) : ratio_(of), through_(make_resampler(of)) {}

  py::array call(py::handle block) {
    const numbers given(block, "x");
    if (given.type != ratio_.type)
      refuse_type("x", "of dtype " + std::string(py::str(given.array.dtype())),
                  std::string("the stream is of ") + name_of(ratio_.type));
    const samples x(given);
    py::array result;
    const turn mine(turnstile_);
    std::uint64_t count = 0;
    lumra::check_open(lumra_resampler_output_count(through_.get(), x.size(), &count));
    auto *out = static_cast<char *>(make_room(result, count));
    with_type(ratio_.type, [&]<class T>(std::type_identity<T>) {
      in_pieces<T>(x, piece, [&](const T *from, std::size_t samples_now) {
        std::uint64_t written = 0;
        lumra::check_open(
            lumra_resampler_process(through_.get(), from, samples_now, samples_now, out, count, count, &written));
        out += written * sizeof(T);
        count -= written;
      });
    });
    return result;
  }

  py::array flush() {
    py::array result;
    const turn mine(turnstile_);
    std::uint64_t count = 0;
    lumra::check_open(lumra_resampler_flush_count(through_.get(), &count));
    void *const out = make_room(result, count);
    lumra::check_open(lumra_resampler_flush(through_.get(), out, count, count, nullptr));
    return result;
  }

  void reset() {
    const turn mine(turnstile_);
    lumra::check_open(lumra_resampler_reset(through_.get()));
  }

  py::bytes save() {
    std::vector<std::byte> state;
    {
      const turn mine(turnstile_);
      state = lumra::detail::save(std::as_const(through_).get(), &lumra_resampler_state_size, &lumra_resampler_save);
    }
    return {reinterpret_cast<const char *>(state.data()), state.size()};
  }
  void load(const py::bytes &saved) {
    const std::string_view bytes = saved;
    const turn mine(turnstile_);
    auto loaded = lumra::detail::make<resampler>(
        [&](lumra_resampler **out) { return lumra_resampler_load(bytes.data(), bytes.size(), out); });
    std::int32_t code = 0;
    lumra::check_open(lumra_resampler_get_type(loaded.get(), &code));
    if (checked_type(code) != ratio_.type)
      throw lumra::error(lumra::status(LUMRA_BAD_STATE), "what was saved is for another type of samples");
    through_ = std::move(loaded);
  }

 private:
  /// Room for so many results, made in the object's turn: nothing waits for it that has the GIL.
  void *make_room(py::array &result, std::uint64_t count) const {
    const py::gil_scoped_acquire held;
    result = new_array(ratio_.type, count);
    return result.mutable_data();
  }

  ratio ratio_;
  turnstile turnstile_;
  resampler through_;
};

using channels = lumra::detail::owned<lumra_channelizer, &lumra_channelizer_free>;

/// The first block that is not empty chooses the type of the stream.
class channelizer {
 public:
  channelizer(py::handle sample_rate, const py::list &given, py::handle rejection) {
    options_.sample_rate_hz = number(sample_rate, "sample_rate");
    options_.rejection_db = number(rejection, "rejection");
    for (const py::handle each : given) {
      lumra_channelizer_channel channel{};
      const auto pair = py::reinterpret_borrow<py::tuple>(each);
      channel.centre_hz = number(pair[0], "a channel's center");
      channel.rate_hz = number(pair[1], "a channel's rate");
      channels_.push_back(channel);
    }
    // In double precision, in which more is allowed: of wrong options the constructor tells.
    type_ = element::cf64;
    through_ = make(type_);
  }

  py::list call(py::handle block) {
    const numbers given(block, "x");
    const samples x(given);
    py::list results;
    std::vector<void *> addresses(channels_.size());
    std::vector<std::uint64_t> counts(channels_.size()), written(channels_.size());
    bool refused = false;
    {
      const turn mine(turnstile_);
      if (x.size() > 0 && fresh_ && given.type != type_) {
        through_ = make(given.type);
        type_ = given.type;
      }
      refused = x.size() > 0 && given.type != type_;
      if (!refused) {
        fresh_ = fresh_ && x.size() == 0;
        lumra::check_open(lumra_channelizer_output_counts(through_.get(), x.size(), counts.data()));
        make_rooms(results, addresses, counts, x.size() > 0 ? type_ : given.type);
        with_type(type_, [&]<class T>(std::type_identity<T>) {
          in_pieces<T>(x, piece, [&](const T *from, std::size_t n) {
            lumra::check_open(
                lumra_channelizer_process(through_.get(), from, n, addresses.data(), counts.data(), written.data()));
            for (std::size_t k = 0; k < written.size(); ++k) {
              addresses[k] = static_cast<char *>(addresses[k]) +
                             written[k] * static_cast<std::uint64_t>(bytes_of(complex_of(type_)));
              counts[k] -= written[k];
            }
          });
        });
      }
    }
    if (refused)
      refuse_type("x", std::string("of dtype ") + name_of(given.type),
                  std::string("the stream is of ") + name_of(type_) + ": give that, or call reset()");
    return results;
  }

  py::list flush() {
    py::list results;
    std::vector<void *> addresses(channels_.size());
    std::vector<std::uint64_t> counts(channels_.size()), written(channels_.size());
    const turn mine(turnstile_);
    lumra::check_open(lumra_channelizer_flush_counts(through_.get(), counts.data()));
    make_rooms(results, addresses, counts, type_);
    lumra::check_open(lumra_channelizer_flush(through_.get(), addresses.data(), counts.data(), written.data()));
    fresh_ = true;
    return results;
  }

  void reset() {
    const turn mine(turnstile_);
    lumra::check_open(lumra_channelizer_reset(through_.get()));
    fresh_ = true;
  }

  py::bytes save() {
    std::vector<std::byte> state;
    {
      const turn mine(turnstile_);
      if (!fresh_)
        state =
            lumra::detail::save(std::as_const(through_).get(), &lumra_channelizer_state_size, &lumra_channelizer_save);
    }
    return {reinterpret_cast<const char *>(state.data()), state.size()};
  }
  void load(const py::bytes &saved) {
    const std::string_view bytes = saved;
    const turn mine(turnstile_);
    if (bytes.empty()) return;
    auto loaded = lumra::detail::make<channels>(
        [&](lumra_channelizer **out) { return lumra_channelizer_load(bytes.data(), bytes.size(), out); });
    std::int32_t code = 0;
    lumra::check_open(lumra_channelizer_get_type(loaded.get(), &code));
    if (lumra::detail::number_of(loaded.get(), &lumra_channelizer_get_count) != channels_.size())
      throw lumra::error(lumra::status(LUMRA_BAD_STATE), "what was saved has another number of channels");
    type_ = checked_type(code);
    through_ = std::move(loaded);
    fresh_ = false;
  }

 private:
  [[nodiscard]] channels make(element type) const {
    lumra_channelizer_options how = options_;
    how.type = static_cast<std::int32_t>(type);
    return lumra::detail::make<channels>([&](lumra_channelizer **out) {
      return lumra_channelizer_create(&how, channels_.data(), channels_.size(), out);
    });
  }
  static void make_rooms(py::list &results, std::vector<void *> &addresses, const std::vector<std::uint64_t> &counts,
                         element type) {
    const py::gil_scoped_acquire held;
    for (std::size_t k = 0; k < counts.size(); ++k) {
      py::array room = new_array(complex_of(type), counts[k]);
      addresses[k] = room.mutable_data();
      results.append(room);
    }
  }

  lumra_channelizer_options options_ = LUMRA_CHANNELIZER_OPTIONS;
  std::vector<lumra_channelizer_channel> channels_;
  turnstile turnstile_;
  channels through_;
  element type_;
  bool fresh_ = true;  // no sample was taken since the beginning of the stream
};

element element_of(py::handle dtype) {
  try {
    const py::dtype wanted = py::dtype::from_args(py::reinterpret_borrow<py::object>(dtype));
    for (const element type : {element::f32, element::f64, element::cf32, element::cf64})
      if (wanted.equal(dtype_of(type))) return type;
  } catch (py::error_already_set &) {
  }
  refuse_type("dtype", text_of(dtype), "give float32, float64, complex64 or complex128");
}

}  // namespace

void add_rates(py::module_ &module) {
  module.def("resample", &resample);
  py::class_<stream_resampler>(module, "Resampler")
      .def(py::init([](py::handle dtype, std::uint64_t up, std::uint64_t down, double rate_in, double rate_out,
                       py::handle passband, py::handle rejection) {
        return std::make_unique<stream_resampler>(
            ratio_of(element_of(dtype), up, down, rate_in, rate_out, passband, rejection));
      }))
      .def("__call__", &stream_resampler::call)
      .def("flush", &stream_resampler::flush)
      .def("reset", &stream_resampler::reset)
      .def("save", &stream_resampler::save)
      .def("load", &stream_resampler::load);
  py::class_<channelizer>(module, "Channelizer")
      .def(py::init<py::handle, const py::list &, py::handle>())
      .def("__call__", &channelizer::call)
      .def("flush", &channelizer::flush)
      .def("reset", &channelizer::reset)
      .def("save", &channelizer::save)
      .def("load", &channelizer::load);
}

}  // namespace binding
