// Accumulators of the open interface, spectra, levels and error vectors, with any arguments: no crash, no word outside
// of the arrays, and a state that is loaded is the one that was saved. What is read goes on to the figures of spectra.
// SPDX-License-Identifier: MIT
#include <lumra/lumra.h>

#include <algorithm>
#include <vector>

#include "open_arrays.hpp"

namespace fuzz {
namespace {

enum kind : unsigned { spectrum, level, evm, kinds, no_object = kinds };

/// What all kinds have.
struct functions {
  lumra_status (*add)(void *object, const void *x, const void *y, std::uint64_t n);
  lumra_status (*merge)(void *object, const void *next);
  lumra_status (*state_size)(const void *object, std::uint64_t *size);
  lumra_status (*save)(const void *object, void *bytes, std::uint64_t room);
  lumra_status (*load)(const void *bytes, std::uint64_t size, void **object);
  void (*free)(void *object);
};

template <class Handle>
Handle *as(void *object) {
  return static_cast<Handle *>(object);
}
template <class Handle>
const Handle *as(const void *object) {
  return static_cast<const Handle *>(object);
}
template <class Handle, class Load>
lumra_status loaded(void **object, Load load) {
  Handle *made = nullptr;
  const lumra_status code = load(&made);
  *object = made;
  return code;
}

constexpr functions all[kinds] = {
    {[](void *o, const void *x, const void *, std::uint64_t n) {
       return lumra_spectrum_add(as<lumra_spectrum_average>(o), x, n);
     },
     [](void *o, const void *next) {
       return lumra_spectrum_merge(as<lumra_spectrum_average>(o), as<lumra_spectrum_average>(next));
     },
     [](const void *o, std::uint64_t *size) { return lumra_spectrum_state_size(as<lumra_spectrum_average>(o), size); },
     [](const void *o, void *bytes, std::uint64_t room) {
       return lumra_spectrum_save(as<lumra_spectrum_average>(o), bytes, room);
     },
     [](const void *bytes, std::uint64_t size, void **o) {
       return loaded<lumra_spectrum_average>(o, [&](auto **made) { return lumra_spectrum_load(bytes, size, 1, made); });
     },
     [](void *o) { lumra_spectrum_free(as<lumra_spectrum_average>(o)); }},
    {[](void *o, const void *x, const void *, std::uint64_t n) { return lumra_level_add(as<lumra_level>(o), x, n); },
     [](void *o, const void *next) { return lumra_level_merge(as<lumra_level>(o), as<lumra_level>(next)); },
     [](const void *o, std::uint64_t *size) { return lumra_level_state_size(as<lumra_level>(o), size); },
     [](const void *o, void *bytes, std::uint64_t room) { return lumra_level_save(as<lumra_level>(o), bytes, room); },
     [](const void *bytes, std::uint64_t size, void **o) {
       return loaded<lumra_level>(o, [&](auto **made) { return lumra_level_load(bytes, size, made); });
     },
     [](void *o) { lumra_level_free(as<lumra_level>(o)); }},
    {[](void *o, const void *x, const void *y, std::uint64_t n) {
       return lumra_evm_meter_add(as<lumra_evm_meter>(o), x, y, n);
     },
     [](void *o, const void *next) { return lumra_evm_meter_merge(as<lumra_evm_meter>(o), as<lumra_evm_meter>(next)); },
     [](const void *o, std::uint64_t *size) { return lumra_evm_meter_state_size(as<lumra_evm_meter>(o), size); },
     [](const void *o, void *bytes, std::uint64_t room) {
       return lumra_evm_meter_save(as<lumra_evm_meter>(o), bytes, room);
     },
     [](const void *bytes, std::uint64_t size, void **o) {
       return loaded<lumra_evm_meter>(o, [&](auto **made) { return lumra_evm_meter_load(bytes, size, made); });
     },
     [](void *o) { lumra_evm_meter_free(as<lumra_evm_meter>(o)); }},
};

struct object {
  unsigned is;
  void *address;
  std::int32_t type;
  std::uint64_t bins;
};

struct bench {
  input &in;
  std::vector<object> live = {};
  std::vector<void *> freed = {};
  std::vector<unsigned char> saved = {};
  object saved_of{no_object, nullptr, LUMRA_TYPE_F32, 0};
  // The last spectrum that was read.
  std::vector<double> power = {};
  lumra_spectrum_info info{};

  explicit bench(input &from) noexcept : in(from) {}
  bench(const bench &) = delete;
  bench &operator=(const bench &) = delete;
  ~bench() {
    while (!live.empty()) free(live.back());
  }

