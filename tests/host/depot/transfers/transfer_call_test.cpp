#include "host/depot/transfers/transfer_call.h"

#include <gtest/gtest.h>

#include "host/depot/transfers/transfer_parameters.h"

namespace {

using host_test::Parameters;

TEST(TransferCall, IsReadInBothByteOrders) {
    for (const bool little : {true, false}) {
        Parameters given;
        given.name = "sub\\file";
        given.littleEndian = little;
        const auto read = host::readTransferCall(given.call());
        ASSERT_TRUE(read) << little;
        EXPECT_EQ(read->name, "sub\\file");
        EXPECT_TRUE(read->startsFile);
        EXPECT_TRUE(read->endsFile);
    }
}

TEST(TransferCall, StartsAFileWithOneOnly) {
    Parameters given;
    for (const unsigned firstBatch : {0U, 2U, 0x01000000U}) {
        given.firstBatch = firstBatch;
        EXPECT_FALSE(host::readTransferCall(given.call())->startsFile);
    }
}

TEST(TransferCall, EndsAFileWhenTheLastChunkHasRoomLeft) {
    Parameters given;
    given.chunks = {4096, 4096, 4096};
    EXPECT_FALSE(host::readTransferCall(given.call())->endsFile);
    given.chunks = {4096, 4096, 4095};
    EXPECT_TRUE(host::readTransferCall(given.call())->endsFile);
    given.lastIndex = 1;
    EXPECT_FALSE(host::readTransferCall(given.call())->endsFile) << "the third is not written";
}

TEST(TransferCall, HasTheBytesOfAllChunksThatAreWritten) {
    Parameters given;
    given.chunks = {4096, 4096, 5};
    EXPECT_EQ(host::readTransferCall(given.call())->bytes, 8197U);
    given.lastIndex = 1;
    EXPECT_EQ(host::readTransferCall(given.call())->bytes, 8192U) << "the third is not written";
    given.chunks = {0xFFFFFFFF};
    given.lastIndex = 0;
    EXPECT_EQ(host::readTransferCall(given.call())->bytes, 4096U) << "no chunk holds more";
}

TEST(TransferCall, HasANameUpToItsFirstZero) {
    Parameters given;
    given.name = std::string("safe\0unsafe", 11);
    EXPECT_EQ(host::readTransferCall(given.call())->name, "safe");
}

TEST(TransferCall, IsNotReadWhenAnythingIsMissing) {
    Parameters given;
    given.chunks = {4096, 1};
    const std::string whole = given.bytes();
    for (std::size_t length = 0; length < whole.size(); length += length < 60 ? 1 : 97) {
        ncs::Call call = given.call();
        call.length = length;
        EXPECT_FALSE(host::readTransferCall(call)) << length;
    }
    given.lastIndex = 2;
    EXPECT_FALSE(host::readTransferCall(given.call()));
    given.lastIndex = 0xFFFFFFFF;
    EXPECT_FALSE(host::readTransferCall(given.call()));
}

TEST(TransferCall, IsTheOneOperationOfItsInterface) {
    ncs::Call call;
    call.interface = "QVS_Agent_v1";
    EXPECT_TRUE(host::isTransfer(call));
    call.operation = 1;
    EXPECT_FALSE(host::isTransfer(call));
    call.operation = 0;
    call.interface = "another";
    EXPECT_FALSE(host::isTransfer(call));
}

TEST(TransferReply, HoldsTheStatus) {
    EXPECT_EQ(host::transferReply(6), std::string("\6\0\0\0", 4));
    EXPECT_EQ(host::statusOfReply(host::transferReply(5)), 5);
    EXPECT_EQ(host::statusOfReply(""), -1);
}

}  // namespace
