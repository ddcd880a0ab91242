// Sessions with their measurements and logs, error vectors, messages, library information. SPDX-License-Identifier: MIT
#include <lumra/error_vector.h>
#include <lumra/library_info.h>
#include <lumra/session.h>

#include <cmath>

#include "host_arrays.hpp"

namespace fuzz {
namespace {

using wide = std::complex<double>;

/// One session serves all inputs, for it starts threads; what an input left in it is dropped before the next.
struct bench {
  input &in;
  hosting &host;
  std::uint64_t open = 0, closed = 0;
  int entries = 0;  // in the log of `open`

  /// The open session, or one that is closed, or never was.
  std::uint64_t session() {
    const unsigned b = in.byte();
    return b < 240 ? open : b < 248 ? closed : in.raw<std::uint64_t>() | 1ULL << 40;
  }
  std::int32_t fft_size() {
    const std::int32_t size = in.one_in(16) ? input::extreme(in.byte()) : 12 + in.count();
    return in.one_in(64) ? size : std::max(size, 16);
  }
  /// The code of a call that failed behind its checks leaves an entry.
  void log(std::int32_t code) { entries += code == LUMRA_INTERNAL_ERROR || code == LUMRA_INVALID_ARGUMENT; }
};

constexpr std::int32_t most_points = 1 << 27;

/// The checks that all calls with a size have in common; 0 where they pass.
std::int32_t size_code(const bench &b, std::uint64_t session, std::int32_t size) {
  return size < 16 ? LUMRA_FFT_SIZE_TOO_SMALL : session != b.open ? LUMRA_INVALID_SESSION : 0;
}

void prepare(bench &b) {
  const std::uint64_t session = b.session();
  const std::int32_t size = b.fft_size(), type = b.in.option(3);
  const bool window = b.in.flag();
  const auto code = window ? qsLumraAlgo_InitializeWindow(session, static_cast<std::uint32_t>(type), size)
                           : qsLumraAlgo_InitializeFFT(session, size);
  std::int32_t want = size_code(b, session, size);
  if (want == 0 && size > most_points && (!window || type == 0 || type == 1)) {
    want = LUMRA_INVALID_ARGUMENT;
    b.log(want);
  }
  hold(code == want, "code of a preparation");
}

void measure(bench &b) {
  call on(b.in, b.host);
  auto &x = on.give<lumra_cf32_block>(reads, 8 * b.in.count() % 3000);
  auto &out = on.give<lumra_f32_block>(writes);
  const std::uint64_t session = b.session();
  const std::int32_t size = b.fft_size(), type = b.in.option(3);
  const bool overlaps = b.in.flag();
  const double percent = !overlaps ? 0 : b.in.one_in(4) ? b.in.real() * 100 : b.in.choice(100);
  const lumra_waveform in{0, 1e-6, x};
  lumra_spectrum spectrum{7, 7, out};
  const auto *const from = b.in.one_in(64) ? nullptr : &in;
  auto *const to = b.in.one_in(64) ? nullptr : &spectrum;
  const auto code =
      overlaps ? qsLumraAlgo_PerformWindowingOverlappedSeqFFTAndIQTransform(session, type, size, percent, from, to)
               : qsLumraAlgo_PerformWindowingFFTAndIQTransform(session, type, size, from, to);
  out.handle = reinterpret_cast<void **>(spectrum.y);
  on.check_inputs();
  std::int32_t want = !from || !to ? LUMRA_INVALID_ARGUMENT : size_code(b, session, size);
  if (want == 0 && (!(percent >= 0) || !(percent < 100))) want = LUMRA_INVALID_OVERLAP;
  if (want == 0 && x.values.size() < static_cast<std::size_t>(size)) want = LUMRA_INPUT_TOO_SHORT;
  if (want == 0 && code == LUMRA_INTERNAL_ERROR && b.host.failed()) {  // the service threw
    b.log(code);
    return;
  }
  // An overlap that is below 100 percent may round up to the whole size.
  hold(code == want || (want == 0 && code == LUMRA_INVALID_OVERLAP && percent > 99.9), "code of a measurement");
  hold(code == 0 ? spectrum.f0 == -5e5 && std::abs(spectrum.df * size - 1e6) < 1e-6 : spectrum.f0 == 7, "frequencies");
  if (code != 0) return;
  const auto n = static_cast<double>(size);
  const auto got = out.now();
  hold(got.size() == static_cast<std::size_t>(size) || b.host.failed(), "number of bins");
  for (const wide v : got)
    hold(!x.tame || b.host.failed() || (v.real() >= 0 && v.real() <= 2.1 * n * n), "bound of a bin");
}

void read_log(bench &b) {
  const std::uint64_t session = b.session();
  std::vector<char> text(b.in.choice(80));
  char none = 0, *const buffer = b.in.one_in(16) ? nullptr : text.empty() ? &none : text.data();
  const double timeout = b.in.flag() ? 0 : b.in.real();
  if (session == b.open && buffer && timeout == 0 && b.entries == 0) return;  // it would wait
  const auto code = qsLumraAlgo_ReadLog(session, timeout, buffer, text.size());
  const auto want = !buffer             ? LUMRA_INVALID_ARGUMENT
                    : session != b.open ? LUMRA_INVALID_SESSION
                    : timeout != 0      ? LUMRA_INTERNAL_ERROR
                                        : 0;
  hold(code == want, "code of a log");
  if (code != 0) return;
  --b.entries;
  hold(text.empty() || std::memchr(text.data(), 0, text.size()), "an entry ends with a NUL");
}

void manage(bench &b) {
  std::uint64_t other = 0;
  const std::uint64_t session = b.session();
  switch (b.in.choice(8)) {
    case 0:
      hold(qsLumraAlgo_CreateSession(b.in.one_in(4) ? nullptr : &other) == (other ? 0 : LUMRA_INVALID_ARGUMENT), "new");
      hold(other == 0 || other > b.open, "handles are never used again");
      hold(qsLumraAlgo_CloseSession(other) == 0, "closing");
      if (other) b.closed = other;
      return;
    case 1:
      return hold(session == b.open || qsLumraAlgo_CloseSession(session) == 0, "closing what is not open");
    default:
      hold(qsLumraAlgo_ResetSession(session) == (session == b.open ? 0 : LUMRA_INVALID_SESSION), "reset");
  }
}

void message(bench &b) {
  const std::int32_t code =
      b.in.flag() ? b.in.raw<std::int32_t>() : -380100 - static_cast<std::int32_t>(b.in.choice(40));
  const std::int32_t length = qsLumraAlgo_GetErrorString(b.session(), code, 0, nullptr);
  const std::int32_t size = b.in.one_in(8) ? input::extreme(b.in.byte()) : static_cast<std::int32_t>(b.in.choice(200));
  std::vector<char> text(static_cast<std::size_t>(size > 0 && size < 256 ? size : 0), 'x');
  char *const buffer = text.empty() ? nullptr : text.data();
  const std::int32_t got = qsLumraAlgo_GetErrorString(b.session(), code, size, buffer);
  hold(size <= length ? got == length : got == 0 || got == LUMRA_UNKNOWN_CODE, "length of a message");
  if (text.size() > 1)
    hold(std::strlen(buffer) == (size >= length + 2 ? static_cast<std::size_t>(length) : 0), "a message, or none");
}

void information(bench &b) {
  std::vector<char> name(b.in.choice(50)), description(b.in.choice(60));
  std::uint32_t version = 0;
  std::uint8_t avx = 7;
  const auto buffer = [&](std::vector<char> &v) { return b.in.one_in(8) ? nullptr : (v.reserve(1), v.data()); };
  const auto room = [](const std::vector<char> &v) { return static_cast<std::uint16_t>(v.size()); };
  char *const to = buffer(name), *const text = buffer(description);
  check_code(qsLumraAlgo_getLibraryFilename(to, room(name)), {-268501027});
  check_code(qsLumraAlgo_getLibraryInfo(b.in.one_in(8) ? nullptr : &version, to, room(name), text, room(description)),
             {-268501053, -268501057, -268501061});
  hold(qsLumraAlgo_hasAvxHardwareSupport(&avx) == 0 && avx <= 1, "processor");
}

void error_vector(bench &b) {
  constexpr decltype(&qsLumraAlgo_CalculateEVM2D) forms[] = {
      &qsLumraAlgo_CalculateEVM2D, &qsLumraAlgo_CalculateMagnitudeError2D, &qsLumraAlgo_CalculatePhaseError2D};
  call on(b.in, b.host);
  const int rows = static_cast<int>(b.in.choice(30)), columns = b.in.one_in(8) ? -1 : 7;
  auto &x = on.give<lumra_cf32_matrix_block>(reads, rows, columns);
  auto &y = on.give<lumra_cf32_matrix_block>(reads, b.in.one_in(8) ? 7 : rows, columns);
  auto &e = on.give<lumra_f32_matrix_block>(reads, rows, columns);
  const unsigned form = b.in.choice(3);
  const std::int32_t mode = b.in.option(4);
  const auto code = forms[form](x, y, e, mode);
  const bool valid = mode >= 1 && mode <= 3 && x.values.size() == y.values.size() && x.values.size() == e.values.size();
  hold(code == 0 ? valid : code == -312401 && (!valid || !on.plain()), "code of error vectors");
  if (code == 0) e.roles = 0;
  on.check_inputs();
  if (code != 0 || !x.tame || !y.tame) return;
  for (const wide v : e.now()) hold(std::abs(v.real()) <= (form == 2 ? 3.15 : 3), "bound of an error");
}

void scale(bench &b) {
  std::vector<lumra_cf32> data(b.in.choice(80), lumra_cf32{1, -2});
  const auto factor = static_cast<float>(b.in.real());
  hold(qsLumraAlgo_scale_cf(data.data(), data.size(), factor) == 0, "scaling");
  for (const auto v : data) hold(std::isnan(factor) || (v.re == factor && v.im == -2 * factor), "scaled value");
  const std::uint64_t n = b.in.byte();
  hold(qsLumraAlgo_scale_cf(nullptr, n, factor) == (n == 0 ? 0 : -1), "scaling of nothing");
}

}  // namespace

void run(input &in) {
  static const std::uint64_t session = [] {
    std::uint64_t handle = 0;
    hold(qsLumraAlgo_CreateSession(&handle) == 0, "a session");
    return handle;
  }();
  hold(qsLumraAlgo_ResetSession(session) == 0, "reset");
  hosting host(in, hosting::unit::bytes);
  bench b{in, host, session};
  constexpr void (*all[])(bench &) = {&measure, &measure, &prepare,      &read_log, &manage,
                                      &message, &measure, &error_vector, &scale,    &information};
  for (int calls = 0; in.left() && calls < 8; ++calls) all[in.choice(std::size(all))](b);
  for (char entry = 0; b.entries > 0; --b.entries) hold(qsLumraAlgo_ReadLog(session, 0, &entry, 1) == 0, "an entry");
}

}  // namespace fuzz
