// Calls of all families in random order and sizes, round after round, on the shared library, which must in the long run
// take no memory, no thread and no descriptor that it does not give back. SPDX-License-Identifier: MIT
//
// Arguments: minutes, or --rounds N; --seed S. Prints one line of counts; fails when something grows.
#include <dirent.h>
#include <malloc.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <chrono>
#include <complex>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <lumra/lumra.hpp>
#include <random>
#include <string>
#include <string_view>
#include <thread>
#include <vector>

namespace {

using cf32 = std::complex<float>;
std::uint64_t calls = 0;  // of the library, but those that make, size and free host arrays

/// Counts a call; none may fail.
void call(std::int32_t status) {
  ++calls;
  lumra::check(status);
}

class draw {
 public:
  explicit draw(std::uint64_t seed) : engine_(seed) {}
  int from(int first, int last) { return std::uniform_int_distribution(first, last)(engine_); }
  std::size_t size() { return static_cast<std::size_t>(from(16, 96)); }
  bool once_in(int n) { return from(1, n) == 1; }

  /// Values between -1 and 1.
  template <class Array>
  void fill(Array &array) {
    for (auto &element : array.elements()) {
      using real = lumra::detail::real_of<std::remove_cvref_t<decltype(element)>>;
      element = static_cast<real>(from(-1000, 1000)) / 1000;
    }
  }
  template <class T>
  lumra::host_array<T> array(std::size_t count) {
    lumra::host_array<T> made(count);
    fill(made);
    return made;
  }
  template <class T>
  lumra::host_matrix<T> matrix(std::size_t rows, std::size_t columns) {
    lumra::host_matrix<T> made(rows, columns);
    fill(made);
    return made;
  }

