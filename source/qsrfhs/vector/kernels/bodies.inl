// Every kernel body, and the table that names them. Bodies include nothing, call no library function and have no
// static state: they are compiled inside a target region. SPDX-License-Identifier: MIT

#include "spectrum.inl"

static constexpr kernel_table table = {
    .copy = &copy,
    .apply_window = &apply_window,
    .accumulate_power = &accumulate_power,
    .accumulate_power_then_apply_window = &accumulate_power_then_apply_window,
    .order_power = &order_power,
    .scale = &scale,
};
