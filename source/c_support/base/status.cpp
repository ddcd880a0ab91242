// SPDX-License-Identifier: MIT
#include "c_support/base/status.hpp"

#include <algorithm>
#include <cstring>
#include <iterator>

namespace c_support {
namespace {

struct message {
  std::int32_t code;
  const char *text;
};

// Texts are part of the interface: capitals, blanks and grammar stay as they are.
constexpr message messages[] = {
    {0, "Success"},
    {312400, "Invalid session."},
    {312401, "The given ConfigurationName is not valid or could not be found in the actual ACP object"},
    {312402, "The given ResultName is not valid or could not be found in the actual ACP object"},
    {-312400, "Invalid session."},
    {-312401, "Invalid input parameter"},
    {-312402, "Internal error."},
    {-312403, "Short buffer."},
    {-312404, "Unknown error code"},
    {-312405, "The given ConfigurationName is not valid or could not be found in the actual ACP object"},
    {-312406, "The given ResultName is not valid or could not be found in the actual ACP object"},
    {-312407, "access to traces is not possible, make sure traces are enabled before analyzing data"},
    {-312408, "The Tamber session is invalid. Please correctly initialize Tamber using real hardware."},
    {-312410, "ACP number of required samples is zero or less, should be a positive number."},
    {-312415, "FFT size is too short, must be at least 16."},
    {-312417, "FFT Overlap factor is too big."},
    {-312418, "(FFT Size - FFT overlap) must be a even number."},
    {-312420, "Input size of IQ samples is too short."},
    {-312421, "given or calculated bandwidth is zero or less."},
    {-312422, "calculated bandwidth is smaller than the required bandwidth for the given channel config"},
    {-312425, "the given channel offset is not a finite number"},
    {-312426, "the given channel bandwidth is not a finite number"},
    {-312427, "the given value for RRC filter alpha is not a positive number, should be between 0 and 1"},
    {-312430, "internal state of the ACP object is not Init but has to be for the requested action"},
    {-312431, "internal state of the ACP object is not Ready but has to be for the requested action"},
    {-312432,
     "unable to initialize FFT with given size, either too many FFTs have been initialized already or the FFT size is "
     "too large"},
    {-312497, "unable to lock result"},
    {-312498, "allocation of memory failed"},
    {-312499, "Undefined error"},
    {-380121, "Invalid  LumraAlgo session."},
    {-380122, "Internal Software Error."},
    {-380123, "Internal Software Error. Invalid argument error occurred in the LumraAlgo component."},
    {-380124,
     "Internal Software Error. FFT size is smaller than expected. Minimum size should be greater than or equal to 16."},
    {-380125, "Internal Software Error. The specified FFT size exceeds the number of samples of the input I/Q data."},
    {-380126, "Invalid Window Type specified. Only supported window types are 'None' and 'Flat Top'."},
    {-380253, "The Lumra version currently installed is no longer compatible with the application being executed."},
};

// Codes that are known but have no message.
constexpr std::int32_t without_message[] = {-312409, -312416, -312433};

const message *find(std::int32_t code) noexcept {
  const auto *found =
      std::find_if(std::begin(messages), std::end(messages), [=](const message &m) { return m.code == code; });
  return found == std::end(messages) ? nullptr : found;
}

}  // namespace

std::int32_t NormalizeStatusCode(std::int32_t code) noexcept {
  const bool known = code != 0 && (find(code) || std::find(std::begin(without_message), std::end(without_message),
                                                           code) != std::end(without_message));
  return known ? code : static_cast<std::int32_t>(LUMRA_UNKNOWN_CODE);
}

const char *GetStatusMessage(std::int32_t code) noexcept {
  const message *found = find(code);
  return found ? found->text : "Error code not mapped. Please contact support.";
}

}  // namespace c_support

int32_t qsLumraAlgo_GetErrorString(uint64_t /*session*/, int32_t errorCode, int32_t bufferSize, char *buffer) {
  const std::int32_t code = c_support::NormalizeStatusCode(errorCode);
  const bool folded = code == LUMRA_UNKNOWN_CODE && errorCode != LUMRA_UNKNOWN_CODE;
  const char *text = c_support::GetStatusMessage(code);
  const std::size_t length = std::strlen(text);
  if (buffer && bufferSize > 1) {
    // The room for the text is one less than the buffer on purpose; a text that does not fit leaves an empty string.
    const auto room = static_cast<std::size_t>(bufferSize) - 1;
    const bool fits = length < room;
    std::memcpy(buffer, fits ? text : "", fits ? length + 1 : 1);
  }
  if (bufferSize <= static_cast<std::int32_t>(length)) return static_cast<std::int32_t>(length);
  return folded ? LUMRA_UNKNOWN_CODE : LUMRA_SUCCESS;
}
