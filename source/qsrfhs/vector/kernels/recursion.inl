// Recursive filters, eight samples at a time. A sample is `parts` values: one, or a real and an imaginary part, with
// tables where each value stands twice. SPDX-License-Identifier: MIT

static constexpr bool many_registers = wide_double::lanes == 8;  // enough for several blocks at a time

// What a state below this leaves is worth nothing, and its products may be subnormal, which takes a hundred times
// longer.
static constexpr double least_state = 1e-290;

/// The sums of a block: outputs, and the state behind it in `registers`.
template <std::size_t parts, std::size_t registers>
struct block_sums {
  static constexpr std::size_t output_registers = 8 * parts / wide_double::lanes;
  wide_double outputs[output_registers], state[registers];
};

/// A sample, all over a register.
template <std::size_t parts>
static inline wide_double repeated(const double *sample) {
  if constexpr (parts == 1)
    return wide_double::broadcast(*sample);
  else
    return wide_double::broadcast_pair(sample);
}
/// The same for value k of a state.
template <std::size_t parts, std::size_t k>
static inline wide_double repeated_lane(const wide_double *state) {
  constexpr std::size_t in_one = wide_double::lanes / parts;
  if constexpr (parts == 1)
    return broadcast_lane<k>(state[0]);
  else
    return broadcast_pair<k % in_one>(state[k / in_one]);
}

/// The sums of `count` samples of several blocks, each times its row of one register of a table, which is loaded once.
template <std::size_t parts, std::size_t blocks>
static inline void sum_products(const double *x, const double *rows, std::size_t width, std::size_t count,
                                wide_double *sums) {
  for (std::size_t b = 0; b < blocks; ++b) sums[b] = repeated<parts>(x + 8 * parts * b) * wide_double::load(rows);
  for (std::size_t i = 1; i < count; ++i) {
    const wide_double row =
        blocks > 1 ? in_register(wide_double::load(rows + width * i)) : wide_double::load(rows + width * i);
    for (std::size_t b = 0; b < blocks; ++b)
      sums[b] = multiply_add(repeated<parts>(x + parts * (8 * b + i)), row, sums[b]);
  }
}

/// What their samples add to several blocks.
template <std::size_t parts, std::size_t registers, std::size_t blocks>
static inline void sum_samples(const block_recursion &plan, std::size_t width, const double *x,
                               block_sums<parts, registers> *sums) {
  constexpr std::size_t lanes = wide_double::lanes;
  wide_double sum[blocks];
  for (std::size_t r = 0; r < registers; ++r) {
    sum_products<parts, blocks>(x, plan.gathering + r * lanes, width, 8, sum);
    for (std::size_t b = 0; b < blocks; ++b) sums[b].state[r] = sum[b];
  }
  for (std::size_t r = 0; r < sums->output_registers; ++r) {
    // Samples behind a register's outputs have no share in it.
    sum_products<parts, blocks>(x, plan.shares + r * lanes, 8 * parts, (r + 1) * lanes / parts, sum);
    for (std::size_t b = 0; b < blocks; ++b) sums[b].outputs[r] = sum[b];
  }
}

/// Registers that hold a state of order 4.
template <std::size_t parts>
static constexpr std::size_t small_state = 4 * parts > wide_double::lanes ? 4 * parts / wide_double::lanes : 1;

/// Puts a block's outputs, and the state behind it in the place of that in front. A block is as fast as the way from
/// one state to the next, so its products add up in two sums.
template <std::size_t parts, std::size_t order>
static inline void finish_block(const block_recursion &plan, const block_sums<parts, small_state<parts>> &sums,
                                wide_double *state, double *out) {
  constexpr std::size_t lanes = wide_double::lanes, registers = small_state<parts>,
                        width = block_recursion::width_of(order, parts);
  bool silent = true;
  for (std::size_t r = 0; r < registers; ++r)
    silent = silent && all_below(state[r], wide_double::broadcast(least_state));
  if (silent) {
    for (std::size_t r = 0; r < registers; ++r) state[r] = sums.state[r];
    for (std::size_t r = 0; r < sums.output_registers; ++r) store(out + r * lanes, sums.outputs[r]);
    return;
  }
  const wide_double values[4] = {repeated_lane<parts, 0>(state), repeated_lane<parts, 1>(state),
                                 repeated_lane<parts, 2>(state), repeated_lane<parts, 3>(state)};
  for (std::size_t r = 0; r < registers; ++r) {
    const auto column = [&](std::size_t j) { return wide_double::load(plan.transition + width * j + r * lanes); };
    wide_double next = multiply_add(values[0], column(0), sums.state[r]);
    if constexpr (order > 1) {
      wide_double odd = values[1] * column(1);
      if constexpr (order > 2) next = multiply_add(values[2], column(2), next);
      if constexpr (order > 3) odd = multiply_add(values[3], column(3), odd);
      next = next + odd;
    }
    state[r] = next;
  }
  for (std::size_t r = 0; r < sums.output_registers; ++r) {
    wide_double outputs = sums.outputs[r];
    for (std::size_t j = 0; j < order; ++j)
      outputs = multiply_add(values[j], wide_double::load(plan.responses + 8 * parts * j + r * lanes), outputs);
    store(out + r * lanes, outputs);
  }
}

