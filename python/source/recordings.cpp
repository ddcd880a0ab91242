// SPDX-License-Identifier: MIT
#include "recordings.hpp"

#include <unistd.h>
#include <cerrno>
#include <cmath>
#include <nlohmann/json.hpp>

#include "module.hpp"
#include "recording/byte_sink.hpp"
#include "recording/failure.hpp"
#include "recording/open.hpp"
#include "recording/sample_encoder.hpp"

namespace binding {
namespace {

std::optional<double> optional_number(py::handle given, const char *name) {
  if (given.is_none()) return std::nullopt;
  const double value = number(given, name);
  if (!std::isfinite(value)) refuse_value(name, text_of(given), "give a finite number, or None");
  return value;
}

recording::sample_format format_of(py::handle datatype) {
  if (!py::isinstance<py::str>(datatype)) refuse_type("datatype", text_of(datatype), "give a name such as \"cf32_le\"");
  try {
    return recording::parse_format(datatype.cast<std::string>());
  } catch (const recording::failure &) {
    refuse_value("datatype", text_of(datatype), std::string("give one of ") + recording::known_formats);
  } catch (const py::cast_error &) {
    refuse_value("datatype", text_of(datatype), std::string("give one of ") + recording::known_formats);
  }
}

std::uint64_t index_below(py::handle given, const char *name, std::uint64_t count) {
  const auto index = static_cast<std::uint64_t>(whole_number(given, name, 0));
  if (index >= count)
    refuse_value(name, text_of(given), "the recording has " + std::to_string(count) + ", counted from 0");
  return index;
}

/// A recording that is read once from front to back.
class block_reader {
 public:
  block_reader(const recording_file &of, std::uint64_t first, std::uint64_t count)
      : reader_(of.reader(first, count)), type_(of.type()) {}

  /// The next samples, at most so many; none at the end.
  py::array next(std::size_t count) {
    py::array block = new_array(type_, count);
    void *const to = block.mutable_data();
    std::size_t got = 0;
    {
      const turn mine(turnstile_);
      got = read_all(to, count);
    }
    return got == count ? block : py::array(block[py::slice(0, static_cast<py::ssize_t>(got), 1)]);
  }
  /// All of `to`, without the GIL.
  std::size_t read_all(void *to, std::size_t count) {
    return type_ == element::cf32 ? fill(static_cast<std::complex<float> *>(to), count)
                                  : fill(static_cast<float *>(to), count);
  }

 private:
  template <class T>
  std::size_t fill(T *to, std::size_t count) {
    interruptions signals;
    std::size_t done = 0;
    while (done < count) {
      const std::size_t got = reader_.read(std::span<T>(to + done, std::min(read_at_once, count - done)));
      if (got == 0) break;
      done += got;
      signals.poll();
    }
    return done;
  }

  recording::sample_reader reader_;
  element type_;
  turnstile turnstile_;
};

py::array read(const recording_file &of, py::handle first_given, py::handle count_given, py::handle out) {
  std::uint64_t first = 0, count = 0;
  of.require_range(first_given, count_given, first, count);
  target result(out, of.type(), {static_cast<py::ssize_t>(count)}, {});
  {
    void *const to = result.first<void>();
    const py::gil_scoped_release released;
    block_reader(of, first, count).read_all(to, static_cast<std::size_t>(count));
  }
  return result.finish();
}

/// start, samples, frequency, seconds and part of a second since 1970, for each capture that has samples chosen.
py::list captures(const recording_file &of) {
  const recording::source &from = of.source();
  const std::uint64_t end = from.chosen_first + from.chosen_samples;
  py::list found;
  for (const recording::capture &each : from.captures) {
    const std::uint64_t first = std::max(each.start, from.chosen_first),
                        last = std::min(each.start + each.samples, end);
    const bool chosen = each.start >= from.chosen_first && each.start + each.samples <= end;
    if (first > last || !chosen) continue;
    py::object time = py::none();
    if (each.begin) time = py::make_tuple(each.begin->seconds, each.begin->part);
    py::object frequency = py::none();
    if (each.frequency) frequency = py::float_(*each.frequency);
    found.append(py::make_tuple(first - from.chosen_first, last - first, frequency, time));
  }
  return found;
}

/// start and index in the metadata's list, for each annotation of the samples chosen.
py::list annotations(const recording_file &of) {
  const recording::source &from = of.source();
  py::list found;
  for (const recording::annotation &each : from.annotations) {
    if (each.start < from.chosen_first || each.start >= from.chosen_first + from.chosen_samples) continue;
    found.append(py::make_tuple(each.start - from.chosen_first, each.item));
  }
  return found;
}

/// first, samples of each stretch that an analysis may run over.
py::list stretches(const recording_file &of) {
  py::list found;
  for (const recording::stretch &each : of.source().stretches)
    found.append(py::make_tuple(each.first - of.source().chosen_first, each.samples));
  return found;
}

py::str metadata(const recording_file &of) {
  if (!of.source().metadata) return "{}";
  return of.source().metadata->dump(-1, ' ', false, nlohmann::json::error_handler_t::replace);
}

class file_sink final : public recording::byte_sink {
 public:
  explicit file_sink(int file) noexcept : file_(file) {}

