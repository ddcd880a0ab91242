/* Host arrays: the resizable blocks in which samples and results cross the interface.
 * SPDX-License-Identifier: MIT
 *
 * An array is a handle: a pointer to a pointer to a block. The block starts with its signed 32-bit sizes (one for a
 * vector; rows, then columns for a matrix) and continues with the elements, row by row. The second pointer lets an
 * array move when it grows while every copy of the handle stays good.
 *
 * Outputs are resized by the library through one service, the first of
 *   1. the function handed to qsHost_SetArrayResize,
 *   2. the process's own symbol HostArrayResize (searched once, at first use),
 *   3. the library's own allocator, which the functions qsHost_Array* offer to hosts without arrays of their own.
 * The own allocator places element 0 on a 64-byte boundary, keeps the old elements, and never moves an array that
 * shrinks. It refuses to resize a block that it has not made.
 *
 * Codes: -20001 no memory, or more than 2^31 - 1 elements; -20004 a negative size; -20061 a type code or a number of
 * dimensions that does not exist; -359503 a transform that could not be freed. */
#ifndef LUMRA_HOST_ARRAY_H
#define LUMRA_HOST_ARRAY_H

#include <lumra/export.h>
#include <lumra/types.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/* Blocks. `elements` has as many elements as the sizes say; elements of 4-byte parts start 4 bytes into a vector's
 * block, all others 8 bytes into theirs. */
typedef struct lumra_f32_block {
  int32_t count;
  float elements[1];
} lumra_f32_block;

typedef struct lumra_f64_block {
  int32_t count;
  double elements[1];
} lumra_f64_block;

typedef struct lumra_cf32_block {
  int32_t count;
  lumra_cf32 elements[1];
} lumra_cf32_block;

typedef struct lumra_cf64_block {
  int32_t count;
  lumra_cf64 elements[1];
} lumra_cf64_block;

typedef struct lumra_f32_matrix_block {
  int32_t rows, columns;
  float elements[1];
} lumra_f32_matrix_block;

typedef struct lumra_f64_matrix_block {
  int32_t rows, columns;
  double elements[1];
} lumra_f64_matrix_block;

typedef struct lumra_cf32_matrix_block {
  int32_t rows, columns;
  lumra_cf32 elements[1];
} lumra_cf32_matrix_block;

typedef struct lumra_cf64_matrix_block {
  int32_t rows, columns;
  lumra_cf64 elements[1];
} lumra_cf64_matrix_block;

/* Handles. */
typedef lumra_f32_block **lumra_f32_array;
typedef lumra_f64_block **lumra_f64_array;
typedef lumra_cf32_block **lumra_cf32_array;
typedef lumra_cf64_block **lumra_cf64_array;
typedef lumra_f32_matrix_block **lumra_f32_matrix;
typedef lumra_f64_matrix_block **lumra_f64_matrix;
typedef lumra_cf32_matrix_block **lumra_cf32_matrix;
typedef lumra_cf64_matrix_block **lumra_cf64_matrix;

/* A host's resize service. typeCode is one of enum lumra_type_code. handleAddress is the address of a handle; the
 * service may replace the block, and the handle where that is null. newSize is the size argument that the calling
 * function names. 0 on success. */
typedef int32_t (*lumra_array_resize)(int32_t typeCode, int32_t dimensions, void *handleAddress, uint64_t newSize);

/* Hands over the host's resize service; null goes back to the search among the process's symbols, made afresh at the
 * next use. Returns 0. Any thread; calls that are running may still use the service of before. */
LUMRA_EXPORT int32_t qsHost_SetArrayResize(lumra_array_resize service);

/* Makes an array of zeros.
 *
 * typeCode    LUMRA_TYPE_*
 * dimensions  1 or 2
 * sizes       one count, or rows and columns
 * array       address of a handle of the matching type; receives the new handle, null on failure
 *
 * Returns 0, or in the order of the checks: -20001 array is null; -20061 bad type code or dimensions, or sizes null;
 * -20004 negative size; -20001 too large, or no memory. Any thread. */
LUMRA_EXPORT int32_t qsHost_ArrayNew(int32_t typeCode, int32_t dimensions, const int32_t *sizes, void *array);

/* Frees an array made by the library's own allocator and sets the handle to null. `array` is the address of a handle;
 * null, and a null handle, are allowed. A block of another maker is left alone. Returns 0. Any thread, but no call may
 * be using the array. */
LUMRA_EXPORT int32_t qsHost_ArrayFree(void *array);

/* Makes room for newSize elements (rows times columns for two dimensions) in an array of the own allocator. The
 * elements and the sizes in the block stay as they are, new room is zero, and the caller writes the new sizes. A null
 * handle, or one to a null block, receives a new block with sizes 0.
 *
 * array  address of a handle
 *
 * Returns 0, or in the order of the checks: -20001 array is null; -20061 bad type code or dimensions; -20001 more than
 * 2^31 - 1 elements, a block of another maker, or no memory; the array is unchanged then. Any thread, but no other
 * call may be using the array. */
LUMRA_EXPORT int32_t qsHost_ArrayResize(int32_t typeCode, int32_t dimensions, void *array, uint64_t newSize);

/* Frees the transform that a call of the toolkit left in a caller's slot and sets the slot to null. slot and *slot may
 * be null. Returns 0, or -359503 when the transform could not be freed (the slot is null then, too). No call may be
 * using the slot. */
LUMRA_EXPORT int32_t qsHost_ReleaseTransform(void **slot);

#ifdef __cplusplus
}
#endif

#endif
