// SPDX-License-Identifier: MIT
#include <lumra/host_array.h>

#include <gtest/gtest.h>

#include <array>
#include <complex>
#include <limits>
#include <lumra/lumra.hpp>

#include "support/test_array.hpp"

namespace {

constexpr std::int32_t no_memory = -20001, negative_size = -20004, bad_type = -20061;

TEST(HostArrays, OwnBlocksAreZeroAlignedAndSized) {
  const struct {
    std::int32_t type, dimensions;
    std::size_t header, width;
  } layouts[] = {{9, 1, 4, 4}, {12, 1, 4, 8}, {10, 1, 8, 8}, {13, 1, 8, 16},
                 {9, 2, 8, 4}, {12, 2, 8, 8}, {10, 2, 8, 8}, {13, 2, 8, 16}};
  for (const auto &l : layouts) {
    SCOPED_TRACE(testing::Message() << "type " << l.type << " dimensions " << l.dimensions);
    const std::int32_t sizes[] = {5, 3};
    char **array = nullptr;
    ASSERT_EQ(0, qsHost_ArrayNew(l.type, l.dimensions, sizes, &array));
    const char *block = *array;
    EXPECT_EQ(0, std::memcmp(block, sizes, static_cast<std::size_t>(l.dimensions) * 4));
    EXPECT_EQ(0U, reinterpret_cast<std::uintptr_t>(block + l.header) % 64);
    const std::size_t bytes = l.width * (l.dimensions == 1 ? 5 : 15);
    EXPECT_EQ(bytes, static_cast<std::size_t>(std::count(block + l.header, block + l.header + bytes, '\0')));
    EXPECT_EQ(0, qsHost_ArrayFree(&array));
    EXPECT_EQ(nullptr, array);
  }
}

TEST(HostArrays, RefusesBadArguments) {
  constexpr std::int32_t huge = std::numeric_limits<std::int32_t>::max();
  constexpr std::uint64_t most = std::numeric_limits<std::uint64_t>::max();
  const struct {
    std::int32_t type, dimensions, sizes[2], code;
  } refusals[] = {{11, 1, {1, 1}, bad_type},    {0, 1, {-1, 1}, bad_type},      {9, 0, {1, 1}, bad_type},
                  {9, 3, {1, 1}, bad_type},     {9, 1, {-1, 1}, negative_size}, {9, 2, {3, -1}, negative_size},
                  {13, 2, {huge, 2}, no_memory}};
  for (const auto &r : refusals) {
    void *stale = &stale;
    void *array = stale;
    EXPECT_EQ(r.code, qsHost_ArrayNew(r.type, r.dimensions, r.sizes, &array)) << r.type << ' ' << r.dimensions;
    EXPECT_EQ(nullptr, array);
  }
  EXPECT_EQ(no_memory, qsHost_ArrayNew(9, 1, refusals[0].sizes, nullptr));
  EXPECT_EQ(no_memory, qsHost_ArrayResize(9, 1, nullptr, 1));
  void *array = nullptr;
  EXPECT_EQ(bad_type, qsHost_ArrayNew(9, 1, nullptr, &array));
  EXPECT_EQ(bad_type, qsHost_ArrayResize(11, 1, &array, 1));
  for (const std::uint64_t count : {std::uint64_t{1} << 31, most})
    EXPECT_EQ(no_memory, qsHost_ArrayResize(9, 1, &array, count));
  EXPECT_EQ(nullptr, array);
  EXPECT_EQ(0, qsHost_ArrayFree(nullptr));
  EXPECT_EQ(0, qsHost_ArrayFree(&array));
}

TEST(HostArrays, ResizeKeepsElementsSizesAndHandle) {
  const std::int32_t size = 3;
  lumra_f64_array array = nullptr;
  ASSERT_EQ(0, qsHost_ArrayNew(10, 1, &size, &array));
  const lumra_f64_array copy_of_handle = array;
  for (int i = 0; i < 3; ++i) (*array)->elements[i] = i + 1;
  ASSERT_EQ(0, qsHost_ArrayResize(10, 1, &array, 100000));
  EXPECT_EQ(copy_of_handle, array);
  EXPECT_EQ(3, (*array)->count);
  for (int i = 0; i < 3; ++i) EXPECT_EQ(i + 1, (*array)->elements[i]);
  for (int i = 3; i < 100000; ++i) ASSERT_EQ(0, (*array)->elements[i]);
  const void *large = *array;
  ASSERT_EQ(0, qsHost_ArrayResize(10, 1, &array, 0));
  ASSERT_EQ(0, qsHost_ArrayResize(10, 1, &array, 100000));
  EXPECT_EQ(large, *array);
  qsHost_ArrayFree(&array);
}

TEST(HostArrays, ForeignBlocksAreNeitherMovedNorFreed) {
  tests::f32_array foreign{1.F, 2.F};
  EXPECT_EQ(no_memory, qsHost_ArrayResize(9, 1, foreign.address(), 10));
  void *handle = foreign.handle();
  EXPECT_EQ(0, qsHost_ArrayFree(&handle));
  EXPECT_EQ(2.F, foreign.elements()[1]);
}

TEST(HostArrays, ACellOfTheCallerReceivesABlock) {
  lumra_f32_block *cell = nullptr;
  lumra_f32_array array = &cell;
  ASSERT_EQ(0, qsHost_ArrayResize(9, 1, &array, 7));
  EXPECT_EQ(&cell, array);
  ASSERT_NE(nullptr, cell);
  cell->elements[6] = 1;
  EXPECT_EQ(0, cell->count);
  qsHost_ArrayFree(&array);
  EXPECT_EQ(nullptr, cell);
}

TEST(ResizeService, HandedOverWinsAndNullSearchesAgain) {
  {
    tests::fake_host host(tests::fake_host::unit::bytes);
    tests::f32_array out(1);
    EXPECT_TRUE(host::resize_vector(out.address(), 4, 16));
    ASSERT_EQ(1U, host.calls.size());
    EXPECT_EQ(9, host.calls[0].type);
    EXPECT_EQ(1, host.calls[0].dimensions);
    EXPECT_EQ(16U, host.calls[0].size);
    EXPECT_TRUE(host::resize_vector(out.address(), 4, 16));  // has the count already
    EXPECT_EQ(1U, host.calls.size());
    host.refuse_from = 1;
    EXPECT_FALSE(host::resize_vector(out.address(), 5, 20));
    EXPECT_EQ(4, out.block()->count);
  }
  lumra_f32_array own = nullptr;
  EXPECT_TRUE(host::resize_vector(&own, 4, 16));
  EXPECT_EQ(4, (*own)->count);
  EXPECT_EQ(0, qsHost_ArrayFree(&own));
}

TEST(HostMatrix, LiesRowByRowAndRefusesSizesThatNoBlockHas) {
  using matrix = lumra::host_matrix<std::complex<double>>;
  matrix m(2, 3);
  EXPECT_EQ((std::pair{2, 3}), (std::pair{(*m.get())->rows, (*m.get())->columns}));
  for (std::size_t i = 0; i < 6; ++i) {
    EXPECT_EQ(0.0, m.elements()[i]);
    m.row(i / 3)[i % 3] = static_cast<double>(i + 1);
  }
  const auto expect = [&m](std::size_t rows, std::size_t columns, std::initializer_list<double> elements) {
    EXPECT_EQ((std::array{rows, columns, rows * columns}), (std::array{m.rows(), m.columns(), m.size()}));
    EXPECT_EQ(static_cast<void *>((*m.get())->elements), m.elements().data());
    EXPECT_TRUE(std::equal(elements.begin(), elements.end(), m.elements().begin(), m.elements().end()));
    for (std::size_t r = 0; r < rows; ++r) EXPECT_EQ(m.elements().data() + r * columns, m.row(r).data());
  };
  expect(2, 3, {1, 2, 3, 4, 5, 6});
  m.resize(1, 2);
  m.resize(2, 2);
  expect(2, 2, {1, 2, 0, 0});  // what was dropped does not come back
  constexpr std::size_t most = 0x7FFFFFFF, negative = static_cast<std::size_t>(-1);
  for (const auto &[rows, columns] : {std::pair{negative, std::size_t{1}},
                                      {1, negative},
                                      {most + 1, 0},
                                      {0, most + 1},
                                      {most, 2},
                                      {65536, 65536},
                                      {std::size_t{1} << 32, std::size_t{1} << 32}}) {
    EXPECT_THROW(m.resize(rows, columns), std::length_error) << rows << " x " << columns;
    EXPECT_THROW(matrix(rows, columns), std::length_error) << rows << " x " << columns;
  }
  expect(2, 2, {1, 2, 0, 0});
  m.resize(0, most);
  expect(0, most, {});
  m = matrix(1, 1);
  expect(1, 1, {0});
  EXPECT_EQ(0U, matrix().size());
}

TEST(TransformSlot, EmptySlotsAreReleased) {
  void *slot = nullptr;
  EXPECT_EQ(0, qsHost_ReleaseTransform(&slot));
  EXPECT_EQ(0, qsHost_ReleaseTransform(nullptr));
}

}  // namespace
