#include "fleet/link/files/spool.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <chrono>
#include <fstream>
#include <string>

#include "fleet/bus/trust/checksum.h"
#include "fleet/files/file_error.h"
#include "tests/support/scratch_dir.h"

namespace {

using fleet::Spool;
using fleet::wallClock;

std::string sumOf(const std::string& bytes) {
    fleet::Checksum sum;
    sum.add(bytes);
    return sum.hex();
}

class SpoolOfFiles : public testing::Test {
protected:
    Spool spool() const { return Spool(scratch_.path("spool"), wallClock()); }
    static std::string contentOf(const std::string& path) {
        std::ifstream in(path);
        return {std::istreambuf_iterator<char>(in), {}};
    }

    ScratchDir scratch_;
};

TEST_F(SpoolOfFiles, HasWhatCameInPiecesAlsoAfterARestart) {
    const std::string sum = sumOf("one two");
    Spool first = spool();
    first.append(sum, "one");
    EXPECT_FALSE(first.has(sum));
    Spool again = spool();
    EXPECT_EQ(again.partOf(sum), 3U);
    again.append(sum, " two");
    EXPECT_TRUE(again.complete(sum));
    EXPECT_TRUE(again.has(sum));
    EXPECT_EQ(contentOf(again.pathOf(sum)), "one two");
    again.forget(sum);
    EXPECT_FALSE(again.has(sum));
}

TEST_F(SpoolOfFiles, ForgetsWhatHasAnotherSum) {
    Spool here = spool();
    here.append(sumOf("right"), "wrong");
    EXPECT_FALSE(here.complete(sumOf("right")));
    EXPECT_EQ(here.partOf(sumOf("right")), 0U);
    EXPECT_FALSE(here.has(sumOf("right")));
}

TEST_F(SpoolOfFiles, TakesAnEmptyFile) {
    Spool here = spool();
    EXPECT_TRUE(here.complete(sumOf("")));
    EXPECT_TRUE(here.has(sumOf("")));
}

TEST_F(SpoolOfFiles, IsForItsOwnerOnly) {
    Spool here = spool();
    struct stat found {};
    ASSERT_EQ(::stat(scratch_.path("spool").c_str(), &found), 0);
    EXPECT_EQ(found.st_mode & 0777U, 0700U);
}

TEST_F(SpoolOfFiles, FollowsNoLink) {
    Spool here = spool();
    const std::string sum = sumOf("right");
    ASSERT_EQ(::symlink(scratch_.path("elsewhere").c_str(), (here.pathOf(sum) + ".part").c_str()),
              0);
    EXPECT_THROW(here.append(sum, "right"), fleet::FileError);
}

TEST_F(SpoolOfFiles, ForgetsWhatWasLeftForDays) {
    const std::string sum = sumOf("old");
    spool().append(sum, "old");
    const timespec longAgo[] = {{1'700'000'000, 0}, {1'700'000'000, 0}};
    ASSERT_EQ(::utimensat(AT_FDCWD, (spool().pathOf(sum) + ".part").c_str(), longAgo, 0), 0);
    EXPECT_EQ(spool().partOf(sum), 0U);
}

}  // namespace
