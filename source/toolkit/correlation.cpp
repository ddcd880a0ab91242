// Cross-correlation: the convolution of the reversed and conjugated first record with the second.
// SPDX-License-Identifier: MIT
#include <lumra/toolkit.h>

#include <algorithm>
#include <bit>
#include <limits>
#include <optional>

#include "toolkit/convolution.hpp"

namespace toolkit {
namespace {

enum class normalisation : std::int32_t { none = 0, unbiased = 1, biased = 2 };

/// Divides the lags by the number of products in each (unbiased), or all by the longer length (biased).
template <class T>
void normalise(normalisation kind, std::span<T> lags, std::int32_t nx, std::int32_t ny) noexcept {
  using real = decltype(std::real(T{}));
  const std::int32_t shorter = std::min(nx, ny), longer = std::max(nx, ny);
  if (kind == normalisation::biased)
    scale(static_cast<std::int32_t>(lags.size()), static_cast<real>(1.0 / longer), lags.data());
  if (kind != normalisation::unbiased) return;
  for (std::int32_t i = 1; i < shorter; ++i) {
    const auto factor = static_cast<real>(1.0 / i);
    lags[static_cast<std::size_t>(i) - 1] *= factor;
    lags[lags.size() - static_cast<std::size_t>(i)] *= factor;
  }
  scale(longer - shorter + 1, static_cast<real>(1.0 / shorter), lags.data() + shorter - 1);
}

/// The directly computed correlation. The first record in its new order and, where the types differ, the widened second
/// one live in the scratch.
template <class E, class U, class V>
void correlate_directly(std::span<const U> x, std::span<const V> y, std::int32_t block, scratch<E> &room,
                        std::span<value_of<E>> out) {
  using value = value_of<E>;
  constexpr bool widened = !std::is_same_v<V, value>;
  const auto memory =
      room.resize(widened ? static_cast<std::int64_t>(x.size() + y.size()) : static_cast<std::int64_t>(out.size()));
  const value *rest = copy_record(x.data(), static_cast<std::int64_t>(x.size()), order::reversed, memory.data());
  std::span<const value> second;
  if constexpr (widened) {
    std::copy(y.begin(), y.end(), memory.begin() + static_cast<std::ptrdiff_t>(x.size()));
    second = {rest, y.size()};
  } else {
    second = y;
  }
  std::fill(out.begin(), out.end(), value{});
  add_convolution(std::span<const value>(memory.data(), x.size()), second, block, out.data());
}

template <class E, class F>
void correlate(input<E> x, input<F> y, output<common_of<E, F>> &out, std::int32_t method_number,
               std::int32_t normalisation_number, std::int32_t block, scratch<common_of<E, F>> reversed,
               scratch<common_of<E, F>> room, transform_slot &slot) {
  require(x.count() >= 1 && y.count() >= 1, empty_input);
  const method how = checked_method(method_number);
  require(normalisation_number >= 0 && normalisation_number <= 2, bad_option);
  const std::int64_t length = std::int64_t{x.count()} + y.count() - 1;
  require(length <= std::numeric_limits<std::int32_t>::max(), no_memory);
  std::optional<fourier_convolution<common_of<E, F>>> plan;
  if (how == method::fourier) plan.emplace(length);
  refuse_sharing(reversed, x, y, out, room);
  refuse_sharing(room, x, y, out);
  x.copy_if_same(out);
  y.copy_if_same(out);

  const auto lags = out.resize(length);
  if (plan) {
    const padded_vector<value_of<E>> first{x.values(), order::reversed};
    const padded_vector<value_of<F>> second{y.values()};
    std::copy_n(plan->run(room, slot, first, second), lags.size(), lags.begin());
  } else {
    correlate_directly(x.values(), y.values(), block, reversed, lags);
  }
  normalise(static_cast<normalisation>(normalisation_number), lags, x.count(), y.count());
}

template <class T>
void correlate_directly(matrix_view<const T> reversed, matrix_view<const T> y, matrix_view<T> out) noexcept {
  std::fill_n(out.data, out.size(), T{});
  const auto row = [](const matrix_view<const T> &m, std::int32_t r) {
    return std::span<const T>(m.row(r), static_cast<std::size_t>(m.columns));
  };
  for (std::int32_t i = 0; i < reversed.rows; ++i)
    for (std::int32_t j = 0; j < y.rows; ++j)
      add_convolution(row(reversed, i), row(y, j), default_block, out.row(i + j));
}

/// Fills a zero-padded matrix from its upper left corner on.
template <class T>
struct padded_matrix {
  matrix_view<const T> from;
  order in;
  std::int64_t rows;

