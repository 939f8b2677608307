#include "ctl/client/transfer/rpc_wire.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstring>

namespace {

using namespace ctl::rpc;
using Bytes = std::vector<unsigned char>;

Bytes bytesOf(const std::string& hex) {
    Bytes bytes;
    for (std::size_t at = 0; at < hex.size(); ++at) {
        if (hex[at] == ' ') continue;
        bytes.push_back(static_cast<unsigned char>(std::stoi(hex.substr(at, 2), nullptr, 16)));
        ++at;
    }
    return bytes;
}

bool parse(const std::string& hex, CommonHeader& header) {
    unsigned char bytes[kCommonHeader] = {};
    const Bytes given = bytesOf(hex);
    std::memcpy(bytes, given.data(), sizeof bytes);
    return parseCommonHeader(bytes, header);
}

TEST(RpcWire, ABindOffersTheInterfaceWithNdr) {
    EXPECT_EQ(bindPacket(1),
              bytesOf("05 00 0b 03 10 00 00 00 48 00 00 00 01 00 00 00"
                      "f8 ff f8 ff 00 00 00 00 01 00 00 00 00 00 01 00"
                      "b3 0f fb b1 c4 03 00 00 02 00 00 09 35 18 3d 00 01 00 00 00"
                      "04 5d 88 8a eb 1c c9 11 9f e8 08 00 2b 10 48 60 02 00 00 00"));
}

TEST(RpcWire, ARequestsHeaderTellsItsLengths) {
    const auto header = requestHeader(0x01020304, kFirstFragment, 0x0506, 0x0A0B0C);
    EXPECT_EQ(Bytes(header.begin(), header.end()),
              bytesOf("05 00 00 01 10 00 00 00 1e 05 00 00 04 03 02 01 0c 0b 0a 00 00 00 00 00"));
}

TEST(RpcWire, TheParametersBeforeTheChunksEndAtAMultipleOfFour) {
    EXPECT_EQ(transferHead("sub\\file", true, 1),
              bytesOf("00 00 00 00 09 00 00 00 00 00 00 00 09 00 00 00 73 75 62 5c 66 69 6c 65 00"
                      "00 00 00 00 00 00 00 01 00 00 00 00 00 00 00 01 00 00 00"));
    EXPECT_EQ(transferHead("abc", false, 250),
              bytesOf("00 00 00 00 04 00 00 00 00 00 00 00 04 00 00 00 61 62 63 00"
                      "00 00 00 00 00 00 00 00 f9 00 00 00 fa 00 00 00"));
    for (std::size_t length = 0; length < 9; ++length) {
        EXPECT_EQ(transferHead(std::string(length, 'n'), true, 1).size() % 4, 0U) << length;
    }
}

TEST(RpcWire, AHeaderIsReadInBothByteOrders) {
    CommonHeader header;
    ASSERT_TRUE(parse("05 00 02 03 10 00 00 00 1c 00 00 00 04 03 02 01", header));
    EXPECT_EQ(header.type, kResponse);
    EXPECT_EQ(header.flags, kFirstFragment | kLastFragment);
    EXPECT_TRUE(header.littleEndian);
    EXPECT_EQ(header.fragmentLength, 28);
    EXPECT_EQ(header.callId, 0x01020304U);
    ASSERT_TRUE(parse("05 00 03 03 00 00 00 00 00 20 00 00 01 02 03 04", header));
    EXPECT_EQ(header.type, kFault);
    EXPECT_FALSE(header.littleEndian);
    EXPECT_EQ(header.fragmentLength, 32);
    EXPECT_EQ(header.callId, 0x01020304U);
}

TEST(RpcWire, AHeaderOfAnotherVersionOrShorterThanItselfIsNone) {
    CommonHeader header;
    EXPECT_FALSE(parse("04 00 02 03 10 00 00 00 1c 00 00 00 01 00 00 00", header));
    EXPECT_FALSE(parse("05 01 02 03 10 00 00 00 1c 00 00 00 01 00 00 00", header));
    EXPECT_FALSE(parse("05 00 02 03 10 00 00 00 0f 00 00 00 01 00 00 00", header));
    EXPECT_FALSE(parse("48 54 54 50 2f 31 2e 31 20 34 30 30 20 42 61 64", header));
}

/// A bind-ack's body with the port "7" or none and the given result.
Bytes bindAck(const std::string& port, const std::string& result, const std::string& sizes) {
    return bytesOf(sizes + "01 00 00 00" + port + "01 00 00 00" + result +
                   "01 00 04 5d 88 8a eb 1c c9 11 9f e8 08 00 2b 10 48 60 02 00 00 00");
}

TEST(RpcWire, ABindAckTellsTheLargestFragmentThatTheHostTakes) {
    const std::string noPort = "00 00 00 00";
    const std::string port = "02 00 37 00";
    const std::string longPort = "06 00 31 32 33 34 35 00";
    for (const std::string& variant : {noPort, port, longPort}) {
        std::uint16_t largest = 0;
        EXPECT_TRUE(parseBindAck(bindAck(variant, "00 00", "10 10 b8 0b"), true, largest));
        EXPECT_EQ(largest, 3000);
        EXPECT_FALSE(parseBindAck(bindAck(variant, "02 00", "10 10 b8 0b"), true, largest))
            << "rejected";
    }
}

TEST(RpcWire, ABindAckThatLeavesNoRoomForDataOrIsCutShortAcceptsNothing) {
    std::uint16_t largest = 0;
    EXPECT_FALSE(parseBindAck(bindAck("00 00 00 00", "00 00", "10 10 18 00"), true, largest));
    const Bytes whole = bindAck("00 00 00 00", "00 00", "10 10 b8 0b");
    const std::size_t upToResult = 18;
    for (std::size_t length = 0; length < upToResult; ++length) {
        const Bytes cut(whole.begin(), whole.begin() + static_cast<std::ptrdiff_t>(length));
        EXPECT_FALSE(parseBindAck(cut, true, largest)) << length;
    }
    Bytes hugePort = whole;
    hugePort[8] = hugePort[9] = 0xFF;
    EXPECT_FALSE(parseBindAck(hugePort, true, largest));
    Bytes noResult = whole;
    noResult[12] = 0;
    EXPECT_FALSE(parseBindAck(noResult, true, largest));
}

}  // namespace
