// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>

/// A polynomial of degree 8 over n values.
void eigen_polynomial(const float *x, const float *c, float *out, std::size_t n);
