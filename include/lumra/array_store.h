/* Arrays that stay inside the library between calls: complex single precision, recycled. SPDX-License-Identifier: MIT
 *
 * An array belongs to the library and is known by a reference, a record of the caller's, and by an owner identifier of
 * the caller's choice, by which all arrays of an owner are released at once. Released memory waits for the next array
 * of a like size; it is never given back to the system, and never cleared.
 *
 * Every code but -46 is recorded in the process's list of failures. Any thread may call any function; a reference, and
 * the elements behind it, are one thread's at a time. A reference whose block is not, or no longer, an array of the
 * library counts as one without an array. */
#ifndef LUMRA_ARRAY_STORE_H
#define LUMRA_ARRAY_STORE_H

#include <lumra/export.h>
#include <lumra/host_array.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/* An array of the library's, to be read only; its elements may be written. */
typedef struct lumra_array_block {
  struct lumra_array_block *next;
  uint32_t units; /* capacity, in 4096 bytes */
  void *raw;
  lumra_cf32 *data; /* element 0, on a 256-byte boundary */
  uint32_t size_class;
  uint32_t bytes;                /* in use: 8 * count */
  lumra_cf32_block *count_field; /* the count in front of element 0: the array as a host array's block */
  lumra_cf32_array handle;       /* a handle to that; it cannot be resized */
  uint32_t count;                /* elements */
} lumra_array_block;

#pragma pack(push, 1)
/* A reference. Set kind to 1 and block to null before its first use. */
typedef struct lumra_array_ref {
  int32_t kind;             /* 1; a reference of any other kind is invalid */
  lumra_array_block *block; /* null: no array */
} lumra_array_ref;
#pragma pack(pop)

/* Takes an array of count elements, whose values are undefined, and attaches it to a reference.
 *
 * array  address of the pointer to the reference. An array already attached is forgotten by it, not released: it stays
 *        under its owner until that is released
 * count  0 to 2^29 - 1; 0 attaches none
 * owner  any value
 *
 * The capacity is the need in whole units of 4096 bytes, from 64 KiB on in whole 64 KiB, from 1 MiB on in whole MiB.
 * Below 128 MiB an array released last of the same capacity is taken first; from there on the one that fits best, if
 * at most about a tenth (the one released last) or half of it would be wasted.
 *
 * Returns 0, or in the order of the checks: -33620066 invalid reference; -33620069 negative count; -33620079 too large,
 * or no memory; -46, not recorded: no memory to register the array. The reference is unchanged on failure. */
LUMRA_EXPORT int32_t qsUtilHS_AllocateArray_CSG(lumra_array_ref **array, int32_t count, uint64_t owner);

/* Releases the array of a reference, whoever its owner is, and sets the reference's block to null. Returns 0, also
 * where there is no array to release; -33620097 invalid reference. */
LUMRA_EXPORT int32_t qsUtilHS_FreeArray_CSG(lumra_array_ref **array);

/* Releases everything that is registered under an owner: arrays, newest first, and FFT resampler descriptors. The
 * references keep their pointers, and must not be used for an array that was allocated since. Returns 0. Takes a time
 * that grows with all that is registered. */
LUMRA_EXPORT int32_t qsUtilHS_FreeArrayIDH_CSG(uint64_t owner);

/* Writes the element count. Returns 0; -33620121 invalid reference, or length is null; -33620126 no array. */
LUMRA_EXPORT int32_t qsUtilHS_ArrayLength_CSG(lumra_array_ref **array, uint32_t *length);

/* Copies elements offset to offset + count - 1 into a host array; elements before the first and behind the last of the
 * array, and all where there is none, are zeros.
 *
 * destination  address of a handle. One with a count of at least `count` is cut to it, any other is resized (type code
 *              12, one dimension, size 8 * count)
 *
 * Returns 0, or in the order of the checks: -33620139 invalid reference, or destination is null; -33620069 negative
 * count; -33620151 refused resize, nothing is written. */
LUMRA_EXPORT int32_t qsUtilHS_ReadArray_CSG(lumra_array_ref **array, lumra_cf32_array *destination, int32_t offset,
                                            int32_t count);

#ifdef __cplusplus
}
#endif

#endif
