// The open interface with any arguments: no crash, no word outside of the arrays, and failures that leave a sentence
// and nothing else behind. SPDX-License-Identifier: MIT
#include <lumra/lumra.h>

#include <tuple>
#include <type_traits>

#include "open_arrays.hpp"

namespace fuzz {
namespace {

// ---- Functions without objects

template <class A>
A argument(input &in, arrays &with, std::uint64_t own_count, std::uint64_t elements) {
  if constexpr (std::is_same_v<A, std::uint64_t>) {
    return own_count;
  } else if constexpr (std::is_same_v<A, const char *>) {
    constexpr const char *names[] = {"hann", "kaiser:8.6", "kaiser:", "kaiser:nan", "", nullptr, "flattop:1", "none"};
    return names[in.choice(8)];
  } else if constexpr (std::is_pointer_v<A>) {
    using T = std::remove_pointer_t<A>;
    return static_cast<A>(with.give(held(elements) * sizeof(T), alignof(T), !std::is_const_v<T>));
  } else if constexpr (std::is_same_v<A, std::int32_t>) {
    return in.option(in.flag() ? 3 : 14);
  } else if constexpr (std::is_floating_point_v<A>) {
    return static_cast<A>(in.real() * (in.flag() ? 1 : 100));
  } else {
    return {static_cast<decltype(A::re)>(in.real()), static_cast<decltype(A::im)>(in.real())};
  }
}

/// Arrays have as many elements as the next count behind them says; the first arguments of some functions as the last.
/// A last count that is a room may not be more than there is.
template <std::size_t by_last, bool room_last, class... A>
void call(input &in, lumra_status (*function)(A...)) {
  arrays with(in);
  std::uint64_t counts[] = {(std::is_same_v<A, std::uint64_t> ? any_count(in) : huge + 1)...};
  if (room_last) counts[sizeof...(A) - 1] = held(counts[sizeof...(A) - 1]);
  std::size_t place = 0;
  const auto elements = [&]() -> std::uint64_t {
    const std::size_t at = place++;
    std::uint64_t found = huge + 1;
    for (std::size_t k = sizeof...(A); k-- > at + 1;)
      if (counts[k] != huge + 1 && (found == huge + 1 || at >= by_last)) found = counts[k];
    return found == huge + 1 ? 1 : found;
  };
  std::size_t own = 0;
  const std::tuple<A...> arguments{argument<A>(in, with, counts[own++], elements())...};
  with.check(std::apply(function, arguments));
}

#define ALL(NAME) &NAME##_f32, &NAME##_f64, &NAME##_cf32, &NAME##_cf64
constexpr std::tuple plain_functions{ALL(lumra_divide),
                                     ALL(lumra_divide_by_value),
                                     ALL(lumra_scale),
                                     ALL(lumra_magnitude),
                                     ALL(lumra_power),
                                     ALL(lumra_log2_power),
                                     &lumra_log2_f32,
                                     &lumra_log2_f64,
                                     &lumra_convolve_size,
                                     &lumra_window_make_f32,
                                     &lumra_window_make_f64,
                                     &lumra_window_figures,
                                     &lumra_window_by_name,
                                     &lumra_design_kaiser_lowpass_count,
                                     &lumra_design_root_raised_cosine_count};
constexpr std::tuple functions_with_room{ALL(lumra_convolve),
                                         ALL(lumra_correlate),
                                         &lumra_convolve_with_real_cf32,
                                         &lumra_convolve_with_real_cf64,
                                         &lumra_design_kaiser_lowpass_f32,
                                         &lumra_design_kaiser_lowpass_f64,
                                         &lumra_design_root_raised_cosine_f32,
                                         &lumra_design_root_raised_cosine_f64};
constexpr std::tuple polynomials{ALL(lumra_polynomial), &lumra_polynomial_of_real_cf32, &lumra_polynomial_of_real_cf64};
constexpr std::tuple lookups{&lumra_lookup_cf32, &lumra_lookup_cf64};
#undef ALL

template <std::size_t by_last, bool room_last, class Functions>
void call_one(input &in, const Functions &functions) {
  unsigned rest = in.choice(std::tuple_size_v<Functions>);
  std::apply([&](auto... each) { ((rest-- == 0 ? call<by_last, room_last>(in, each) : void()), ...); }, functions);
}

// ---- Objects

enum kind : unsigned { fft, fir, iir, solver, no_object };
struct object {
  unsigned is;
  void *address;
  std::int32_t type;
  std::uint64_t sizes[3];  // points; values of a state; rows, columns and right sides
};

struct bench {
  input &in;
  std::vector<object> live = {};
  std::vector<void *> freed = {};
  std::vector<unsigned char> saved = {};
  unsigned saved_kind = no_object;

