// The picture of a spectrum. SPDX-License-Identifier: MIT
#pragma once

#include <string>

#include "analysis/averaged_spectrum.hpp"
#include "pictures/gnuplot.hpp"
#include "recording/source.hpp"

namespace tool {

/// The gnuplot script: level over frequency with a marker at bin `peak`; settings is the line below the title.
std::string spectrum_script(const recording::source &source, const averaged_spectrum &spectrum, std::size_t peak,
                            const std::string &settings, picture_type type);

}  // namespace tool
