// Every kernel body, and the table that names them. Bodies include nothing, call no library function and have no
// static state: they are compiled inside a target region. SPDX-License-Identifier: MIT

#include "element_wise.inl"
//
#include "complex.inl"
#include "doubles.inl"
#include "fir.inl"
#include "interpolation.inl"
#include "log2.inl"
#include "lookup.inl"
#include "polynomial.inl"
#include "polyphase.inl"
#include "recursion.inl"
#include "resampler.inl"
//
#include "radix.inl"
#include "rms.inl"
#include "spectrum.inl"
#include "transform.inl"
#include "window.inl"

static constexpr kernel_table table = {
    .copy = &copy,
    .apply_window = &apply_window,
    .store_power = &store_power,
    .accumulate_power = &accumulate_power,
    .store_power_then_apply_window = &store_power_then_apply_window,
    .accumulate_power_then_apply_window = &accumulate_power_then_apply_window,
    .order_power = &order_power,
    .windowed_radix_16 = &windowed_radix_16,
    .windowed_radix_16_double = &windowed_radix_16_double,
    .radix_16 = &radix_16,
    .radix_16_double = &radix_16_double,
    .windowed_real_radix_16 = &windowed_real_radix_16,
    .windowed_real_radix_16_double = &windowed_real_radix_16_double,
    .weigh_and_rotate_rows = &weigh_and_rotate_rows,
    .add = &add,
    .reverse_conjugate = &reverse_conjugate,
    .scaled_power = &scaled_power,
    .multiply = &multiply,
    .scale = &scale,
    .scale_and_shift = &scale_and_shift,
    .divide = &divide,
    .divide_by_value = &divide_by_value,
    .magnitude = &magnitude,
    .magnitude_squared = &magnitude_squared,
    .polynomial_reach = &polynomial_reach,
    .polynomial = &polynomial,
    .complex_polynomial = &complex_polynomial,
    .log2_scaled = &log2_scaled,
    .log2_scaled_or_infinity = &log2_scaled_or_infinity,
    .log2_scaled_power = &log2_scaled_power,
    .sum_power = &sum_power,
    .sum_power_and_peak = &sum_power_and_peak,
    .lookup = &lookup,
    .lookup_between = &lookup_between,
    .weigh = &weigh,
    .weigh_and_rotate = &weigh_and_rotate,
    .polyphase = &polyphase,
    .complex_polyphase = &complex_polyphase,
    .stretched = &stretched,
    .complex_stretched = &complex_stretched,
    .fir = &fir,
    .fir_double = &fir_double,
    .complex_fir = &complex_fir,
    .complex_fir_double = &complex_fir_double,
    .multiply_double = &multiply_double,
    .interpolate = &interpolate,
    .interpolate_double = &interpolate_double,
    .recursion = &recursion,
    .complex_recursion = &complex_recursion,
    .widen = &widen,
    .narrow = &narrow,
    .is_finite = &is_finite,
    .weigh_double = &weigh_double,
    .cosine_window = &cosine_window,
    .cosine_window_double = &cosine_window_double,
    .complex_cosine_window = &complex_cosine_window,
    .complex_cosine_window_double = &complex_cosine_window_double,
};
