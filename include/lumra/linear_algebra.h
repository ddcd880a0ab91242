/* Least squares. SPDX-License-Identifier: MIT
 *
 * Conventions of the open interface: lumra/lumra.h. */
#ifndef LUMRA_LINEAR_ALGEBRA_H
#define LUMRA_LINEAR_ALGEBRA_H

#include <lumra/export.h>
#include <lumra/status.h>
#include <lumra/types.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/* A solver for problems of one size: the x that make |a x - b| least, column by column of b, and of those the shortest.
 *
 * A problem of full rank is solved by a QR decomposition (of the conjugated transpose where there are fewer rows than
 * columns). Where an estimate of the matrix's condition leaves its rank in doubt, singular values decide: those up to
 * rcond times the largest count as zero, at several times the cost. */
typedef struct lumra_least_squares lumra_least_squares;

typedef struct lumra_least_squares_options {
  uint32_t size;        /* of this record in bytes */
  int32_t type;         /* of all matrices: one of enum lumra_type_code */
  uint64_t rows;        /* of a and b, 1 or more */
  uint64_t columns;     /* of a, 1 or more; rows and columns at most 2^31 - 1, their product at most 2^40 */
  uint64_t right_sides; /* columns of b and x, 1 to 2^31 - 1 */
} lumra_least_squares_options;

#define LUMRA_LEAST_SQUARES_OPTIONS \
  { sizeof(lumra_least_squares_options), LUMRA_TYPE_F64, 1, 1, 1 }

/* Makes a solver with all its workspace.
 *
 * options  null for LUMRA_LEAST_SQUARES_OPTIONS
 * out      receives the solver
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT out; LUMRA_BAD_SIZE_FIELD options; LUMRA_UNKNOWN_CHOICE
 * type; LUMRA_OUT_OF_RANGE rows, columns, right_sides. */
LUMRA_EXPORT lumra_status lumra_least_squares_create(const lumra_least_squares_options *options,
                                                     lumra_least_squares **out);

/* Frees a solver; null is allowed. */
LUMRA_EXPORT void lumra_least_squares_free(lumra_least_squares *solver);

/* Solves one problem. Matrices lie row by row without gaps.
 *
 * a      rows times columns elements, finite
 * b      rows times right_sides elements, finite
 * rcond  relative size of the singular values that count as zero, 0 or more; NaN for max(rows, columns) times the
 *        precision's epsilon
 * x      columns times right_sides elements, written; apart from a and b
 * rank   receives the rank found; may be null
 *
 * Returns 0, or in the order of the checks: LUMRA_NULL_ARGUMENT, LUMRA_WRONG_OBJECT solver; LUMRA_NULL_ARGUMENT a, b,
 * x; LUMRA_OVERLAP; LUMRA_OUT_OF_RANGE rcond; LUMRA_OUT_OF_RANGE an element that is not finite; LUMRA_NO_CONVERGENCE.
 */
LUMRA_EXPORT lumra_status lumra_least_squares_solve(lumra_least_squares *solver, const void *a, const void *b,
                                                    double rcond, void *x, uint64_t *rank);

#ifdef __cplusplus
}
#endif

#endif
