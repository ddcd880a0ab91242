// What SigMF says about a recording that was made from another. SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <nlohmann/json_fwd.hpp>
#include <optional>
#include <string>
#include <vector>

#include "recording/source.hpp"

namespace recording {

/// Samples of the source that follow each other, and what of the result was made of them.
struct derived_piece {
  std::uint64_t first = 0, samples_in = 0;
  std::uint64_t at = 0, samples = 0;
};

/// From the first sample of a piece on, time is the same in both.
struct derivation {
  std::vector<derived_piece> pieces;  // in order; one at least
  double rate = 0;                    // of the result, samples per second
  std::optional<double> frequency;    // centre of the result, where it is another than the captures'
  std::string datatype;               // SigMF's
  std::string description;            // added to the source's own
};

/// The metadata of the result. What the source's metadata say is carried over where it is still true; captures and
/// annotations get the indices of the new samples, rounded to the nearest, and an annotation holds one sample at least.
/// Captures that begin in the middle get the time of their new first sample. Of another rate or centre, annotations are
/// cut to the frequencies that the result has, and left out where these are none of theirs.
nlohmann::json derived_metadata(const source &from, const derivation &made);

}  // namespace recording