  void write(std::span<const std::byte> bytes) override {
    while (!bytes.empty()) {
      const ssize_t count = ::write(file_, bytes.data(), bytes.size());
      if (count < 0 && errno == EINTR) continue;
      if (count < 0) throw recording::failure("the samples cannot be written: {}", recording::system_reason(errno));
      bytes = bytes.subspan(static_cast<std::size_t>(count));
    }
  }

 private:
  int file_;
};

/// Index of the first element that is not finite, or the size.
template <class T>
std::size_t first_bad(std::span<const T> x) noexcept {
  for (std::size_t i = 0; i < x.size(); ++i)
    if (!std::isfinite(std::real(x[i])) || !std::isfinite(std::imag(x[i]))) return i;
  return x.size();
}

/// Writes the samples to an open file and gives how many were beyond full scale.
std::uint64_t write_samples(int file, py::handle x_given, py::handle datatype) {
  const numbers given(x_given, "x");
  const recording::sample_format format = format_of(datatype);
  if (is_complex(given.type) && !format.is_complex)
    refuse_value("datatype", text_of(datatype),
                 std::string("x is of ") + name_of(given.type) + ", so it begins with c");
  const element type = format.is_complex ? complex_of(given.type) : element::f64;
  const samples x(given, type);
  file_sink sink(file);
  recording::sample_encoder encoder(sink, format);
  std::size_t done = 0;
  std::optional<std::size_t> bad;
  {
    const py::gil_scoped_release released;
    with_type(type, [&]<class T>(std::type_identity<T>) {
      if constexpr (!std::is_same_v<T, float>)
        in_pieces<T>(x, read_at_once, [&](const T *from, std::size_t count) {
          const std::span<const T> block(from, count);
          const std::size_t at = first_bad(block);
          if (!bad && at < count) bad = done + at;
          if (!bad) encoder.write(block);
          done += count;
        });
    });
  }
  if (bad)
    throw py::value_error("x[" + std::to_string(*bad) + "] is not finite; a recording holds finite samples alone");
  return encoder.clipped();
}

/// The datatype's name in full.
std::string datatype_name(py::handle datatype) {
  return format_of(datatype).name();
}

}  // namespace

recording_file::recording_file(const std::string &path, py::handle datatype, py::handle sample_rate,
                               py::handle frequency, py::handle capture, py::handle channel) {
  recording::options said;
  said.names = {"sample_rate=", "frequency=", "datatype=", "channel=", "capture=", "start=", "duration="};
  said.rate = optional_number(sample_rate, "sample_rate");
  if (said.rate && !(*said.rate > 0)) refuse_value("sample_rate", text_of(sample_rate), "give hertz above 0");
  said.frequency = optional_number(frequency, "frequency");
  if (!datatype.is_none()) said.format = format_of(datatype).name();
  // They are compared with what there is once the recording is open.
  if (!capture.is_none()) whole_number(capture, "capture", 0);
  whole_number(channel, "channel", 0);
  try {
    const py::gil_scoped_release released;
    source_ = recording::open(path, said);
  } catch (const recording::failure &failed) {
    const std::string_view text = failed.what();
    for (const std::string &name : {said.names.rate, said.names.format})
      if (text.find(name) != std::string_view::npos) throw py::value_error(failed.what());
    throw;
  }
  said.channel = static_cast<std::int64_t>(index_below(channel, "channel", source_.channels));
  if (!capture.is_none())
    said.capture = static_cast<std::int64_t>(index_below(capture, "capture", source_.captures.size()));
  recording::choose(source_, said);
}

void recording_file::require_range(py::handle first, py::handle count, std::uint64_t &first_read,
                                   std::uint64_t &count_read) const {
  first_read = static_cast<std::uint64_t>(whole_number(first, "start", 0));
  if (first_read > samples())
    refuse_value("start", text_of(first), "the recording has " + std::to_string(samples()) + " samples");
  const std::uint64_t left = samples() - first_read;
  count_read = count.is_none() ? left : static_cast<std::uint64_t>(whole_number(count, "count", 0));
  if (count_read > left)
    refuse_value("count", text_of(count), "from there on the recording has " + std::to_string(left) + " samples");
}

void add_recordings(py::module_ &module) {
  py::class_<recording_file>(module, "RecordingFile")
      .def(py::init<const std::string &, py::handle, py::handle, py::handle, py::handle, py::handle>())
      .def("read", &read)
      .def("captures", &captures)
      .def("annotations", &annotations)
      .def("stretches", &stretches)
      .def("metadata", &metadata)
      .def_property_readonly("datatype", [](const recording_file &of) { return of.source().datatype; })
      .def_property_readonly("sample_rate", [](const recording_file &of) { return of.source().rate; })
      .def_property_readonly("frequency",
                             [](const recording_file &of) -> py::object {
                               if (of.source().frequency) return py::float_(*of.source().frequency);
                               return py::none();
                             })
      .def_property_readonly("samples", &recording_file::samples)
      .def_property_readonly("channels", [](const recording_file &of) { return of.source().channels; })
      .def_property_readonly("is_complex", [](const recording_file &of) { return is_complex(of.type()); });
  py::class_<block_reader>(module, "BlockReader")
      .def(py::init<const recording_file &, std::uint64_t, std::uint64_t>(), py::keep_alive<1, 2>())
      .def("next", &block_reader::next);
  module.def("write_samples", &write_samples);
  module.def("datatype_name", &datatype_name);
}

}  // namespace binding
