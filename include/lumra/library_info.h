/* Which library this is, and which processor path it takes. SPDX-License-Identifier: MIT
 *
 * Codes of these functions have no message. Any thread, any time. */
#ifndef LUMRA_LIBRARY_INFO_H
#define LUMRA_LIBRARY_INFO_H

#include <lumra/export.h>
#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/* Writes the library's name, "qsLumraAlgo", when size is at least 13 bytes, else an empty string; nothing for a size
 * of 1 or less. Returns 0; -268501027 when buffer is null. */
LUMRA_EXPORT int32_t qsLumraAlgo_getLibraryFilename(char *buffer, uint16_t size);

/* Writes the version: the number has the major version in its top byte, the minor in the next; the text ("20.6.0f0")
 * is written when versionTextSize is at least 13, and after it the description when descriptionSize is at least its
 * length + 1 (40). Buffers that are too small are left as they are, and so is what follows them.
 * Returns 0; in the order of the checks -268501053, -268501057, -268501061 when version, versionText, description is
 * null. */
LUMRA_EXPORT int32_t qsLumraAlgo_getLibraryInfo(uint32_t *version, char *versionText, uint16_t versionTextSize,
                                                char *description, uint16_t descriptionSize);

/* Writes 1 when processor and operating system support AVX, else 0; the kernels in use follow the same test.
 * Returns 0; -268501078 when result is null. */
LUMRA_EXPORT int32_t qsLumraAlgo_hasAvxHardwareSupport(uint8_t *result);

#ifdef __cplusplus
}
#endif

#endif
