// Recursive filters, eight samples at a time. SPDX-License-Identifier: MIT

static constexpr std::size_t block_parts = 8 / wide_double::lanes;  // registers that hold a block

struct block_sums {
  wide_double part[block_parts];
};

/// The samples' shares of a block's outputs.
static inline block_sums shares_of(const double *x, const double *shares) {
  block_sums sums;
  for (std::size_t p = 0; p < block_parts; ++p) {
    sums.part[p] = wide_double::broadcast(0);
    // Samples behind a register's outputs have no share in it.
    for (std::size_t i = 0; i < (p + 1) * wide_double::lanes; ++i)
      sums.part[p] =
          sums.part[p] + wide_double::broadcast(x[i]) * wide_double::load(shares + 8 * i + p * wide_double::lanes);
  }
  return sums;
}

/// Adds an output's responses, times(register's index) of them.
template <class Times>
static inline void add_responses(block_sums &sums, Times times) {
  for (std::size_t p = 0; p < block_parts; ++p) sums.part[p] = sums.part[p] + times(p);
}

// What outputs below this leave is worth nothing, and their products may be subnormal, which takes a hundred times
// longer.
static constexpr double least_output = 1e-290;

/// A block is as fast as the way from its last outputs to those of the next: the newest two add up beside the others,
/// and with an order of at most 4 they never leave the registers.
template <std::size_t order>
static inline void recurse_over_block(const block_recursion &plan, wide_double &last, double *data) {
  block_sums sums = shares_of(data, plan.shares);
  if (!newest_are_below(last, least_output)) {
    const auto response = [&](std::size_t j, std::size_t p) {
      return wide_double::load(plan.responses + 8 * j + p * wide_double::lanes);
    };
    const wide_double past[4] = {broadcast_newest<0>(last), broadcast_newest<1>(last), broadcast_newest<2>(last),
                                 broadcast_newest<3>(last)};
    for (std::size_t j = order; j-- > 2;) add_responses(sums, [&](std::size_t p) { return past[j] * response(j, p); });
    add_responses(sums, [&](std::size_t p) {
      const wide_double newest = past[0] * response(0, p);
      return order == 1 ? newest : past[1] * response(1, p) + newest;
    });
  }
  for (std::size_t p = 0; p < block_parts; ++p) store(data + p * wide_double::lanes, sums.part[p]);
  last = sums.part[block_parts - 1];
}

/// The same for any order, out of memory.
static inline void recurse_over_block(const block_recursion &plan, double *data) {
  const d4 limit = d4::broadcast(least_output);
  bool silent = true;
  for (std::size_t j = 0; j < plan.order; j += 4) silent = silent && all_below(d4::load(data - j - 4), limit);
  block_sums sums = shares_of(data, plan.shares);
  if (!silent) {
    const auto response = [&](std::size_t j, std::size_t p) {
      return wide_double::broadcast(*(data - 1 - static_cast<std::ptrdiff_t>(j))) *
             wide_double::load(plan.responses + 8 * j + p * wide_double::lanes);
    };
    for (std::size_t j = plan.order; j-- > 2;) add_responses(sums, [&](std::size_t p) { return response(j, p); });
    add_responses(sums, [&](std::size_t p) { return response(1, p) + response(0, p); });
  }
  for (std::size_t p = 0; p < block_parts; ++p) store(data + p * wide_double::lanes, sums.part[p]);
}

/// The newest four outputs of a stream, in the place that broadcast_newest takes them from.
static inline wide_double newest_outputs(const double *data) {
  double lanes[wide_double::lanes] = {};
  for (std::size_t l = 0; l < 4; ++l) lanes[wide_double::lanes - 4 + l] = data[static_cast<std::ptrdiff_t>(l) - 4];
  return wide_double::load(lanes);
}

template <std::size_t order, std::size_t count>
static inline void recurse_over(const block_recursion &plan, std::size_t blocks, double *const *streams) {
  wide_double last[count];
  for (std::size_t s = 0; s < count; ++s) last[s] = newest_outputs(streams[s]);
  for (std::size_t block = 0; block < blocks; ++block)
    for (std::size_t s = 0; s < count; ++s) recurse_over_block<order>(plan, last[s], streams[s] + 8 * block);
}

template <std::size_t order>
static inline void recurse_over_streams(const block_recursion &plan, std::size_t blocks, double *const *streams,
                                        std::size_t count) {
  if (count == 1)
    recurse_over<order, 1>(plan, blocks, streams);
  else
    recurse_over<order, 2>(plan, blocks, streams);
}

static void recursion(const block_recursion &plan, std::size_t blocks, double *const *streams, std::size_t count) {
  switch (plan.order) {
    case 1:
      return recurse_over_streams<1>(plan, blocks, streams, count);
    case 2:
      return recurse_over_streams<2>(plan, blocks, streams, count);
    case 3:
      return recurse_over_streams<3>(plan, blocks, streams, count);
    case 4:
      return recurse_over_streams<4>(plan, blocks, streams, count);
    default:
      for (std::size_t block = 0; block < blocks; ++block)
        for (std::size_t s = 0; s < count; ++s) recurse_over_block(plan, streams[s] + 8 * block);
  }
}
