#include "fleet/server/depot/file_depot.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <chrono>
#include <cstdint>
#include <fstream>
#include <limits>
#include <string>

#include "fleet/bus/trust/checksum.h"
#include "tests/support/scratch_dir.h"

namespace {

using fleet::Checksum;
using fleet::DepotError;
using fleet::DepotFile;
using fleet::DepotLimits;
using fleet::FileDepot;
using fleet::Moment;

/// The files have the system's times.
const Moment kNow = fleet::wallClock();

std::string sumOf(const std::string& bytes) {
    Checksum sum;
    sum.add(bytes);
    return sum.hex();
}

class Depot : public testing::Test {
protected:
    std::string path(const std::string& name) const { return scratch_.path("files/" + name); }
    static DepotLimits limits() {
        DepotLimits limits;
        limits.freeShare = 0;
        return limits;
    }

    ScratchDir scratch_;
    FileDepot depot{scratch_.path("files"), limits()};
};

TEST(Checksums, AreTheStandardsOwn) {
    EXPECT_EQ(sumOf("abc"), "ba7816bf8f01cfea414140de5dae2223b00361a396177a9cb410ff61f20015ad");
    EXPECT_TRUE(fleet::isChecksum(sumOf("")));
    EXPECT_FALSE(
        fleet::isChecksum("BA7816BF8F01CFEA414140DE5DAE2223B00361A396177A9CB410FF61F20015AD"));
    EXPECT_FALSE(fleet::isChecksum("ba"));
}

TEST_F(Depot, HasWhatCameInPieces) {
    const std::string text = "one two three";
    const std::string sum = sumOf(text);
    EXPECT_FALSE(depot.find(sum, text.size()));
    EXPECT_EQ(depot.add(sum, text.size(), 0, "one ", kNow).have, 4U);
    EXPECT_FALSE(depot.has(sum));
    EXPECT_EQ(depot.read(sum, 0, 100), std::nullopt) << "it is not complete";
    EXPECT_EQ(depot.find(sum, text.size())->have, 4U);
    EXPECT_TRUE(depot.add(sum, text.size(), 4, "two three", kNow).isComplete());
    EXPECT_TRUE(depot.has(sum));
    EXPECT_EQ(depot.read(sum, 0, 100), text);
    EXPECT_EQ(depot.read(sum, 4, 3), "two");
    EXPECT_EQ(depot.read(sum, 100, 3), "");
}

TEST_F(Depot, TakesNoPieceThatDoesNotFit) {
    const std::string text = "one two three";
    const std::string sum = sumOf(text);
    depot.add(sum, text.size(), 0, "one ", kNow);
    EXPECT_EQ(depot.add(sum, text.size(), 0, "one ", kNow).have, 4U) << "it came before";
    EXPECT_EQ(depot.add(sum, text.size(), 8, "three", kNow).have, 4U);
    EXPECT_THROW(depot.add(sum, text.size(), 4, "two three four", kNow), DepotError);
    EXPECT_TRUE(depot.add(sum, text.size(), 4, "two three", kNow).isComplete());
}

TEST_F(Depot, TakesAnEmptyFile) {
    EXPECT_TRUE(depot.add(sumOf(""), 0, 0, "", kNow).isComplete());
    EXPECT_TRUE(depot.has(sumOf("")));
}

TEST_F(Depot, ForgetsAFileWithAnotherSum) {
    const std::string sum = sumOf("right");
    EXPECT_THROW(depot.add(sum, 5, 0, "wrong", kNow), DepotError);
    EXPECT_FALSE(depot.find(sum, 5));
    EXPECT_TRUE(depot.add(sum, 5, 0, "right", kNow).isComplete());
}

TEST_F(Depot, TakesACompleteFileForWhatItIs) {
    depot.add(sumOf("right"), 5, 0, "right", kNow);
    EXPECT_TRUE(depot.add(sumOf("right"), 5, 0, "right", kNow).isComplete());
    EXPECT_EQ(depot.read(sumOf("right"), 0, 100), "right");
}

TEST_F(Depot, GoesOnAfterARestart) {
    const std::string sum = sumOf("one two");
    depot.add(sum, 7, 0, "one", kNow);
    FileDepot again(scratch_.path("files"), limits());
    EXPECT_EQ(again.find(sum, 7)->have, 3U);
    EXPECT_TRUE(again.add(sum, 7, 3, " two", kNow).isComplete());
}

TEST_F(Depot, NamesAFileThatWasCompleteWhenItWasKilled) {
    const std::string sum = sumOf("one two");
    std::ofstream(path(sum + ".7.part")) << "one two";
    EXPECT_FALSE(depot.has(sum));
    EXPECT_TRUE(depot.add(sum, 7, 0, "", kNow).isComplete());
    EXPECT_TRUE(depot.has(sum));
    const std::string other = sumOf("three");
    std::ofstream(path(other + ".5.part")) << "other";
    EXPECT_THROW(depot.add(other, 5, 0, "", kNow), DepotError);
    EXPECT_FALSE(depot.find(other, 5));
}

TEST_F(Depot, CountsWhatFilesWillTakeAndNotWhatIsThereOfThem) {
    DepotLimits tight = limits();
    tight.allBytes = 20;
    FileDepot small(scratch_.path("small"), tight);
    small.add(sumOf("a"), 12, 0, "x", kNow);
    EXPECT_THROW(small.add(sumOf("b"), 12, 0, "x", kNow), DepotError);
    EXPECT_EQ(small.add(sumOf("a"), 12, 1, "y", kNow).have, 2U) << "it has its room";
}

TEST_F(Depot, KnowsNoNamesThatAreNoSums) {
    std::ofstream(scratch_.path("secret")) << "secret";
    for (const char* const name : {"../secret", "", "..", "a/b"}) {
        EXPECT_FALSE(depot.has(name)) << name;
        EXPECT_FALSE(depot.find(name, 6)) << name;
        EXPECT_EQ(depot.read(name, 0, 10), std::nullopt) << name;
        EXPECT_THROW(depot.add(name, 1, 0, "x", kNow), DepotError) << name;
    }
}

TEST_F(Depot, IsForItsOwnerOnly) {
    struct stat found {};
    ASSERT_EQ(::stat(scratch_.path("files").c_str(), &found), 0);
    EXPECT_EQ(found.st_mode & 0777U, 0700U);
    depot.add(sumOf("right"), 5, 0, "right", kNow);
    ASSERT_EQ(::stat(path(sumOf("right")).c_str(), &found), 0);
    EXPECT_EQ(found.st_mode & 0777U, 0600U);
}

TEST_F(Depot, TakesNoMoreThanItMay) {
    DepotLimits tight = limits();
    tight.fileBytes = 10;
    tight.allBytes = 12;
    FileDepot small(scratch_.path("small"), tight);
    EXPECT_THROW(small.add(sumOf("x"), 11, 0, "x", kNow), DepotError);
    small.add(sumOf("0123456789"), 10, 0, "0123456789", kNow);
    EXPECT_THROW(small.add(sumOf("012"), 3, 0, "012", kNow), DepotError);
    EXPECT_TRUE(small.add(sumOf("01"), 2, 0, "01", kNow).isComplete());
}

TEST_F(Depot, LeavesTheDiskRoomForTheDatabase) {
    DepotLimits cautious = limits();
    cautious.freeShare = 1;
    cautious.freeBytes = std::numeric_limits<std::uint64_t>::max();
    FileDepot full(scratch_.path("full"), cautious);
    try {
        full.add(sumOf("x"), 1, 0, "x", kNow);
        FAIL() << "it was taken";
    } catch (const DepotError& error) {
        EXPECT_EQ(error.kind(), DepotError::Kind::Full);
    }
}

TEST_F(Depot, KeepsNoMoreOfALargeDiskThanTheDatabaseNeeds) {
    DepotLimits cautious = limits();
    cautious.freeShare = 1;
    cautious.freeBytes = 1;
    FileDepot large(scratch_.path("large"), cautious);
    EXPECT_TRUE(large.add(sumOf("x"), 1, 0, "x", kNow).isComplete());
}

TEST_F(Depot, ForgetsWhatNobodyHasUsedForDays) {
    depot.add(sumOf("old"), 3, 0, "old", kNow);
    depot.add(sumOf("part"), 4, 0, "p", kNow);
    const timespec longAgo[] = {{1'700'000'000, 0}, {1'700'000'000, 0}};
    for (const std::string& name : {sumOf("old"), sumOf("part") + ".4.part"})
        ASSERT_EQ(::utimensat(AT_FDCWD, path(name).c_str(), longAgo, 0), 0);
    depot.add(sumOf("new"), 3, 0, "new", kNow + std::chrono::hours(2));
    EXPECT_FALSE(depot.has(sumOf("old")));
    EXPECT_FALSE(depot.find(sumOf("part"), 4));
    EXPECT_TRUE(depot.has(sumOf("new")));
}

}  // namespace
