/* Status codes, what they mean, and the latest failure. SPDX-License-Identifier: MIT
 *
 * Every function of the library returns a signed 32-bit status: 0 for success, a negative value for a
 * failure. The open interface has a few codes for all of its functions; each older family has codes of its own, which
 * stand beside its functions, too. */
#ifndef LUMRA_STATUS_H
#define LUMRA_STATUS_H

#include <lumra/export.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/* Every code of the library. Those of 0xFxxxxxxx appear in the headers of their families as hexadecimal too. */
enum lumra_status {
  LUMRA_SUCCESS = 0,

  /* The open interface, whose functions are named lumra_. */
  LUMRA_NULL_ARGUMENT = -390001,    /* a pointer is null that must not be */
  LUMRA_BAD_SIZE_FIELD = -390002,   /* an options record whose size is none of this library's */
  LUMRA_OUT_OF_RANGE = -390003,     /* a count, number or option outside of its range, or not a number */
  LUMRA_UNKNOWN_CHOICE = -390004,   /* a number or name that stands for no choice */
  LUMRA_TOO_LITTLE_ROOM = -390005,  /* an output has too little room; nothing was taken or written */
  LUMRA_OVERLAP = -390006,          /* arrays overlap that must not */
  LUMRA_WRONG_OBJECT = -390007,     /* an object that was freed, is of another kind, or never was one */
  LUMRA_WRONG_TYPE = -390008,       /* an object made for another element type */
  LUMRA_BAD_STATE = -390009,        /* saved bytes that are cut, damaged, or of another object or version */
  LUMRA_NO_MEMORY = -390010,        /* no memory */
  LUMRA_TRANSFORM_FAILED = -390011, /* the Fourier transform could not be made or computed */
  LUMRA_NO_CONVERGENCE = -390012,   /* the algorithm did not converge */
  LUMRA_TOO_FEW_SAMPLES = -390013,  /* fewer samples, or complete segments, than the result needs */
  LUMRA_UNEXPECTED = -390099,       /* a failure that none of the codes describes */

  /* Sessions. */
  LUMRA_UNKNOWN_CODE = -312404,       /* a code that has no message */
  LUMRA_INVALID_SESSION = -380121,    /* the handle names no open session */
  LUMRA_INTERNAL_ERROR = -380122,     /* the work failed; the session's log says why */
  LUMRA_INVALID_ARGUMENT = -380123,   /* a required pointer is null, or a size that cannot be served */
  LUMRA_FFT_SIZE_TOO_SMALL = -380124, /* an FFT size below 16 */
  LUMRA_INPUT_TOO_SHORT = -380125,    /* fewer input samples than the FFT size */
  LUMRA_INVALID_WINDOW = -380126,     /* has a message; returned by no function */
  LUMRA_INVALID_OVERLAP = -380128,    /* overlap negative, not finite, or not below the FFT size; has no message */
  LUMRA_INVALID_PARAMETER =
      -312401, /* error vectors: a block is null, sizes differ or are negative, or an unknown accuracy mode */
  LUMRA_NOT_OFFERED = -312402,          /* qsLTEHS: what it stands for is not offered */
  LUMRA_FFT_SIZE_UNSUPPORTED = -312432, /* has a message, an FFT size above 2^27; returned by no function */
  LUMRA_ALLOCATION_FAILED = -312498,    /* error vectors: no memory */
  LUMRA_UNDEFINED_ERROR = -312499,      /* has a message, MKL failed; returned by no function */

  /* Library information. */
  LUMRA_INFO_FILENAME_NULL = -268501027,
  LUMRA_INFO_VERSION_NULL = -268501053,
  LUMRA_INFO_VERSION_TEXT_NULL = -268501057,
  LUMRA_INFO_DESCRIPTION_NULL = -268501061,
  LUMRA_INFO_AVX_NULL = -268501078,

  /* Host arrays and toolkit. */
  LUMRA_TOOLKIT_NO_MEMORY = -20001, /* no memory, a refused resize, too many elements, or a null output */
  LUMRA_TOOLKIT_LENGTHS_DIFFER = -20002,
  LUMRA_TOOLKIT_EMPTY_INPUT = -20003,
  LUMRA_TOOLKIT_NEGATIVE_SIZE = -20004,
  LUMRA_TOOLKIT_TOO_FEW_POINTS = -20006,
  LUMRA_TOOLKIT_EMPTY_RESULT = -20008,
  LUMRA_TOOLKIT_BAD_RATIO = -20016,
  LUMRA_TOOLKIT_BAD_FACTOR = -20022,
  LUMRA_TOOLKIT_INNER_DIMENSIONS = -20039,
  LUMRA_TOOLKIT_DESTINATION_TOO_SMALL = -20046,
  LUMRA_TOOLKIT_BAD_DELAY = -20059,
  LUMRA_TOOLKIT_BAD_OPTION =
      -20061, /* an option out of its choices, or workspace that is another array of the call too */
  LUMRA_TOOLKIT_NOT_FINITE = -20068,
  LUMRA_TOOLKIT_HISTORY_TOO_SHORT = -20075,
  LUMRA_TOOLKIT_NO_SCRATCH = -20999,
  LUMRA_TOOLKIT_TRANSFORM_FAILED = -359501,
  LUMRA_TOOLKIT_NO_TRANSFORM = -359502,
  LUMRA_TOOLKIT_TRANSFORM_NOT_FREED = -359503,

