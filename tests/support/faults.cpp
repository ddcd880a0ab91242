// SPDX-License-Identifier: MIT
#include "support/faults.hpp"

#include <mkl_dfti.h>
#include <mkl_lapack.h>

#include <cstdarg>

namespace tests {

constinit fault_counter transforms, lapack;

namespace {

// MKL's own calls from one of its functions to another are not counted.
thread_local int depth = 0;

/// A call that may fail; the outermost one that makes a descriptor says where it puts it.
template <class Call>
MKL_LONG counted(Call call, DFTI_DESCRIPTOR_HANDLE *made = nullptr) {
  const bool outermost = depth == 0;
  if (made) *made = nullptr;
  if (outermost && transforms.fails()) return DFTI_MEMORY_ERROR;
  ++depth;
  const MKL_LONG status = call();
  --depth;
  if (outermost && made && *made) ++transforms.live;
  return status;
}

}  // namespace
}  // namespace tests

using namespace tests;
using descriptor = DFTI_DESCRIPTOR_HANDLE;
using size = const MKL_INT *;

extern "C" {

// REAL is variadic where MKL's own is: such functions look at a register that other calls leave alone. In-place calls
// pass no output; the register that is read for it then is handed on and not looked at.
#define DFTI(NAME, REAL, PARAMETERS, ARGUMENTS, ...)                                        \
  MKL_LONG __real_Dfti##NAME REAL;                                                          \
  MKL_LONG __wrap_Dfti##NAME PARAMETERS {                                                   \
    return counted([=] { return __real_Dfti##NAME ARGUMENTS; } __VA_OPT__(, ) __VA_ARGS__); \
  }
DFTI(CreateDescriptor_s_1d, (descriptor *, DFTI_CONFIG_VALUE, ...),
     (descriptor * made, DFTI_CONFIG_VALUE d, MKL_LONG n), (made, d, n), made)
DFTI(CreateDescriptor_d_1d, (descriptor *, DFTI_CONFIG_VALUE, ...),
     (descriptor * made, DFTI_CONFIG_VALUE d, MKL_LONG n), (made, d, n), made)
DFTI(CreateDescriptor_s_md, (descriptor *, DFTI_CONFIG_VALUE, MKL_LONG, ...),
     (descriptor * made, DFTI_CONFIG_VALUE d, MKL_LONG rank, MKL_LONG *n), (made, d, rank, n), made)
DFTI(CreateDescriptor_d_md, (descriptor *, DFTI_CONFIG_VALUE, MKL_LONG, ...),
     (descriptor * made, DFTI_CONFIG_VALUE d, MKL_LONG rank, MKL_LONG *n), (made, d, rank, n), made)
DFTI(CopyDescriptor, (descriptor, descriptor *), (descriptor from, descriptor *made), (from, made), made)
DFTI(CommitDescriptor, (descriptor), (descriptor d), (d))
DFTI(ComputeForward, (descriptor, void *, ...), (descriptor d, void *in, void *out), (d, in, out))
DFTI(ComputeBackward, (descriptor, void *, ...), (descriptor d, void *in, void *out), (d, in, out))
DFTI(GetValue, (descriptor, DFTI_CONFIG_PARAM, ...), (descriptor d, DFTI_CONFIG_PARAM what, void *value),
     (d, what, value))
#undef DFTI

MKL_LONG __real_DftiSetValue(descriptor, DFTI_CONFIG_PARAM, ...);
MKL_LONG __wrap_DftiSetValue(descriptor d, int parameter, ...) {
  const auto what = static_cast<DFTI_CONFIG_PARAM>(parameter);
  const bool scale = what == DFTI_FORWARD_SCALE || what == DFTI_BACKWARD_SCALE;
  std::va_list values;
  va_start(values, parameter);
  const double real = scale ? va_arg(values, double) : 0.0;
  void *const word = scale ? nullptr : va_arg(values, void *);
  va_end(values);
  return counted([=] { return scale ? __real_DftiSetValue(d, what, real) : __real_DftiSetValue(d, what, word); });
}

MKL_LONG __real_DftiFreeDescriptor(descriptor *);
MKL_LONG __wrap_DftiFreeDescriptor(descriptor *d) {
  const bool mine = depth == 0 && *d;
  const MKL_LONG status = depth == 0 && transforms.fails() ? DFTI_MEMORY_ERROR : DFTI_NO_ERROR;
  ++depth;
  const MKL_LONG freed = __real_DftiFreeDescriptor(d);
  --depth;
  if (mine) --transforms.live;
  return status == DFTI_NO_ERROR ? freed : status;
}

// The last argument of all of them is info.
#define LAPACK(ROUTINE, PARAMETERS, ARGUMENTS) \
  void __real_##ROUTINE PARAMETERS;            \
  void __wrap_##ROUTINE PARAMETERS {           \
    if (lapack.fails())                        \
      *info = lapack.status();                 \
    else                                       \
      __real_##ROUTINE ARGUMENTS;              \
  }
LAPACK(sgelsd,
       (size m, size n, size k, float *a, size lda, float *b, size ldb, float *s, const float *cut, MKL_INT *rank,
        float *work, size lwork, MKL_INT *iwork, MKL_INT *info),
       (m, n, k, a, lda, b, ldb, s, cut, rank, work, lwork, iwork, info))
LAPACK(cgelsd,
       (size m, size n, size k, MKL_Complex8 *a, size lda, MKL_Complex8 *b, size ldb, float *s, const float *cut,
        MKL_INT *rank, MKL_Complex8 *work, size lwork, float *rwork, MKL_INT *iwork, MKL_INT *info),
       (m, n, k, a, lda, b, ldb, s, cut, rank, work, lwork, rwork, iwork, info))
LAPACK(sgesdd,
       (const char *job, size m, size n, float *a, size lda, float *s, float *u, size ldu, float *vt, size ldvt,
        float *work, size lwork, MKL_INT *iwork, MKL_INT *info),
       (job, m, n, a, lda, s, u, ldu, vt, ldvt, work, lwork, iwork, info))
LAPACK(cgesdd,
       (const char *job, size m, size n, MKL_Complex8 *a, size lda, float *s, MKL_Complex8 *u, size ldu,
        MKL_Complex8 *vt, size ldvt, MKL_Complex8 *work, size lwork, float *rwork, MKL_INT *iwork, MKL_INT *info),
       (job, m, n, a, lda, s, u, ldu, vt, ldvt, work, lwork, rwork, iwork, info))
#undef LAPACK

}  // extern "C"
