// What SigMF says about a recording that was made from another. SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <nlohmann/json_fwd.hpp>
#include <optional>
#include <string>

#include "recording/source.hpp"

namespace recording {

/// Sample k of the result is made of sample first + k * ratio of the source.
struct derivation {
  std::uint64_t first = 0, samples_in = 0;  // what of the source the result covers
  double ratio = 1;
  std::uint64_t samples = 0;        // of the result
  double rate = 0;                  // of the result, samples per second
  std::optional<double> frequency;  // centre of the result, where it is another than the captures'
  std::string datatype;             // SigMF's
  std::string description;          // added to the source's own
};

/// The metadata of the result. What the source's metadata say is carried over where it is still true; captures and
/// annotations get the indices of the new samples, rounded to the nearest, and an annotation holds one sample at least.
/// Captures that begin in the middle get the time of their new first sample.
nlohmann::json derived_metadata(const source &from, const derivation &made);

}  // namespace recording
