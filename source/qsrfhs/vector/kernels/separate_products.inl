// Products that are rounded before anything is added to them. SPDX-License-Identifier: MIT

/// a b + c.
template <class Lanes>
static inline Lanes multiply_add(Lanes a, Lanes b, Lanes c) {
  return a * b + c;
}
/// a b - c.
template <class Lanes>
static inline Lanes multiply_subtract(Lanes a, Lanes b, Lanes c) {
  return a * b - c;
}
/// a b - c in even lanes, a b + c in odd ones.
template <class Lanes>
static inline Lanes multiply_subtract_and_add(Lanes a, Lanes b, Lanes c) {
  return subtract_and_add(a * b, c);
}
