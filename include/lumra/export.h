/* Marks the functions that the shared library offers. SPDX-License-Identifier: MIT */
#ifndef LUMRA_EXPORT_H
#define LUMRA_EXPORT_H

#if defined(__GNUC__)
#define LUMRA_EXPORT __attribute__((visibility("default")))
#else
#define LUMRA_EXPORT
#endif

#endif
