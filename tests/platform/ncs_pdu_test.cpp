#include "ncs/pdu.h"

#include <gtest/gtest.h>

#include <string>

#include "ncs/registry.h"
#include "platform/ncs_packets.h"

namespace {

using namespace ncs_test;

const unsigned char* bytesOf(const std::string& text) {
    return reinterpret_cast<const unsigned char*>(text.data());
}

ncs::HeaderProblem decode(const std::string& packet, ncs::PduHeader& header) {
    return ncs::decodeHeader(bytesOf(packet), packet.size(), header);
}

ncs::HeaderProblem problemOf(const std::string& packet) {
    ncs::PduHeader header;
    return decode(packet, header);
}

class BothOrders : public testing::TestWithParam<bool> {};
INSTANTIATE_TEST_SUITE_P(Callers, BothOrders, testing::Values(true, false));

TEST_P(BothOrders, AHeaderIsRead) {
    const std::string packet = Packet(kRequest, 0x12345678, GetParam(), 0x83).raw("0123").done();
    ncs::PduHeader header;
    ASSERT_EQ(decode(packet, header), ncs::HeaderProblem::None);
    EXPECT_TRUE(header.is(ncs::PduType::Request));
    EXPECT_EQ(header.flags, 0x83);
    EXPECT_EQ(header.littleEndian, GetParam());
    EXPECT_EQ(header.fragmentLength, 20);
    EXPECT_EQ(header.authLength, 0);
    EXPECT_EQ(header.callId, 0x12345678U);
}

TEST_P(BothOrders, ARequestsHeadIsRead) {
    for (const bool hasObject : {false, true}) {
        const std::string packet =
            fragment(hasObject ? 0x83 : 3, 0x0102, "stub", 9, GetParam(), 0x0304, 0x05060708);
        ncs::PduHeader header;
        ASSERT_EQ(decode(packet, header), ncs::HeaderProblem::None);
        EXPECT_EQ(ncs::requestHeadSize(header), hasObject ? 40U : 24U);
        const ncs::RequestHead head = ncs::decodeRequestHead(bytesOf(packet), header);
        EXPECT_EQ(head.allocationHint, 0x05060708U);
        EXPECT_EQ(head.contextId, 0x0304);
        EXPECT_EQ(head.operation, 0x0102);
        EXPECT_EQ(packet.substr(head.size), "stub");
    }
}

TEST_P(BothOrders, ABindIsRead) {
    Context second;
    second.id = 0x0203;
    second.version = 0x00010002;
    second.syntaxVersion = 1;
    const std::string packet = bindPacket({Context{}, second}, GetParam(), kBind, 4280, 0x0A0B0C0D);
    ncs::PduHeader header;
    ncs::BindRequest bind;
    ASSERT_EQ(decode(packet, header), ncs::HeaderProblem::None);
    ASSERT_TRUE(ncs::decodeBind(bytesOf(packet), packet.size(), header, bind));
    EXPECT_EQ(bind.largestSent, 4280);
    EXPECT_EQ(bind.largestTaken, 4280);
    EXPECT_EQ(bind.associationGroup, 0x0A0B0C0DU);
    ASSERT_EQ(bind.contexts.size(), 2U);
    EXPECT_TRUE(ncs::operator==(bind.contexts[0].interface, kEcho));
    EXPECT_EQ(bind.contexts[0].version, 1U);
    EXPECT_TRUE(bind.contexts[0].offersNdr);
    EXPECT_EQ(bind.contexts[1].id, 0x0203);
    EXPECT_EQ(bind.contexts[1].version, 0x00010002U);
    EXPECT_FALSE(bind.contexts[1].offersNdr);
}

TEST_P(BothOrders, ABindThatEndsAnywhereBeforeItsEndIsRefused) {
    const std::string packet = bindPacket({Context{}, Context{}}, GetParam());
    ncs::PduHeader header;
    ASSERT_EQ(decode(packet, header), ncs::HeaderProblem::None);
    for (std::size_t length = 16; length < packet.size(); ++length) {
        // A block of exactly that length, so that the sanitizers see any look behind it.
        const std::vector<unsigned char> part(packet.begin(),
                                              packet.begin() + static_cast<long>(length));
        ncs::BindRequest bind;
        EXPECT_FALSE(ncs::decodeBind(part.data(), part.size(), header, bind)) << length;
    }
}

TEST(Header, FewerThanSixteenBytesAreIncomplete) {
    const std::string packet = bindPacket();
    for (std::size_t length = 0; length < 16; ++length) {
        const std::vector<unsigned char> part(packet.begin(),
                                              packet.begin() + static_cast<long>(length));
        ncs::PduHeader header;
        EXPECT_EQ(ncs::decodeHeader(part.data(), part.size(), header),
                  ncs::HeaderProblem::Incomplete);
    }
}

TEST(Header, VersionsFiveZeroAndFiveOneAreUnderstood) {
    EXPECT_EQ(problemOf(Packet(kBind).poke(1, 1).done()), ncs::HeaderProblem::None);
    EXPECT_EQ(problemOf(Packet(kBind).poke(1, 2).done()), ncs::HeaderProblem::Version);
    EXPECT_EQ(problemOf(Packet(kBind).poke(0, 4).done()), ncs::HeaderProblem::Version);
    EXPECT_EQ(problemOf(std::string(16, '\0')), ncs::HeaderProblem::Version);
}

TEST(Header, OnlyIntegersOfTwoOrdersAndAsciiAreUnderstood) {
    EXPECT_EQ(problemOf(Packet(kBind).poke(4, 0x20).done()), ncs::HeaderProblem::Representation);
    EXPECT_EQ(problemOf(Packet(kBind).poke(4, 0x11).done()), ncs::HeaderProblem::Representation);
    EXPECT_EQ(problemOf(Packet(kBind).poke(5, 3).done()), ncs::HeaderProblem::None);
}

TEST(Header, ALengthThatHoldsNotEvenTheHeaderIsRefused) {
    for (const unsigned length : {0U, 15U}) {
        std::string packet = Packet(kBind).done();
        packet[8] = static_cast<char>(length);
        EXPECT_EQ(problemOf(packet), ncs::HeaderProblem::Length);
    }
    std::string packet = Packet(kBind).u32(0).done();
    packet[10] = 4;
    EXPECT_EQ(problemOf(packet), ncs::HeaderProblem::None);
    packet[10] = 5;
    EXPECT_EQ(problemOf(packet), ncs::HeaderProblem::Length);
}

std::string bytes(std::initializer_list<int> values) {
    std::string out;
    for (const int value : values)
        out += static_cast<char>(value);
    return out;
}

TEST(Encoding, ABindAnswerHasItsBytes) {
    ncs::BindAnswer answer;
    answer.largestSent = 0x1122;
    answer.largestTaken = 0x3344;
    answer.associationGroup = 0x55667788;
    answer.port = "1024";
    answer.results = {ncs::ContextResult::Accepted, ncs::ContextResult::UnknownInterface};
    std::string out = "before";
    ncs::encodeBindAnswer(ncs::PduType::BindAck, 0x01020304, answer, out);
    EXPECT_EQ(
        out,
        "before" + bytes({5,    0,    12,   3,    0x10, 0,    0,    0,    84,   0,    0,    0,
                          4,    3,    2,    1,    0x22, 0x11, 0x44, 0x33, 0x88, 0x77, 0x66, 0x55,
                          5,    0,    '1',  '0',  '2',  '4',  0,    0,    2,    0,    0,    0,
                          0,    0,    0,    0,    0x04, 0x5d, 0x88, 0x8a, 0xeb, 0x1c, 0xc9, 0x11,
                          0x9f, 0xe8, 0x08, 0x00, 0x2b, 0x10, 0x48, 0x60, 2,    0,    0,    0,
                          2,    0,    1,    0,    0,    0,    0,    0,    0,    0,    0,    0,
                          0,    0,    0,    0,    0,    0,    0,    0,    0,    0,    0,    0}));
}

TEST(Encoding, WithoutAPortTheTextIsEmpty) {
    ncs::BindAnswer answer;
    std::string out;
    ncs::encodeBindAnswer(ncs::PduType::AlterContextResponse, 1, answer, out);
    EXPECT_EQ(out, bytes({5, 0, 15, 3, 0x10, 0, 0, 0, 32, 0, 0, 0, 1, 0, 0, 0,
                          0, 0, 0,  0, 0,    0, 0, 0, 0,  0, 0, 0, 0, 0, 0, 0}));
}

TEST(Encoding, ARefusedBindHasItsBytes) {
    std::string out;
    ncs::encodeBindRefusal(1, ncs::BindRefusal::Version, out);
    EXPECT_EQ(out, bytes({5, 0, 13, 3, 0x10, 0, 0, 0, 21, 0, 0, 0, 1, 0, 0, 0, 4, 0, 1, 5, 0}));
}

TEST(Encoding, AFaultHasItsBytes) {
    std::string out;
    ncs::encodeFault(1, 0x0203, 0x1C010003, ncs::kDidNotExecute, out);
    EXPECT_EQ(out, bytes({5, 0, 3, 0x23, 0x10, 0, 0, 0, 32, 0, 0, 0,    1, 0, 0, 0,
                          0, 0, 0, 0,    3,    2, 0, 0, 3,  0, 1, 0x1C, 0, 0, 0, 0}));
}

TEST(Encoding, AResponseIsCutAtMultiplesOfEight) {
    const std::string data(5000, 'd');
    for (const std::size_t length : {0U, 1U, 1408U, 1409U, 2816U, 5000U}) {
        std::string out;
        ncs::encodeResponse(3, 4, bytesOf(data), length, 1432, out);
        const std::vector<Reply> fragments = replies(out);
        EXPECT_EQ(fragments.size(), length == 0 ? 1 : (length + 1407) / 1408);
        EXPECT_EQ(stubOf(fragments), data.substr(0, length));
        for (std::size_t i = 0; i < fragments.size(); ++i) {
            const bool isLast = i + 1 == fragments.size();
            EXPECT_EQ(fragments[i].flags, (i == 0 ? 1 : 0) | (isLast ? 2 : 0));
            EXPECT_TRUE(isLast || fragments[i].stub().size() % 8 == 0);
            EXPECT_EQ(fragments[i].number(0, 4), length - i * 1408);
            EXPECT_EQ(fragments[i].number(4, 2), 4U);
        }
    }
}

}  // namespace
