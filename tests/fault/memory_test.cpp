// Every allocation of a call fails: ours, MKL's, and those of the C and C++ runtimes; alone and with all that follow;
// in a process that has made the call before, as a thread's first call, and as the process's first. The call gives a
// documented code or what it always gives, nothing is lost, and the same call works afterwards.
// SPDX-License-Identifier: MIT
#include <lumra/lumra.h>

#include <mkl_dfti.h>
#include <sys/mman.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <set>
#include <thread>

#include "fault/session_calls.hpp"
#include "qsrfhs/util/batch_scheduler.hpp"
#include "support/failing_malloc.h"
#include "support/session.hpp"
#include "toolkit/operations.hpp"

namespace {

using namespace tests;
using codes = std::set<std::int32_t>;

constexpr std::int32_t kept_count = 1;  // ours: a refused resize that is no error left the output's count as it was

struct outcome {
  std::int32_t code = 0;
  std::uint64_t hash = 0;  // of the results' bytes

  outcome(std::int32_t of_call = 0) : code(of_call) {}
  outcome(std::int32_t of_call, std::span<const unsigned char> bytes) : code(of_call), hash(14695981039346656037U) {
    for (const unsigned char byte : bytes) hash = (hash ^ byte) * 1099511628211U;
  }
  friend bool operator==(const outcome &, const outcome &) = default;
};

/// Runs the call that is looked at, while `count` allocations (0 for all) from the first-th on fail.
struct memory_limit {
  long first = 0, count = 1, tried = 0;

