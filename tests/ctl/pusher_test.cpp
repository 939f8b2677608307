#include "ctl/client/pusher.h"

#include <gtest/gtest.h>

namespace {

using ctl::PushedFile;
using ctl::statusText;

TEST(StatusText, SaysEachStatusInWords) {
    EXPECT_EQ(statusText({0, 0}), "done");
    EXPECT_EQ(statusText({1, 0}), "the host has no usable depot directory");
    EXPECT_EQ(statusText({2, 0}), "the host answered with status 2");
    EXPECT_EQ(statusText({3, 0}), "the name is too long");
    EXPECT_EQ(statusText({4, 0}), "the host could not open the file");
    EXPECT_EQ(statusText({5, 0}), "the host could not write the file");
    EXPECT_EQ(statusText({6, 0}), "the host could not make the file's directory");
    EXPECT_EQ(statusText({-1, 0}), "the host answered with status -1");
    EXPECT_EQ(statusText({0, 0x1C00001B}), "the host is short of memory");
}

TEST(PushedFile, IsTakenWithoutAStatusOrAFault) {
    PushedFile file;
    EXPECT_TRUE(ctl::wasTaken(file));
    file.worst = {4, 0};
    EXPECT_FALSE(ctl::wasTaken(file));
    file.worst = {0, 0x000006F7};
    EXPECT_FALSE(ctl::wasTaken(file));
}

TEST(BytesText, ChoosesTheUnit) {
    EXPECT_EQ(ctl::bytesText(0), "0 B");
    EXPECT_EQ(ctl::bytesText(999), "999 B");
    EXPECT_EQ(ctl::bytesText(1000), "1.0 kB");
    EXPECT_EQ(ctl::bytesText(12'345'678), "12.3 MB");
    EXPECT_EQ(ctl::bytesText(5e15), "5000.0 TB");
}

}  // namespace
