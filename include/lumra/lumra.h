/* The whole C interface. SPDX-License-Identifier: MIT */
#ifndef LUMRA_LUMRA_H
#define LUMRA_LUMRA_H

#include <lumra/core_services.h>
#include <lumra/error_vector.h>
#include <lumra/host_array.h>
#include <lumra/library_info.h>
#include <lumra/session.h>
#include <lumra/status.h>
#include <lumra/toolkit.h>
#include <lumra/vector_utilities.h>
#include <lumra/version.h>

#endif
