// SPDX-License-Identifier: MIT
#include "lifetime/caller.hpp"

#include <lumra/elementwise.hpp>

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <cstring>
#include <string>
#include <vector>

namespace lifetime {
namespace {

constexpr int samples = 256, long_samples = 70000;  // beyond 65536 the library's own threads share the work

template <class Array>
void make(lumra_type_code type, int count, Array &array) {
  (void)qsHost_ArrayNew(type, 1, &count, &array);
}

bool is_near(float a, float b) {
  return std::abs(a - b) <= 1e-3F * (1 + std::abs(b));
}

/// The power of a long constant, by the library's own threads.
bool has_power(const lumra_cf32 *x, double power) {
  lumra_level_options options = LUMRA_LEVEL_OPTIONS;
  options.threads = 2;
  lumra_level *level = nullptr;
  lumra_level_result result{};
  result.size = sizeof result;
  const bool good = lumra_level_create(&options, &level) == 0 && lumra_level_add(level, x, long_samples) == 0 &&
                    lumra_level_read(level, &result) == 0 && result.power == power && result.peak_index == 0;
  lumra_level_free(level);
  return good;
}

/// A polynomial of a long constant, by the library's own threads.
bool has_polynomial(const lumra_cf32 *x, lumra_cf32 *out, lumra_cf32 value) {
  const lumra_cf32 c[9] = {{1, 0}, {2, 0}};
  {
    const lumra::elementwise_threads use(2);
    if (lumra_polynomial_cf32(x, c, 9, out, long_samples) != 0) return false;
  }
  return lumra_elementwise_threads() == 1 &&
         std::all_of(out, out + long_samples, [&](lumra_cf32 y) { return y.re == value.re && y.im == value.im; });
}

}  // namespace

shared_objects::shared_objects() {
  (void)qsLumraAlgo_CreateSession(&session);
  fifo = qsLTEHS_DataFIFOCreate(("shared " + std::to_string(session)).c_str(), 1024, 0, &fifo_cell);
}

shared_objects::~shared_objects() {
  (void)qsLTEHS_DataFIFOUnreserve(&fifo_cell);
  (void)qsLumraAlgo_CloseSession(session);
}

caller::caller(shared_objects &shared, int number) : shared_(shared), number_(number) {
  for (lumra_cf32_array *array : {&samples_, &spectrum_, &scratch_}) make(LUMRA_TYPE_CF32, samples, *array);
  for (lumra_cf32_array *array : {&long_in_, &long_out_}) make(LUMRA_TYPE_CF32, long_samples, *array);
  make(LUMRA_TYPE_CF32, 4, table_);
  make(LUMRA_TYPE_F32, samples, power_);
  make(LUMRA_TYPE_F32, long_samples, keys_);
  for (lumra_f32_array *array : {&x_, &work_[0], &work_[1], &work_[2]}) make(LUMRA_TYPE_F32, 2, *array);
  constexpr int two_by_two[] = {2, 2};
  (void)qsHost_ArrayNew(LUMRA_TYPE_F32, 2, two_by_two, &matrix_);
  for (lumra_cf32 *s = (*samples_)->elements; s < (*samples_)->elements + samples; ++s) *s = {1, 0};
  for (lumra_cf32 *s = (*long_in_)->elements; s < (*long_in_)->elements + long_samples; ++s) *s = {1, 2};
  (*table_)->elements[0] = {3, 0};
}

caller::~caller() {
  (void)qsHost_ReleaseTransform(&slot_);
  for (lumra_cf32_array *array : {&samples_, &spectrum_, &scratch_, &long_in_, &long_out_, &table_})
    (void)qsHost_ArrayFree(array);
  for (lumra_f32_array *array : {&power_, &keys_, &x_, &work_[0], &work_[1], &work_[2]}) (void)qsHost_ArrayFree(array);
  (void)qsHost_ArrayFree(&matrix_);
}

bool caller::call(int family) {
  constexpr bool (caller::*families[family_count])() = {
      &caller::host_arrays,        &caller::own_session,      &caller::shared_session, &caller::session_log,
      &caller::stored_arrays,      &caller::filters,          &caller::fifos,          &caller::resampler,
      &caller::toolkit_transforms, &caller::toolkit_matrices, &caller::open_objects,   &caller::lookup_and_errors};
  ++round_;
  return (this->*families[family])();
}

bool caller::call_all() {
  bool good = true;
  for (int family = 0; family < family_count; ++family) {
    if (call(family)) continue;
    std::fprintf(stderr, "family %d of caller %d failed\n", family, number_);
    good = false;
  }
  return good;
}

bool caller::host_arrays() {
  lumra_cf64_array array = nullptr;
  const int count = 100 + round_ % 100;
  bool good = qsHost_ArrayNew(LUMRA_TYPE_CF64, 1, &count, &array) == 0 && (*array)->count == count;
  good = good && qsHost_ArrayResize(LUMRA_TYPE_CF64, 1, &array, 1000) == 0 && (*array)->elements[999].im == 0;
  return qsHost_ArrayFree(&array) == 0 && good && !array;
}

/// Spectrum of a constant: all its power lies in the middle.
bool spectrum_is_right(std::uint64_t session, lumra_cf32_array samples_of_one, lumra_f32_array power) {
  const lumra_waveform in{0, 1e-6, samples_of_one};
  lumra_spectrum out{0, 0, power};
  if (qsLumraAlgo_PerformWindowingFFTAndIQTransform(session, LUMRA_WINDOW_NONE, samples / 4, &in, &out) != 0)
    return false;
  return is_near((*out.y)->elements[samples / 8], samples / 4 * samples / 4) && is_near((*out.y)->elements[0], 0);
}

bool caller::own_session() {
  std::uint64_t session = 0;
  bool good = qsLumraAlgo_CreateSession(&session) == 0 && qsLumraAlgo_InitializeFFT(session, samples / 4) == 0 &&
              qsLumraAlgo_InitializeWindow(session, LUMRA_WINDOW_NONE, samples / 4) == 0;
  good = good && spectrum_is_right(session, samples_, power_);
  return qsLumraAlgo_CloseSession(session) == 0 && good;
}

bool caller::shared_session() {
  const bool reset = round_ % 16 != 0 || qsLumraAlgo_ResetSession(shared_.session) == 0;
  // Whether the window is there depends on who has reset the session since; so no look at the numbers.
  const lumra_waveform in{0, 1e-6, samples_};
  lumra_spectrum out{0, 0, power_};
  return reset && qsLumraAlgo_InitializeFFT(shared_.session, 16 + round_ % 64) == 0 &&
         qsLumraAlgo_InitializeWindow(shared_.session, LUMRA_WINDOW_FLAT_TOP, samples / 4) == 0 &&
         qsLumraAlgo_PerformWindowingFFTAndIQTransform(shared_.session, LUMRA_WINDOW_FLAT_TOP, samples / 4, &in,
                                                       &out) == 0;
}

bool caller::session_log() {
  constexpr int too_long = (1 << 27) + 1;
  char text[200] = "";
  return qsLumraAlgo_InitializeFFT(shared_.session, too_long) == LUMRA_INVALID_ARGUMENT &&
         qsLumraAlgo_ReadLog(shared_.session, 0, text, sizeof text) == 0 && std::strchr(text, ':');
}

bool caller::stored_arrays() {
  const auto owner = static_cast<std::uint64_t>(1000 + number_);
  lumra_array_ref kept{1, nullptr}, other{1, nullptr}, *kept_address = &kept, *other_address = &other;
  std::uint32_t length = 0;
  bool good = qsUtilHS_AllocateArray_CSG(&kept_address, 100, owner) == 0 &&
              qsUtilHS_AllocateArray_CSG(&other_address, 5000, owner) == 0;
  const auto own = static_cast<float>(number_);
  if (good) kept.block->data[99].re = other.block->data[4999].re = own;
  good = good && qsUtilHS_ArrayLength_CSG(&kept_address, &length) == 0 && length == 100 &&
         qsUtilHS_ReadArray_CSG(&other_address, &scratch_, 4990, 20) == 0 && kept.block->data[99].re == own &&
         (*scratch_)->elements[9].re == own && (*scratch_)->elements[19].re == 0 &&
         qsUtilHS_FreeArray_CSG(&kept_address) == 0;
  return qsUtilHS_FreeArrayIDH_CSG(owner) == 0 && good;
}

bool caller::filters() {
  lumra_filter_key key{};
  key.kind = LUMRA_FILTER_ROOT_RAISED_COSINE;
  key.values[0] = 4;
  key.values[1] = 1;
  key.values[2] = 0.25 + round_ % 200 * 1e-4;
  key.values[3] = 8;
  lumra_filter_record record{};
  if (qsUtilHS_RegisterFilterSpec(&record, nullptr, &key, 0) != 0 || record.entry->n != 33) return false;
  if (round_ % 8 == 0) (void)qsUtilHS_MatchFilterSpecErase(&record, &key, 1);
  return qsUtilHS_UnegisterFilterSpec(&record) == 0;
}

bool caller::fifos() {
  const std::string name = "own " + std::to_string(number_);
  std::uint64_t *cell = nullptr;
  const std::uint64_t own = qsLTEHS_DataFIFOCreate(name.c_str(), 100, 0, &cell);
  char data[64] = "0123456789";
  bool good = own != 0;
  for (int i = 0; i < 4; ++i)
    good = good && qsLTEHS_DataFIFO(own, LUMRA_FIFO_WRITE, data, nullptr, 0, 64) == 64 &&
           qsLTEHS_DataFIFO(own, !LUMRA_FIFO_WRITE, nullptr, data, 0, 64) == 64;
  (void)qsLTEHS_DataFIFOUnreserve(&cell);
  // Others read and write here too: all that is sure is that the handle is good.
  std::uint32_t capacity = 0;
  return good && std::strcmp(data, "0123456789") == 0 &&
         qsLTEHS_DataFIFO_GetStatus(shared_.fifo, &capacity, nullptr) == 0 && capacity == 1024 &&
         qsLTEHS_DataFIFO_Flush(shared_.fifo) == 0 &&
         qsLTEHS_DataFIFO(shared_.fifo, LUMRA_FIFO_WRITE, data, nullptr, 0, 8) != -2;
}

bool caller::resampler() {
  const auto owner = static_cast<std::uint64_t>(2000 + number_);
  lumra_resampler_descriptor *descriptor = nullptr;
  if (qsUtilHS_FFTResampler_CSG_CreateDescriptor(&descriptor, 64, 1, 1, owner) != 0) return false;
  auto *const samples_of_own = static_cast<lumra_cf32 *>(descriptor->aligned_buffer);
  samples_of_own[0].re = samples_of_own[63].im = static_cast<float>(number_);
  const bool good = descriptor->length == 64 && samples_of_own[0].re == samples_of_own[63].im;
  return qsUtilHS_FreeArrayIDH_CSG(owner) == 0 && good;
}

bool caller::toolkit_transforms() {
  if (qsRFPELTA_c1DFFTH(samples_, spectrum_, samples, 0, scratch_, round_ % 2 ? &slot_ : nullptr) != 0) return false;
  if (round_ % 4 == 0 && qsHost_ReleaseTransform(&slot_) != 0) return false;
  return is_near((*spectrum_)->elements[0].re, samples) && is_near((*spectrum_)->elements[1].re, 0);
}

bool caller::toolkit_matrices() {
  float *const a = (*matrix_)->elements;
  a[0] = a[3] = 2;
  a[1] = a[2] = 0;
  (*power_)->count = 2;
  (*power_)->elements[0] = 2;
  (*power_)->elements[1] = 4;
  const std::int32_t status = qsRFPELTA_sLSEqH(matrix_, power_, 0, x_, work_[0], work_[1], work_[2]);
  (*power_)->count = samples;
  return status == 0 && is_near((*x_)->elements[0], 1) && is_near((*x_)->elements[1], 2);
}

/// The spectrum of a constant, by the library's own threads now and then, and through saved bytes.
bool caller::open_objects() {
  lumra_spectrum_options options = LUMRA_SPECTRUM_OPTIONS;
  options.points = round_ % 8 == 0 ? 16384 : 64;
  options.window = LUMRA_WINDOW_RECTANGULAR;
  options.threads = 2;
  const std::uint64_t count = 4 * options.points;
  lumra_spectrum_average *spectrum = nullptr, *loaded = nullptr;
  std::uint64_t size = 0;
  bool good = lumra_spectrum_create(&options, &spectrum) == 0 &&
              lumra_spectrum_add(spectrum, (*long_in_)->elements, count) == 0 &&
              lumra_spectrum_state_size(spectrum, &size) == 0;
  std::vector<unsigned char> bytes(size);
  good = good && lumra_spectrum_save(spectrum, bytes.data(), size) == 0 &&
         lumra_spectrum_load(bytes.data(), size, 1, &loaded) == 0;
  std::vector<double> power(options.points);
  lumra_spectrum_info info{};
  info.size = sizeof info;
  good = good && lumra_spectrum_read(loaded, &info, power.data(), nullptr, nullptr, power.size()) == 0 &&
         info.segments == 7 && is_near(static_cast<float>(power[power.size() / 2]), 5) &&
         is_near(static_cast<float>(power[0]), 0);
  lumra_spectrum_free(loaded);
  lumra_spectrum_free(spectrum);
  return good;
}

/// Each looked-up sample is thrice the input.
bool caller::lookup_and_errors() {
  std::uint64_t before = 0, after = 0;
  (*long_out_)->elements[long_samples - 1] = {0, 0};
  return qsrfhs_getErrorCnt(&before) == 0 && qsUtilHS_FreeArray_CSG(nullptr) == -33620097 &&
         qsrfhs_getErrorCnt(&after) == 0 && after > before &&
         qsUtilHS_LookupTable(keys_, long_in_, &long_out_, table_, 0, 1) == 0 && (*long_out_)->elements[0].im == 6 &&
         (*long_out_)->elements[long_samples - 1].re == 3 && has_power((*long_in_)->elements, 5) &&
         has_polynomial((*long_in_)->elements, (*long_out_)->elements, {3, 4});
}

}  // namespace lifetime
