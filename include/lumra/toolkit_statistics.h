/* Root mean square and straight-line fit. The conventions are those of lumra/toolkit.h, which includes this.
 * SPDX-License-Identifier: MIT */
#ifndef LUMRA_TOOLKIT_STATISTICS_H
#define LUMRA_TOOLKIT_STATISTICS_H

#include <lumra/export.h>
#include <lumra/host_array.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/* Root mean square:  sqrt(sum of |x|^2) / sqrt(n).
 *
 * data    n samples
 * result  NaN on failure; null is allowed
 *
 * Codes: -20003. */
LUMRA_EXPORT int32_t qsRFPELTA_sRMSH(lumra_f32_array data, float *result);
LUMRA_EXPORT int32_t qsRFPELTA_dRMSH(lumra_f64_array data, double *result);
LUMRA_EXPORT int32_t qsRFPELTA_cRMSH(lumra_cf32_array data, float *result);
LUMRA_EXPORT int32_t qsRFPELTA_zRMSH(lumra_cf64_array data, double *result);

/* Fits a straight line  f(x) = slope x + intercept  to points and replaces y by f(x).
 *
 * y           n values, read and written
 * x           n values
 * weights     n values, 0 or above and not all 0, or none: all points count alike
 * slope, intercept, residue
 *             results, NaN on failure; null is allowed. The residue is  sum of w (y - f)^2 / sum of w,  w the weights
 * method      0: least squares
 *             1: least absolute deviations, by least squares with w / |y - f| in repetition
 *             2: bisquare: from the line of method 1, with w (1 - u^2)^2,  u = |y - f| / (6.95 median |y - f|), and 0
 *                where u > 1
 * tuning1     of methods 1 and 2, relative: they end when the sum that they weight changes by less from one repetition
 *             to the next; 0 or below: 1e-4
 * tuning2     largest number of repetitions; below 1: 100. Method 2 spends half of them, at most, on method 1
 * iterations  receives the repetitions done, 0 for method 0 and on failure; null is allowed
 * scratch     needed by methods 1 and 2, and by method 0 with weights that differ (n elements)
 *
 * Sums are taken in double precision from the mean of x on. Source of method 2: P. W. Holland, R. E. Welsch, Commun.
 * Statist. A6 (1977), 813-827. Codes in the order of the checks: -20061 (method), -20002 (counts), -20006 (fewer than
 * two points), -20068 (x or y not finite, or the largest number of the type), -20061 (negative weight), -20068 (weight
 * not finite), -20061 (all weights 0), -20061 (shared scratch), -20999, -20001, -20006 (all points of weight above 0 at
 * one x), -20068 (a line beyond double precision). */
LUMRA_EXPORT int32_t qsRFPELTA_sLinearFitH(lumra_f32_array y, lumra_f32_array x, lumra_f32_array weights, float *slope,
                                           float *intercept, float *residue, int32_t method, float tuning1,
                                           float tuning2, int32_t *iterations, lumra_f32_array scratch);
LUMRA_EXPORT int32_t qsRFPELTA_dLinearFitH(lumra_f64_array y, lumra_f64_array x, lumra_f64_array weights, double *slope,
                                           double *intercept, double *residue, int32_t method, float tuning1,
                                           float tuning2, int32_t *iterations, lumra_f64_array scratch);

#ifdef __cplusplus
}
#endif

#endif
