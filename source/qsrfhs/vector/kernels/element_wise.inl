// How an element-wise kernel goes over its arrays. A kernel is a step: a function object that makes `block` elements of
// the output from as many of its one or two inputs, and reads all of them before it writes, so that the output may be
// an input. The widths are in floats an element; an input of width 0 is not read. SPDX-License-Identifier: MIT

/// Bytes in all arrays of a call from which the output is stored past the caches.
static constexpr std::size_t streaming_bytes = std::size_t{24} << 20;

static inline void copy_floats(const float *from, float *to, std::size_t n) {
  for (std::size_t i = 0; i < n; ++i) to[i] = from[i];
}

template <class Step>
static inline void go_over(const Step &step, const float *x, const float *y, float *out, std::size_t n) {
  constexpr std::size_t block = Step::block;
  std::size_t k = 0;
  for (; k + block <= n; k += block) step(x + k * Step::x_width, y + k * Step::y_width, out + k * Step::out_width);
  if (k == n) return;
  // The rest is padded to a block, with ones: they raise no floating-point exception.
  const std::size_t rest = n - k;
  float xs[2 * block], ys[2 * block], outs[2 * block];
  for (std::size_t i = 0; i < 2 * block; ++i) xs[i] = ys[i] = 1;
  copy_floats(x + k * Step::x_width, xs, rest * Step::x_width);
  copy_floats(y + k * Step::y_width, ys, rest * Step::y_width);
  step(xs, ys, outs);
  copy_floats(outs, out + k * Step::out_width, rest * Step::out_width);
}

/// go_over into an output beyond the caches, whose lines need not be read before they are written. They are gathered in
/// front, as elements start at any multiple of 4 bytes and only whole aligned lines can be stored that way.
template <class Step>
static inline void go_over_streaming(const Step &step, const float *x, const float *y, float *out, std::size_t n) {
  constexpr std::size_t line = 16, piece = 256;
  alignas(64) float gathered[line + piece * Step::out_width];
  const std::size_t misplaced = reinterpret_cast<std::size_t>(out) % 64 / sizeof(float);
  std::size_t lead = misplaced == 0 ? 0 : line - misplaced;  // floats in front of the first whole line, once
  std::size_t held = 0;
  for (std::size_t k = 0; k < n; k += piece) {
    const std::size_t count = n - k < piece ? n - k : piece;
    go_over(step, x + k * Step::x_width, y + k * Step::y_width, gathered + held, count);
    held += count * Step::out_width;
    copy_floats(gathered, out, lead);
    std::size_t done = lead;
    for (; done + line <= held; done += line) {
      stream(out + done, load(gathered + done));
      stream(out + done + 8, load(gathered + done + 8));
    }
    out += done;
    held -= done;
    copy_floats(gathered + done, gathered, held);
    lead = 0;
  }
  copy_floats(gathered, out, held);
  _mm_sfence();
}

template <class Step>
static inline void run(const Step &step, const float *x, const float *y, float *out, std::size_t n) {
  constexpr std::size_t bytes = sizeof(float) * (Step::x_width + Step::y_width + Step::out_width);
  // Lines of an output that is an input are in the caches anyway.
  if (n >= streaming_bytes / bytes && out != x && out != y)
    go_over_streaming(step, x, y, out, n);
  else
    go_over(step, x, y, out, n);
}
