// ctest-label: threaded
#include "ctl/client/transfer/chunk_batch.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <algorithm>
#include <thread>

#include "ctl/client/chunks.h"
#include "ctl/client/failure.h"
#include "support/scratch_dir.h"

namespace {

using ctl::ChunkBatch;
using ctl::Failure;
using ctl_test::bytesOf;
using ctl_test::contentOf;
using ctl_test::Descriptor;
using ctl_test::pattern;

constexpr std::size_t kChunk = 4100;
constexpr std::size_t kBatchBytes = ChunkBatch::kMostData;

TEST(ChunkBatch, HoldsAFileInChunksOf4096Bytes) {
    const ScratchDir scratch;
    for (const std::size_t size : {std::size_t{0}, std::size_t{1}, std::size_t{4095},
                                   std::size_t{4096}, std::size_t{4097}, kBatchBytes}) {
        const std::string content = pattern(size);
        const Descriptor file(::open(scratch.write("file", content).c_str(), O_RDONLY));
        ChunkBatch batch;
        EXPECT_EQ(batch.read(file.get(), "file"), size);
        EXPECT_EQ(batch.count(), std::max<std::size_t>(1, (size + 4095) / 4096));
        EXPECT_EQ(batch.size(), batch.count() * kChunk);
        EXPECT_TRUE(contentOf(bytesOf(batch)) == content) << size;
        EXPECT_EQ(batch.read(file.get(), "file"), 0U) << "the file's end";
        EXPECT_EQ(batch.count(), 1);
        EXPECT_EQ(bytesOf(batch), std::string(kChunk, '\0')) << "one empty chunk";
    }
}

TEST(ChunkBatch, GoesOnWhereTheLastOneEnded) {
    const ScratchDir scratch;
    const std::string content = pattern(2 * kBatchBytes + 5000);
    const Descriptor file(::open(scratch.write("file", content).c_str(), O_RDONLY));
    ChunkBatch batch;
    std::string read;
    for (const std::size_t expected : {kBatchBytes, kBatchBytes, std::size_t{5000}}) {
        EXPECT_EQ(batch.read(file.get(), "file"), expected);
        read += contentOf(bytesOf(batch));
    }
    EXPECT_TRUE(read == content);
}

TEST(ChunkBatch, HoldsWhatIsThereWhateverWasExpected) {
    const ScratchDir scratch;
    for (const std::size_t size :
         {std::size_t{0}, std::size_t{1}, std::size_t{4096}, std::size_t{10'000}, kBatchBytes}) {
        const std::string content = pattern(size);
        const std::string path = scratch.write("file", content);
        for (const std::size_t expected :
             {std::size_t{1}, std::size_t{4096}, size - std::min<std::size_t>(size, 1), size,
              size + 1, kBatchBytes - 1, kBatchBytes, 3 * kBatchBytes}) {
            const Descriptor file(::open(path.c_str(), O_RDONLY));
            ChunkBatch batch;
            EXPECT_EQ(batch.read(file.get(), "file", expected), size) << expected;
            EXPECT_TRUE(contentOf(bytesOf(batch)) == content) << size << ' ' << expected;
        }
    }
}

TEST(ChunkBatch, LeavesNothingOfAnEarlierFileBehindTheContent) {
    const ScratchDir scratch;
    const Descriptor first(::open(scratch.write("first", pattern(9000)).c_str(), O_RDONLY));
    const Descriptor second(::open(scratch.write("second", "abc").c_str(), O_RDONLY));
    ChunkBatch batch;
    batch.read(first.get(), "first");
    batch.read(second.get(), "second");
    EXPECT_EQ(bytesOf(batch), std::string("\3\0\0\0abc", 7) + std::string(4093, '\0'));
}

TEST(ChunkBatch, IsFilledFromAPipeThatGivesLittleAtATime) {
    int ends[2];
    ASSERT_EQ(::pipe(ends), 0);
    const Descriptor from(ends[0]);
    std::thread writer([&] {
        const Descriptor to(ends[1]);
        const std::string content = pattern(10'000);
        for (std::size_t at = 0; at < content.size(); at += 777) {
            const std::string part = content.substr(at, 777);
            ASSERT_EQ(::write(to.get(), part.data(), part.size()),
                      static_cast<ssize_t>(part.size()));
        }
    });
    ChunkBatch batch;
    EXPECT_EQ(batch.read(from.get(), "pipe"), 10'000U);
    writer.join();
    EXPECT_TRUE(contentOf(bytesOf(batch)) == pattern(10'000));
}

TEST(ChunkBatch, SaysWhatCannotBeRead) {
    const Descriptor directory(::open("/", O_RDONLY));
    ChunkBatch batch;
    try {
        batch.read(directory.get(), "root");
        FAIL();
    } catch (const Failure& failure) {
        EXPECT_EQ(failure.status(), ctl::kWrongUsage);
        EXPECT_STREQ(failure.what(), "cannot read root: Is a directory");
    }
}

}  // namespace
