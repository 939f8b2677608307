#include "host/depot/transfers/conversion_probe.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <filesystem>

#include "support/scratch_dir.h"

namespace {

TEST(ConversionProblem, IsNoneWithinOneFileSystem) {
    const ScratchDir scratch;
    EXPECT_EQ(host::conversionProblem(scratch.makeDir("tmp"), scratch.makeDir("depot")), "");
    EXPECT_TRUE(std::filesystem::is_empty(scratch.path("tmp")));
    EXPECT_TRUE(std::filesystem::is_empty(scratch.path("depot")));
}

TEST(ConversionProblem, IsAnotherFileSystem) {
    const ScratchDir scratch;
    const std::string depot = "/dev/shm/zavmgmt-probe-" + std::to_string(::getpid());
    std::filesystem::create_directories(depot);
    EXPECT_EQ(
        host::conversionProblem(scratch.makeDir("tmp"), depot),
        "the depot " + depot + " and " + scratch.path("tmp") + " are on different file systems");
    EXPECT_TRUE(std::filesystem::is_empty(scratch.path("tmp")));
    std::filesystem::remove(depot);
}

TEST(ConversionProblem, IsAMissingDirectory) {
    const ScratchDir scratch;
    EXPECT_EQ(host::conversionProblem(scratch.path("none"), scratch.makeDir("depot")),
              "cannot write to " + scratch.path("none") + ": No such file or directory");
    EXPECT_THAT(host::conversionProblem(scratch.makeDir("tmp"), scratch.path("none")),
                testing::StartsWith("cannot link from "));
    EXPECT_TRUE(std::filesystem::is_empty(scratch.path("tmp")));
}

}  // namespace