 private:
  std::mt19937_64 engine_;
};

/// A session from its beginning to its end, with an entry in its log.
void sessions(draw &d) {
  const std::int32_t points = 16 << d.from(0, 4), too_many = (1 << 27) + 1;
  const auto samples = d.array<cf32>(static_cast<std::size_t>(4 * points));
  lumra::session session;
  lumra::spectrum out;
  session.initialize_fft(points);
  if (d.once_in(2)) session.initialize_window(lumra::window::flat_top, points);
  session.power_spectrum(lumra::window::flat_top, points, d.from(0, 90), samples, 1e-6, out);
  if (qsLumraAlgo_InitializeFFT(session.get(), too_many) == 0 || session.read_log().empty()) std::abort();
  if (d.once_in(2)) session.reset();
  calls += 7;
}

template <class T>
void toolkit(draw &d) {
  using namespace lumra;
  using real = detail::real_of<T>;
  const auto x = d.array<T>(d.size()), y = d.array<T>(d.size());
  const auto how = d.once_in(2) ? method::fourier : method::direct;
  {
    plan<T> plan;  // its transform is released with it
    inverse_fft(plan, fft(plan, x.elements(), d.from(0, 96), shift::centred), shift::centred);
    convolve(plan, x.elements(), y.elements(), part::same, how);
    correlate(plan, x.elements(), y.elements(), normalisation::unbiased, how);
    power_spectrum(plan, x.elements());
    apply_window(plan, x.elements(), cosine_window::blackman);

    host_matrix<T> a(5, d.size()), b(3, 4), lags(0, 0);
    constexpr auto correlate_2d = detail::choose<T>(&qsRFPELTA_s2DCorrelationH, &qsRFPELTA_d2DCorrelationH,
                                                    &qsRFPELTA_c2DCorrelationH, &qsRFPELTA_z2DCorrelationH);
    call(correlate_2d(a.get(), b.get(), lags.get(), static_cast<std::int32_t>(how), plan.scratch.get(),
                      plan.transform_scratch.get(), plan.slot()));
  }
  const std::array<real, 3> b{1, 2, 1}, a{4, -1, real(0.5)};
  iir_filter<T> filter(b, a);
  resampler<T> resampler(b, 2, {.ratio = 1 + static_cast<float>(d.from(0, 100)) / 100});
  for (int block = 0; block < 2; ++block) resampler(filter(x.elements()));
  decimate(x, d.from(1, 8), true);
  static_cast<void>(rms(x));
  calls += 13;
}

void matrices(draw &d) {
  const std::size_t rows = d.size() / 4, columns = d.size() / 8;
  const auto a = d.matrix<cf32>(rows, columns), b = d.matrix<cf32>(columns, 7), c = d.matrix<cf32>(rows, columns);
  multiply(a, b);
  multiply(a, d.array<cf32>(columns));
  least_squares(a, d.array<cf32>(rows));
  lumra::host_matrix<float> e(rows, columns);
  error_magnitude(a, c, e);
  magnitude_error(a, c, e);
  phase_error(a, c, e);
  auto x = d.array<double>(rows), y = d.array<double>(rows);
  for (std::size_t k = 0; k < rows; ++k) x.elements()[k] += static_cast<double>(3 * k);
  linear_fit(y, x, lumra::host_array<double>(0), lumra::fit_method::bisquare);
  calls += 7;
}

/// Element by element.
void vectors_of(draw &d, std::size_t n) {
  auto x = d.array<cf32>(n), y = d.array<cf32>(n);
  const auto keys = d.array<float>(n), coefficients = d.array<float>(9);
  lumra::host_array<cf32> samples;
  lumra::host_array<float> reals;
  divide(x, y, samples);
  divide(x, cf32(2, 1), samples);
  magnitude(x, reals);
  magnitude_squared(x, reals);
  scaled_log2(x, reals, 3.01F, 0);
  scaled_log2(keys, reals, 3.01F, 0);
  polynomial(keys, coefficients, reals);
  lookup(keys, x, samples, d.array<cf32>(20), -1, 0.2F);
  static_cast<void>(lumra::rms(x));
  static_cast<void>(rms_and_peak(x));
  lumra::scale(x.elements(), 0.5F);
  calls += 11;
}

/// Now and then so many that the library's threads take part.
void vectors(draw &d) {
  vectors_of(d, d.once_in(500) ? 70000 : d.size());
}

/// By reference, and by identifier for what is left.
void stored_arrays(draw &d) {
  const auto owner = static_cast<std::uint64_t>(d.from(1, 1000));
  std::array<lumra_array_ref, 4> references;
  lumra::host_array<cf32> copy(0);
  for (lumra_array_ref &reference : references) {
    reference = {1, nullptr};
    lumra_array_ref *address = &reference;
    std::uint32_t length = 0;
    call(qsUtilHS_AllocateArray_CSG(&address, d.from(1, 1500), owner));
    call(qsUtilHS_ArrayLength_CSG(&address, &length));
    call(qsUtilHS_ReadArray_CSG(&address, copy.address(), d.from(-10, 10), 64));
    if (d.once_in(2)) call(qsUtilHS_FreeArray_CSG(&address));
  }
  call(qsUtilHS_FreeArrayIDH_CSG(owner));
}

void resampler_descriptors(draw &d) {
  const std::uint32_t flag = d.once_in(2), length = 16U << d.from(0, 3);
  const auto owner = static_cast<std::uint64_t>(d.from(1, 1000));
  lumra_resampler_descriptor *descriptor = nullptr;
  call(qsUtilHS_FFTResampler_CSG_CreateDescriptor(&descriptor, length, flag, flag, owner));
  call(qsUtilHS_FreeArrayIDH_CSG(owner));
}

/// Few keys, so that the registry holds all of them soon; some are erased and designed again.
void filters(draw &d) {
  const lumra_filter_key key{LUMRA_FILTER_KAISER_LOW_PASS, {}, {100, 10.0 + d.from(0, 7), 30, 40}};
  {
    const lumra::registered_filter filter(key);
    if (!lumra::registered_filter::find(key)) std::abort();
    if (d.once_in(4)) lumra::registered_filter::erase(key), ++calls;
  }
  calls += 4;
}

/// A thread writes, this one reads.
void fifos(draw &d) {
  const auto samples = d.array<cf32>(24);
  const auto bytes = std::as_bytes(samples.elements());
  lumra::fifo_ends ends("soak " + std::to_string(d.from(0, 3)), 256);
  std::thread other([&] {
    while (ends.writer.write(bytes) == lumra::transfer::timed_out) {
    }
  });
  std::array<std::byte, 24 * sizeof(cf32)> received;
  while (ends.reader.read(received) == lumra::transfer::timed_out) {
  }
  other.join();
  calls += 6;
}

/// Threads that live for one transform. Not often: MKL keeps about 100 bytes of every thread that has ever computed
/// with it, in a table that it frees with the process.
void threads(draw &d) {
  if (!d.once_in(100)) return;
  const auto samples = d.array<cf32>(d.size());
  const auto transform = [&samples] {
    lumra::plan<cf32> plan;
    lumra::fft(plan, samples.elements());
  };
  std::thread one(transform), other(transform);
  one.join();
  other.join();
  calls += 4;
}

/// The list of failures is read; none is added, since it keeps them for ever.
void failures(draw &) {
  std::uint64_t count = 0;
  call(qsrfhs_getErrorCnt(&count));
  std::vector<std::int32_t> codes(count + 1);
  call(qsrfhs_getErrors(codes.data(), codes.size()));
  static_cast<void>(lumra::library());
  calls += 3;
}

constexpr std::array families{
    &sessions, &toolkit<float>, &toolkit<double>, &toolkit<cf32>, &toolkit<std::complex<double>>,
    &matrices, &vectors,        &stored_arrays,   &filters,       &resampler_descriptors,
    &fifos,    &threads,        &failures};

void round(draw &d) {
  for (int k = 0; k < 4; ++k) families[static_cast<std::size_t>(d.from(0, std::ssize(families) - 1))](d);
}

/// What is kept for good is made, before anything is measured.
void warm_up(draw &d) {
  vectors_of(d, 70000);
  for (int k = 0; k < 50; ++k)
    for (const auto family : families) family(d);
}

// What the process holds.

int entries(const char *folder) {
  DIR *const listing = opendir(folder);
  int count = 0;
  while (listing && readdir(listing)) ++count;
  if (listing) closedir(listing);
  return count;
}

struct sample {
  double calls, resident, in_use;  // bytes
  int threads, descriptors;
};

sample take_sample() {
  malloc_trim(0);  // what is free but kept for later calls comes and goes
  double size = 0, pages = 0, shared = 0;
  std::ifstream("/proc/self/statm") >> size >> pages >> shared;
  pages -= shared;  // code that runs late for the first time is no leak
  const struct mallinfo2 heap = mallinfo2();
  return {static_cast<double>(calls), pages * static_cast<double>(sysconf(_SC_PAGESIZE)),
          static_cast<double>(heap.uordblks + heap.hblkhd), entries("/proc/self/task"), entries("/proc/self/fd")};
}

/// Bytes for 10,000 calls, by least squares.
double slope(const std::vector<sample> &samples, double sample::*value) {
  double x = 0, y = 0, xx = 0, xy = 0;
  for (const sample &s : samples) x += s.calls, y += s.*value;
  x /= static_cast<double>(samples.size());
  y /= static_cast<double>(samples.size());
  for (const sample &s : samples) {
    xx += (s.calls - x) * (s.calls - x);
    xy += (s.calls - x) * (s.*value - y);
  }
  return 1e4 * xy / xx;
}

/// Growth from the first to the second half; a thread that ends may still be listed, so that the lowest count matters.
int growth(const std::vector<sample> &samples, int sample::*count) {
  const auto less = [count](const sample &a, const sample &b) { return a.*count < b.*count; };
  const auto middle = samples.begin() + static_cast<std::ptrdiff_t>(samples.size() / 2);
  return (*std::min_element(middle, samples.end(), less)).*count -
         (*std::min_element(samples.begin(), middle, less)).*count;
}

}  // namespace

