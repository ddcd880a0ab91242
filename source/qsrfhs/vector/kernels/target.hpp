// Regions of a file that are compiled for a richer processor. They open behind all includes, instead of a compiler flag
// for the file: with the flag, inline functions of headers would be compiled for that processor too, and the linker
// might keep those copies for the whole library. SPDX-License-Identifier: MIT
#pragma once

#define LUMRA_PRAGMA(text) _Pragma(#text)
#if defined(__clang__)
#define LUMRA_BEGIN_TARGET(features) \
  LUMRA_PRAGMA(clang attribute push(__attribute__((target(features))), apply_to = function))
#define LUMRA_END_TARGET LUMRA_PRAGMA(clang attribute pop)
#else
#define LUMRA_BEGIN_TARGET(features) LUMRA_PRAGMA(GCC push_options) LUMRA_PRAGMA(GCC target(features))
#define LUMRA_END_TARGET LUMRA_PRAGMA(GCC pop_options)
#endif
