// What all families share: refusals, slots, sizing. SPDX-License-Identifier: MIT
#include <cstring>
#include <functional>
#include <typeinfo>

#include "toolkit/operations.hpp"

namespace {

using namespace tests;

template <class E>
using Toolkit = toolkit_test<E>;
TYPED_TEST_SUITE(Toolkit, all_letters);

template <class E>
struct refusal {
  const char *why;
  std::int32_t code;
  std::function<std::int32_t(arguments<E> &)> run;
  int emptied = 1;  // arrays of the arguments: outputs and states among them, and inputs that are scratch, too
};

template <class E>
std::vector<refusal<E>> stream_refusals() {
  using A = arguments<E>;
  using R = toolkit::magnitude_of<E>;
  constexpr float nan = std::numeric_limits<float>::quiet_NaN(), inf = std::numeric_limits<float>::infinity();
  const auto decimation = [](array_of<E> A::*x, int factor) {
    return [=](A &a) { return family<E>::decimate(a.*x, a.out, factor, 1); };
  };
  const auto filtering = [](std::vector<toolkit::value_of<R>> b, std::vector<toolkit::value_of<R>> a,
                            bool with_scratch = false, array_of<E> A::*data = &A::x) {
    return [=](A &args) {
      array_of<R> forward = filled<R>(b), reverse = filled<R>(a);
      const auto room = [&](auto &array) { return with_scratch ? array.handle() : nullptr; };
      return filter<E>(args.*data, reverse, forward, args.history, args.output_history, 0, room(args.numbers_scratch),
                       room(args.more_numbers), room(args.scratch));
    };
  };
  const auto resampling = [](float ratio, float delay, int phases = 16, array_of<E> A::*x = &A::x) {
    return [=](A &a) {
      const lumra_resampler_parameters given{ratio, delay, 0};
      return family<E>::resample(a.*x, a.numbers, phases, &given, 1, 0, a.out, &a.time, a.history, a.tap_history,
                                 a.state.data());
    };
  };
  const auto without = [](bool with_coefficients, bool with_state) {
    return [=](A &a) {
      return family<E>::resample(a.x, with_coefficients ? a.numbers.handle() : nullptr, 16, nullptr, 0, 0, a.out,
                                 &a.time, a.history, a.tap_history, with_state ? a.state.data() : nullptr);
    };
  };
  return {
      {"decimation: factor 0", -20022, decimation(&A::x, 0)},
      {"decimation: factor least", -20022, decimation(&A::x, std::numeric_limits<int>::min())},
      {"decimation: factor 41", -20022, decimation(&A::x, 41)},
      {"decimation: no samples", -20003, decimation(&A::none, 0)},
      {"decimation: null output", -20001, [](A &a) { return family<E>::decimate(a.x, nullptr, 2, 0); }, 0},
      {"filter: reverse alone", -20008, filtering({}, {1, 2}, true), 3},
      {"filter: no scratch", -20999, filtering({1, 2}, {1, 2}), 3},
      {"filter: no reverse scratch", -20999, filtering({1}, {1, 2}), 3},
      {"filter: no coefficients", 0, filtering({}, {}), 0},
      {"filter: no samples", 0, filtering({1, 2}, {1, 2}, true, &A::none), 0},
      {"filter: none needed", 0, filtering({1}, {2}), 2},
      {"resampling: no samples", -20003, resampling(0, -1, 0, &A::none), 3},
      {"resampling: no coefficients", -20003, without(false, false), 3},
      {"resampling: no state", -20061, without(true, false), 3},
      {"resampling: never reset", -20016, without(true, true), 3},
      {"resampling: no phases", -20061, resampling(0, 0, 0), 3},
      {"resampling: ratio 0", -20016, resampling(0, -1), 3},
      {"resampling: ratio negative", -20016, resampling(-1, 0), 3},
      {"resampling: ratio not a number", -20016, resampling(nan, 0), 3},
      {"resampling: ratio infinite", -20016, resampling(inf, 0), 3},
      {"resampling: delay negative", -20059, resampling(1, -0.5F), 3},
      {"resampling: delay not a number", -20059, resampling(1, nan), 3},
      {"resampling: delay too long", -20059, resampling(1, 0x1p31F), 3},
      {"resampling: tiny ratio", -20001, resampling(1e-44F, 0), 3},
      {"rms: no samples", -20003,
       [](A &a) {
         const std::int32_t code = family<E>::rms(a.none, &a.slope);
         EXPECT_TRUE(std::isnan(a.slope));
         return code;
       },
       0},
  };
}

template <class E>
std::vector<refusal<E>> fit_refusals() {
  using real = toolkit::real_of<E>;
  using reals = std::vector<real>;
  constexpr real inf = std::numeric_limits<real>::infinity(), nan = std::numeric_limits<real>::quiet_NaN();
  const auto fit = [](reals x, reals y, reals w, int method = 0, bool with_scratch = true) {
    return [=](arguments<E> &a) {
      array_of<E> given = filled<E>(x), record = filled<E>(y), weights = filled<E>(w);
      const std::int32_t code =
          partial_family<E>::linear_fit(record, given, weights, &a.slope, &a.intercept, &a.residue, method, 0, 0,
                                        &a.iterations, with_scratch ? a.scratch.handle() : nullptr);
      EXPECT_TRUE(record.elements().empty());
      EXPECT_TRUE(std::isnan(a.slope) && std::isnan(a.intercept) && std::isnan(a.residue) && a.iterations == 0);
      return code;
    };
  };
  return {
      {"fit: method 3", -20061, fit({}, {1}, {}, 3), 0},
      {"fit: method -1", -20061, fit({}, {1}, {}, -1), 0},
      {"fit: counts", -20002, fit({1, 2, 3}, {1, 2}, {}), 0},
      {"fit: weights", -20002, fit({1}, {1}, {1, 2}), 0},
      {"fit: no points", -20006, fit({}, {}, {}), 0},
      {"fit: one point", -20006, fit({1}, {inf}, {}, 1), 0},
      {"fit: x infinite", -20068, fit({1, inf}, {1, 2}, {-1, 0}), 0},
      {"fit: y not a number", -20068, fit({1, 2}, {1, nan}, {}, 2), 0},
      {"fit: largest", -20068, fit({1, 2}, {1, -std::numeric_limits<real>::max()}, {}), 0},
      {"fit: negative weight", -20061, fit({1, 2}, {1, 2}, {-1, nan}), 0},
      {"fit: weight not finite", -20068, fit({1, 2}, {1, 2}, {inf, -1}), 0},
      {"fit: weights zero", -20061, fit({1, 2}, {1, 2}, {0, 0}), 0},
      {"fit: no scratch", -20999, fit({1, 2}, {1, 2}, {1, 2}, 0, false), 0},
      {"fit: no scratch, method 1", -20999, fit({1, 2}, {1, 2}, {}, 1, false), 0},
      {"fit: one x", -20006, fit({2, 2, 2}, {1, 2, 3}, {}), 0},
      {"fit: one x that counts", -20006, fit({2, 2, 3}, {1, 2, 3}, {1, 2, 0}, 1), 0},
  };
}

template <class E>
std::vector<refusal<E>> matrix_refusals() {
  using A = arguments<E>;
  using P = partial_family<E>;
  struct shape {
    std::int32_t rows, columns;
  };
  const auto product = [](shape a, shape b) {  // refused before an element is read
    return [=](A &args) {
      matrix_of<E> left(1, 1), right(1, 1);
      const auto show = [](matrix_of<E> &m, shape as) { std::memcpy(m.block(), &as, sizeof as); };
      show(left, a);
      show(right, b);
      return P::multiply(left, right, args.matrix_out);
    };
  };
  const auto squares = [](std::int32_t rows, std::int32_t columns, std::size_t b, float tolerance = 0, int missing = -1,
                          toolkit::real_of<E> first = 1) {
    return [=](A &a) {
      matrix_of<E> left(rows, columns);
      array_of<E> right(b);
      for (auto &v : values<E>(left)) v = first;
      const auto room = [&](int which, array_of<E> &array) { return which == missing ? nullptr : array.handle(); };
      return P::least_squares(left, right, tolerance, a.out, room(0, a.scratch), room(1, a.room), room(2, a.more_room));
    };
  };
  constexpr float nan = std::numeric_limits<float>::quiet_NaN();
  std::vector<refusal<E>> all = {
      {"product: inner sizes", -20039, product({3, 2}, {3, 2})},
      {"product: no factor", -20003, [](A &a) { return P::multiply(nullptr, a.my, a.matrix_out); }},
      {"product: negative size", -20004, product({2, 2}, {-3, 2})},
      {"product: too large", -20001, product({1 << 16, 1}, {1, 1 << 16})},
      {"product with a vector: inner sizes", -20039, [](A &a) { return P::multiply_vector(a.mx, a.x, a.out); }},
      {"product with a vector: none", -20003, [](A &a) { return P::multiply_vector(a.mx, nullptr, a.out); }},
      {"product with a vector: null output", -20001,
       [](A &a) {
         array_of<E> six(6);
         return P::multiply_vector(a.mx, six, nullptr);
       },
       0},
      {"product with a vector: negative size", -20004,
       [](A &a) {
         array_of<E> two(2);
         two.block()->count = -2;
         return P::multiply_vector(a.mx, two, a.out);
       }},
      {"least squares: no matrix", -20003,
       [](A &a) { return P::least_squares(nullptr, a.y, 0, a.out, a.scratch, a.room, a.more_room); }},
      {"least squares: no right-hand side", -20003,
       [](A &a) { return P::least_squares(a.mx, nullptr, 0, a.out, a.scratch, a.room, a.more_room); }},
      {"least squares: no rows", -20003, squares(0, 2, 0)},
      {"least squares: no columns", -20003, squares(2, 0, 2)},
      {"least squares: lengths", -20002, squares(3, 2, 2, nan)},
      {"least squares: tolerance", -20061, squares(3, 2, 3, nan, 0)},
      {"least squares: not finite", -20068, squares(3, 2, 3, 0, 0, nan)},
  };
  for (const int missing : {0, 1, 2})
    for (const float tolerance : {0.F, 1e-6F})
      all.push_back({"least squares: scratch", -20999, squares(3, 2, 3, tolerance, missing)});
  return all;
}

TYPED_TEST(Toolkit, RefusesInTheOrderOfTheChecks) {
  using E = TypeParam;
  using A = arguments<E>;
  using F = family<E>;
  using room = array_of<E> A::*;
  const auto at = [](A &a, room array) { return array ? (a.*array).handle() : nullptr; };
  const auto convolution = [=](room x, room y, int mode, int method, room scratch = &A::scratch, room more = &A::room) {
    return
        [=](A &a) { return F::convolution(a.*x, a.*y, a.out, mode, method, 0, at(a, scratch), at(a, more), &a.slot); };
  };
  const auto correlation = [=](room x, int method, int how, room scratch = &A::scratch, room more = &A::room) {
    return [=](A &a) {
      return correlation_pair<E, E>::correlate(a.*x, a.y, a.out, method, how, 0, at(a, scratch), at(a, more), &a.slot);
    };
  };
  array_of<E> null_block;
  array_of<toolkit::complex_of<E>> no_bins(std::size_t{0});
  matrix_of<E> no_columns(3, 0), many_rows(1 << 16, 1), many_columns(1, 1 << 15);
  std::vector<refusal<E>> refusals = {
      {"fft: no samples", -20003, [&](A &a) { return F::fft(a.none, a.bins_out, 1 << 28, 0, a.scratch, &a.slot); }},
      {"fft: null handle", -20003, [&](A &a) { return F::fft(nullptr, a.bins_out, 8, 0, a.scratch, &a.slot); }},
      {"fft: null block", -20003, [&](A &a) { return F::fft(null_block, a.bins_out, 8, 0, a.scratch, &a.slot); }},
      {"fft: too long", -359502, [&](A &a) { return F::fft(a.x, a.bins_out, (1 << 27) + 1, 0, a.x, &a.slot); }, 2},
      {"fft: shared", -20061, [&](A &a) { return F::fft(a.x, a.bins_out, 48, 0, a.x, &a.slot); }, 2},
      {"fft: null output", -20001, [&](A &a) { return F::fft(a.x, nullptr, 48, 0, nullptr, &a.slot); }, 0},
      {"fft: no scratch", -20999, [&](A &a) { return F::fft(a.x, a.bins_out, 48, 0, nullptr, &a.slot); }},
      {"inverse: no bins", -20003, [&](A &a) { return F::inverse_fft(no_bins, a.out, 0, a.bins_scratch, &a.slot); }},
      {"inverse: no scratch", -20999, [&](A &a) { return F::inverse_fft(a.bins, a.out, 1, nullptr, &a.slot); }},
      {"convolution: no x", -20003, convolution(&A::none, &A::y, 3, 2)},
      {"convolution: no y", -20003, convolution(&A::x, &A::none, 3, 2)},
      {"convolution: method 2", -20061, convolution(&A::x, &A::y, 0, 2)},
      {"convolution: method -1", -20061, convolution(&A::y, &A::x, 2, -1)},
      {"convolution: mode 3", -20061, convolution(&A::x, &A::y, 3, 0)},
      {"convolution: mode -1", -20061, convolution(&A::x, &A::y, -1, 0)},
      {"convolution: nothing valid", -20008, convolution(&A::y, &A::x, 2, 0, nullptr, nullptr)},
      {"convolution: shared", -20061, convolution(&A::x, &A::y, 0, 1, &A::scratch, &A::scratch)},
      {"convolution: no scratch", -20999, convolution(&A::x, &A::y, 1, 1, nullptr)},
      {"convolution: no room", -20999, convolution(&A::x, &A::y, 0, 1, &A::scratch, nullptr)},
      {"correlation: no x", -20003, correlation(&A::none, 2, 3)},
      {"correlation: method", -20061, correlation(&A::x, 2, 0)},
      {"correlation: normalisation", -20061, correlation(&A::x, 0, 3, nullptr)},
      {"correlation: no scratch", -20999, correlation(&A::x, 0, 0, nullptr)},
      {"correlation: no room", -20999, correlation(&A::x, 1, 0, &A::scratch, nullptr)},
      {"matrices: no columns", -20003,
       [&](A &a) { return F::matrix_correlation(a.mx, no_columns, a.matrix_out, 2, a.scratch, a.room, &a.slot); }},
      {"matrices: method", -20061,
       [&](A &a) { return F::matrix_correlation(a.mx, a.my, a.matrix_out, 2, nullptr, a.room, &a.slot); }},
      {"matrices: no scratch", -20999,
       [&](A &a) { return F::matrix_correlation(a.mx, a.my, a.matrix_out, 0, nullptr, a.room, &a.slot); }},
      {"matrices: no room", -20999,
       [&](A &a) { return F::matrix_correlation(a.mx, a.my, a.matrix_out, 1, a.scratch, nullptr, &a.slot); }},
      // (2^16 - 1) rows and (2^15 - 1) columns take 16 and 15 bits: one too many, although the product fits.
      {"matrices: too large", -20001,
       [&](A &a) {
         return F::matrix_correlation(many_rows, many_columns, a.matrix_out, 0, a.scratch, a.room, &a.slot);
       }},
      {"window: no samples", -20003, [&](A &a) { return F::window(a.none, 12, 0, a.tables); }, 0},
      {"window: type 10", -20061, [&](A &a) { return F::window(a.x, 10, 0, nullptr); }},
      {"window: type 12", -20061, [&](A &a) { return F::window(a.x, 12, 0, a.tables); }},
      {"window: type -1", -20061, [&](A &a) { return F::window(a.x, -1, 0, a.tables); }},
      {"window: shared, not needed", -20061,
       [&](A &a) { return F::window(a.x, 0, 0, reinterpret_cast<lumra_f64_array>(a.x.handle())); }},
      {"window: no scratch", -20999, [&](A &a) { return F::window(a.x, 1, 0, nullptr); }},
      {"power: no samples", -20003, [&](A &a) { return F::power_spectrum(a.none, a.real_out, nullptr, &a.slot); }},
      {"power: no scratch", -20999, [&](A &a) { return F::power_spectrum(a.x, a.real_out, nullptr, &a.slot); }},
      {"power: shared", -20061, [&](A &a) { return F::power_spectrum(a.x, a.real_out, a.x, &a.slot); }, 2},
  };
  const auto add = [&refusals](const auto &more) { refusals.insert(refusals.end(), more.begin(), more.end()); };
  add(stream_refusals<E>());
  if constexpr (requires { partial_family<E>::linear_fit; }) add(fit_refusals<E>());
  if constexpr (requires { partial_family<E>::multiply; }) add(matrix_refusals<E>());
  for (const auto &r : refusals) {
    SCOPED_TRACE(r.why);
    A a;
    EXPECT_EQ(r.code, r.run(a));
    // All are filled before, and no matrix is left with one size of 0.
    int emptied = a.matrix_out.block()->rows == 0 && a.matrix_out.block()->columns == 0;
    const auto count = [&](auto &...arrays) { emptied += (arrays.elements().empty() + ...); };
    count(a.bins_out, a.out, a.real_out, a.x, a.history, a.output_history, a.tap_history);
    EXPECT_EQ(r.emptied, emptied);
    EXPECT_TRUE(a.scratch_is_empty());
  }
}

/// An array of the arguments, of whatever type; pointers are copied because their types differ.
struct argument {
  void *handle_address;
  bool handed_over;
  const std::type_info *type;
  bool unshared;  // workspace or a state

