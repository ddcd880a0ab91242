// SPDX-License-Identifier: MIT
#include <lumra/status.h>

#include <algorithm>
#include <cstdint>
#include <iterator>

#include "c_support/base/status.hpp"

namespace {

struct entry {
  std::int32_t code;
  const char *name, *text;
};

// A name is written once, as the code.
#define LUMRA_TEXT(CODE, TEXT) \
  { CODE, #CODE, TEXT }
constexpr entry entries[] = {
    LUMRA_TEXT(LUMRA_SUCCESS, "success"),
    LUMRA_TEXT(LUMRA_NULL_ARGUMENT, "a required pointer is null"),
    LUMRA_TEXT(LUMRA_BAD_SIZE_FIELD,
               "an options record's size is not one that this library knows; start from its LUMRA_..._OPTIONS"),
    LUMRA_TEXT(LUMRA_OUT_OF_RANGE, "an argument lies outside of its range, or is not a number"),
    LUMRA_TEXT(LUMRA_UNKNOWN_CHOICE, "a number or name stands for none of the choices"),
    LUMRA_TEXT(LUMRA_TOO_LITTLE_ROOM, "an output has too little room; nothing was taken or written"),
    LUMRA_TEXT(LUMRA_OVERLAP, "arrays overlap that must be apart"),
    LUMRA_TEXT(LUMRA_WRONG_OBJECT, "an object was freed, is of another kind, or never was one"),
    LUMRA_TEXT(LUMRA_WRONG_TYPE, "an object was made for another element type"),
    LUMRA_TEXT(LUMRA_BAD_STATE, "saved bytes are cut, damaged, or of another object or version"),
    LUMRA_TEXT(LUMRA_NO_MEMORY, "not enough memory"),
    LUMRA_TEXT(LUMRA_TRANSFORM_FAILED, "a Fourier transform could not be made or computed"),
    LUMRA_TEXT(LUMRA_NO_CONVERGENCE, "the algorithm did not converge"),
    LUMRA_TEXT(LUMRA_TOO_FEW_SAMPLES, "there are fewer samples, or complete segments, than the result needs"),
    LUMRA_TEXT(LUMRA_UNEXPECTED, "a failure that none of the codes describes"),
    LUMRA_TEXT(LUMRA_UNKNOWN_CODE, "a code that has no message"),
    LUMRA_TEXT(LUMRA_INVALID_SESSION, "the handle names no open session"),
    LUMRA_TEXT(LUMRA_INTERNAL_ERROR, "the work failed; the session's log says why"),
    LUMRA_TEXT(LUMRA_INVALID_ARGUMENT, "a required pointer is null, or a size cannot be served"),
    LUMRA_TEXT(LUMRA_FFT_SIZE_TOO_SMALL, "the FFT size is below 16"),
    LUMRA_TEXT(LUMRA_INPUT_TOO_SHORT, "there are fewer input samples than the FFT size"),
    LUMRA_TEXT(LUMRA_INVALID_WINDOW, "the window is neither none nor flat top"),
    LUMRA_TEXT(LUMRA_INVALID_OVERLAP, "the overlap is negative, not finite, or not below the FFT size"),
    LUMRA_TEXT(LUMRA_INVALID_PARAMETER, "a matrix is missing, sizes differ, or the accuracy mode is unknown"),
    LUMRA_TEXT(LUMRA_NOT_OFFERED, "the function is not offered"),
    LUMRA_TEXT(LUMRA_FFT_SIZE_UNSUPPORTED, "the FFT size is above 2^27"),
    LUMRA_TEXT(LUMRA_ALLOCATION_FAILED, "not enough memory"),
    LUMRA_TEXT(LUMRA_UNDEFINED_ERROR, "MKL reported a failure"),
    LUMRA_TEXT(LUMRA_INFO_FILENAME_NULL, "the buffer for the file name is null"),
    LUMRA_TEXT(LUMRA_INFO_VERSION_NULL, "the version number's address is null"),
    LUMRA_TEXT(LUMRA_INFO_VERSION_TEXT_NULL, "the buffer for the version's text is null"),
    LUMRA_TEXT(LUMRA_INFO_DESCRIPTION_NULL, "the buffer for the description is null"),
    LUMRA_TEXT(LUMRA_INFO_AVX_NULL, "the address for the AVX support is null"),
    LUMRA_TEXT(LUMRA_TOOLKIT_NO_MEMORY, "not enough memory, an array could not be resized, or an output is null"),
    LUMRA_TEXT(LUMRA_TOOLKIT_LENGTHS_DIFFER, "arrays have different lengths"),
    LUMRA_TEXT(LUMRA_TOOLKIT_EMPTY_INPUT, "an input is empty"),
    LUMRA_TEXT(LUMRA_TOOLKIT_NEGATIVE_SIZE, "a size is negative"),
    LUMRA_TEXT(LUMRA_TOOLKIT_TOO_FEW_POINTS, "there are too few points"),
    LUMRA_TEXT(LUMRA_TOOLKIT_EMPTY_RESULT, "the result would be empty"),
    LUMRA_TEXT(LUMRA_TOOLKIT_BAD_RATIO, "the resampling ratio is not a positive number up to 2^30"),
    LUMRA_TEXT(LUMRA_TOOLKIT_BAD_FACTOR, "the decimation factor does not fit"),
    LUMRA_TEXT(LUMRA_TOOLKIT_INNER_DIMENSIONS, "the inner dimensions of a matrix product differ"),
    LUMRA_TEXT(LUMRA_TOOLKIT_DESTINATION_TOO_SMALL, "the destination is too small"),
    LUMRA_TEXT(LUMRA_TOOLKIT_BAD_DELAY, "the delay is negative or not a number, or the resampler's state is damaged"),
    LUMRA_TEXT(LUMRA_TOOLKIT_BAD_OPTION,
               "an option is none of its choices, or workspace is another array of the call, too"),
    LUMRA_TEXT(LUMRA_TOOLKIT_NOT_FINITE, "data are not finite, or no convergence"),
    LUMRA_TEXT(LUMRA_TOOLKIT_HISTORY_TOO_SHORT, "a resampler's history is too short for its filter"),
    LUMRA_TEXT(LUMRA_TOOLKIT_NO_SCRATCH, "workspace that the call needs is missing"),
    LUMRA_TEXT(LUMRA_TOOLKIT_TRANSFORM_FAILED, "a Fourier transform failed"),
    LUMRA_TEXT(LUMRA_TOOLKIT_NO_TRANSFORM, "a Fourier transform could not be made; at most 2^27 points are possible"),
    LUMRA_TEXT(LUMRA_TOOLKIT_TRANSFORM_NOT_FREED, "a Fourier transform could not be freed"),
    LUMRA_TEXT(LUMRA_REFUSED, "a required argument is null, or a FIFO's transfer timed out"),
    LUMRA_TEXT(LUMRA_FIFO_UNKNOWN, "the FIFO is unknown or closed, or the transfer's arguments do not fit"),
    LUMRA_TEXT(LUMRA_LOOKUP_TABLE_INVALID, "the lookup table is empty, or its step is 0"),
    LUMRA_TEXT(LUMRA_DIVIDE_X_NULL, "the dividend is null"),
    LUMRA_TEXT(LUMRA_DIVIDE_Y_NULL, "the divisor is null"),
    LUMRA_TEXT(LUMRA_DIVIDE_OUT_NULL, "the quotient is null"),
    LUMRA_TEXT(LUMRA_DIVIDE_Y_TOO_SHORT, "the divisor is shorter than the dividend"),
    LUMRA_TEXT(LUMRA_DIVIDE_IN_PLACE_X_NULL, "the dividend is null"),
    LUMRA_TEXT(LUMRA_DIVIDE_IN_PLACE_Y_NULL, "the divisor is null"),
    LUMRA_TEXT(LUMRA_DIVIDE_IN_PLACE_Y_TOO_SHORT, "the divisor is shorter than the dividend"),
    LUMRA_TEXT(LUMRA_DIVIDE_VALUE_X_NULL, "the dividend is null"),
    LUMRA_TEXT(LUMRA_DIVIDE_VALUE_NULL, "the divisor is null"),
    LUMRA_TEXT(LUMRA_DIVIDE_VALUE_OUT_NULL, "the quotient is null"),
    LUMRA_TEXT(LUMRA_DIVIDE_VALUE_IN_PLACE_X_NULL, "the dividend is null"),
    LUMRA_TEXT(LUMRA_DIVIDE_VALUE_IN_PLACE_NULL, "the divisor is null"),
    LUMRA_TEXT(LUMRA_MAGNITUDE_X_NULL, "the samples are null"),
    LUMRA_TEXT(LUMRA_MAGNITUDE_OUT_NULL, "the magnitudes are null"),
    LUMRA_TEXT(LUMRA_MAGNITUDE_SQUARED_X_NULL, "the samples are null"),
    LUMRA_TEXT(LUMRA_MAGNITUDE_SQUARED_OUT_NULL, "the squared magnitudes are null"),
    LUMRA_TEXT(LUMRA_ERRORS_COUNT_NULL, "the address for the number of errors is null"),
    LUMRA_TEXT(LUMRA_ERRORS_CODES_NULL, "the array for the codes is null"),
    LUMRA_TEXT(LUMRA_ERRORS_CAPACITY, "the array for the codes is too short"),
    LUMRA_TEXT(LUMRA_THREADS_SHARED_FAILED, "a worker thread could not be started"),
    LUMRA_TEXT(LUMRA_THREADS_PINNED_FAILED, "a pinned worker thread could not be started"),
    LUMRA_TEXT(LUMRA_THREADS_SHARED_TIMEOUT, "the worker threads did not finish in time"),
    LUMRA_TEXT(LUMRA_THREADS_PINNED_TIMEOUT, "the pinned worker threads did not finish in time"),
    LUMRA_TEXT(LUMRA_REGISTRY_NO_MEMORY, "not enough memory to register an array"),
    LUMRA_TEXT(LUMRA_ARRAY_ALLOCATE_REFERENCE, "the array's reference is null or of another kind"),
    LUMRA_TEXT(LUMRA_ARRAY_NEGATIVE_COUNT, "a number of elements is negative"),
    LUMRA_TEXT(LUMRA_ARRAY_NO_BLOCK, "not enough memory, or 2^29 elements and more"),
    LUMRA_TEXT(LUMRA_ARRAY_FREE_REFERENCE, "the array's reference is null or of another kind"),
    LUMRA_TEXT(LUMRA_ARRAY_LENGTH_REFERENCE,
               "the array's reference or the length's address is null, or of another kind"),
    LUMRA_TEXT(LUMRA_ARRAY_LENGTH_NONE, "the reference holds no array that is in use"),
    LUMRA_TEXT(LUMRA_ARRAY_READ_REFERENCE, "the array's reference or the destination is null, or of another kind"),
    LUMRA_TEXT(LUMRA_ARRAY_READ_RESIZE, "the destination could not be resized"),
    LUMRA_TEXT(LUMRA_FILTER_MATCH_RECORD_NULL, "the filter's record is null"),
    LUMRA_TEXT(LUMRA_FILTER_MATCH_KEY_NULL, "the filter's key is null"),
    LUMRA_TEXT(LUMRA_FILTER_MATCH_ERASED, "the filter was erased"),
    LUMRA_TEXT(LUMRA_FILTER_MATCH_NONE, "the record and the key do not match"),
    LUMRA_TEXT(LUMRA_FILTER_UNREGISTER_NULL, "the filter's record is null"),
    LUMRA_TEXT(LUMRA_FILTER_UNREGISTER_EMPTY, "the record holds no filter"),
    LUMRA_TEXT(LUMRA_FILTER_UNREGISTER_UNKNOWN, "the filter is not registered"),
    LUMRA_TEXT(LUMRA_FILTER_REGISTER_NULL, "the record or the key is null"),
    LUMRA_TEXT(LUMRA_FILTER_NO_DESIGN, "the key makes no filter"),
    LUMRA_TEXT(LUMRA_RESAMPLER_FREE_FAILED_AGAIN, "a transform could not be freed"),
    LUMRA_TEXT(LUMRA_RESAMPLER_LENGTH_QUERY, "a transform's length could not be read"),
    LUMRA_TEXT(LUMRA_RESAMPLER_FREE_FAILED, "a transform could not be freed"),
    LUMRA_TEXT(LUMRA_RESAMPLER_CREATE, "a transform could not be made"),
    LUMRA_TEXT(LUMRA_RESAMPLER_SCALE, "a transform's scale could not be set"),
    LUMRA_TEXT(LUMRA_RESAMPLER_IN_PLACE, "a transform could not be set in place"),
    LUMRA_TEXT(LUMRA_RESAMPLER_OUT_OF_PLACE, "a transform could not be set out of place"),
    LUMRA_TEXT(LUMRA_RESAMPLER_COMMIT, "a transform could not be prepared"),
    LUMRA_TEXT(LUMRA_RESAMPLER_NO_BUFFER, "not enough memory for a work buffer"),
    LUMRA_TEXT(LUMRA_RESAMPLER_RELEASED, "a descriptor was released"),
    LUMRA_TEXT(LUMRA_RESAMPLER_NO_DESCRIPTOR, "not enough memory for a descriptor, or its address is null"),
    LUMRA_TEXT(LUMRA_RESAMPLER_FORWARD, "a forward transform failed"),
    LUMRA_TEXT(LUMRA_RESAMPLER_BACKWARD, "a backward transform failed"),
};
#undef LUMRA_TEXT

const entry *find(std::int32_t code) noexcept {
  const auto *found =
      std::find_if(std::begin(entries), std::end(entries), [=](const entry &e) { return e.code == code; });
  return found == std::end(entries) ? nullptr : found;
}

}  // namespace

const char *lumra_status_text(int32_t code) {
  const entry *found = find(code);
  return found ? found->text : c_support::GetStatusMessage(code);
}

const char *lumra_status_name(int32_t code) {
  const entry *found = find(code);
  return found ? found->name : "";
}
