#include "ctl/show/transfers/transfer_status.h"

#include <gtest/gtest.h>

namespace {

using ctl::statusText;

TEST(TransferStatus, IsSaidInWords) {
    EXPECT_EQ(statusText({0, 0}), "done");
    EXPECT_EQ(statusText({1, 0}), "the host has no usable depot directory");
    EXPECT_EQ(statusText({2, 0}), "the host answered with status 2");
    EXPECT_EQ(statusText({3, 0}), "the name is too long");
    EXPECT_EQ(statusText({4, 0}), "the host could not open the file");
    EXPECT_EQ(statusText({5, 0}), "the host could not write the file");
    EXPECT_EQ(statusText({6, 0}), "the host could not make the file's directory");
    EXPECT_EQ(statusText({-1, 0}), "the host answered with status -1");
}

TEST(TransferStatus, OfACallThatFailedIsItsFault) {
    EXPECT_EQ(statusText({0, 0x000006F7}), "the host could not make sense of the request");
    EXPECT_EQ(statusText({0, 0x1C010002}), "the host does not know the operation");
    EXPECT_EQ(statusText({0, 0x1C010003}), "the host does not offer file transfer");
    EXPECT_EQ(statusText({4, 0x1C00001B}), "the host is short of memory");
    EXPECT_EQ(statusText({0, 0x1C000012}), "the host answered with fault 0x1C000012");
}

}  // namespace