int main(int argc, char **argv) {
  constexpr double unmeasured = 0.25, sampling = 0.75 / 256;  // parts of the run
  constexpr double most = 1024;                               // bytes for 10,000 calls
  std::uint64_t seed = 1;
  double minutes = 0, rounds = 0;
  for (int k = 1; k < argc; ++k) {
    const std::string_view option = argv[k];
    if (option == "--seed" && k + 1 < argc)
      seed = std::strtoull(argv[++k], nullptr, 10);
    else if (option == "--rounds" && k + 1 < argc)
      rounds = std::atof(argv[++k]);
    else
      minutes = std::atof(argv[k]);
  }
  if (!(minutes > 0) && !(rounds > 0)) {
    std::fputs("usage: lumra_soak MINUTES | --rounds N [--seed S]\n", stderr);
    return 2;
  }

  // Each thread's stock of small free blocks, filled bit by bit over a long time, would count as memory in use.
  constexpr const char *tunables = "GLIBC_TUNABLES", *no_stock = "glibc.malloc.tcache_count=0";
  if (const char *const set = std::getenv(tunables); !set || std::string_view(set) != no_stock) {
    setenv(tunables, no_stock, 1);
    execv("/proc/self/exe", argv);
  }

  draw d(seed);
  std::vector<sample> samples;
  samples.reserve(300);
  const auto start = std::chrono::steady_clock::now();
  double done = 0, seconds = 0, next = unmeasured;
  for (double progress = 0; progress < 1; ++done) {
    try {
      if (done == 0) warm_up(d);
      round(d);
    } catch (const std::exception &failure) {
      std::printf("seed %llu, round %.0f: %s\n", static_cast<unsigned long long>(seed), done, failure.what());
      return EXIT_FAILURE;
    }
    seconds = std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
    progress = rounds > 0 ? (done + 1) / rounds : seconds / (60 * minutes);
    if (progress < next) continue;
    samples.push_back(take_sample());
    next += sampling;
  }

  const double resident = slope(samples, &sample::resident), in_use = slope(samples, &sample::in_use);
  const int threads = growth(samples, &sample::threads), descriptors = growth(samples, &sample::descriptors);
  const bool grows = !(resident < most && in_use < most && threads <= 0 && descriptors <= 0);
  std::printf(
      "%s: seed %llu, %.0f rounds, %llu calls, %.0f s; for 10,000 calls %.0f bytes resident, %.0f bytes in use; "
      "%+d threads, %+d descriptors; %.1f MiB resident\n",
      grows ? "GROWS" : "steady", static_cast<unsigned long long>(seed), done, static_cast<unsigned long long>(calls),
      seconds, resident, in_use, threads, descriptors, samples.back().resident / (1 << 20));
  return grows ? EXIT_FAILURE : EXIT_SUCCESS;
}
