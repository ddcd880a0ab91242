/* The whole C interface. SPDX-License-Identifier: MIT
 *
 * It has two doors into the same rooms. The open interface, functions named lumra_, takes plain arrays and is the one
 * to begin with; its conventions are on this page. The older one, functions named qs, takes arrays in blocks that carry
 * their own counts (host_array.h), for hosts that have such arrays; the top of each of its headers says how it works.
 *
 * Conventions of the open interface
 * ---------------------------------
 * Arrays are an address and a uint64_t count of elements. The alignment of an element is enough. lumra_cf32 and
 * lumra_cf64 lie in memory as complex numbers of C, C++ and NumPy do. Inputs are never written, and no address is
 * remembered after a call. An array of 0 elements may be null. An output may be one of the inputs where its header says
 * "in place"; arrays that overlap in any other way are refused (LUMRA_OVERLAP).
 *
 * Outputs are the caller's. How much a call writes is known before: a formula in the header, and a function where it
 * depends on more than the arguments. Too little room is refused before anything is taken or written.
 *
 * Statuses: every function that can fail returns a lumra_status, 0 for success. After a failure nothing was written,
 * and an object is as it was before, unless the header says otherwise. lumra_status_text says what a code means;
 * lumra_last_error what happened to the calling thread last: function, argument, value, and what would be right.
 * Nothing is printed, no environment is read or changed, nothing throws or aborts. Codes are listed in the order of
 * the checks; every function can also return LUMRA_NO_MEMORY, before it has changed anything.
 *
 * Objects are opaque: lumra_x_create makes one from a lumra_x_options and writes its address, lumra_x_free frees it
 * and takes null, too. A function that is given a freed object, or another kind of one, refuses it
 * (LUMRA_WRONG_OBJECT). One thread at a time may use an object; any number of objects may be used at once. Functions
 * without an object may be called by any number of threads. An object starts threads only where its options say so, a
 * function without one where lumra_elementwise_set_threads does.
 *
 * Options are records that begin with their own size, so that they can grow. Begin with the header's initialiser, then
 * change what you need:
 *
 *   lumra_fft_options options = LUMRA_FFT_OPTIONS;
 *   options.points = 4096;
 *   lumra_fft *fft = NULL;
 *   if (lumra_fft_create(&options, &fft) != LUMRA_SUCCESS) puts(lumra_last_error());
 *
 * Null options are the initialiser's. From another language, set `size` to the record's size and the rest to what the
 * header shows.
 *
 * States: what streams can be saved to bytes (lumra_x_save; lumra_x_state_size tells how many) and loaded again, in
 * another process and on another machine (lumra_x_load). The bytes are versioned and checked: what is cut, changed or
 * of another kind of object is refused (LUMRA_BAD_STATE).
 *
 * Results do not depend on how a stream was cut into calls, on the number of threads, or on which build of the loops
 * the processor gets, but where a header says so. The last bits of a Fourier transform may differ between models of
 * processors, those of filters with fixed taps, convolutions, resamplers and channels between processors with fused
 * multiply-add and those without. NaN and infinity follow IEEE arithmetic: they spoil the results they enter, not the
 * object.
 *
 * Units stand on every value: seconds, hertz, cycles per sample, dB of full scale. A power is that of the samples: a
 * complex tone of amplitude 1 has power 1. */
#ifndef LUMRA_LUMRA_H
#define LUMRA_LUMRA_H

#include <lumra/channelizer.h>
#include <lumra/core_services.h>
#include <lumra/elementwise.h>
#include <lumra/error_vector.h>
#include <lumra/evm.h>
#include <lumra/filter.h>
#include <lumra/host_array.h>
#include <lumra/level.h>
#include <lumra/library_info.h>
#include <lumra/linear_algebra.h>
#include <lumra/measure.h>
#include <lumra/resampler.h>
#include <lumra/session.h>
#include <lumra/spectrum.h>
#include <lumra/status.h>
#include <lumra/toolkit.h>
#include <lumra/transform.h>
#include <lumra/types.h>
#include <lumra/vector_utilities.h>
#include <lumra/version.h>
#include <lumra/window.h>

#endif
