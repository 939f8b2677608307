#include "ctl/client/whole_file.h"

#include <fcntl.h>
#include <gtest/gtest.h>

#include "ctl/client/chunks.h"
#include "ctl/client/failure.h"
#include "support/scratch_dir.h"

namespace {

using ctl_test::Descriptor;

TEST(WholeFile, IsReadByteForByte) {
    const ScratchDir scratch;
    for (const std::size_t size : {0U, 1U, 16384U, 16385U, 100'000U}) {
        std::string content = ctl_test::pattern(size);
        if (size > 2) content[1] = '\0';
        EXPECT_TRUE(ctl::readFile(scratch.write("file", content)) == content) << size;
    }
}

TEST(WholeFile, ThatCannotBeReadIsWrongUsageAndIsNamed) {
    const ScratchDir scratch;
    scratch.makeDir("folder");
    for (const std::string& path : {scratch.path("none"), scratch.path("folder")}) {
        try {
            ctl::readFile(path);
            ADD_FAILURE() << path;
        } catch (const ctl::Failure& failure) {
            EXPECT_EQ(failure.status(), ctl::kWrongUsage);
            EXPECT_EQ(failure.what(), "cannot read " + path);
        }
    }
}

TEST(WholeFile, IsWrittenToADescriptor) {
    const ScratchDir scratch;
    const std::string path = scratch.path("file");
    const std::string content = ctl_test::pattern(100'000);
    {
        const Descriptor file(::open(path.c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0600));
        EXPECT_TRUE(ctl::writeDescriptor(file.get(), content));
    }
    EXPECT_TRUE(ctl::readFile(path) == content);
}

TEST(WholeFile, ThatCannotBeWrittenIsNoSuccess) {
    const Descriptor full(::open("/dev/full", O_WRONLY | O_CLOEXEC));
    EXPECT_FALSE(ctl::writeDescriptor(full.get(), "x"));
}

}  // namespace
