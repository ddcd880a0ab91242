// Arrays by identifier. SPDX-License-Identifier: MIT
#include "qsrfhs/util/array_store.hpp"

#include <gtest/gtest.h>

#include <algorithm>
#include <limits>
#include <random>
#include <vector>

#include "support/recorded.hpp"
#include "support/test_array.hpp"

namespace {

constexpr std::int32_t int_min = std::numeric_limits<std::int32_t>::min();
constexpr std::int32_t int_max = std::numeric_limits<std::int32_t>::max();

// A reference with its pointer, as C callers hold them.
struct reference {
  lumra_array_ref record{1, nullptr};
  lumra_array_ref *pointer = &record;

  reference() = default;
  explicit reference(std::int32_t count, std::uint64_t owner = 7) {
    EXPECT_EQ(0, qsUtilHS_AllocateArray_CSG(&pointer, count, owner));
    for (std::int32_t k = 0; k < count; ++k) record.block->data[k] = {static_cast<float>(k + 1), -1.F};
  }
  reference(const reference &) = delete;
  reference &operator=(const reference &) = delete;
  ~reference() {
    record.kind = 1;
    qsUtilHS_FreeArray_CSG(&pointer);
  }
  lumra_array_ref **address() { return &pointer; }
  lumra_array_block *block() { return record.block; }
};

TEST(ArrayStore, CapacityIsInSizeClassesAndTheBlockIsAHostArray) {
  struct row {
    std::int32_t count;
    std::uint32_t units;
  };
  for (const row &r : {row{1, 1}, row{512, 1}, row{513, 2}, row{8191, 16}, row{8192, 16}, row{8193, 32},
                       row{131071, 256}, row{131072, 256}, row{131073, 512}}) {
    SCOPED_TRACE(r.count);
    reference array(r.count);
    const lumra_array_block &block = *array.block();
    EXPECT_EQ(r.units, block.units);
    EXPECT_EQ(r.units, block.size_class);
    EXPECT_EQ(static_cast<std::uint32_t>(r.count), block.count);
    EXPECT_EQ(block.count * 8, block.bytes);
    EXPECT_EQ((reinterpret_cast<std::uintptr_t>(block.raw) + 512) / 256 * 256,
              reinterpret_cast<std::uintptr_t>(block.data));
    EXPECT_EQ(static_cast<std::size_t>(r.count), host::elements(block.handle).size());
    EXPECT_EQ(block.data, host::elements(block.handle).data());
    std::uint32_t length = 0;
    EXPECT_EQ(0, qsUtilHS_ArrayLength_CSG(array.address(), &length));
    EXPECT_EQ(block.count, length);
  }
  EXPECT_EQ(32768U, qsrfhs::units_for(1U << 27));
  EXPECT_EQ(1048576U, qsrfhs::units_for(0xFFFFFFF8U));
}

TEST(ArrayStore, AReleasedBlockIsTheNextOfItsClassContentsAndAll) {
  reference array(100);
  const lumra_array_block *const block = array.block();
  EXPECT_EQ(0, qsUtilHS_FreeArray_CSG(array.address()));
  EXPECT_EQ(nullptr, array.block());
  EXPECT_EQ(0, qsUtilHS_FreeArray_CSG(array.address()));
  EXPECT_EQ(0, qsUtilHS_AllocateArray_CSG(array.address(), 512, 7));  // the same class
  EXPECT_EQ(block, array.block());
  EXPECT_EQ(100.F, array.block()->data[99].re);
  EXPECT_EQ(512, array.block()->count_field->count);
}

// The rule for blocks from 128 MiB on, on a recycler of its own and without touching the memory.
TEST(ArrayStore, LargeBlocksAreTakenByBestFit) {
  constexpr std::uint32_t mib = 131072;  // elements in a MiB
  struct row {
    const char *what;
    std::vector<std::uint32_t> free;  // in MiB, the head last
    std::uint32_t need;
    int taken;  // index into free, -1 for a new block
  };
  const row rows[] = {{"only the head, a tenth wasted", {144}, 130, 0},
                      {"only the head, more wasted", {150}, 130, -1},
                      {"only the head, too small", {140}, 150, -1},
                      {"best behind a head too small", {200, 160, 128}, 150, 1},
                      {"behind wastes up to half", {260, 128}, 130, 0},
                      {"behind wastes more, the head is not tried", {270, 290}, 130, -1},
                      {"behind no better than the head", {150, 140}, 135, 1},
                      {"the earlier of equals", {150, 150, 128}, 140, 1},
                      {"the head fits, behind fits better", {131, 140}, 130, 0}};
  for (const row &r : rows) {
    SCOPED_TRACE(r.what);
    qsrfhs::recycler recycler;
    std::vector<qsrfhs::array_block *> blocks;
    for (const std::uint32_t size : r.free) blocks.push_back(&recycler.take(size * mib));
    for (qsrfhs::array_block *block : blocks) recycler.give_back(*block);
    qsrfhs::array_block *const taken = &recycler.take(r.need * mib);
    const auto found = std::find(blocks.begin(), blocks.end(), taken);
    EXPECT_EQ(r.taken, found == blocks.end() ? -1 : found - blocks.begin());
    EXPECT_EQ(r.need * mib, taken->count);
    if (found == blocks.end()) blocks.push_back(taken);
    for (qsrfhs::array_block *block : blocks) ::operator delete(block->raw);
  }
}

TEST(ArrayStore, AnOwnerReleasesItsArraysOnly) {
  reference mine(10, 100), other(10, 101), mine_too(2000, 100);
  std::uint32_t length = 0;
  EXPECT_EQ(0, qsUtilHS_FreeArrayIDH_CSG(99));
  EXPECT_EQ(0, qsUtilHS_ArrayLength_CSG(mine.address(), &length));
  EXPECT_EQ(0, qsUtilHS_FreeArrayIDH_CSG(100));
  EXPECT_EQ(-33620126, qsUtilHS_ArrayLength_CSG(mine.address(), &length));
  EXPECT_EQ(-33620126, qsUtilHS_ArrayLength_CSG(mine_too.address(), &length));
  EXPECT_EQ(0, qsUtilHS_ArrayLength_CSG(other.address(), &length));
  // A reference that is used again forgets its array, which stays its owner's.
  const lumra_array_block *const forgotten = other.block();
  EXPECT_EQ(0, qsUtilHS_AllocateArray_CSG(other.address(), 0, 101));
  EXPECT_EQ(nullptr, other.block());
  EXPECT_EQ(0, qsUtilHS_FreeArrayIDH_CSG(101));
  EXPECT_EQ(0, qsUtilHS_AllocateArray_CSG(other.address(), 10, 101));
  EXPECT_EQ(forgotten, other.block());
}

TEST(ArrayStore, ReadsWithZerosOnBothSides) {
  tests::fake_host host(tests::fake_host::unit::bytes);
  reference array(5), empty;
  for (const std::int32_t offset : {int_min, -1000, -8, -7, -3, 0, 2, 4, 5, 6, 1 << 29, int_max})
    for (const std::int32_t count : {0, 1, 3, 5, 8, 300}) {
      SCOPED_TRACE(testing::Message() << offset << " " << count);
      tests::cf32_array destination(3);
      destination.elements()[0] = {9, 9};
      ASSERT_EQ(0, qsUtilHS_ReadArray_CSG(array.address(), destination.address(), offset, count));
      ASSERT_EQ(static_cast<std::size_t>(count), destination.elements().size());
      for (std::int32_t k = 0; k < count; ++k) {
        const std::int64_t from = std::int64_t{offset} + k;
        EXPECT_EQ(from >= 0 && from < 5 ? static_cast<float>(from + 1) : 0.F,
                  destination.elements()[static_cast<std::size_t>(k)].re);
      }
      ASSERT_EQ(0, qsUtilHS_ReadArray_CSG(empty.address(), destination.address(), offset, count));
      for (const lumra_cf32 &element : destination.elements()) EXPECT_EQ(0.F, element.re);
    }
  // Only a destination that is too short is resized, in bytes.
  host.calls.clear();
  tests::cf32_array destination(3);
  EXPECT_EQ(0, qsUtilHS_ReadArray_CSG(array.address(), destination.address(), 0, 2));
  EXPECT_EQ(0U, host.calls.size());
  EXPECT_EQ(0, qsUtilHS_ReadArray_CSG(array.address(), destination.address(), 0, 4));
  ASSERT_EQ(1U, host.calls.size());
  EXPECT_EQ(12, host.calls[0].type);
  EXPECT_EQ(32U, host.calls[0].size);
  // Into itself.
  EXPECT_EQ(0, qsUtilHS_ReadArray_CSG(array.address(), &array.block()->handle, -1, 5));
  EXPECT_EQ(0.F, array.block()->data[0].re);
  EXPECT_EQ(1.F, array.block()->data[1].re);
  EXPECT_EQ(4.F, array.block()->data[4].re);
}

TEST(ArrayStore, RefusesAndRecords) {
  tests::fake_host host(tests::fake_host::unit::bytes);
  reference array(4), none, bad;
  bad.record.kind = 2;
  lumra_array_ref *null = nullptr;
  tests::cf32_array out{lumra_cf32{5, 5}};
  std::uint32_t length = 0;
  const tests::recorded list;
  for (lumra_array_ref **invalid : {static_cast<lumra_array_ref **>(nullptr), &null, bad.address()}) {
    EXPECT_EQ(-33620066, qsUtilHS_AllocateArray_CSG(invalid, -1, 0));
    EXPECT_EQ(-33620097, qsUtilHS_FreeArray_CSG(invalid));
    EXPECT_EQ(-33620121, qsUtilHS_ArrayLength_CSG(invalid, &length));
    EXPECT_EQ(-33620139, qsUtilHS_ReadArray_CSG(invalid, out.address(), 0, -1));
  }
  EXPECT_EQ(-33620069, qsUtilHS_AllocateArray_CSG(array.address(), -1, 0));
  EXPECT_EQ(-33620079, qsUtilHS_AllocateArray_CSG(array.address(), 1 << 29, 0));
  EXPECT_EQ(-33620079, qsUtilHS_AllocateArray_CSG(array.address(), int_max, 0));
  EXPECT_EQ(-33620121, qsUtilHS_ArrayLength_CSG(array.address(), nullptr));
  EXPECT_EQ(-33620126, qsUtilHS_ArrayLength_CSG(none.address(), &length));
  EXPECT_EQ(-33620139, qsUtilHS_ReadArray_CSG(array.address(), nullptr, 0, 1));
  EXPECT_EQ(-33620069, qsUtilHS_ReadArray_CSG(array.address(), out.address(), 0, -1));
  host.refuse_from = 0;
  EXPECT_EQ(-33620151, qsUtilHS_ReadArray_CSG(array.address(), out.address(), 0, 4));
  EXPECT_EQ(20U, list.codes().size());
  EXPECT_EQ(-33620151, list.codes().back());
  EXPECT_EQ(5.F, out.elements()[0].re);
  EXPECT_NE(nullptr, array.block());
}

TEST(ArrayStore, ForgedReferencesAreHarmless) {
  reference array(4);
  std::mt19937_64 random(1);
  for (int i = 0; i < 1000000; ++i) {
    lumra_array_ref forged{1, reinterpret_cast<lumra_array_block *>(random() >> (i % 64))};
    lumra_array_ref *pointer = &forged;
    ASSERT_EQ(0, qsUtilHS_FreeArray_CSG(&pointer));
  }
  tests::cf32_array out(2);
  for (int i = 0; i < 1000; ++i) {
    lumra_array_ref forged{1, reinterpret_cast<lumra_array_block *>(random())};
    lumra_array_ref *pointer = &forged;
    std::uint32_t length = 0;
    ASSERT_EQ(-33620126, qsUtilHS_ArrayLength_CSG(&pointer, &length));
    ASSERT_EQ(0, qsUtilHS_ReadArray_CSG(&pointer, out.address(), 0, 2));
  }
  // A copy of a reference does not release twice.
  lumra_array_ref copy = array.record;
  lumra_array_ref *pointer = &copy;
  EXPECT_EQ(0, qsUtilHS_FreeArray_CSG(&pointer));
  EXPECT_EQ(0, qsUtilHS_FreeArray_CSG(array.address()));
  reference first(4), second(4);
  EXPECT_NE(first.block(), second.block());
}

}  // namespace