template <std::size_t parts, std::size_t order, std::size_t blocks>
static inline void recurse_over_blocks(const block_recursion &plan, double *data, wide_double *state) {
  block_sums<parts, small_state<parts>> sums[blocks];
  sum_samples<parts, small_state<parts>, blocks>(plan, block_recursion::width_of(order, parts), data, sums);
  for (std::size_t b = 0; b < blocks; ++b) finish_block<parts, order>(plan, sums[b], state, data + 8 * parts * b);
}

/// Orders up to 4: the state never leaves the registers.
template <std::size_t parts, std::size_t order>
static inline void recurse_in_registers(const block_recursion &plan, std::size_t n, double *data, double *state) {
  constexpr std::size_t together = many_registers ? 2 : 1, registers = small_state<parts>;
  wide_double values[registers];
  for (std::size_t r = 0; r < registers; ++r) values[r] = wide_double::load(state + r * wide_double::lanes);
  for (; n >= 8 * together; n -= 8 * together, data += 8 * parts * together)
    recurse_over_blocks<parts, order, together>(plan, data, values);
  if (together > 1 && n >= 8) {
    recurse_over_blocks<parts, order, 1>(plan, data, values);
    data += 8 * parts;
  }
  for (std::size_t r = 0; r < registers; ++r) store(state + r * wide_double::lanes, values[r]);
  if (n % 8 > 0) recurse_over_blocks<parts, order, 1>(plan, data, values);
}

/// Any order, with a state of `width` values in memory.
template <std::size_t parts, std::size_t width>
static inline void recurse_in_memory(const block_recursion &plan, std::size_t n, double *data, double *state) {
  constexpr std::size_t lanes = wide_double::lanes, registers = width / lanes;
  using sums_of_block = block_sums<parts, registers>;
  for (std::size_t k = 0; k < n; k += 8, data += 8 * parts) {
    sums_of_block even, odd;
    sum_samples<parts, registers, 1>(plan, width, data, &even);
    for (wide_double &sum : odd.outputs) sum = wide_double::broadcast(0);
    for (wide_double &sum : odd.state) sum = wide_double::broadcast(0);
    bool silent = true;
    for (std::size_t at = 0; at < width; at += lanes)
      silent = silent && all_below(wide_double::load(state + at), wide_double::broadcast(least_state));
    const auto add = [&](std::size_t j, sums_of_block &sums) {
      const wide_double value = repeated<parts>(state + parts * j);
      for (std::size_t r = 0; r < registers; ++r)
        sums.state[r] = multiply_add(value, wide_double::load(plan.transition + width * j + r * lanes), sums.state[r]);
      for (std::size_t r = 0; r < sums.output_registers; ++r)
        sums.outputs[r] =
            multiply_add(value, wide_double::load(plan.responses + 8 * parts * j + r * lanes), sums.outputs[r]);
    };
    for (std::size_t j = 0; !silent && j < plan.order; j += 2) {
      add(j, even);
      add(j + 1, odd);
    }
    for (std::size_t r = 0; r < even.output_registers; ++r) store(data + r * lanes, even.outputs[r] + odd.outputs[r]);
    for (std::size_t r = 0; r < registers && k + 8 <= n; ++r) store(state + r * lanes, even.state[r] + odd.state[r]);
  }
}

template <std::size_t parts>
static inline void recurse(const block_recursion &plan, std::size_t n, double *data, double *state) {
  switch (plan.order) {
    case 1:
      return recurse_in_registers<parts, 1>(plan, n, data, state);
    case 2:
      return recurse_in_registers<parts, 2>(plan, n, data, state);
    case 3:
      return recurse_in_registers<parts, 3>(plan, n, data, state);
    case 4:
      return recurse_in_registers<parts, 4>(plan, n, data, state);
    default:
      return plan.order <= 8 ? recurse_in_memory<parts, 8 * parts>(plan, n, data, state)
                             : recurse_in_memory<parts, 16 * parts>(plan, n, data, state);
  }
}

static void recursion(const block_recursion &plan, std::size_t n, double *data, double *state) {
  recurse<1>(plan, n, data, state);
}
static void complex_recursion(const block_recursion &plan, std::size_t n, double *data, double *state) {
  recurse<2>(plan, n, data, state);
}