  /// A live object of that kind, or now and then none of them: null, one that was freed, or of another kind.
  object pick(unsigned wanted) {
    const unsigned b = in.byte();
    object picked{no_object, nullptr, LUMRA_TYPE_F32, 1};
    if (b >= 252 && !freed.empty()) picked.address = freed[in.byte() % freed.size()];
    const std::size_t start = live.empty() ? 0 : in.byte() % live.size();
    for (std::size_t k = 0; k < live.size(); ++k) {
      const object &one = live[(start + k) % live.size()];
      if (one.address == picked.address || (b < 244 ? one.is == wanted : b < 248)) return one;
    }
    return picked;
  }
  void free(object one) {
    all[one.is].free(one.address);
    std::erase_if(live, [one](const object &other) { return other.address == one.address; });
    freed.push_back(one.address);
  }
  static void check(const arrays &with, const object &one, unsigned wanted, lumra_status code,
                    int line = __builtin_LINE()) {
    with.check(code, line);
    hold(one.is == wanted || code == LUMRA_WRONG_OBJECT || code == LUMRA_NULL_ARGUMENT, "code of what is no object",
         line);
  }
};

/// Positions of streams: where another object ends, small ones, and those at the end of all.
std::uint64_t position(bench &b) {
  if (b.in.flag()) return 0;
  const object one = b.pick(b.in.choice(kinds));
  lumra_spectrum_extent s{};
  lumra_level_extent l{};
  lumra_evm_meter_extent e{};
  if (one.is == spectrum) (void)lumra_spectrum_where(as<lumra_spectrum_average>(one.address), &s);
  if (one.is == level) (void)lumra_level_where(as<lumra_level>(one.address), &l);
  if (one.is == evm) (void)lumra_evm_meter_where(as<lumra_evm_meter>(one.address), &e);
  if (b.in.one_in(8)) return (std::uint64_t{1} << 62) - b.in.choice(3) + b.in.choice(3);
  return s.start + s.samples + l.start + l.samples + e.start + e.samples + (b.in.one_in(8) ? b.in.byte() : 0);
}

double near(input &in, double usual) {
  return in.one_in(8) ? in.real() * (in.flag() ? 1 : 1000) : usual;
}

lumra_spectrum_options spectrum_options(bench &b, std::int32_t type) {
  input &in = b.in;
  constexpr std::uint64_t odd[] = {0, 15, (1 << 27) + 1, huge};
  const std::uint64_t start = position(b);
  return {sizeof(lumra_spectrum_options),
          type,
          near(in, 1e6),
          near(in, 0),
          in.one_in(16) ? odd[in.choice(4)] : 16U + in.choice(64),
          in.option(13),
          in.option(2),
          near(in, 8),
          near(in, in.choice(4) / 4.0),
          in.one_in(16)  ? 1025U
          : in.one_in(8) ? 2U
                         : 1U,
          in.one_in(32),
          start,
          in.one_in(4) ? start - in.choice(2) : 0};
}

lumra_evm_meter_options evm_options(bench &b, std::int32_t type) {
  input &in = b.in;
  const std::uint32_t align = in.one_in(16) ? in.byte() : in.choice(16);
  return {sizeof(lumra_evm_meter_options),
          type,
          align,
          in.one_in(32),
          position(b),
          near(in, 1),
          near(in, 1),
          near(in, 0),
          near(in, in.flag() ? 0 : 2.5),
          near(in, in.flag() ? 0 : 0.01),
          near(in, 0),
          near(in, 0)};
}

void create(bench &b) {
  if (b.live.size() >= 6) return b.free(b.live[b.in.byte() % b.live.size()]);
  input &in = b.in;
  const arrays with(in);
  const bool nowhere = in.one_in(32);
  const auto finish = [&](unsigned as_kind, void *made, std::int32_t type, lumra_status code, std::uint64_t bins = 0) {
    with.check(code);
    hold(code == LUMRA_SUCCESS ? !nowhere && made : made == nullptr, "an object, or none");
    if (code == LUMRA_SUCCESS) b.live.push_back({as_kind, made, type, bins});
  };
  const std::int32_t type = any_type(in);
  switch (in.choice(3)) {
    case spectrum: {
      lumra_spectrum_average *made = nullptr;
      const record<lumra_spectrum_options> how(in, spectrum_options(b, type), LUMRA_SPECTRUM_OPTIONS);
      const auto code = lumra_spectrum_create(how.address, nowhere ? nullptr : &made);
      return finish(spectrum, made, how.meant.type, code,
                    is_real(how.meant.type) ? how.meant.points / 2 + 1 : how.meant.points);
    }
    case level: {
      lumra_level *made = nullptr;
      const record<lumra_level_options> how(in, {sizeof(lumra_level_options), type, position(b), in.choice(3), 0},
                                            LUMRA_LEVEL_OPTIONS);
      const auto code = lumra_level_create(how.address, nowhere ? nullptr : &made);
      return finish(level, made, how.meant.type, code);
    }
    default: {
      lumra_evm_meter *made = nullptr;
      const record<lumra_evm_meter_options> how(in, evm_options(b, in.flag() ? LUMRA_TYPE_CF32 : type),
                                                LUMRA_EVM_METER_OPTIONS);
      const auto code = lumra_evm_meter_create(how.address, nowhere ? nullptr : &made);
      return finish(evm, made, how.meant.type, code);
    }
  }
}

/// Now and then more than a block of error vectors.
std::uint64_t sample_count(input &in) {
  return in.one_in(64) ? LUMRA_EVM_WINDOW + in.choice(200) * std::uint64_t{20} : any_count(in);
}

void add(bench &b) {
  const unsigned wanted = b.in.choice(kinds);
  const object one = b.pick(wanted);
  arrays with(b.in);
  const std::uint64_t n = sample_count(b.in), bytes = held(n) * size_of(one.type);
  const void *const x = with.give(bytes, real_size(one.type), false);
  const void *const y = wanted == evm ? with.give(bytes, real_size(one.type), false) : nullptr;
  bench::check(with, one, wanted, all[wanted].add(one.address, x, y, n));
}

void merge(bench &b) {
  const unsigned wanted = b.in.choice(kinds);
  const object one = b.pick(wanted), next = b.pick(wanted);
  const arrays none(b.in);
  const auto code = all[wanted].merge(one.address, next.address);
  none.check(code);
  hold(code != LUMRA_SUCCESS || (one.is == wanted && next.is == wanted), "a merge of what is no object");
}

void interrupt(bench &b) {
  const object one = b.pick(spectrum);
  const arrays none(b.in);
  auto *const object = as<lumra_spectrum_average>(one.address);
  bench::check(none, one, spectrum, b.in.flag() ? lumra_spectrum_gap(object) : lumra_spectrum_clear(object));
}

void read(bench &b) {
  const unsigned wanted = b.in.choice(kinds);
  const object one = b.pick(wanted);
  arrays with(b.in);
  const auto doubles = [&](std::uint64_t count) {
    return static_cast<double *>(with.give(held(count) * sizeof(double), sizeof(double), true));
  };
  if (wanted == spectrum) {
    const std::uint64_t room = b.in.one_in(8) ? any_count(b.in) : one.bins;
    double *const power = doubles(room), *const maximum = b.in.flag() ? doubles(room) : nullptr;
    double *const minimum = b.in.flag() ? doubles(room) : nullptr;
    lumra_spectrum_info info{};
    info.size = b.in.one_in(16) ? b.in.byte() : sizeof info;
    const auto code = lumra_spectrum_read(as<lumra_spectrum_average>(one.address), b.in.one_in(32) ? nullptr : &info,
                                          power, maximum, minimum, room);
    bench::check(with, one, spectrum, code);
    if (code != LUMRA_SUCCESS || info.size != sizeof info) return;
    b.power.assign(power, power + one.bins);
    b.info = info;
  } else if (wanted == level) {
    lumra_level_result result{};
    result.size = b.in.one_in(16) ? b.in.byte() : sizeof result;
    const auto *const object = as<lumra_level>(one.address);
    bench::check(with, one, level, lumra_level_read(object, b.in.one_in(32) ? nullptr : &result));
    const std::uint64_t count = any_count(b.in);
    const double *const above = doubles(count);
    bench::check(with, one, level, lumra_level_ccdf(object, above, doubles(count), count));
  } else {
    lumra_evm_result result{};
    result.size = b.in.one_in(16) ? b.in.byte() : sizeof result;
    const auto *const object = as<lumra_evm_meter>(one.address);
    bench::check(with, one, evm, lumra_evm_meter_read(object, b.in.one_in(32) ? nullptr : &result));
    lumra_evm_refinement better{};
    better.size = b.in.one_in(16) ? b.in.byte() : sizeof better;
    bench::check(with, one, evm, lumra_evm_meter_refine(object, b.in.one_in(32) ? nullptr : &better));
  }
}

/// Error vectors of records: aligned, and under a known model.
void compare(bench &b) {
  input &in = b.in;
  arrays with(in);
  const std::int32_t type = in.flag() ? LUMRA_TYPE_CF32 : LUMRA_TYPE_CF64;
  const std::uint64_t n = any_count(in), real = real_size(type);
  const auto give = [&](std::uint64_t size, bool writes) {
    return writes && in.flag() ? nullptr : with.give(held(n) * size, real, writes);
  };
  const void *const x = give(2 * real, false), *const y = in.one_in(4) ? x : give(2 * real, false);
  void *const error = give(2 * real, true), *const magnitude = give(real, true), *const phase = give(real, true);
  if (in.flag()) {
    const record<lumra_evm_meter_options> how(in, evm_options(b, type), LUMRA_EVM_METER_OPTIONS);
    if (how.meant.type != type) return;
    return with.check(lumra_evm_errors(how.address, x, y, n, error, magnitude, phase));
  }
  const record<lumra_evm_options> how(in, {sizeof(lumra_evm_options), in.choice(17), near(in, 1), in.choice(3), 0},
                                      LUMRA_EVM_OPTIONS);
  lumra_evm_result result{};
  result.size = sizeof result;
  with.check(type == LUMRA_TYPE_CF32
                 ? lumra_evm_measure_cf32(as<lumra_cf32>(x), as<lumra_cf32>(y), n, how.address, &result,
                                          as<lumra_cf32>(error), as<float>(magnitude), as<float>(phase))
                 : lumra_evm_measure_cf64(as<lumra_cf64>(x), as<lumra_cf64>(y), n, how.address, &result,
                                          as<lumra_cf64>(error), as<double>(magnitude), as<double>(phase)));
}

/// Figures of the last spectrum, or of what is none.
void measure(bench &b) {
  input &in = b.in;
  arrays with(in);
  std::vector<double> power = b.power;
  lumra_spectrum_info info = b.info;
  if (in.one_in(4)) {
    power.assign(in.byte(), in.real());
    info.sides = in.option(3);
    info.points = in.flag() ? power.size() : 2 * power.size() - 2;
    info.noise_bandwidth_bins = in.real();
    info.spacing_hz = in.real();
    info.window = in.option(13);
  }
  for (double &value : power)
    if (in.left() && in.one_in(16)) value = in.real();
  const auto *const about = in.one_in(32) ? nullptr : &info;
  const auto hertz = [&] { return near(in, info.first_hz + in.real() * info.sample_rate_hz); };
  const auto doubles = [&](std::uint64_t count) {
    return static_cast<double *>(with.give(held(count) * sizeof(double), sizeof(double), true));
  };
  const std::uint64_t bins = in.one_in(16) ? huge : power.size();
  switch (in.choice(5)) {
    case 0:
      return with.check(lumra_channel_power(power.data(), bins, about, hertz(), hertz(), doubles(1)));
    case 1: {
      double *const low = doubles(1);
      return with.check(lumra_occupied_bandwidth(power.data(), bins, about, near(in, 0.99), low, doubles(1)));
    }
    case 2: {
      const std::uint64_t count = any_count(in);
      const double *const offsets = doubles(count);
      auto *const adjacent =
          static_cast<lumra_adjacent *>(with.give(held(count) * sizeof(lumra_adjacent), sizeof(double), true));
      return with.check(lumra_adjacent_power(power.data(), bins, about, hertz(), near(in, info.spacing_hz * 4),
                                             near(in, info.spacing_hz * 2), offsets, count, adjacent));
    }
    case 3: {
      const record<lumra_find_peaks_options> how(
          in,
          {sizeof(lumra_find_peaks_options), in.one_in(32), near(in, 0), near(in, info.spacing_hz), hertz(), hertz()},
          LUMRA_FIND_PEAKS_OPTIONS);
      const std::uint64_t room = any_count(in) % 100;
      auto *const peaks = static_cast<lumra_peak *>(with.give(room * sizeof(lumra_peak), sizeof(double), true));
      auto *const count = static_cast<std::uint64_t *>(with.give(sizeof(std::uint64_t), sizeof(double), true));
      return with.check(lumra_find_peaks(power.data(), bins, about, how.address, peaks, room, count));
    }
    default: {
      const auto orders = static_cast<std::uint32_t>(in.one_in(16) ? 1001 : 1 + in.choice(12));
      const record<lumra_tone_options> how(
          in, {sizeof(lumra_tone_options), orders, in.option(2), in.one_in(32), hertz()}, LUMRA_TONE_OPTIONS);
      auto *const figures =
          static_cast<lumra_tone_figures *>(with.give(sizeof(lumra_tone_figures), sizeof(double), true));
      const std::uint64_t room = in.flag() ? 0 : in.choice(16);
      auto *const harmonics =
          static_cast<lumra_harmonic *>(with.give(room * sizeof(lumra_harmonic), sizeof(double), true));
      return with.check(lumra_tone(power.data(), bins, about, how.address, figures, harmonics, room));
    }
  }
}

std::vector<unsigned char> state_of(const object &one) {
  std::uint64_t size = 0;
  hold(all[one.is].state_size(one.address, &size) == LUMRA_SUCCESS, "a state's size");
  std::vector<unsigned char> bytes(size);
  hold(all[one.is].save(one.address, bytes.data(), size) == LUMRA_SUCCESS, "a state");
  return bytes;
}

void save(bench &b) {
  const unsigned wanted = b.in.choice(kinds);
  const object one = b.pick(wanted);
  const arrays none(b.in);
  std::uint64_t size = 0;
  const auto code = all[wanted].state_size(one.address, &size);
  bench::check(none, one, wanted, code);
  if (code != LUMRA_SUCCESS) return;
  std::vector<unsigned char> bytes(size - 1);
  hold(all[wanted].save(one.address, bytes.data(), bytes.size()) == LUMRA_TOO_LITTLE_ROOM, "too little room");
  b.saved = state_of(one);
  b.saved_of = one;
}

/// States as they were saved, damaged, or with a checksum that hides what was changed.
void load(bench &b) {
  std::vector<unsigned char> bytes = b.saved;
  const unsigned how = b.in.choice(4), wanted = b.in.one_in(16) ? b.in.choice(kinds) : b.saved_of.is;
  if (bytes.size() < 32 || b.live.size() >= 8) return;
  const auto anywhere = [&] {
    // Most of the fields that are checked lie in front.
    const std::size_t at = b.in.flag() ? b.in.byte() : b.in.raw<std::uint32_t>();
    return at % bytes.size();
  };
  if (how == 1) bytes.resize(anywhere());
  for (unsigned k = 0; how > 1 && k <= b.in.choice(4); ++k)
    bytes[anywhere()] ^= static_cast<unsigned char>(1 + b.in.choice(255));
  if (how == 3) {
    seal(bytes);
  }
  const arrays none(b.in);
  object one = b.saved_of;
  one.is = wanted;
  const auto code = all[wanted].load(bytes.data(), bytes.size(), &one.address);
  none.check(code);
  const bool whole = bytes == b.saved && wanted == b.saved_of.is;
  hold(how == 3 || (code == LUMRA_SUCCESS) == whole, "a whole state is loaded");
  if (code != LUMRA_SUCCESS) return hold(one.address == nullptr, "no object");
  if (whole) hold(state_of(one) == b.saved, "what is loaded is what was saved");
  if (wanted == spectrum) {
    lumra_spectrum_options options{};
    lumra_spectrum_extent extent{};
    options.size = sizeof options;
    hold(lumra_spectrum_get_options(as<lumra_spectrum_average>(one.address), &options) == LUMRA_SUCCESS &&
             lumra_spectrum_where(as<lumra_spectrum_average>(one.address), &extent) == LUMRA_SUCCESS,
         "a spectrum that is whole");
    one.type = options.type;
    one.bins = extent.bins;
  } else if (wanted == level) {
    lumra_level_extent extent{};
    hold(lumra_level_where(as<lumra_level>(one.address), &extent) == LUMRA_SUCCESS, "a level that is whole");
    one.type = extent.type;
  } else {
    lumra_evm_meter_extent extent{};
    hold(lumra_evm_meter_where(as<lumra_evm_meter>(one.address), &extent) == LUMRA_SUCCESS, "a meter that is whole");
    one.type = extent.type;
  }
  b.live.push_back(one);
}

}  // namespace

void run(input &in) {
  bench b(in);
  constexpr void (*steps[])(bench &) = {&create, &create, &add,     &add,     &add,  &merge, &merge,
                                        &read,   &read,   &compare, &measure, &save, &load,  &interrupt};
  for (int calls = 0; in.left() && calls < 32; ++calls) steps[in.choice(std::size(steps))](b);
}

}  // namespace fuzz