  void operator()(T *to, std::int64_t columns) const noexcept {
    std::fill_n(to, rows * columns, T{});
    for (std::int32_t r = 0; r < from.rows; ++r)
      copy_record(from.row(in == order::reversed ? from.rows - 1 - r : r), from.columns, in, to + r * columns);
  }
};

template <class E>
void correlate_matrices(input_matrix<E> x, input_matrix<E> y, output_matrix<E> &out, std::int32_t method_number,
                        scratch<E> reversed, scratch<E> room, transform_slot &slot) {
  const auto is_empty = [](const auto &m) { return m.rows < 1 || m.columns < 1; };
  require(!is_empty(x.view()) && !is_empty(y.view()), empty_input);
  const method how = checked_method(method_number);
  const std::int64_t rows = std::int64_t{x.view().rows} + y.view().rows - 1;
  const std::int64_t columns = std::int64_t{x.view().columns} + y.view().columns - 1;
  const auto bits = [](std::int64_t n) { return std::bit_width(static_cast<std::uint64_t>(n - 1)); };
  require(bits(rows) + bits(columns) < 31, no_memory);
  std::optional<fourier_convolution<E>> plan;
  if (how == method::fourier) plan.emplace(rows, columns);
  refuse_sharing(reversed, x, y, out, room);
  refuse_sharing(room, x, y, out);
  x.copy_if_same(out);
  y.copy_if_same(out);

  using value = value_of<E>;
  const matrix_view<value> lags = out.resize(rows, columns);
  if (plan) {
    const padded_matrix<value> first{x.view(), order::reversed, plan->rows()};
    const padded_matrix<value> second{y.view(), order::forward, plan->rows()};
    const value *const result = plan->run(room, slot, first, second);
    for (std::int32_t r = 0; r < lags.rows; ++r) std::copy_n(result + r * plan->columns(), lags.columns, lags.row(r));
  } else {
    const auto turned = static_cast<std::int64_t>(x.view().size());
    const auto memory = reversed.resize(turned);
    copy_record(x.view().data, turned, order::reversed, memory.data());
    correlate_directly<value>({memory.data(), x.view().rows, x.view().columns}, y.view(), lags);
  }
}

}  // namespace
}  // namespace toolkit

using namespace toolkit;

#define CORRELATION(NAME, E, F)                                                                                       \
  int32_t qsRFPELTA_##NAME##1DCorrelationH(handle<E> x, handle<F> y, handle<common_of<E, F>> out, int32_t method,     \
                                           int32_t normalisation, int32_t blockSize, handle<common_of<E, F>> scratch, \
                                           handle<common_of<E, F>> transformScratch, void **slot) {                   \
    return toolkit_call(                                                                                              \
        [&](output<common_of<E, F>> &lags, transform_slot &kept) {                                                    \
          correlate<E, F>(x, y, lags, method, normalisation, blockSize, scratch, transformScratch, kept);             \
        },                                                                                                            \
        output<common_of<E, F>>(out), transform_slot(slot));                                                          \
  }
CORRELATION(s, s, s)
CORRELATION(d, d, d)
CORRELATION(c, c, c)
CORRELATION(z, z, z)
CORRELATION(sc, s, c)
CORRELATION(cs, c, s)
CORRELATION(dz, d, z)
CORRELATION(zd, z, d)
#undef CORRELATION

#define MATRIX_CORRELATION(E)                                                                                         \
  int32_t qsRFPELTA_##E##2DCorrelationH(matrix_handle<E> x, matrix_handle<E> y, matrix_handle<E> out, int32_t method, \
                                        handle<E> scratch, handle<E> transformScratch, void **slot) {                 \
    return toolkit_call(                                                                                              \
        [&](output_matrix<E> &lags, transform_slot &kept) {                                                           \
          correlate_matrices<E>(x, y, lags, method, scratch, transformScratch, kept);                                 \
        },                                                                                                            \
        output_matrix<E>(out), transform_slot(slot));                                                                 \
  }
MATRIX_CORRELATION(s)
MATRIX_CORRELATION(d)
MATRIX_CORRELATION(c)
MATRIX_CORRELATION(z)
#undef MATRIX_CORRELATION
