// Recursive filters, eight samples at a time. SPDX-License-Identifier: MIT

/// Adds the samples' shares of four outputs.
static inline d4 add_samples(d4 sum, const double *x, const double *shares) {
  for (std::size_t i = 0; i < 4; ++i) sum = sum + d4::broadcast(x[i]) * d4::load(shares + 4 * i);
  return sum;
}

/// In front of the samples stand the outputs so far.
template <class Order>
static inline void recurse_over_block(const block_recursion &plan, Order order, double *data) {
  // What outputs below this leave is worth nothing, and their products may be subnormal, which takes a hundred times
  // longer.
  static constexpr double least = 1e-290;
  const d4 limit = d4::broadcast(least);
  bool silent = true;
  for (std::size_t j = 0; j < order(); j += 4) silent = silent && all_below(d4::load(data - j - 4), limit);

  d4 first = add_samples(d4::broadcast(0), data, plan.own);
  d4 second = add_samples(add_samples(d4::broadcast(0), data, plan.later), data + 4, plan.own);
  for (std::size_t j = order(); !silent && j-- > 0;) {
    const d4 past = d4::broadcast(*(data - 1 - static_cast<std::ptrdiff_t>(j)));
    first = first + past * d4::load(plan.responses + 8 * j);
    second = second + past * d4::load(plan.responses + 8 * j + 4);
  }
  store(data, first);
  store(data + 4, second);
}

template <class Order>
static inline void recurse_over(const block_recursion &plan, Order order, std::size_t blocks, double *const *streams,
                                std::size_t count) {
  for (std::size_t block = 0; block < blocks; ++block)
    for (std::size_t s = 0; s < count; ++s) recurse_over_block(plan, order, streams[s] + 8 * block);
}

template <std::size_t n>
struct constant_order {
  constexpr std::size_t operator()() const { return n; }
};

struct any_order {
  std::size_t n;
  std::size_t operator()() const { return n; }
};

static void recursion(const block_recursion &plan, std::size_t blocks, double *const *streams, std::size_t count) {
  switch (plan.order) {
    case 1:
      return recurse_over(plan, constant_order<1>{}, blocks, streams, count);
    case 2:
      return recurse_over(plan, constant_order<2>{}, blocks, streams, count);
    case 3:
      return recurse_over(plan, constant_order<3>{}, blocks, streams, count);
    case 4:
      return recurse_over(plan, constant_order<4>{}, blocks, streams, count);
    default:
      return recurse_over(plan, any_order{plan.order}, blocks, streams, count);
  }
}
