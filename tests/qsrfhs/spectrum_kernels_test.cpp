// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <cstring>
#include <random>
#include <vector>

#include "platform/processor.hpp"
#include "qsrfhs/vector/kernels/kernels.hpp"

namespace {

using qsrfhs::kernels::kernel_table;

// A buffer whose first float lies `offset` floats behind a 32-byte boundary, with a guard behind its end.
class operand {
 public:
  operand(std::size_t size, std::size_t offset, unsigned seed) : storage_(size + 32, 12345.F) {
    const auto address = reinterpret_cast<std::uintptr_t>(storage_.data());
    first_ = 8 + (32 - address % 32) % 32 / 4 + offset;
    size_ = size;
    std::mt19937 random(seed);
    std::normal_distribution<float> value(0, 1e3F);
    for (std::size_t i = 0; i < size; ++i) data()[i] = value(random);
  }
  float *data() { return storage_.data() + first_; }
  bool guard_is_intact() const { return storage_[first_ + size_] == 12345.F && storage_[first_ - 1] == 12345.F; }
  std::vector<float> values() { return {data(), data() + size_}; }

 private:
  std::vector<float> storage_;
  std::size_t first_ = 0, size_ = 0;
};

TEST(SpectrumKernels, EachBuildComputesTheFormulaBitForBit) {
  std::vector<const kernel_table *> tables = {&qsrfhs::kernels::baseline_kernels};
  if (platform::has_avx()) tables.push_back(&qsrfhs::kernels::avx_kernels);
  for (const kernel_table *table : tables)
    for (const std::size_t n : {0U, 1U, 3U, 4U, 7U, 8U, 9U, 15U, 16U, 17U, 64U, 1003U})
      for (const std::size_t offset : {0U, 1U, 4U, 7U}) {
        SCOPED_TRACE(testing::Message() << (table == tables[0] ? "baseline" : "avx") << " n " << n << " offset "
                                        << offset);
        operand x(2 * n, offset, 1), w(n, 7 - offset, 2), out(2 * n, offset / 2, 3), power(n, offset, 4);
        std::vector<float> windowed(2 * n), sum(n);
        for (std::size_t k = 0; k < n; ++k) {
          const float re = x.data()[2 * k], im = x.data()[2 * k + 1];
          windowed[2 * k] = re * w.data()[k];
          windowed[2 * k + 1] = im * w.data()[k];
          const float square = re * re, other = im * im;
          const float magnitude = square + other;
          sum[k] = magnitude + magnitude;
        }
        table->copy(x.data(), out.data(), n);
        EXPECT_EQ(x.values(), out.values());
        table->apply_window(x.data(), w.data(), out.data(), n);
        EXPECT_EQ(windowed, out.values());

        operand work = x;
        // Two segments into zeros: the order of the powers is the build's own until they are put into theirs.
        std::fill_n(power.data(), n, 0.F);
        operand fused = power;
        table->accumulate_power(x.data(), power.data(), n);
        table->accumulate_power(x.data(), power.data(), n);
        table->order_power(power.data(), n);
        EXPECT_EQ(sum, power.values());
        table->accumulate_power_then_apply_window(work.data(), fused.data(), x.data(), w.data(), x.data(), n, n);
        table->accumulate_power(x.data(), fused.data(), n);
        table->order_power(fused.data(), n);
        EXPECT_EQ(sum, fused.values());
        EXPECT_EQ(windowed, work.values());

        for (float &s : sum) s *= 0.3F;
        table->scale(power.data(), 0.3F, n);
        EXPECT_EQ(sum, power.values());
        for (const operand *o : {&x, &w, &out, &power, &work, &fused}) EXPECT_TRUE(o->guard_is_intact());
      }
}

}  // namespace
