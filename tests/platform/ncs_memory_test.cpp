#include "ncs/memory.h"

#include <gtest/gtest.h>

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <vector>

#include "ncs/stub_buffer.h"
#include "platform/ncs.h"

namespace {

constexpr std::size_t kKiB = 1024;
constexpr std::size_t kMiB = 1024 * kKiB;

class Blocks : public testing::Test {
protected:
    Blocks() { ncs::releaseKeptBlocks(); }
    ~Blocks() override { ncs::releaseKeptBlocks(); }
};

TEST_F(Blocks, HoldWhatWasAskedForAndAreAligned) {
    for (const std::size_t size : {std::size_t{0}, std::size_t{1}, 32 * kKiB, 32 * kKiB + 1,
                                   64 * kKiB, 4 * kMiB, 4 * kMiB + 1, 8 * kMiB, 9 * kMiB}) {
        std::size_t capacity = 0;
        void* const block = ncs::takeBlock(size, &capacity);
        ASSERT_NE(block, nullptr);
        EXPECT_GE(capacity, size);
        EXPECT_EQ(reinterpret_cast<std::uintptr_t>(block) % alignof(std::max_align_t), 0U);
        std::memset(block, 'x', capacity);
        ncs::giveBlock(block);
    }
}

TEST_F(Blocks, TheLatestLargeOneIsUsedAgain) {
    void* const first = rpc__malloc(3 * kMiB);
    rpc__free(first);
    EXPECT_EQ(ncs::keptBytes(), 4 * kMiB);
    void* const second = rpc__malloc(4 * kMiB);
    EXPECT_EQ(second, first);
    EXPECT_EQ(ncs::keptBytes(), 0U);
    rpc__free(second);
}

TEST_F(Blocks, SmallOnesAreNotKept) {
    rpc__free(rpc__malloc(100));
    rpc__free(rpc__malloc(32 * kKiB));
    EXPECT_EQ(ncs::keptBytes(), 0U);
}

TEST_F(Blocks, FewAreKeptAndReleasedOnDemand) {
    std::vector<void*> blocks;
    for (int i = 0; i < 10; ++i)
        blocks.push_back(rpc__malloc(4 * kMiB));
    for (void* block : blocks)
        rpc__free(block);
    EXPECT_EQ(ncs::keptBytes(), 16 * kMiB);
    ncs::releaseKeptBlocks();
    EXPECT_EQ(ncs::keptBytes(), 0U);
}

TEST(Buffer, KeepsItsContentWhileItGrows) {
    ncs::MemoryBudget budget(kMiB);
    ncs::StubBuffer buffer(budget);
    for (std::size_t i = 0; i < 1000; ++i) {
        ASSERT_TRUE(buffer.reserve(1000, 0));
        std::memset(buffer.end(), static_cast<int>(i % 251), 1000);
        buffer.grow(1000);
    }
    EXPECT_EQ(buffer.size(), 1'000'000U);
    for (std::size_t i = 0; i < 1'000'000; ++i) {
        ASSERT_EQ(buffer.data()[i], i / 1000 % 251);
    }
}

TEST(Buffer, CountsAgainstTheBudgetWhatIsFilledAndNotWhatIsExpected) {
    ncs::MemoryBudget budget(1000);
    ncs::StubBuffer first(budget), second(budget);
    EXPECT_TRUE(first.reserve(600, 4 * kMiB));
    EXPECT_FALSE(second.reserve(401, 0));
    EXPECT_TRUE(second.reserve(400, 0));
    first.release();
    second.grow(400);
    EXPECT_TRUE(second.reserve(600, 0));
}

}  // namespace
