/* Matrix products and linear least squares. The conventions are those of lumra/toolkit.h, which includes this.
 * SPDX-License-Identifier: MIT */
#ifndef LUMRA_TOOLKIT_MATRIX_H
#define LUMRA_TOOLKIT_MATRIX_H

#include <lumra/export.h>
#include <lumra/host_array.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/* Matrix product C = A B.
 *
 * a  m rows, k columns
 * b  k rows, n columns
 * c  resized to m rows and n columns; the numbers of significant bits of m - 1 and n - 1 must be below 31 together.
 *    With k = 0 all of its elements are NaN
 *
 * Codes in the order of the checks: -20003 (null matrix), -20004 (negative size), -20039 (k differs), -20001. On
 * failure both sizes are 0. */
LUMRA_EXPORT int32_t qsRFPELTA_sMtrxMulH(lumra_f32_matrix a, lumra_f32_matrix b, lumra_f32_matrix c);
LUMRA_EXPORT int32_t qsRFPELTA_cMtrxMulH(lumra_cf32_matrix a, lumra_cf32_matrix b, lumra_cf32_matrix c);

/* Matrix times vector y = A x.
 *
 * a  m rows, k columns
 * x  k elements
 * y  resized to m elements, to none with k = 0 (not NaN as above)
 *
 * Codes in the order of the checks: -20003 (null matrix or vector), -20004 (negative size), -20039 (k differs),
 * -20001. */
LUMRA_EXPORT int32_t qsRFPELTA_sMtrxVecMulH(lumra_f32_matrix a, lumra_f32_array x, lumra_f32_array y);
LUMRA_EXPORT int32_t qsRFPELTA_cMtrxVecMulH(lumra_cf32_matrix a, lumra_cf32_array x, lumra_cf32_array y);

/* Least squares: of all x that make |A x - b| smallest the shortest one, by a singular value decomposition of A.
 *
 * a          m rows, n columns
 * b          m elements
 * tolerance  singular values up to this part of the largest count as zero; below 0: the type's machine precision;
 *            0: max(m, n) times 2^-23
 * x          resized to n elements
 * scratch    all needed: a copy of A, one of b, and what the decomposition asks for
 *
 * Codes in the order of the checks: -20003 (null or empty), -20002 (b not of m elements), -20061 (tolerance not finite,
 * shared scratch), -20068 (A or b not finite), -20001, -20999, -20001, -20061 (LAPACK refuses an argument), -20068 (no
 * convergence). */
LUMRA_EXPORT int32_t qsRFPELTA_sLSEqH(lumra_f32_matrix a, lumra_f32_array b, float tolerance, lumra_f32_array x,
                                      lumra_f32_array matrixScratch, lumra_f32_array rhsScratch,
                                      lumra_f32_array workScratch);
LUMRA_EXPORT int32_t qsRFPELTA_cLSEqH(lumra_cf32_matrix a, lumra_cf32_array b, float tolerance, lumra_cf32_array x,
                                      lumra_cf32_array matrixScratch, lumra_cf32_array rhsScratch,
                                      lumra_cf32_array workScratch);

#ifdef __cplusplus
}
#endif

#endif
