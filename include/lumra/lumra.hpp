// C++20 on top of the C interface: owning types over spans, whose functions throw lumra::error.
// SPDX-License-Identifier: MIT
#pragma once

#include <lumra/lumra.h>

#include <lumra/channelizer.hpp>
#include <lumra/elementwise.hpp>
#include <lumra/error.hpp>
#include <lumra/error_vector.hpp>
#include <lumra/evm.hpp>
#include <lumra/filter.hpp>
#include <lumra/host_array.hpp>
#include <lumra/level.hpp>
#include <lumra/library.hpp>
#include <lumra/linear_algebra.hpp>
#include <lumra/measure.hpp>
#include <lumra/resampler.hpp>
#include <lumra/services.hpp>
#include <lumra/session.hpp>
#include <lumra/spectrum.hpp>
#include <lumra/toolkit.hpp>
#include <lumra/transform.hpp>
#include <lumra/vector_utilities.hpp>
#include <lumra/window.hpp>