  /* Vector utilities and data FIFOs. */
  LUMRA_REFUSED = -1, /* vector utilities: a required argument is null; FIFOs: a transfer timed out */
  LUMRA_FIFO_UNKNOWN = -2,
  LUMRA_LOOKUP_TABLE_INVALID = -380127,
  LUMRA_DIVIDE_X_NULL = -83951665,
  LUMRA_DIVIDE_Y_NULL = -83951668,
  LUMRA_DIVIDE_OUT_NULL = -83951671,
  LUMRA_DIVIDE_Y_TOO_SHORT = -83951676,
  LUMRA_DIVIDE_IN_PLACE_X_NULL = -83951703,
  LUMRA_DIVIDE_IN_PLACE_Y_NULL = -83951706,
  LUMRA_DIVIDE_IN_PLACE_Y_TOO_SHORT = -83951711,
  LUMRA_DIVIDE_VALUE_X_NULL = -83951730,
  LUMRA_DIVIDE_VALUE_NULL = -83951733,
  LUMRA_DIVIDE_VALUE_OUT_NULL = -83951736,
  LUMRA_DIVIDE_VALUE_IN_PLACE_X_NULL = -83951766,
  LUMRA_DIVIDE_VALUE_IN_PLACE_NULL = -83951769,
  LUMRA_MAGNITUDE_X_NULL = -83951791,
  LUMRA_MAGNITUDE_OUT_NULL = -83951794,
  LUMRA_MAGNITUDE_SQUARED_X_NULL = -83951822,
  LUMRA_MAGNITUDE_SQUARED_OUT_NULL = -83951825,

  /* Error list and the library's own threads. */
  LUMRA_ERRORS_COUNT_NULL = -67371090,
  LUMRA_ERRORS_CODES_NULL = -67371105,
  LUMRA_ERRORS_CAPACITY = -67371113,
  LUMRA_THREADS_SHARED_FAILED = -67436963,
  LUMRA_THREADS_PINNED_FAILED = -67436809,
  LUMRA_THREADS_SHARED_TIMEOUT = -67436764,
  LUMRA_THREADS_PINNED_TIMEOUT = -67436752,

  /* Arrays by identifier. */
  LUMRA_REGISTRY_NO_MEMORY = -46,
  LUMRA_ARRAY_ALLOCATE_REFERENCE = -33620066,
  LUMRA_ARRAY_NEGATIVE_COUNT = -33620069,
  LUMRA_ARRAY_NO_BLOCK = -33620079,
  LUMRA_ARRAY_FREE_REFERENCE = -33620097,
  LUMRA_ARRAY_LENGTH_REFERENCE = -33620121,
  LUMRA_ARRAY_LENGTH_NONE = -33620126,
  LUMRA_ARRAY_READ_REFERENCE = -33620139,
  LUMRA_ARRAY_READ_RESIZE = -33620151,

  /* Filters by key. */
  LUMRA_FILTER_MATCH_RECORD_NULL = -50462763,
  LUMRA_FILTER_MATCH_KEY_NULL = -50462766,
  LUMRA_FILTER_MATCH_ERASED = -50462794,
  LUMRA_FILTER_MATCH_NONE = -50462810,
  LUMRA_FILTER_UNREGISTER_NULL = -50462818,
  LUMRA_FILTER_UNREGISTER_EMPTY = -50462821,
  LUMRA_FILTER_UNREGISTER_UNKNOWN = -50462843,
  LUMRA_FILTER_REGISTER_NULL = -50462874,
  LUMRA_FILTER_NO_DESIGN = -50462898,

  /* FFT resampler. */
  LUMRA_RESAMPLER_FREE_FAILED_AGAIN = -50397436,
  LUMRA_RESAMPLER_LENGTH_QUERY = -50397466,
  LUMRA_RESAMPLER_FREE_FAILED = -50397473,
  LUMRA_RESAMPLER_CREATE = -50397485,
  LUMRA_RESAMPLER_SCALE = -50397494,
  LUMRA_RESAMPLER_IN_PLACE = -50397499,
  LUMRA_RESAMPLER_OUT_OF_PLACE = -50397506,
  LUMRA_RESAMPLER_COMMIT = -50397513,
  LUMRA_RESAMPLER_NO_BUFFER = -50397544,
  LUMRA_RESAMPLER_RELEASED = -50397566,
  LUMRA_RESAMPLER_NO_DESCRIPTOR = -50397684,
  LUMRA_RESAMPLER_FORWARD = -50397767,
  LUMRA_RESAMPLER_BACKWARD = -50397840
};
typedef enum lumra_status lumra_status;

/* What a code means, in a sentence without its end; a fixed text for codes that the library does not have. Never null,
 * valid for ever. Any thread. */
LUMRA_EXPORT const char *lumra_status_text(int32_t code);

/* The code's name in enum lumra_status, or "" for codes without one. Never null, valid for ever. Any thread. */
LUMRA_EXPORT const char *lumra_status_name(int32_t code);

/* The calling thread's latest failure of a function named lumra_: function, argument, value and what would be right, in
 * one sentence. "" while there was none. Never null; valid until the thread's next failure. Any thread. */
LUMRA_EXPORT const char *lumra_last_error(void);

/* Gives the message of a status code.
 *
 * session     ignored; any value will do
 * errorCode   a code of this interface; a value without an entry counts as LUMRA_UNKNOWN_CODE. Success (0) has no
 *             message and counts as unknown too
 * bufferSize  size of buffer in bytes
 * buffer      receives the message with its NUL when bufferSize is at least its length + 2, else an empty string;
 *             nothing is written when bufferSize is 1 or less, or buffer is null
 *
 * Returns the length of the message without its NUL when bufferSize is not greater than that length (so a call with
 * a null buffer and size 0 asks for the length), otherwise LUMRA_UNKNOWN_CODE for a code without an entry, else 0.
 * Any thread, any time. */
LUMRA_EXPORT int32_t qsLumraAlgo_GetErrorString(uint64_t session, int32_t errorCode, int32_t bufferSize, char *buffer);

#ifdef __cplusplus
}
#endif

#endif
