// Every operation with all of its arrays at pages that fault. SPDX-License-Identifier: MIT
#include "toolkit/operations.hpp"

namespace {

using namespace tests;

/// While it lives, blocks are made at such a page.
class blocks_at {
 public:
  explicit blocks_at(edge at) { block_edge() = at; }
  blocks_at(const blocks_at &) = delete;
  blocks_at &operator=(const blocks_at &) = delete;
  ~blocks_at() { block_edge().reset(); }
};

/// Every family with options that the table of operations leaves out.
template <class E>
void run_with_other_options(arguments<E> &a) {
  using F = family<E>;
  using R = toolkit::magnitude_of<E>;
  EXPECT_EQ(0, F::rms(a.x, &a.slope));
  for (const int type : {0, 1, 3, 7, 8, 9}) EXPECT_EQ(0, F::window(a.x, type, 0, a.tables));
  for (int factor = 1; factor <= static_cast<int>(a.n); factor += 1 + factor / 3)
    for (const int average : {0, 1}) EXPECT_EQ(0, F::decimate(a.x, a.out, factor, average));
  // Taps in rows, at offsets, and for each output alone.
  for (const float ratio : {0.3F, 1.7F, 5.F})
    for (const int phases : {1, 5})
      for (const int stretched : {0, 1}) {
        const lumra_resampler_parameters parameters{ratio, 0.25F, 0};
        for (const int reset : {1, 0})
          EXPECT_EQ(0, F::resample(a.x, a.numbers, phases, &parameters, reset, stretched, a.out, &a.time, a.history,
                                   a.tap_history, a.state.data()));
      }
  if constexpr (toolkit::is_complex<E>) {
    for (const int method : {0, 1}) {
      EXPECT_EQ(0,
                (correlation_pair<R, E>::correlate(a.numbers, a.y, a.out, method, 1, 0, a.scratch, a.room, &a.slot)));
      EXPECT_EQ(0,
                (correlation_pair<E, R>::correlate(a.y, a.numbers, a.out, method, 1, 0, a.scratch, a.room, &a.slot)));
    }
  }
}

template <class E>
using ToolkitGuards = toolkit_test<E>;
TYPED_TEST_SUITE(ToolkitGuards, all_letters);

TYPED_TEST(ToolkitGuards, NothingBesidesTheArraysIsTouched) {
  using E = TypeParam;
  std::vector<std::size_t> lengths = {63, 64, 65, 131, 160};
  for (std::size_t n = 3; n <= 40; ++n) lengths.push_back(n);
  for (const edge at : {edge::front, edge::back}) {
    const blocks_at guard(at);
    for (const std::size_t n : lengths) {
      for (const auto &op : operations<E>()) {
        SCOPED_TRACE(testing::Message() << op.name << " n " << n << (at == edge::back ? " back" : " front"));
        arguments<E> a(n);
        EXPECT_EQ(0, op.run(a));
      }
      arguments<E> a(n);
      run_with_other_options(a);
    }
  }
}

}  // namespace