  static void *at(const void *address) {
    void *pointer = nullptr;
    std::memcpy(&pointer, address, sizeof pointer);
    return pointer;
  }
  static void set(void *address, void *pointer) { std::memcpy(address, &pointer, sizeof pointer); }

  [[nodiscard]] void *cell() const { return at(handle_address); }
  [[nodiscard]] void *block() const { return at(cell()); }
  void set_block(void *block) const { set(cell(), block); }
  void become(const argument &other) const { set(handle_address, other.cell()); }
};

template <class E>
std::vector<argument> arrays_of(arguments<E> &a) {
  std::vector<argument> all;
  const auto add = [&](bool unshared) {
    return [&all, unshared](auto &...arrays) {
      (all.push_back({arrays.address(), arrays.handed_over(), &typeid(arrays), unshared}), ...);
    };
  };
  std::apply(add(false), a.records());
  std::apply(add(true), a.states());
  std::apply(add(true), a.workspace());
  return all;
}

enum class sharing { handle_without_block, handle, block };

/// The same call with two of its arrays being one, and with two of the same contents.
template <class E>
void expect_as_documented(fake_host &host, const operation<E> &op, std::size_t i, std::size_t j, sharing how) {
  arguments<E> shared(12), apart(12), spare(12);
  shared.once = apart.once = true;
  const auto given = arrays_of(shared), copies = arrays_of(apart);
  const argument &first = given[i], &second = given[j];
  if (how == sharing::handle_without_block) {
    for (const argument &array : {first, second, copies[i], copies[j]}) {
      free_block(array.block());
      array.set_block(nullptr);
    }
  } else {
    copies[j].become(arrays_of(spare)[i]);
  }
  void *const block = first.block();
  if (how == sharing::block) {
    free_block(second.block());
    second.set_block(block);
  } else {
    second.become(first);
  }
  host.empties_in_place = how == sharing::block;  // the other handle would be left with a block that is gone

  const auto before = op.result(apart);
  const std::int32_t expected = op.run(apart), code = op.run(shared);
  // A recursive filter without data changes nothing, and refuses nothing.
  const bool nothing_to_do = expected == 0 && op.result(apart) == before;
  const bool refused = (first.unshared || second.unshared) && !nothing_to_do;
  EXPECT_TRUE(code == (refused ? -20061 : expected) || (refused && expected < 0 && code == expected)) << code;
  if (code < 0) {
    EXPECT_TRUE(op.result(shared).empty());
    EXPECT_TRUE(shared.scratch_is_empty());
  } else {
    EXPECT_EQ(op.result(apart), op.result(shared));
  }
  // One of two handles is left with a block that moved, or both hold it.
  if (how == sharing::block) (first.block() == block && second.block() != block ? first : second).set_block(nullptr);
}

TYPED_TEST(Toolkit, OneArrayTwiceIsRefusedOrRight) {
  using E = TypeParam;
  for (const auto &op : operations<E>()) {
    arguments<E> called(12);
    called.once = true;
    ASSERT_EQ(0, op.run(called));
    const auto arrays = arrays_of(called);
    for (std::size_t i = 0; i < arrays.size(); ++i)
      for (std::size_t j = 0; j < arrays.size(); ++j) {
        if (i == j || !arrays[i].handed_over || !arrays[j].handed_over) continue;
        SCOPED_TRACE(testing::Message() << op.name << ", arrays " << i << " and " << j);
        expect_as_documented(this->host, op, i, j, sharing::handle_without_block);
        if (*arrays[i].type != *arrays[j].type) continue;
        expect_as_documented(this->host, op, i, j, sharing::handle);
        expect_as_documented(this->host, op, i, j, sharing::block);
      }
  }
}

TYPED_TEST(Toolkit, SizedOutputsAreLeftAlone) {
  using E = TypeParam;
  arguments<E> a;
  array_of<toolkit::complex_of<E>> bins(std::size_t{40});
  ASSERT_EQ(0, family<E>::fft(a.x, bins, 0, 0, nullptr, &a.slot));
  EXPECT_TRUE(this->host.calls.empty());
}

// Whatever transform lies in the slot, a result is the one of a call with an empty slot.
TYPED_TEST(Toolkit, ASlotOfAnotherFamilyIsNoticed) {
  using E = TypeParam;
  for (const auto &earlier : operations<E>()) {
    for (const auto &later : operations<E>()) {
      SCOPED_TRACE(testing::Message() << later.name << " behind " << earlier.name);
      arguments<E> fresh, before, used;
      ASSERT_EQ(0, later.run(fresh));
      ASSERT_EQ(0, earlier.run(before));
      std::swap(before.slot, used.slot);
      ASSERT_EQ(0, later.run(used));
      EXPECT_EQ(later.result(fresh), later.result(used));
    }
  }
}

TEST(TransformSlot, TellsScalingDomainAndPrecisionAtOneLength) {
  fake_host host(fake_host::unit::elements);
  void *slot = nullptr;
  constexpr std::size_t n = 48;
  const auto run = [&]<class E>(E, bool inverse) {
    array_of<E> x = filled<E>(noise<E>(n)), back;
    array_of<toolkit::complex_of<E>> bins;
    void *other = nullptr;
    ASSERT_EQ(0, family<E>::fft(x, bins, 0, 0, nullptr, inverse ? &other : &slot));
    qsHost_ReleaseTransform(&other);
    EXPECT_LT(error_in_epsilons<E>(values<toolkit::complex_of<E>>(bins), dft(wide(noise<E>(n)))), transform_bound(n));
    if (!inverse) return;
    ASSERT_EQ(0, family<E>::inverse_fft(bins, back, 0, nullptr, &slot));
    EXPECT_LT(error_in_epsilons<E>(values<E>(back), wide(noise<E>(n))), 2 * transform_bound(n));
  };
  for (const bool inverse : {false, true, false}) {
    run(toolkit::s{}, inverse);
    run(toolkit::c{}, inverse);
    run(toolkit::z{}, inverse);
    run(toolkit::d{}, inverse);
  }
  EXPECT_EQ(0, qsHost_ReleaseTransform(&slot));
  EXPECT_EQ(nullptr, slot);
}

}  // namespace
