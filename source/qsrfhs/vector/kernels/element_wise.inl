// How an element-wise kernel goes over its arrays. A kernel is a step: a function object that makes some groups of
// wide::lanes elements of the output from as many of its one or two inputs, `groups` of them side by side where there
// are so many. It reads an element before it writes there, so that the output may be an input, and writes through Put.
// The widths are in values an element; an input of width 0 is not read.
// SPDX-License-Identifier: MIT

/// Bytes in all arrays from which the output is stored past the caches: its lines need not be read then before they
/// are written.
static constexpr std::size_t streaming_bytes = std::size_t{24} << 20;

struct into_caches {
  template <class Real, class Lanes>
  static inline void put(Real *p, Lanes a) {
    store(p, a);
  }
};

struct past_caches {
  static inline void put(float *p, wide a) { stream(p, a); }
};

template <class Put>
static inline void store_complex(float *p, wide re, wide im) {
  wide a, b;
  join(re, im, a, b);
  Put::put(p, a);
  Put::put(p + wide::lanes, b);
}

template <class Real>
static inline void copy_values(const Real *from, Real *to, std::size_t n) {
  for (std::size_t i = 0; i < n; ++i) to[i] = from[i];
}

/// Whole blocks of `groups` groups, from element k on. Where it ended.
template <class Put, std::size_t groups, class Step, class Real>
[[gnu::flatten]] static inline std::size_t go_over_blocks(const Step &step, const Real *x, const Real *y, Real *out,
                                                          std::size_t k, std::size_t n) {
  constexpr std::size_t block = groups * wide::lanes;
  for (; k + block <= n; k += block)
    step.template run<Put, groups>(x + k * Step::x_width, y + k * Step::y_width, out + k * Step::out_width);
  return k;
}

/// At most a group of elements, padded to it with ones, which raise no floating-point exception.
template <class Step, class Real>
[[gnu::noinline]] static void go_over_few(const Step &step, const Real *x, const Real *y, Real *out, std::size_t n) {
  Real xs[2 * wide::lanes], ys[2 * wide::lanes], outs[2 * wide::lanes];
  for (std::size_t i = 0; i < 2 * wide::lanes; ++i) xs[i] = ys[i] = 1;
  copy_values(x, xs, n * Step::x_width);
  copy_values(y, ys, n * Step::y_width);
  step.template run<into_caches, 1>(xs, ys, outs);
  copy_values(outs, out, n * Step::out_width);
}

template <class Put, class Step, class Real>
static inline void go_over(const Step &step, const Real *x, const Real *y, Real *out, std::size_t n,
                           std::size_t first = 0) {
  std::size_t k = go_over_blocks<Put, Step::groups>(step, x, y, out, first, n);
  if constexpr (Step::groups > 1) k = go_over_blocks<Put, 1>(step, x, y, out, k, n);
  if (k < n) go_over_few(step, x + k * Step::x_width, y + k * Step::y_width, out + k * Step::out_width, n - k);
}

/// Elements in front of the first at which the array with the most bytes an element lies on a boundary of registers, the
/// output or else x; none where no element does, and in short calls, which do not earn that back.
template <class Step>
static inline std::size_t in_front_of_boundary(const float *x, const float *out, std::size_t n) {
  constexpr bool by_x = Step::x_width > Step::out_width;
  constexpr std::size_t boundary = sizeof(float) * wide::lanes;
  constexpr std::size_t element = sizeof(float) * (by_x ? Step::x_width : Step::out_width);
  const std::size_t past = reinterpret_cast<std::size_t>(by_x ? x : out) % boundary;
  return past == 0 || past % element || n < 1024 ? 0 : (boundary - past) / element;
}

/// Outputs past the caches pay where they are complex. Gathering whole lines for others costs more than it saves, and
/// lines of an output that is an input are in the caches anyway. From element `first` on they lie on a boundary.
template <class Step>
static inline bool passes_caches(const float *x, const float *y, const float *out, std::size_t first, part_of_all n) {
  constexpr std::size_t bytes = sizeof(float) * (Step::x_width + Step::y_width + Step::out_width);
  return Step::out_width == 2 && n.all >= streaming_bytes / bytes && out != x && out != y &&
         reinterpret_cast<std::size_t>(out + first * Step::out_width) % (sizeof(float) * wide::lanes) == 0;
}

/// A record, in groups that begin on a boundary, so that fewer loads and stores are split between two lines of the
/// caches: most allocators place all arrays alike, 16 bytes behind one.
template <class Step>
static inline void run(const Step &step, const float *x, const float *y, float *out, part_of_all n) {
  const std::size_t first = in_front_of_boundary<Step>(x, out, n.count);
  if (first) go_over_few(step, x, y, out, first);
  if (!passes_caches<Step>(x, y, out, first, n)) return go_over<into_caches>(step, x, y, out, n.count, first);
  go_over<past_caches>(step, x, y, out, n.count, first);
  _mm_sfence();
}