  template <class Call>
  auto operator()(Call call) {
    failing_malloc_arm(first, count);
    const auto returned = call();
    tried = failing_malloc_disarm();
    return returned;
  }
};

enum class place { same_thread, new_thread, new_process };

struct trial {
  long tried, left;  // allocations; blocks that stay
  outcome limited, repeated;
};

/// All blocks but those of the list of failures, which only grows.
long blocks() {
  std::uint64_t failures = 0;
  qsrfhs_getErrorCnt(&failures);
  return failing_malloc_live() - static_cast<long>(failures);
}

template <class Attempt>
trial try_at(place where, long first, long count, Attempt &attempt) {
  static auto *const shared =
      static_cast<trial *>(mmap(nullptr, sizeof(trial), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0));
  *shared = trial{-1, 0, {}, {}};
  const long before = blocks();
  const auto work = [&]() noexcept {  // the test must not go on in a child
    memory_limit limit{first, count}, none;
    shared->limited = attempt(limit);
    shared->repeated = attempt(none);
    shared->tried = limit.tried;
  };
  if (where == place::same_thread) {
    work();
  } else if (where == place::new_thread) {
    std::thread(work).join();
  } else if (const pid_t child = fork(); child == 0) {
    work();
    shared->left = blocks() - before;
    _exit(testing::Test::HasFailure());
  } else {
    int status = -1;
    waitpid(child, &status, 0);
    EXPECT_EQ(0, status);
  }
  if (where != place::new_process) shared->left = blocks() - before;
  return *shared;
}

/// `attempt` makes what a call needs, runs the call in its argument, and frees everything.
template <class Attempt>
void exhaust(const char *name, const codes &documented, std::initializer_list<place> places, Attempt attempt) {
  long points = 0;
  for (const place where : places) {
    if (where != place::new_process) try_at(where, 0, 1, attempt);  // what stays for good is there now
    const trial reference = try_at(where, 0, 1, attempt);
    EXPECT_EQ(0, reference.limited.code) << name;
    EXPECT_TRUE(reference.limited == reference.repeated) << name;
    for (const long count : {1L, 0L}) {
      for (long first = 1;; ++first) {
        trial t = try_at(where, first, count, attempt);
        // What is lost is lost again, unlike room for message texts, or for more threads in MKL's list of them.
        if (t.left > reference.left) t = try_at(where, first, count, attempt);
        const bool failed = t.tried >= first;
        const bool right = t.limited == reference.limited || (failed && documented.contains(t.limited.code));
        EXPECT_TRUE(right && t.repeated == reference.limited && t.left <= reference.left && t.tried >= 0)
            << name << ": allocation " << first << (count == 0 ? " and all that follow" : "") << ", place "
            << static_cast<int>(where) << ", code " << t.limited.code << ", then " << t.repeated.code
            << ", blocks left " << t.left << " and not " << reference.left;
        if (!failed || t.tried < 0) break;
        ++points;
      }
    }
  }
  testing::Test::RecordProperty(name, std::to_string(points));  // how many allocations failed
}

constexpr auto warm = {place::same_thread, place::new_thread};
constexpr auto everywhere = {place::new_process, place::same_thread, place::new_thread};

template <class Array>
outcome of_output(std::int32_t code, Array handle, std::int32_t count) {
  if (code == 0 && (!handle || !*handle || (*handle)->count != count)) return kept_count;
  if (code != 0) return code;
  return {code,
          {reinterpret_cast<const unsigned char *>((*handle)->elements),
           static_cast<std::size_t>(count) * sizeof *(*handle)->elements}};
}

template <class E>
class ToolkitMemory : public testing::Test {};
TYPED_TEST_SUITE(ToolkitMemory, all_letters);

TYPED_TEST(ToolkitMemory, RunsOut) {
  fake_host host(fake_host::unit::elements);
  for (const auto &op : operations<TypeParam>())
    exhaust(op.name, {-20001, -359501, -359502}, warm, [&](auto &limit) {
      host.calls.clear();
      arguments<TypeParam> a;
      const std::int32_t code = limit([&] { return op.run(a); });
      const auto bytes = op.result(a);
      EXPECT_TRUE(a.scratch_is_empty() && (code == 0 || (bytes.empty() && !a.slot))) << op.name;
      return outcome(code, bytes);
    });
}

TEST(SessionMemory, RunsOut) {
  (void)DftiErrorMessage(DFTI_MEMORY_ERROR);  // MKL keeps its texts
  exhaust("CreateSession", {-380122}, everywhere, [](auto &limit) {
    std::uint64_t session = UINT64_MAX;
    const std::int32_t code = limit([&] { return qsLumraAlgo_CreateSession(&session); });
    EXPECT_EQ(code != 0, session == UINT64_MAX);
    if (code == 0) qsLumraAlgo_CloseSession(session);
    return outcome(code);
  });
  // Each call after those in front of it. 1009: MKL's transforms of primes allocate most.
  constexpr std::int32_t n = 1009;
  cf32_array input = filled<toolkit::c>(noise<toolkit::c>(4 * n));
  for (const session_call &last : session_calls)
    exhaust(last.name, {-380122, kept_count}, everywhere, [&](auto &limit) {
      lumra_waveform in{0, 1, input.handle()};
      lumra_spectrum out{-1, -1, nullptr};
      const open_session session;
      for (const session_call *c = session_calls; c != &last; ++c) EXPECT_EQ(0, c->run(session, n, in, out));
      qsHost_ArrayFree(&out.y);
      out = {-1, -1, nullptr};
      const std::int32_t code = limit([&] { return last.run(session, n, in, out); });
      if (code != 0) {
        EXPECT_EQ(-1, out.f0);
        EXPECT_EQ(0, last.run(session, n, in, out));  // the same session goes on
      }
      const outcome result = out.df == -1 ? outcome(code) : of_output(code, out.y, n);
      qsHost_ArrayFree(&out.y);
      return result;
    });
}

TEST(SessionMemory, ACallTakesOneBlockOfMemory) {
  constexpr std::int32_t n = 64;
  cf32_array input(4 * n);
  f32_array output(n);
  const lumra_waveform in{0, 1, input.handle()};
  lumra_spectrum out{0, 0, output.handle()};
  const open_session session;
  ASSERT_EQ(0, qsLumraAlgo_InitializeFFT(session, n));
  const auto run = [&] { return qsLumraAlgo_PerformWindowingFFTAndIQTransform(session, 1, n, &in, &out); };
  ASSERT_EQ(0, run());
  memory_limit counting;
  EXPECT_EQ(0, counting(run));
  EXPECT_EQ(1, counting.tried);
}

TEST(ErrorVectorMemory, RunsOut) {
  test_array<lumra_cf32_matrix_block> a = filled<toolkit::c>(50, 40, noise<toolkit::c>(2000, 1)),
                                      b = filled<toolkit::c>(50, 40, noise<toolkit::c>(2000, 2));
  test_array<lumra_f32_matrix_block> e(40, 50);
  for (const auto function :
       {&qsLumraAlgo_CalculateEVM2D, &qsLumraAlgo_CalculateMagnitudeError2D, &qsLumraAlgo_CalculatePhaseError2D})
    exhaust("error vectors", {-312498}, everywhere, [&](auto &limit) {
      std::fill_n(e.block()->elements, 2000, 7.F);
      const std::int32_t code =
          limit([&] { return function(a.handle(), b.handle(), e.handle(), LUMRA_ACCURACY_HIGH); });
      if (code != 0) {
        EXPECT_EQ(2000, std::count(e.block()->elements, e.block()->elements + 2000, 7.F));
      }
      return outcome(code, {reinterpret_cast<const unsigned char *>(e.block()->elements), 2000 * sizeof(float)});
    });
}

TEST(HostArrayMemory, RunsOut) {
  const std::int32_t size = 4;
  exhaust("host arrays", {-20001}, everywhere, [&](auto &limit) {
    lumra_f32_array array = nullptr;
    std::int32_t made = 0;
    const std::int32_t code = limit([&] {
      made = qsHost_ArrayNew(9, 1, &size, &array);
      return made == 0 ? qsHost_ArrayResize(9, 1, &array, 1000) : made;
    });
    EXPECT_EQ(made != 0, array == nullptr);
    EXPECT_TRUE(!array || (*array)->count == 4);
    qsHost_ArrayFree(&array);
    return outcome(code);
  });
}

TEST(VectorMemory, RunsOut) {
  constexpr std::int32_t n = 100;
  cf32_array x = filled<toolkit::c>(noise<toolkit::c>(n, 1)), y = filled<toolkit::c>(noise<toolkit::c>(n, 2));
  f32_array keys = filled<toolkit::s>(noise<toolkit::s>(n, 3));
  const lumra_cf32 v{2, 1};
  float seconds = 0;
  const auto exhaust_output = [&](const char *name, auto output, auto call) {
    exhaust(name, {kept_count}, everywhere, [&](auto &limit) {
      auto out = output;
      const std::int32_t code = limit([&] { return call(&out); });
      const outcome result = of_output(code, out, n);
      qsHost_ArrayFree(&out);
      return result;
    });
  };
  const lumra_f32_array reals = nullptr;
  const lumra_cf32_array samples = nullptr;
  exhaust_output("division", samples, [&](auto out) { return qsRFHS_complex_division_array_by_array(x, y, out); });
  exhaust_output("division by a value", samples,
                 [&](auto out) { return qsRFHS_complex_division_array_by_value(x, &v, out); });
  exhaust_output("magnitude", reals, [&](auto out) { return qsRFHS_complex_magnitude(x, out); });
  exhaust_output("squared magnitude", reals, [&](auto out) { return qsRFHS_complex_magnitude_squared(x, out); });
  exhaust_output("logarithm", reals, [&](auto out) { return qsUtilHS_aLog2Plusb_SGL(keys, out, 1, 0); });
  exhaust_output("logarithm of samples", reals, [&](auto out) { return qsUtilHS_aLog2Plusb_IQ(x, out, 1, 0); });
  exhaust_output("lookup", samples, [&](auto out) { return qsUtilHS_LookupTable(keys, x, out, y, 0, 1); });
  exhaust("polynomials", {kept_count}, everywhere, [&](auto &limit) {
    const std::int32_t size = 1;
    lumra_cf32_array out = nullptr;
    EXPECT_EQ(0, qsHost_ArrayNew(12, 1, &size, &out));
    const std::int32_t code = limit([&] { return qsRFHS_ApplyPolynomialCplx(keys, y, out, &seconds); });
    const outcome result = of_output(code, out, n);
    qsHost_ArrayFree(&out);
    return result;
  });
}

TEST(SchedulerMemory, RunsOutInTheFirstBatch) {
  constexpr std::int32_t timed_out = -67436764;
  exhaust("first batch", {timed_out}, {place::new_process, place::new_thread}, [](auto &limit) {
    std::mutex mutex;
    qsrfhs::batch_scheduler scheduler(
        mutex, 4, [](std::int32_t code) { return code; }, std::chrono::milliseconds(200));
    std::atomic<int> done[8]{};
    const std::int32_t code = limit([&] {
      return scheduler.RunBatch([](void *record, void *) { ++*static_cast<std::atomic<int> *>(record); }, done, 8,
                                sizeof *done, qsrfhs::batch_scheduler::shared_mode);
    });
    EXPECT_TRUE(code != 0 || std::all_of(std::begin(done), std::end(done), [](int runs) { return runs == 1; }));
    return outcome(code);
  });
}

TEST(ServicesMemory, RunsOut) {
  const auto cold = {place::new_process};  // what these make once is used again
  exhaust("array store", {-33620079, -46}, cold, [](auto &limit) {
    lumra_array_ref record{1, nullptr};
    lumra_array_ref *array = &record;
    const std::int32_t code = limit([&] { return qsUtilHS_AllocateArray_CSG(&array, 1 << 20, 1); });
    EXPECT_EQ(code != 0, record.block == nullptr);
    EXPECT_EQ(0, qsUtilHS_FreeArray_CSG(&array));
    return outcome(code);
  });
  exhaust("FIFO", {-1}, cold, [](auto &limit) {
    std::uint64_t *cell = nullptr;
    const std::uint64_t handle = limit([&] { return qsLTEHS_DataFIFOCreate("memory", 64, 0, &cell); });
    EXPECT_EQ(handle, cell ? *cell : 0);
    if (cell) {
      EXPECT_EQ(0, qsLTEHS_DataFIFOUnreserve(&cell));
    }
    return outcome(handle == 0 ? -1 : 0);
  });
  exhaust("filter registry", {-50462898}, cold, [](auto &limit) {
    const lumra_filter_key key{2, {}, {4, 1, .25, 8}};
    lumra_filter_record record{};
    const std::int32_t code = limit([&] { return qsUtilHS_RegisterFilterSpec(&record, nullptr, &key, 0); });
    EXPECT_EQ(code != 0, record.entry == nullptr);
    if (code == 0) {
      qsUtilHS_MatchFilterSpecErase(&record, &key, 1);
      EXPECT_EQ(0, qsUtilHS_UnegisterFilterSpec(&record));
    }
    return outcome(code);
  });
  for (const std::uint32_t inverse : {0U, 1U})
    exhaust("resampler descriptor", {-50397684, -50397485, -50397513, -50397544, -46}, cold, [=](auto &limit) {
      lumra_resampler_descriptor *out = nullptr;
      const std::int32_t code =
          limit([&] { return qsUtilHS_FFTResampler_CSG_CreateDescriptor(&out, 1009, 1, inverse, 77); });
      EXPECT_EQ(code == 0, out != nullptr);
      qsUtilHS_FreeArrayIDH_CSG(77);
      return outcome(code);
    });
  exhaust("list of failures", {}, cold, [](auto &limit) {
    return outcome(limit([] { return qsUtilHS_FreeArray_CSG(nullptr); }) == -33620097 ? 0 : -1);
  });
}

/// Threads leave their stacks to the next ones, with a block each; small ones all of them.
const bool stacks_are_small = [] {
  pthread_attr_t attributes;
  return pthread_attr_init(&attributes) == 0 && pthread_attr_setstacksize(&attributes, 1 << 18) == 0 &&
         pthread_setattr_default_np(&attributes) == 0;
}();

}  // namespace
