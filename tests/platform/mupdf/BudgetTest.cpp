// SPDX-License-Identifier: Apache-2.0
#include "quilt/platform/mupdf/Budget.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <vector>

namespace quilt::platform::mupdf {
namespace {

class BudgetTest : public ::testing::Test {
 protected:
  void* allocate(std::size_t size) { return memory->malloc(memory->user, size); }
  void* reallocate(void* block, std::size_t size) { return memory->realloc(memory->user, block, size); }
  void release(void* block) { memory->free(memory->user, block); }

  /// As many blocks of this size as there are.
  std::vector<void*> allocateAll(std::size_t size) {
    std::vector<void*> blocks;
    while (void* const block = allocate(size)) blocks.push_back(block);
    return blocks;
  }

  Budget budget;
  const fz_alloc_context* memory = budget.allocator();
};

TEST_F(BudgetTest, EveryBlockIsAlignedAndItsOwn) {
  std::vector<unsigned char*> blocks;
  for (std::size_t size = 1; size <= 2 * kSmallBlock; ++size) {
    blocks.push_back(static_cast<unsigned char*>(allocate(size)));
    ASSERT_TRUE(blocks.back());
    EXPECT_EQ(reinterpret_cast<std::uintptr_t>(blocks.back()) % alignof(std::max_align_t), 0U);
    std::memset(blocks.back(), static_cast<int>(size % 251), size);
  }
  for (std::size_t size = 1; size <= 2 * kSmallBlock; ++size) {
    const unsigned char* const block = blocks[size - 1];
    for (std::size_t i = 0; i < size; ++i) ASSERT_EQ(block[i], size % 251) << i << " of " << size;
  }
  for (unsigned char* const block : blocks) release(block);
}

TEST_F(BudgetTest, ContentsMoveWithABlockThatGrowsOrShrinks) {
  constexpr std::size_t kSizes[] = {
      1, 15, 16, 17, kSmallBlock - 1, kSmallBlock, kSmallBlock + 1, 5000, 700, 300, 256, 100, 9, 4000, 40};
  auto* block = static_cast<unsigned char*>(reallocate(nullptr, 8));
  std::size_t before = 8;
  std::memset(block, 1, before);
  for (const std::size_t size : kSizes) {
    block = static_cast<unsigned char*>(reallocate(block, size));
    ASSERT_TRUE(block);
    for (std::size_t i = 0; i < std::min(before, size); ++i) ASSERT_EQ(block[i], 1) << i << " of " << size;
    std::memset(block, 1, size);
    before = size;
  }
  release(block);
}

TEST_F(BudgetTest, TheLimitHoldsForBlocksOfAnySize) {
  for (const std::size_t size : {std::size_t{128}, kSmallBlock, kSmallBlock + 1, std::size_t{1} << 20}) {
    Budget another;
    memory = another.allocator();
    const std::vector<void*> blocks = allocateAll(size);
    EXPECT_LE(blocks.size() * size, kMaximumMemory);
    EXPECT_GE(blocks.size() * size, kMaximumMemory / 2) << size;
    for (void* const block : blocks) release(block);
  }
}

TEST_F(BudgetTest, WhatIsReleasedCanBeHadAgain) {
  for (const std::size_t size : {kMaximumMemory / 2, std::size_t{4000}, std::size_t{128}}) {
    const std::vector<void*> first = allocateAll(size);
    EXPECT_FALSE(first.empty());
    for (void* const block : first) release(block);
    const std::vector<void*> second = allocateAll(size);
    EXPECT_EQ(second.size(), first.size()) << size;
    for (void* const block : second) release(block);
  }
}

TEST_F(BudgetTest, MoreThanThereIsAtAllIsRefused) {
  EXPECT_FALSE(allocate(kMaximumMemory + 1));
  EXPECT_FALSE(allocate(SIZE_MAX));
  void* const block = allocate(10);
  EXPECT_FALSE(reallocate(block, SIZE_MAX - 8));
  release(block);
  release(nullptr);
}

}  // namespace
}  // namespace quilt::platform::mupdf