  explicit bench(input &from) noexcept : in(from) {}
  bench(const bench &) = delete;
  bench &operator=(const bench &) = delete;
  ~bench() {
    while (!live.empty()) free(live.back());
  }

  /// A live object of that kind, or none of them: null, one that was freed, of another kind, or never was one.
  object pick(unsigned wanted) {
    const unsigned b = in.byte();
    object picked{no_object, nullptr, LUMRA_TYPE_F32, {1, 1, 1}};
    if (b >= 252) picked.address = in.flag() ? this : in.raw<void *>();
    if (b >= 248 && b < 252 && !freed.empty()) picked.address = freed[in.byte() % freed.size()];
    const std::size_t start = live.empty() ? 0 : in.byte() % live.size();
    for (std::size_t k = 0; k < live.size(); ++k) {
      const object &one = live[(start + k) % live.size()];
      if (one.address == picked.address || (b < 240 ? one.is == wanted : b < 244)) return one;
    }
    return picked;
  }
  void keep(unsigned as, void *address, std::int32_t type, std::uint64_t a, std::uint64_t b = 0, std::uint64_t c = 0) {
    hold(address != nullptr, "an object");
    live.push_back({as, address, type, {a, b, c}});
  }
  void free(const object &one) {
    void *const address = one.address;
    if (one.is == fft) lumra_fft_free(static_cast<lumra_fft *>(address));
    if (one.is == fir) lumra_fir_free(static_cast<lumra_fir *>(address));
    if (one.is == iir) lumra_iir_free(static_cast<lumra_iir *>(address));
    if (one.is == solver) lumra_least_squares_free(static_cast<lumra_least_squares *>(address));
    std::erase_if(live, [address](const object &other) { return other.address == address; });
    freed.push_back(address);
  }
  /// What a function of objects of that kind returned.
  static void check(const arrays &with, const object &one, unsigned wanted, lumra_status code,
                    int line = __builtin_LINE()) {
    with.check(code, line);
    hold(one.is == wanted || code == LUMRA_WRONG_OBJECT || (code == LUMRA_NULL_ARGUMENT && !one.address),
         "code of what is no object", line);
  }
};

/// The lowest and the highest distance from the first element, in bytes, that rows of elements reach.
struct reach {
  std::int64_t low, high;
  reach(std::int64_t step, std::int64_t distance, std::uint64_t count, std::uint64_t rows, std::size_t size) {
    const auto last = static_cast<std::int64_t>(count) - 1, last_row = static_cast<std::int64_t>(held(rows)) - 1;
    const auto limited = [](std::int64_t d) { return -5000 < d && d < 5000 ? d : 0; };  // others are refused
    const std::int64_t along = limited(step) * last, across = limited(distance) * last_row;
    const auto bytes = static_cast<std::int64_t>(size);
    low = -bytes * (std::min<std::int64_t>(along, 0) + std::min<std::int64_t>(across, 0));
    high = bytes * (std::max<std::int64_t>(along, 0) + std::max<std::int64_t>(across, 0) + 1);
  }
};

void transform(bench &b) {
  const object one = b.pick(fft);
  arrays with(b.in);
  const std::uint64_t points = one.sizes[0], bins = is_real(one.type) ? points / 2 + 1 : points;
  const std::uint64_t rows = b.in.one_in(16) ? huge << b.in.choice(3) : b.in.choice(5);
  lumra_fft_layout layout{1, static_cast<std::int64_t>(points), 1, static_cast<std::int64_t>(bins)};
  const bool packed = b.in.flag();
  for (std::int64_t *value :
       {&layout.record_step, &layout.record_distance, &layout.spectrum_step, &layout.spectrum_distance}) {
    if (packed || b.in.flag()) continue;
    const auto small = static_cast<std::int64_t>(b.in.choice(9) * b.in.choice(40)) - 8;
    *value = b.in.one_in(8) ? static_cast<std::int64_t>(huge << b.in.choice(4)) : small;
  }
  const std::size_t real = real_size(one.type);
  const reach samples(layout.record_step, layout.record_distance, points, rows, size_of(one.type));
  const reach spectra(layout.spectrum_step, layout.spectrum_distance, bins, rows, 2 * real);
  const bool in_place = b.in.flag(), forward = b.in.flag();
  const auto room = [&](const reach &r, bool writes) {
    const std::int64_t low = in_place ? std::max(samples.low, spectra.low) : r.low;
    const std::int64_t high = in_place ? std::max(samples.high, spectra.high) : r.high;
    return with.give(static_cast<std::uint64_t>(high), real, writes, static_cast<std::uint64_t>(low));
  };
  void *const record = room(samples, in_place || !forward);
  void *const spectrum = in_place ? record : room(spectra, forward);
  auto *const object = static_cast<lumra_fft *>(one.address);
  const auto *const how = packed ? nullptr : &layout;
  bench::check(with, one, fft,
               forward ? lumra_fft_forward(object, record, spectrum, rows, how)
                       : lumra_fft_backward(object, spectrum, record, rows, how));
}

void create(bench &b) {
  if (b.live.size() >= 8) return b.free(b.live[b.in.byte() % b.live.size()]);
  input &in = b.in;
  arrays with(in);
  const bool nowhere = in.one_in(32), sections = in.flag();
  const auto finish = [&](unsigned as, auto *const &made, std::int32_t type, lumra_status code, std::uint64_t x,
                          std::uint64_t y = 0, std::uint64_t z = 0) {
    with.check(code);
    hold(code == LUMRA_SUCCESS ? !nowhere : made == nullptr, "an object, or none");
    if (code == LUMRA_SUCCESS) b.keep(as, made, type, x, y, z);
  };
  const std::int32_t type = any_type(in);
  switch (in.choice(4)) {
    case fft: {
      lumra_fft *made = nullptr;
      constexpr std::uint64_t sizes[] = {0, (1 << 27) + 1, 997, huge};
      lumra_fft_options options{sizeof options, type, in.one_in(16) ? sizes[in.choice(4)] : 1U + in.choice(70),
                                in.option(4), in.one_in(64)};
      const record<lumra_fft_options> how(in, options, LUMRA_FFT_OPTIONS);
      const auto code = lumra_fft_create(how.address, nowhere ? nullptr : &made);
      return finish(fft, made, how.meant.type, code, how.meant.points);
    }
    case fir: {
      lumra_fir *made = nullptr;
      lumra_fir_options options{sizeof options, type, in.flag() ? 0 : in.flag() ? type : any_type(in), in.option(3)};
      const record<lumra_fir_options> how(in, options, LUMRA_FIR_OPTIONS);
      const std::uint64_t count = any_count(in);
      const std::size_t real = real_size(how.meant.type);
      const std::size_t size = how.meant.taps_type == 0 ? real : size_of(how.meant.taps_type);
      const void *const taps = with.give(held(count) * size, real, false);
      const auto code = lumra_fir_create(how.address, taps, count, nowhere ? nullptr : &made);
      return finish(fir, made, how.meant.type, code, count);
    }
    case iir: {
      lumra_iir *made = nullptr;
      const record<lumra_iir_options> how(in, {sizeof(lumra_iir_options), type, in.option(3)}, LUMRA_IIR_OPTIONS);
      const auto coefficients = [&](std::uint64_t count) {
        return static_cast<const double *>(with.give(held(count) * sizeof(double), sizeof(double), false));
      };
      const std::uint64_t most = in.one_in(16) ? huge : 20, m = in.byte() % most,
                          n = in.one_in(16) ? huge : in.choice(20);
      const double *const forward = coefficients(sections ? 6 * m : m), *const reverse = coefficients(n);
      auto **const to = nowhere ? nullptr : &made;
      const auto code = sections ? lumra_iir_create_sections(how.address, forward, m, to)
                                 : lumra_iir_create(how.address, forward, m, reverse, n, to);
      std::uint64_t order = 0;
      if (code == LUMRA_SUCCESS) hold(lumra_iir_order(made, &order) == LUMRA_SUCCESS, "an order");
      return finish(iir, made, how.meant.type, code, order);
    }
    default: {
      lumra_least_squares *made = nullptr;
      const auto side = [&in] { return in.one_in(32) ? huge : in.one_in(32) ? 0 : 1 + in.choice(12); };
      const std::uint64_t m = side(), n = side();
      const record<lumra_least_squares_options> how(in, {sizeof(lumra_least_squares_options), type, m, n, side()},
                                                    LUMRA_LEAST_SQUARES_OPTIONS);
      const auto code = lumra_least_squares_create(how.address, nowhere ? nullptr : &made);
      return finish(solver, made, how.meant.type, code, how.meant.rows, how.meant.columns, how.meant.right_sides);
    }
  }
}

void filter(bench &b) {
  const bool recursive = b.in.flag();
  const object one = b.pick(recursive ? iir : fir);
  arrays with(b.in);
  const std::uint64_t n = any_count(b.in), bytes = held(n) * size_of(one.type);
  const void *const from = with.give(bytes, real_size(one.type), false);
  void *const to = with.give(bytes, real_size(one.type), true);
  bench::check(with, one, recursive ? iir : fir,
               recursive ? lumra_iir_process(static_cast<lumra_iir *>(one.address), from, to, n)
                         : lumra_fir_process(static_cast<lumra_fir *>(one.address), from, to, n));
}

void inspect_filter(bench &b) {
  const unsigned wanted = b.in.flag() ? iir : fir;
  const object one = b.pick(wanted);
  arrays with(b.in);
  auto *const f = static_cast<lumra_fir *>(one.address);
  auto *const r = static_cast<lumra_iir *>(one.address);
  const std::uint64_t count = b.in.one_in(16) ? any_count(b.in) : one.sizes[0];
  const std::uint64_t bytes = held(count) * (is_real(one.type) ? sizeof(double) : sizeof(lumra_cf64));
  auto *const number = static_cast<std::int32_t *>(with.give(sizeof(std::int32_t), sizeof(std::int32_t), true));
  const unsigned what = b.in.choice(wanted == iir ? 5 : 2);
  if (what == 0) bench::check(with, one, wanted, wanted == iir ? lumra_iir_reset(r) : lumra_fir_reset(f));
  if (what == 1)
    bench::check(with, one, wanted, wanted == iir ? lumra_iir_get_type(r, number) : lumra_fir_get_type(f, number));
  if (what == 2) bench::check(with, one, wanted, lumra_iir_get_method(r, number));
  if (what == 3) bench::check(with, one, wanted, lumra_iir_get_state(r, with.give(bytes, sizeof(double), true), count));
  if (what == 4)
    bench::check(with, one, wanted, lumra_iir_set_state(r, with.give(bytes, sizeof(double), false), count));
}

void solve(bench &b) {
  const object one = b.pick(solver);
  arrays with(b.in);
  const auto matrix = [&](std::uint64_t m, std::uint64_t n, bool writes) {
    return with.give(m * n * size_of(one.type), real_size(one.type), writes);
  };
  const auto &[m, n, k] = one.sizes;
  const void *const a = matrix(m, n, false), *const sides = matrix(m, k, false);
  void *const x = matrix(n, k, true);
  auto *const rank = static_cast<std::uint64_t *>(with.give(sizeof(std::uint64_t), sizeof(std::uint64_t), true));
  bench::check(
      with, one, solver,
      lumra_least_squares_solve(static_cast<lumra_least_squares *>(one.address), a, sides, b.in.real(), x, rank));
}

void save(bench &b) {
  const bool recursive = b.in.flag();
  const object one = b.pick(recursive ? iir : fir);
  const auto *const f = static_cast<lumra_fir *>(one.address);
  const auto *const r = static_cast<lumra_iir *>(one.address);
  std::uint64_t size = 0;
  const arrays none(b.in);
  const auto code = recursive ? lumra_iir_state_size(r, &size) : lumra_fir_state_size(f, &size);
  bench::check(none, one, recursive ? iir : fir, code);
  std::vector<unsigned char> bytes(b.in.one_in(8) && size > 0 ? size - 1 : size);
  const auto saved =
      recursive ? lumra_iir_save(r, bytes.data(), bytes.size()) : lumra_fir_save(f, bytes.data(), bytes.size());
  bench::check(none, one, recursive ? iir : fir, saved);
  hold(code != LUMRA_SUCCESS || (saved == LUMRA_SUCCESS) == (bytes.size() == size), "room for a state");
  if (saved != LUMRA_SUCCESS) return;
  b.saved = bytes;
  b.saved_kind = one.is;
}

/// States as they were saved, damaged, or with a checksum that hides what was changed.
void load(bench &b) {
  std::vector<unsigned char> bytes = b.saved;
  const unsigned how = b.in.choice(4), wanted = b.in.flag() ? iir : fir;
  if (bytes.size() < 32 && how != 0) return;
  if (how == 1) bytes.resize(b.in.raw<std::uint16_t>() % bytes.size());
  for (unsigned k = 0; how > 1 && k <= b.in.choice(4); ++k)
    bytes[b.in.raw<std::uint16_t>() % bytes.size()] ^= static_cast<unsigned char>(1 + b.in.choice(255));
  if (how == 3) {
    seal(bytes);
  }
  const arrays none(b.in);
  lumra_iir *recursive = nullptr;
  lumra_fir *other = nullptr;
  const auto code = wanted == iir ? lumra_iir_load(bytes.data(), bytes.size(), &recursive)
                                  : lumra_fir_load(bytes.data(), bytes.size(), &other);
  none.check(code);
  hold(how == 3 || (code == LUMRA_SUCCESS) == (bytes == b.saved && wanted == b.saved_kind), "a whole state is loaded");
  if (code != LUMRA_SUCCESS) return hold(!recursive && !other, "no object");
  std::int32_t type = 0;
  std::uint64_t order = 0;
  if (recursive)
    hold(lumra_iir_get_type(recursive, &type) == 0 && lumra_iir_order(recursive, &order) == 0,
         "a filter that is whole");
  else
    hold(lumra_fir_get_type(other, &type) == 0, "a filter that is whole");
  b.keep(wanted, recursive ? static_cast<void *>(recursive) : other, type, order);
}

}  // namespace

void run(input &in) {
  bench b(in);
  constexpr void (*all[])(bench &) = {&create, &create, &transform, &filter, &inspect_filter, &solve, &save, &load};
  for (int calls = 0; in.left() && calls < 24; ++calls) {
    const unsigned what = in.choice(12);
    if (what < std::size(all)) all[what](b);
    if (what == 8) call_one<0, false>(in, plain_functions);
    if (what == 9) call_one<0, true>(in, functions_with_room);
    if (what == 10) call_one<1, false>(in, polynomials);
    if (what == 11) call_one<2, false>(in, lookups);
    hold(lumra_status_text(in.one_in(16) ? in.raw<std::int32_t>() : 0) != nullptr, "every code has a text");
  }
}

}  // namespace fuzz
