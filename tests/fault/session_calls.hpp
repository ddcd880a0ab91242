// The calls of a measurement on one session, in the order in which a user makes them. SPDX-License-Identifier: MIT
#pragma once

#include <lumra/session.h>

#include <cstdint>

namespace tests {

struct session_call {
  const char *name;
  std::int32_t (*run)(std::uint64_t session, std::int32_t n, const lumra_waveform &in, lumra_spectrum &out);
};

inline constexpr session_call session_calls[] = {
    {"InitializeFFT", [](auto s, auto n, auto &, auto &) { return qsLumraAlgo_InitializeFFT(s, n); }},
    {"InitializeWindow", [](auto s, auto n, auto &, auto &) { return qsLumraAlgo_InitializeWindow(s, 1, n); }},
    {"unknown window", [](auto s, auto n, auto &, auto &) { return qsLumraAlgo_InitializeWindow(s, 9, n); }},
    {"prepared", [](auto s, auto n, auto &in,
                    auto &out) { return qsLumraAlgo_PerformWindowingFFTAndIQTransform(s, 1, n, &in, &out); }},
    {"reset", [](auto s, auto, auto &, auto &) { return qsLumraAlgo_ResetSession(s); }},
    {"unprepared", [](auto s, auto n, auto &in, auto &out) {
       return qsLumraAlgo_PerformWindowingOverlappedSeqFFTAndIQTransform(s, 1, n, 50, &in, &out);
     }}};

}  // namespace tests
