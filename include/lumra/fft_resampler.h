/* Transforms of the FFT resampler. SPDX-License-Identifier: MIT */
#ifndef LUMRA_FFT_RESAMPLER_H
#define LUMRA_FFT_RESAMPLER_H

#include <lumra/export.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/* A descriptor: one complex single-precision transform, and a work buffer. To be read only. */
typedef struct lumra_resampler_descriptor {
  void *transform; /* MKL's descriptor */
  void *buffer_block;
  void *aligned_buffer; /* 8 * length + 4096 bytes on a 4096-byte boundary, or null */
  uint32_t length;
  uint32_t buffer_flag;
  uint32_t inverse_flag;
  int32_t status; /* 0: usable */
} lumra_resampler_descriptor;

/* Takes a descriptor that is free, or makes one. It is its owner's until qsUtilHS_FreeArrayIDH_CSG releases the owner;
 * then it waits, as it is, for the next call with the same length and flags. The library never frees it.
 *
 * out          receives the descriptor, null on failure
 * length       of the transform in samples, 1 to 2^27
 * bufferFlag   not 0, together with inverseFlag: a work buffer comes with it. Flags are compared as values
 * inverseFlag  not 0: in place, the backward direction scaled by 1 / length; 0: out of place, unscaled
 * owner        any value; shared with the arrays of qsUtilHS_AllocateArray_CSG
 *
 * Returns 0, or a code that is recorded: -50397684 out is null, or no memory for the descriptor; -50397485 a length
 * that cannot be served, -50397494, -50397499, -50397506 or -50397513 a transform that could not be set up; -50397544
 * no memory for the work buffer; -46 no memory to register it. -50397566 is recorded behind the code of a descriptor
 * that is given up. Any thread; a descriptor is one thread's at a time. */
LUMRA_EXPORT int32_t qsUtilHS_FFTResampler_CSG_CreateDescriptor(lumra_resampler_descriptor **out, uint32_t length,
                                                                uint32_t bufferFlag, uint32_t inverseFlag,
                                                                uint64_t owner);

#ifdef __cplusplus
}
#endif

#endif
