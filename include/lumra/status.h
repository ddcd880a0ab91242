/* Status codes of the session interface and their messages. SPDX-License-Identifier: MIT
 *
 * Every function of the library returns a signed 32-bit status: 0 for success, a negative value for a
 * failure. Each export family has codes of its own; they stand beside its functions. */
#ifndef LUMRA_STATUS_H
#define LUMRA_STATUS_H

#include <lumra/export.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/* Codes that functions named qsLumraAlgo_ return. */
enum lumra_status {
  LUMRA_SUCCESS = 0,
  LUMRA_UNKNOWN_CODE = -312404,       /* a code that has no message */
  LUMRA_INVALID_SESSION = -380121,    /* the handle names no open session */
  LUMRA_INTERNAL_ERROR = -380122,     /* the work failed; the session's log says why */
  LUMRA_INVALID_ARGUMENT = -380123,   /* a required pointer is null, or a size that cannot be served */
  LUMRA_FFT_SIZE_TOO_SMALL = -380124, /* an FFT size below 16 */
  LUMRA_INPUT_TOO_SHORT = -380125,    /* fewer input samples than the FFT size */
  LUMRA_INVALID_WINDOW = -380126,     /* has a message; returned by no function */
  LUMRA_INVALID_OVERLAP = -380128     /* overlap negative, not finite, or not below the FFT size; has no message */
};

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
