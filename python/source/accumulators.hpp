// What accumulators of streams have in common: the type that the first block fixes, merging, saving.
// SPDX-License-Identifier: MIT
#pragma once

#include <lumra/object.hpp>
#include <string_view>
#include <utility>

#include "arrays.hpp"
#include "recordings.hpp"

namespace binding {

/// Throws where bytes that were saved name another type.
element checked_type(std::int32_t code);

/// A kind has the C functions of its objects, `owned` and `object`; where(object) gives start, samples, segments and
/// origin; type_of(object); make(type, start, origin), which throws for wrong options; type_for(first block's type);
/// adopt(object), after loading; and piece(), the samples of one call without the GIL in between.
template <class Kind>
class accumulator {
 public:
  explicit accumulator(Kind kind)
      : kind_(std::move(kind)), object_(kind_.make(kind_.usual(), kind_.start, kind_.origin)) {}

  void add(py::handle block) {
    const numbers given(block, "x");
    if (given.array.ndim() == 1 && given.array.size() == 0) return;
    // The type is fixed before the array is looked at again, so that the conversion has the GIL.
    const samples x(given, settle(given.type));
    const turn mine(turnstile_);
    with_type(x.type(), [&]<class T>(std::type_identity<T>) {
      in_pieces<T>(x, kind_.piece(),
                   [&](const T *from, std::size_t count) { lumra::check_open(Kind::add(object_.get(), from, count)); });
    });
  }

  /// Samples of a recording, from `first` on.
  void add_recording(const recording_file &from, py::handle first_given, py::handle count_given) {
    std::uint64_t first = 0, count = 0;
    from.require_range(first_given, count_given, first, count);
    if (count == 0) return;
    const element type = settle(from.type());
    const turn mine(turnstile_);
    with_type(type, [&]<class T>(std::type_identity<T>) {
      // Complex samples never come to a stream of real ones.
      if constexpr (std::is_floating_point_v<T>)
        if (is_complex(from.type())) return;
      add_read<T>(from.reader(first, count));
    });
  }

  void merge(const accumulator &next) {
    if (this == &next) throw py::value_error("other is the accumulator itself; give its neighbour");
    const turn mine(turnstile_, const_cast<accumulator &>(next).turnstile_);
    const auto here = Kind::where(object_.get()), there = Kind::where(next.object_.get());
    const std::uint64_t end = here.start + here.samples;
    if (there.start != end)
      throw py::value_error("other.start is " + std::to_string(there.start) + "; it is where this one ends, " +
                            std::to_string(end));
    const element type = Kind::type_of(object_.get()), next_type = Kind::type_of(next.object_.get());
    if (type == next_type) {
      lumra::check_open(Kind::merge(object_.get(), next.object_.get()));
    } else if (there.samples == 0) {
      const auto same = next.kind_.make(type, there.start, there.origin);
      lumra::check_open(Kind::merge(object_.get(), same.get()));
    } else if (here.samples == 0) {
      auto same = kind_.make(next_type, here.start, here.origin);
      lumra::check_open(Kind::merge(same.get(), next.object_.get()));
      object_ = std::move(same);
    } else {
      throw py::value_error(std::string("other is of ") + name_of(next_type) + "; this one is of " + name_of(type));
    }
  }

  [[nodiscard]] auto where() {
    const turn mine(turnstile_);
    return Kind::where(object_.get());
  }

  py::bytes save() {
    std::vector<std::byte> state;
    {
      const turn mine(turnstile_);
      state = lumra::detail::save(std::as_const(object_).get(), Kind::state_size, Kind::save);
    }
    return {reinterpret_cast<const char *>(state.data()), state.size()};
  }
  void load(const py::bytes &saved) {
    const std::string_view bytes = saved;
    const turn mine(turnstile_);
    auto loaded = kind_.load(bytes);
    checked_type(static_cast<std::int32_t>(Kind::type_of(loaded.get())));
    kind_.adopt(loaded.get());
    object_ = std::move(loaded);
  }

  /// Runs work(object) in turn.
  template <class Work>
  decltype(auto) with_object(Work work) {
    const turn mine(turnstile_);
    return work(object_.get());
  }
  [[nodiscard]] const Kind &kind() const noexcept { return kind_; }

 private:
  /// The type of the stream, after a block of this one. Throws TypeError.
  element settle(element block) {
    const element wanted = kind_.type_for(block);
    element fixed{};
    {
      const turn mine(turnstile_);
      const auto here = Kind::where(object_.get());
      fixed = Kind::type_of(object_.get());
      if (here.samples == 0 && fixed != wanted) {
        object_ = kind_.make(wanted, here.start, here.origin);
        fixed = wanted;
      }
    }
    if (is_complex(block) && !is_complex(fixed))
      refuse_type("x", std::string("of dtype ") + name_of(block), "the stream is of real samples");
    return fixed;
  }

  template <class T>
  void add_read(recording::sample_reader reader) {
    interruptions signals;
    std::vector<T> buffer(read_at_once);
    for (;;) {
      const std::size_t count = reader.read(std::span<T>(buffer));
      if (count == 0) return;
      lumra::check_open(Kind::add(object_.get(), buffer.data(), count));
      signals.poll();
    }
  }

  Kind kind_;
  turnstile turnstile_;
  typename Kind::owned object_;
};

}  // namespace binding
