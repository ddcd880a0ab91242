// The typed toolkit: calls in sequence that share two slots for transforms. SPDX-License-Identifier: MIT
#include <array>

#include "host_call.hpp"
#include "support/letters.hpp"

namespace fuzz {
namespace {

using tests::correlation_pair;
using tests::family;
using tests::partial_family;
using toolkit::c;
using toolkit::d;
using toolkit::s;
using toolkit::z;

struct bench {
  input &in;
  hosting &host;
  shared_places places = {};

  bench(input &from, hosting &service) : in(from), host(service) {}
  bench(const bench &) = delete;
  bench &operator=(const bench &) = delete;
  ~bench() {
    for (void *&slot : places.slots) hold(qsHost_ReleaseTransform(&slot) == 0 && !slot, "a slot is released");
  }

  template <class... A>
  void check(std::int32_t (*function)(A...), std::string_view letters, std::initializer_list<std::int32_t> codes) {
    call on(in, host);
    const auto code = call_host(in, on, places, function, letters);
    on.check(code, codes);
  }
};

/// One stream in up to three blocks that leave each other a state, which may be damaged.
template <class E, class Block, class Function>
void resample(bench &b, Function function) {
  using R = toolkit::magnitude_of<E>;
  call on(b.in, b.host);
  auto &h = on.give<typename R::block>(reads, b.in.flag() ? b.in.count() : 33);
  auto &out = on.give<Block>(writes), &history = on.give<Block>(writes);
  auto &taps = on.give<typename R::block>(writes);
  const lumra_resampler_parameters parameters{static_cast<float>(b.in.one_in(3) ? b.in.real() * 4 : b.in.byte() / 32.),
                                              static_cast<float>(b.in.one_in(3) ? b.in.real() * 40 : 0),
                                              b.in.option(2)};
  const std::int32_t phases = b.in.option(20), stretched = b.in.option(2);
  std::array<unsigned char, LUMRA_RESAMPLER_STATE_SIZE> state;
  state.fill(0xA5);
  if (b.in.one_in(8))
    for (auto &byte : state) byte = static_cast<unsigned char>(b.in.byte());
  for (unsigned block = 0; block <= 2; ++block) {
    auto &x = on.give<Block>(reads);
    float time = 7;
    const bool reset = block == 0 && !b.in.one_in(16);
    if (reset == (block == 0) && b.in.one_in(32)) state[b.in.choice(LUMRA_RESAMPLER_STATE_SIZE)] ^= 1;
    const auto code = function(x, h, phases, reset && !b.in.one_in(64) ? &parameters : nullptr, reset, stretched, out,
                               &time, history, taps, b.in.one_in(64) ? nullptr : state.data());
    if (!on.check(code, {-20003, -20061, -20016, -20059, -20001, -20075})) return hold(time == 0, "no time");
  }
}

/// One stream in two blocks that leave each other what the filter remembers.
template <class E, class F>
void filter(bench &b) {
  call on(b.in, b.host);
  auto &reverse = on.give<typename F::block>(reads, static_cast<int>(b.in.choice(20)));
  auto &forward = on.give<typename F::block>(reads, static_cast<int>(b.in.choice(20)));
  auto &inputs = on.give<typename E::block>(writes), &outputs = on.give<typename E::block>(writes);
  auto &room = on.give<typename F::block>(works), &saved = on.give<typename E::block>(works);
  auto &more = std::is_same_v<E, z> ? room : on.give<typename F::block>(works);  // one for both
  for (unsigned block = 0; block < 2; ++block) {
    auto &data = on.give<typename E::block>(writes);
    const std::int32_t reset = block == 0 ? b.in.option(4) : 0;
    // As they are now: the first block may have emptied what is workspace, too.
    on.set_idle(data.count() == 0 || (forward.count() == 0 && reverse.count() == 0));
    const auto run = [&](auto... more_room) {
      return partial_family<E>::filter(data, reverse, forward, inputs, outputs, reset, room, more_room..., saved);
    };
    std::int32_t code = 0;
    if constexpr (std::is_same_v<E, z>)
      code = run();
    else
      code = run(more);
    if (!on.check(code, {-20008, -20061, -20001, -20999}) || forward.count() == 0 || data.count() == 0) return;
    hold(inputs.count() == forward.count() - 1, "samples that are remembered");
    data.roles = 0;  // a failure of the next block does not reach it
  }
}

template <class X, class Y>
void correlate(bench &b) {
  b.check(correlation_pair<X, Y>::correlate, "rrw23fxxs", {-20003, -20061, -20001, -20999});
}

template <class E>
void any_letter(bench &b) {
  using all = family<E>;
  switch (b.in.choice(12)) {
    case 0:
      return b.check(all::fft, "rwl2xs", {-20003, -359502, -20061, -20001, -20999});
    case 1:
      return b.check(all::inverse_fft, "rw2xs", {-20003, -359502, -20061, -20001, -20999});
    case 2:
      return b.check(all::convolution, "rrw32fxxs", {-20003, -20061, -20008, -20001, -20999});
    case 3:
      return correlate<E, E>(b);
    case 4:
      return b.check(all::decimate, "rwf2", {-20003, -20022, -20001});
    case 5:
      return b.check(all::matrix_correlation, "rrw2xxs", {-20003, -20061, -20001, -20999});
    case 6:
      return b.check(all::window, "wm2x", {-20003, -20061, -20001, -20999});
    case 7:
      return b.check(all::power_spectrum, "rwxs", {-20003, -20061, -20001, -20999});
    case 8:
      return b.check(all::rms, "r?", {-20003});
    case 9:
      return resample<E, typename E::block>(b, all::resample);
    case 10:
      return resample<E, typename E::matrix_block>(b, all::resample_channels);
    default:
      return filter<E, toolkit::magnitude_of<E>>(b);
  }
}

template <class E>
void line(bench &b) {
  b.check(partial_family<E>::linear_fit, "wrr...3...x", {-20061, -20002, -20006, -20068, -20999, -20001});
}

template <class E>
void matrices(bench &b) {
  using all = partial_family<E>;
  const unsigned which = b.in.choice(3);
  if (which == 0) return b.check(all::multiply, "rrw", {-20003, -20004, -20039, -20001});
  if (which == 1) return b.check(all::multiply_vector, "rrw", {-20003, -20004, -20039, -20001});
  b.check(all::least_squares, "rr.wxxx", {-20003, -20002, -20061, -20068, -20001, -20999});
}

}  // namespace

void run(input &in) {
  hosting host(in, hosting::unit::elements);
  bench b(in, host);
  constexpr void (*all[])(bench &) = {&any_letter<s>,   &any_letter<d>,   &any_letter<c>,   &any_letter<z>,
                                      &correlate<s, c>, &correlate<c, s>, &correlate<d, z>, &correlate<z, d>,
                                      &line<s>,         &line<d>,         &matrices<s>,     &matrices<c>};
  for (int calls = 0; in.left() && calls < 6; ++calls) all[in.choice(std::size(all))](b);
}

}  // namespace fuzz
