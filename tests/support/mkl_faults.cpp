// SPDX-License-Identifier: MIT
#include "support/mkl_faults.hpp"

#include <gtest/gtest.h>
#include <mkl_dfti.h>

#include <atomic>
#include <cstdarg>

namespace tests::mkl_faults {
namespace {

std::atomic<bool> armed{false};
std::atomic<int> count{0};
std::atomic<int> failing{0};
std::atomic<int> live{0};

// MKL's own calls from one of these functions to another are not counted.
thread_local int depth = 0;

template <class Call>
MKL_LONG counted(Call call) {
  const bool outermost = depth == 0;
  if (outermost && armed && ++count == failing) return DFTI_MEMORY_ERROR;
  ++depth;
  const MKL_LONG status = call();
  --depth;
  return status;
}

template <class Call>
MKL_LONG making(DFTI_DESCRIPTOR_HANDLE *made, Call call) {
  const bool outermost = depth == 0;
  *made = nullptr;
  const MKL_LONG status = counted(call);
  if (outermost && *made) ++live;
  return status;
}

/// What an earlier test left in a cache of the process is not the next one's.
class live_from_each_test : public testing::EmptyTestEventListener {
  void OnTestStart(const testing::TestInfo & /*test*/) override { live = 0; }
};
[[maybe_unused]] const bool listening = [] {
  testing::UnitTest::GetInstance()->listeners().Append(new live_from_each_test);
  return true;
}();

}  // namespace

fail_at::fail_at(int n) noexcept {
  count = 0;
  failing = n;
  armed = true;
}

fail_at::~fail_at() {
  armed = false;
}

int calls() noexcept {
  return count;
}

int live_descriptors() noexcept {
  return live;
}

}  // namespace tests::mkl_faults

using tests::mkl_faults::counted;
using tests::mkl_faults::making;

extern "C" {

using handle = DFTI_DESCRIPTOR_HANDLE;

// Variadic as MKL's own are: such functions look at a register that other calls leave alone.
MKL_LONG __real_DftiCreateDescriptor_s_1d(handle *, DFTI_CONFIG_VALUE, ...);
MKL_LONG __real_DftiCreateDescriptor_d_1d(handle *, DFTI_CONFIG_VALUE, ...);
MKL_LONG __real_DftiCreateDescriptor_s_md(handle *, DFTI_CONFIG_VALUE, MKL_LONG, ...);
MKL_LONG __real_DftiCreateDescriptor_d_md(handle *, DFTI_CONFIG_VALUE, MKL_LONG, ...);
MKL_LONG __real_DftiCopyDescriptor(handle, handle *);
MKL_LONG __real_DftiCommitDescriptor(handle);
MKL_LONG __real_DftiComputeForward(handle, void *, ...);
MKL_LONG __real_DftiComputeBackward(handle, void *, ...);
MKL_LONG __real_DftiSetValue(handle, DFTI_CONFIG_PARAM, ...);
MKL_LONG __real_DftiGetValue(handle, DFTI_CONFIG_PARAM, ...);
MKL_LONG __real_DftiFreeDescriptor(handle *);

MKL_LONG __wrap_DftiCreateDescriptor_s_1d(handle *made, DFTI_CONFIG_VALUE domain, MKL_LONG size) {
  return making(made, [=] { return __real_DftiCreateDescriptor_s_1d(made, domain, size); });
}

MKL_LONG __wrap_DftiCreateDescriptor_d_1d(handle *made, DFTI_CONFIG_VALUE domain, MKL_LONG size) {
  return making(made, [=] { return __real_DftiCreateDescriptor_d_1d(made, domain, size); });
}

MKL_LONG __wrap_DftiCreateDescriptor_s_md(handle *made, DFTI_CONFIG_VALUE domain, MKL_LONG rank, MKL_LONG *sizes) {
  return making(made, [=] { return __real_DftiCreateDescriptor_s_md(made, domain, rank, sizes); });
}

MKL_LONG __wrap_DftiCreateDescriptor_d_md(handle *made, DFTI_CONFIG_VALUE domain, MKL_LONG rank, MKL_LONG *sizes) {
  return making(made, [=] { return __real_DftiCreateDescriptor_d_md(made, domain, rank, sizes); });
}

MKL_LONG __wrap_DftiCopyDescriptor(handle from, handle *made) {
  return making(made, [=] { return __real_DftiCopyDescriptor(from, made); });
}

MKL_LONG __wrap_DftiCommitDescriptor(handle descriptor) {
  return counted([=] { return __real_DftiCommitDescriptor(descriptor); });
}

// In-place calls pass no output; the register that is read for it then is handed on and not looked at.
MKL_LONG __wrap_DftiComputeForward(handle descriptor, void *in, void *out) {
  return counted([=] { return __real_DftiComputeForward(descriptor, in, out); });
}

MKL_LONG __wrap_DftiComputeBackward(handle descriptor, void *in, void *out) {
  return counted([=] { return __real_DftiComputeBackward(descriptor, in, out); });
}

MKL_LONG __wrap_DftiSetValue(handle descriptor, int parameter, ...) {
  const auto config = static_cast<DFTI_CONFIG_PARAM>(parameter);
  const bool scale = config == DFTI_FORWARD_SCALE || config == DFTI_BACKWARD_SCALE;
  std::va_list values;
  va_start(values, parameter);
  const double real = scale ? va_arg(values, double) : 0.0;
  void *const word = scale ? nullptr : va_arg(values, void *);
  va_end(values);
  return counted([=] {
    return scale ? __real_DftiSetValue(descriptor, config, real) : __real_DftiSetValue(descriptor, config, word);
  });
}

MKL_LONG __wrap_DftiGetValue(handle descriptor, DFTI_CONFIG_PARAM parameter, void *value) {
  return counted([=] { return __real_DftiGetValue(descriptor, parameter, value); });
}

MKL_LONG __wrap_DftiFreeDescriptor(handle *descriptor) {
  using namespace tests::mkl_faults;
  if (depth != 0) return __real_DftiFreeDescriptor(descriptor);
  const bool held = *descriptor != nullptr;
  const MKL_LONG status = counted([]() -> MKL_LONG { return DFTI_NO_ERROR; });
  ++depth;
  const MKL_LONG freed = __real_DftiFreeDescriptor(descriptor);
  --depth;
  if (held) --live;
  return status == DFTI_NO_ERROR ? freed : status;
}

}  // extern "C"
