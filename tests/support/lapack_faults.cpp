// SPDX-License-Identifier: MIT
#include "support/lapack_faults.hpp"

#include <mkl_lapack.h>

namespace tests::lapack_faults {
namespace {

int count = 0, failing = 0, told = 0;

}  // namespace

fail_at::fail_at(int n, int info) noexcept {
  count = 0;
  failing = n;
  told = info;
}

fail_at::~fail_at() {
  failing = 0;
}

int calls() noexcept {
  return count;
}

}  // namespace tests::lapack_faults

using tests::lapack_faults::count;
using tests::lapack_faults::failing;
using tests::lapack_faults::told;

// The last argument of all of them is info.
#define WRAP(ROUTINE, PARAMETERS, ARGUMENTS)    \
  extern "C" void __real_##ROUTINE PARAMETERS;  \
  extern "C" void __wrap_##ROUTINE PARAMETERS { \
    if (++count == failing)                     \
      *info = told;                             \
    else                                        \
      __real_##ROUTINE ARGUMENTS;               \
  }
using size = const MKL_INT *;
WRAP(sgelsd,
     (size m, size n, size k, float *a, size lda, float *b, size ldb, float *s, const float *cut, MKL_INT *rank,
      float *work, size lwork, MKL_INT *iwork, MKL_INT *info),
     (m, n, k, a, lda, b, ldb, s, cut, rank, work, lwork, iwork, info))
WRAP(cgelsd,
     (size m, size n, size k, MKL_Complex8 *a, size lda, MKL_Complex8 *b, size ldb, float *s, const float *cut,
      MKL_INT *rank, MKL_Complex8 *work, size lwork, float *rwork, MKL_INT *iwork, MKL_INT *info),
     (m, n, k, a, lda, b, ldb, s, cut, rank, work, lwork, rwork, iwork, info))
WRAP(sgesdd,
     (const char *job, size m, size n, float *a, size lda, float *s, float *u, size ldu, float *vt, size ldvt,
      float *work, size lwork, MKL_INT *iwork, MKL_INT *info),
     (job, m, n, a, lda, s, u, ldu, vt, ldvt, work, lwork, iwork, info))
WRAP(cgesdd,
     (const char *job, size m, size n, MKL_Complex8 *a, size lda, float *s, MKL_Complex8 *u, size ldu, MKL_Complex8 *vt,
      size ldvt, MKL_Complex8 *work, size lwork, float *rwork, MKL_INT *iwork, MKL_INT *info),
     (job, m, n, a, lda, s, u, ldu, vt, ldvt, work, lwork, rwork, iwork, info))
#undef WRAP
