// What SigMF says about a recording at a new rate. SPDX-License-Identifier: MIT
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string>

#include "recording/source.hpp"

namespace recording {

/// The metadata of `samples` samples of type cf32_le, of which number k lies at sample k * ratio of from. What the
/// source's metadata say is carried over where it is still true; captures and annotations get the indices of the new
/// samples, rounded to the nearest, and an annotation holds one sample at least. The text is added to the description.
/// Throws failure where the source's annotations make no sense.
nlohmann::json resampled_metadata(const source &from, double ratio, double rate, std::uint64_t samples,
                                  const std::string &text);

}  // namespace recording
