// How an element-wise kernel goes over its arrays. A kernel is a step: a function object that makes `block` elements of
// the output from as many of its one or two inputs. It reads an element before it writes there, so that the output may
// be an input, and writes through Put. The widths are in floats an element; an input of width 0 is not read.
// SPDX-License-Identifier: MIT

/// Bytes in all arrays of a call from which the output is stored past the caches: its lines need not be read then
/// before they are written.
static constexpr std::size_t streaming_bytes = std::size_t{24} << 20;

struct into_caches {
  static inline void put(float *p, f8 a) { store(p, a); }
};

struct past_caches {
  static inline void put(float *p, f8 a) { stream(p, a); }
};

template <class Put>
static inline void store_complex(float *p, f8 re, f8 im) {
  f8 a, b;
  join(re, im, a, b);
  Put::put(p, a);
  Put::put(p + 8, b);
}

static inline void copy_floats(const float *from, float *to, std::size_t n) {
  for (std::size_t i = 0; i < n; ++i) to[i] = from[i];
}

template <class Put, class Step>
static inline void go_over(const Step &step, const float *x, const float *y, float *out, std::size_t n) {
  constexpr std::size_t block = Step::block;
  std::size_t k = 0;
  for (; k + block <= n; k += block)
    step.template run<Put>(x + k * Step::x_width, y + k * Step::y_width, out + k * Step::out_width);
  if (k == n) return;
  // The rest is padded to a block, with ones: they raise no floating-point exception.
  const std::size_t rest = n - k;
  float xs[2 * block], ys[2 * block], outs[2 * block];
  for (std::size_t i = 0; i < 2 * block; ++i) xs[i] = ys[i] = 1;
  copy_floats(x + k * Step::x_width, xs, rest * Step::x_width);
  copy_floats(y + k * Step::y_width, ys, rest * Step::y_width);
  step.template run<into_caches>(xs, ys, outs);
  copy_floats(outs, out + k * Step::out_width, rest * Step::out_width);
}

/// Outputs past the caches pay where they are complex and lie on the boundary that such stores need. Gathering whole
/// lines for others costs more than it saves, and lines of an output that is an input are in the caches anyway.
template <class Step>
static inline bool passes_caches(const float *x, const float *y, const float *out, std::size_t n) {
  constexpr std::size_t bytes = sizeof(float) * (Step::x_width + Step::y_width + Step::out_width);
  return Step::out_width == 2 && n >= streaming_bytes / bytes && reinterpret_cast<std::size_t>(out) % sizeof(f8) == 0 &&
         out != x && out != y;
}

template <class Step>
static inline void run(const Step &step, const float *x, const float *y, float *out, std::size_t n) {
  if (!passes_caches<Step>(x, y, out, n)) return go_over<into_caches>(step, x, y, out, n);
  go_over<past_caches>(step, x, y, out, n);
  _mm_sfence();
}
