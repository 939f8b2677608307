#include "ncs/association.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <memory>
#include <optional>
#include <random>
#include <stdexcept>
#include <string>
#include <vector>

#include "ncs/memory.h"
#include "platform/ncs_packets.h"
#include "support/trace_capture.h"

namespace {

using namespace ncs_test;

constexpr std::size_t kLimit = 100'000;

/// Feeds an association by way of its windows and collects what it says.
class Wire {
public:
    explicit Wire(std::size_t limit = kLimit, std::size_t budget = 10 * kLimit,
                  ncs::CallWatch* watch = nullptr)
        : shared(limit, budget, watch),
          association(std::make_unique<ncs::Association>(shared, "")) {}

    /// Portions of at most `size` bytes; stops when the association ends.
    void feed(const std::string& bytes, std::size_t size = static_cast<std::size_t>(-1)) {
        for (std::size_t at = 0; at < bytes.size() && association->isOpen();) {
            at += put(bytes.substr(at, size));
            takeOutput();
        }
    }
    std::vector<Reply> answers() {
        std::vector<Reply> found = replies(output);
        output.clear();
        return found;
    }
    std::vector<Reply> ask(const std::string& bytes) {
        feed(bytes);
        return answers();
    }

    ncs::SharedState shared;
    std::unique_ptr<ncs::Association> association;
    std::string output;

private:
    std::size_t put(const std::string& portion) {
        iovec ranges[2];
        const int count = association->windows(ranges);
        std::size_t done = 0;
        for (int i = 0; i < count; ++i) {
            const std::size_t part = std::min(portion.size() - done, ranges[i].iov_len);
            if (part > 0) std::memcpy(ranges[i].iov_base, portion.data() + done, part);
            done += part;
        }
        association->received(done);
        return done;
    }
    void takeOutput() {
        while (!association->output().empty()) {
            output += association->output();
            association->output().clear();
            association->handle();
        }
    }
};

class AnAssociation : public testing::Test {
protected:
    AnAssociation() {
        registerEcho();
        callsOfRepeat() = 0;
    }
    void bind() {
        const std::vector<Reply> answers = wire.ask(bindPacket());
        ASSERT_EQ(answers.size(), 1U);
        ASSERT_EQ(answers[0].type, kBindAck);
        ASSERT_EQ(answers[0].number(16, 2), 0U);
    }
    bool isOpen() const { return wire.association->isOpen(); }

    Wire wire;
};

/// Result and reason of the n-th context in an answer without a port.
std::pair<unsigned, unsigned> resultOf(const Reply& answer, std::size_t n) {
    return {answer.number(16 + 24 * n, 2), answer.number(18 + 24 * n, 2)};
}

using Result = std::pair<unsigned, unsigned>;

TEST_F(AnAssociation, AcceptsAKnownInterfaceWithNdr) {
    for (const bool little : {true, false}) {
        Wire fresh;
        const std::vector<Reply> answers = fresh.ask(bindPacket({Context{}}, little, kBind, 4280));
        ASSERT_EQ(answers.size(), 1U);
        EXPECT_EQ(answers[0].type, kBindAck);
        EXPECT_EQ(answers[0].flags, 3);
        EXPECT_EQ(answers[0].callId, 7U);
        EXPECT_EQ(answers[0].number(0, 2), 4280U);
        EXPECT_EQ(answers[0].number(2, 2), 4280U);
        EXPECT_NE(answers[0].number(4, 4), 0U);
        EXPECT_EQ(answers[0].number(12, 1), 1U);
        EXPECT_EQ(resultOf(answers[0], 0), Result(0, 0));
        EXPECT_TRUE(fresh.association->isBound());
    }
}

TEST_F(AnAssociation, KeepsTheGroupThatAClientNames) {
    EXPECT_EQ(wire.ask(bindPacket({Context{}}, true, kBind, 4280, 0xABCD))[0].number(4, 4),
              0xABCDU);
}

TEST_F(AnAssociation, SaysWhyItRejectsAContext) {
    Context unknown, wrongVersion, wrongMinor, wrongSyntax, oldSyntax;
    unknown.interface = kUnknown;
    wrongVersion.version = 2;
    wrongMinor.version = 0x00010001;
    wrongSyntax.syntax = kEcho;
    oldSyntax.syntaxVersion = 1;
    const std::vector<Reply> answers = wire.ask(
        bindPacket({unknown, wrongVersion, wrongMinor, wrongSyntax, oldSyntax, Context{}}));
    ASSERT_EQ(answers.size(), 1U);
    EXPECT_EQ(resultOf(answers[0], 0), Result(2, 1));
    EXPECT_EQ(resultOf(answers[0], 1), Result(2, 1));
    EXPECT_EQ(resultOf(answers[0], 2), Result(2, 1));
    EXPECT_EQ(resultOf(answers[0], 3), Result(2, 2));
    EXPECT_EQ(resultOf(answers[0], 4), Result(2, 2));
    EXPECT_EQ(resultOf(answers[0], 5), Result(0, 0));
    EXPECT_TRUE(isOpen());
}

TEST_F(AnAssociation, FindsNdrAmongSeveralTransferSyntaxes) {
    Packet packet(kBind, 1);
    packet.u16(4280).u16(4280).u32(0).u8(1).u8(0).u16(0);
    packet.u16(0).u8(2).u8(0).id(kEcho).u32(1).id(kEcho).u32(1).id(kNdr).u32(2);
    EXPECT_EQ(resultOf(wire.ask(packet.done())[0], 0), Result(0, 0));
}

TEST_F(AnAssociation, HasALimitOfContexts) {
    std::vector<Context> many(40);
    for (std::uint16_t i = 0; i < 40; ++i)
        many[i].id = i;
    const std::vector<Reply> answers = wire.ask(bindPacket(many));
    EXPECT_EQ(resultOf(answers[0], 31), Result(0, 0));
    EXPECT_EQ(resultOf(answers[0], 32), Result(2, 3));
    EXPECT_TRUE(isOpen());
}

TEST_F(AnAssociation, KeepsFragmentsBetweenWhatAllTakeAndWhatFits) {
    EXPECT_EQ(wire.ask(bindPacket({Context{}}, true, kBind, 10))[0].number(0, 2), 1432U);
    Wire other;
    EXPECT_EQ(other.ask(bindPacket({Context{}}, true, kBind, 65535))[0].number(2, 2), 65528U);
}

TEST_F(AnAssociation, RefusesABindOfAnotherVersion) {
    std::string packet = bindPacket();
    packet[1] = 2;
    const std::vector<Reply> answers = wire.ask(packet);
    ASSERT_EQ(answers.size(), 1U);
    EXPECT_EQ(answers[0].type, kBindNak);
    EXPECT_EQ(answers[0].number(0, 2), 4U);
    EXPECT_FALSE(isOpen());
}

TEST_F(AnAssociation, RefusesAuthentication) {
    std::string packet = Packet(kBind).raw(bindPacket().substr(16)).raw("12345678AUTH").done();
    packet[10] = 4;
    const std::vector<Reply> answers = wire.ask(packet);
    ASSERT_EQ(answers.size(), 1U);
    EXPECT_EQ(answers[0].type, kBindNak);
    EXPECT_EQ(answers[0].number(0, 2), 8U);
    EXPECT_FALSE(isOpen());
}

TEST_F(AnAssociation, RefusesABindInPiecesASecondBindAndOneThatHoldsTooLittle) {
    std::string first = bindPacket();
    first[3] = 1;
    EXPECT_EQ(wire.ask(first)[0].type, kBindNak);
    EXPECT_FALSE(isOpen());

    Wire second;
    second.feed(bindPacket());
    second.answers();
    EXPECT_EQ(second.ask(bindPacket())[0].type, kBindNak);
    EXPECT_FALSE(second.association->isOpen());

    Wire third;
    EXPECT_EQ(third.ask(Packet(kBind).u32(0).done())[0].type, kBindNak);
    EXPECT_FALSE(third.association->isOpen());
}

TEST_F(AnAssociation, AnswersACall) {
    bind();
    for (const bool little : {true, false}) {
        const std::vector<Reply> answers =
            wire.ask(requestPackets(kRepeat, "stub data", 65504, 0x01020304, little));
        ASSERT_EQ(answers.size(), 1U);
        EXPECT_EQ(answers[0].type, kResponse);
        EXPECT_EQ(answers[0].flags, 3);
        EXPECT_EQ(answers[0].callId, 0x01020304U);
        EXPECT_EQ(answers[0].number(0, 4), 9U);
        EXPECT_EQ(answers[0].stub(), "stub data");
    }
    EXPECT_EQ(wire.shared.calls, 2U);
    EXPECT_EQ(wire.association->requestsDone(), 2U);
}

TEST_F(AnAssociation, TellsTheStubTheCallersByteOrderManagerAndHandle) {
    bind();
    EXPECT_EQ(wire.ask(fragment(3, kOrder, "", 1, true))[0].stub(), std::string("\1\1\1"));
    EXPECT_EQ(wire.ask(fragment(3, kOrder, "", 1, false))[0].stub(), std::string("\0\1\1", 3));
}

TEST_F(AnAssociation, TakesNoNoticeOfAnObject) {
    bind();
    EXPECT_EQ(wire.ask(fragment(0x83, kRepeat, "abc"))[0].stub(), "abc");
}

TEST_F(AnAssociation, PutsFragmentsTogetherWhereverTheyAreCut) {
    bind();
    const std::string stub = "The quick brown fox jumps over the lazy dog";
    for (std::size_t part = 1; part <= stub.size(); ++part) {
        for (const std::size_t portion : {1U, 7U, 24U, 25U, 1000U}) {
            wire.feed(requestPackets(kRepeat, stub, part), portion);
            const std::vector<Reply> answers = wire.answers();
            ASSERT_EQ(answers.size(), 1U) << part << " " << portion;
            EXPECT_EQ(answers[0].stub(), stub) << part << " " << portion;
        }
    }
}

TEST_F(AnAssociation, TakesLargeRequestsInPortionsOfAnySize) {
    bind();
    std::string stub(60'000, '\0');
    for (std::size_t i = 0; i < stub.size(); ++i)
        stub[i] = static_cast<char>(i * 31 / 7);
    for (const std::size_t part : {1408U, 5816U, 20'000U, 60'000U}) {
        for (const std::size_t portion : {999U, 8192U, 8193U, 65'536U, 1'000'000U}) {
            wire.feed(requestPackets(kRepeat, stub, part), portion);
            EXPECT_EQ(stubOf(wire.answers()), stub) << part << " " << portion;
        }
    }
}

TEST_F(AnAssociation, AnswersRequestsThatComeOneBehindTheOther) {
    bind();
    std::string packets;
    for (std::uint32_t i = 0; i < 500; ++i) {
        packets += requestPackets(kRepeat, std::to_string(i), 2, i);
    }
    for (const std::size_t portion : {1U, 100U, 100'000U}) {
        wire.feed(packets, portion);
        const std::vector<Reply> answers = wire.answers();
        ASSERT_EQ(answers.size(), 500U);
        for (std::uint32_t i = 0; i < 500; ++i) {
            EXPECT_EQ(answers[i].callId, i);
            EXPECT_EQ(answers[i].stub(), std::to_string(i));
        }
    }
}

TEST_F(AnAssociation, EmptyFragmentsAndAnEmptyRequestAreGood) {
    bind();
    EXPECT_EQ(wire.ask(fragment(3, kRepeat, ""))[0].stub(), "");
    EXPECT_EQ(wire.ask(fragment(1, kRepeat, "") + fragment(0, kRepeat, "ab") +
                       fragment(0, kRepeat, "") + fragment(2, kRepeat, ""))[0]
                  .stub(),
              "ab");
}

TEST_F(AnAssociation, AnAllocationHintIsOnlyAHint) {
    bind();
    for (const std::uint32_t hint : {0U, 1U, 3U, 1000U, 0xFFFFFFFFU}) {
        EXPECT_EQ(wire.ask(fragment(1, kRepeat, "a", 1, true, 0, hint) +
                           fragment(2, kRepeat, "bc", 1, true, 0, hint))[0]
                      .stub(),
                  "abc");
    }
}

TEST_F(AnAssociation, NoTruncatedRequestIsAnsweredOrCalled) {
    const std::string request = requestPackets(kRepeat, "0123456789abcdefghijklmnop", 10);
    for (std::size_t length = 0; length < request.size(); ++length) {
        Wire fresh;
        fresh.feed(bindPacket());
        fresh.answers();
        fresh.feed(request.substr(0, length));
        EXPECT_TRUE(fresh.answers().empty()) << length;
        EXPECT_EQ(fresh.association->isMidRequest(), length > 0) << length;
        EXPECT_EQ(callsOfRepeat(), 0) << length;
    }
}

TEST_F(AnAssociation, NoTruncatedBindIsAnswered) {
    const std::string packet = bindPacket();
    for (std::size_t length = 0; length < packet.size(); ++length) {
        Wire fresh;
        fresh.feed(packet.substr(0, length));
        EXPECT_TRUE(fresh.answers().empty()) << length;
        EXPECT_FALSE(fresh.association->isBound());
    }
}

TEST_F(AnAssociation, ARequestOfExactlyTheLimitPassesAndOneByteMoreIsAFault) {
    bind();
    EXPECT_EQ(stubOf(wire.ask(requestPackets(kRepeat, std::string(kLimit, 'x')))).size(), 65'536U);
    const std::vector<Reply> answers =
        wire.ask(requestPackets(kRepeat, std::string(kLimit + 1, 'x')));
    ASSERT_EQ(answers.size(), 1U);
    EXPECT_EQ(answers[0].type, kFault);
    EXPECT_EQ(answers[0].fault(), 0x1C00001BU);
    EXPECT_EQ(answers[0].flags, 0x23);
    EXPECT_EQ(callsOfRepeat(), 1);
    EXPECT_EQ(wire.ask(requestPackets(kRepeat, "next"))[0].stub(), "next");
}

TEST_F(AnAssociation, WithoutMemoryForAllACallIsAFaultAndLaterOnesPass) {
    Wire poor(kLimit, 50'000);
    poor.feed(bindPacket());
    poor.answers();
    EXPECT_EQ(poor.ask(requestPackets(kRepeat, std::string(50'001, 'x')))[0].fault(), 0x1C00001BU);
    EXPECT_EQ(stubOf(poor.ask(requestPackets(kRepeat, std::string(50'000, 'x')))).size(), 50'000U);
}

TEST_F(AnAssociation, GivesMemoryBackWhenItEndsInTheMiddleOfARequest) {
    {
        Wire rich(kLimit, kLimit);
        rich.feed(bindPacket());
        rich.feed(fragment(1, kRepeat, std::string(60'000, 'x')));
        EXPECT_FALSE(rich.shared.memory.take(kLimit));
        rich.association.reset();
        EXPECT_TRUE(rich.shared.memory.take(kLimit));
    }
}

TEST_F(AnAssociation, FaultsLeaveTheAssociationUsable) {
    bind();
    struct Case {
        std::string request;
        std::uint32_t fault;
        int flags;
    };
    const Case cases[] = {
        {fragment(3, kRepeat, "x", 5, true, 9), 0x1C010003, 0x23},
        {fragment(3, kOperations, "x", 5), 0x1C010002, 0x23},
        {fragment(3, 0xFFFF, std::string(50'000, 'x'), 5), 0x1C010002, 0x23},
        {fragment(3, kRefuse, "x", 5), 0x000006F7, 3},
        {fragment(3, kThrow, "x", 5), 0x1C000012, 3},
        {fragment(3, kOverfill, "x", 5), 0x1C000012, 3},
        {requestPackets(kRefuse, std::string(3000, 'x'), 100, 5), 0x000006F7, 3},
    };
    for (const Case& c : cases) {
        for (const std::size_t portion : {1U, 100'000U}) {
            wire.feed(c.request, portion);
            const std::vector<Reply> answers = wire.answers();
            ASSERT_EQ(answers.size(), 1U);
            EXPECT_EQ(answers[0].type, kFault);
            EXPECT_EQ(answers[0].fault(), c.fault);
            EXPECT_EQ(answers[0].flags, c.flags);
            EXPECT_EQ(answers[0].callId, 5U);
            EXPECT_TRUE(isOpen());
        }
    }
    EXPECT_EQ(wire.ask(requestPackets(kRepeat, "good"))[0].stub(), "good");
}

TEST_F(AnAssociation, RejectedContextsCannotBeCalled) {
    Context unknown;
    unknown.interface = kUnknown;
    wire.feed(bindPacket({unknown}));
    wire.answers();
    EXPECT_EQ(wire.ask(fragment(3, kRepeat, "x"))[0].fault(), 0x1C010003U);
}

TEST_F(AnAssociation, AlterContextAddsContexts) {
    bind();
    Context second;
    second.id = 5;
    EXPECT_EQ(wire.ask(fragment(3, kRepeat, "x", 1, true, 5))[0].fault(), 0x1C010003U);
    const std::vector<Reply> answers = wire.ask(bindPacket({second}, true, kAlter));
    ASSERT_EQ(answers.size(), 1U);
    EXPECT_EQ(answers[0].type, kAlterResponse);
    EXPECT_EQ(resultOf(answers[0], 0), Result(0, 0));
    EXPECT_EQ(wire.ask(fragment(3, kRepeat, "x", 1, true, 5))[0].stub(), "x");
    EXPECT_EQ(wire.ask(fragment(3, kRepeat, "y"))[0].stub(), "y");
}

TEST_F(AnAssociation, LargeRepliesComeInFragments) {
    wire.feed(bindPacket({Context{}}, true, kBind, 1432));
    wire.answers();
    const std::vector<Reply> answers = wire.ask(fragment(3, kFill, ""));
    EXPECT_EQ(answers.size(), (65'536U + 1407) / 1408);
    EXPECT_EQ(stubOf(answers), std::string(65'536, 'f'));
}

TEST_F(AnAssociation, WaitsWithRequestsWhileItsAnswersAreNotTaken) {
    bind();
    std::string packets;
    for (std::uint32_t i = 0; i < 100; ++i)
        packets += fragment(3, kFill, "", i);
    iovec ranges[2];
    wire.association->windows(ranges);
    ASSERT_GE(ranges[0].iov_len, packets.size());
    std::memcpy(ranges[0].iov_base, packets.data(), packets.size());
    wire.association->received(packets.size());
    EXPECT_LT(wire.association->output().size(), 400'000U);
    std::size_t answered = 0;
    while (!wire.association->output().empty()) {
        for (const Reply& reply : replies(wire.association->output())) {
            answered += (reply.flags & 2) != 0 ? 1 : 0;
        }
        wire.association->output().clear();
        wire.association->handle();
    }
    EXPECT_EQ(answered, 100U);
}

TEST_F(AnAssociation, ACallerThatWantsNoAnswerGetsNone) {
    bind();
    EXPECT_TRUE(wire.ask(fragment(0x43, kRepeat, "x")).empty());
    EXPECT_EQ(callsOfRepeat(), 1);
    EXPECT_TRUE(wire.ask(fragment(0x43, kRefuse, "x")).empty());
    EXPECT_TRUE(isOpen());
}

TEST_F(AnAssociation, CancelsComeTooLateAndAreIgnored) {
    bind();
    EXPECT_TRUE(wire.ask(Packet(kCancel).done()).empty());
    EXPECT_EQ(
        wire.ask(fragment(1, kRepeat, "a") + Packet(kCancel).done() + fragment(2, kRepeat, "b"))[0]
            .stub(),
        "ab");
}

TEST_F(AnAssociation, AnOrphanedCallIsForgotten) {
    bind();
    EXPECT_TRUE(wire.ask(fragment(1, kRepeat, "a", 4) + Packet(kOrphaned, 4).done()).empty());
    EXPECT_EQ(callsOfRepeat(), 0);
    EXPECT_EQ(wire.ask(fragment(3, kRepeat, "b", 5))[0].stub(), "b");
    EXPECT_TRUE(wire.ask(Packet(kOrphaned, 5).done()).empty());
    EXPECT_EQ(wire.ask(fragment(1, kRepeat, "a", 6) + Packet(kOrphaned, 5).done() +
                       fragment(2, kRepeat, "b", 6))[0]
                  .stub(),
              "ab");
}

TEST_F(AnAssociation, WhatBreaksTheProtocolGetsAFaultAndTheEnd) {
    const std::string bound = bindPacket();
    std::string withAuth = fragment(3, kRepeat, "12345678");
    withAuth[10] = 4;
    std::string tooShort = fragment(3, kRepeat, "");
    tooShort[8] = 23;
    std::string noHeader = fragment(3, kRepeat, "");
    noHeader[8] = 15;
    std::string ebcdic = fragment(3, kRepeat, "");
    ebcdic[4] = 0x11;
    std::string longControl = Packet(kCancel).raw(std::string(9000, 'x')).done();
    std::string objectTooShort = fragment(3, kRepeat, "");
    objectTooShort[3] = static_cast<char>(0x83);
    const std::string cases[] = {
        bound + fragment(0, kRepeat, "x"),
        bound + fragment(2, kRepeat, "x"),
        bound + fragment(1, kRepeat, "x") + fragment(1, kRepeat, "x"),
        bound + fragment(1, kRepeat, "x", 1) + fragment(2, kRepeat, "x", 2),
        bound + fragment(1, kRepeat, "x") + fragment(2, kOrder, "x"),
        bound + fragment(1, kRepeat, "x", 1, true) + fragment(2, kRepeat, "x", 1, false),
        bound + fragment(1, kRepeat, "x", 1, true, 0) + fragment(2, kRepeat, "x", 1, true, 1),
        bound + fragment(1, kRepeat, "x") + bindPacket({Context{}}, true, kAlter),
        bound + withAuth,
        bound + tooShort,
        bound + noHeader,
        bound + ebcdic,
        bound + longControl,
        bound + objectTooShort,
        bound + Packet(kAlter).u32(0).done(),
        bound + Packet(kResponse).u32(0).done(),
        bound + Packet(kFault).u32(0).done(),
        bound + Packet(kBindAck).u32(0).done(),
        bound + Packet(kBindNak).u32(0).done(),
        bound + Packet(kAlterResponse).u32(0).done(),
        bound + Packet(kAuth3).u32(0).done(),
        bound + Packet(kShutdown).done(),
        bound + Packet(1).done(),
        bound + Packet(255).done(),
        fragment(3, kRepeat, "x"),
        bindPacket({Context{}}, true, kAlter),
    };
    int number = 0;
    for (const std::string& c : cases) {
        for (const std::size_t portion : {1U, 100'000U}) {
            Wire fresh;
            fresh.feed(c, portion);
            const std::vector<Reply> answers = fresh.answers();
            ASSERT_FALSE(answers.empty()) << number;
            EXPECT_EQ(answers.back().type, kFault) << number;
            EXPECT_EQ(answers.back().fault(), 0x1C01000BU) << number;
            EXPECT_FALSE(fresh.association->isOpen()) << number;
        }
        ++number;
    }
    EXPECT_EQ(callsOfRepeat(), 0);
}

TEST_F(AnAssociation, WhatIsNoPacketAtAllGetsNothing) {
    EXPECT_TRUE(wire.ask("GET / HTTP/1.1\r\n\r\n").empty());
    EXPECT_FALSE(isOpen());
}

TEST_F(AnAssociation, ControlPacketsStandBetweenFragmentsOfACall) {
    bind();
    const std::string head(60'000, 'h');
    wire.feed(fragment(1, kRepeat, head) + Packet(kCancel).done() + fragment(2, kRepeat, "t"), 777);
    EXPECT_EQ(stubOf(wire.answers()), head + "t");
}

TEST_F(AnAssociation, ALaterRegistrationServesBoundCallers) {
    bind();
    static constexpr rpc__server_stub kStubs[] = {refuseStub};
    static constexpr rpc__server_epv kVector = {kStubs, 1};
    static constexpr rpc__if_spec kSmaller = {"echo", kEcho, 1, 1};
    std::uint32_t status = 1;
    rpc__register_mgr(&uuid__nil, &kSmaller, &kVector, nullptr, &status);
    ASSERT_EQ(status, 0U);
    EXPECT_EQ(wire.ask(fragment(3, kRepeat, "x"))[0].fault(), 0x6F7U);
    EXPECT_EQ(wire.ask(fragment(3, kOrder, "x"))[0].fault(), 0x1C010002U);
    registerEcho();
}

TEST_F(AnAssociation, TracesWhatItRejects) {
    bind();
    const TraceCapture trace;
    wire.ask(fragment(3, kRefuse, "x", 5));
    EXPECT_THAT(trace.details("ncs"),
                testing::ElementsAre("Call 5 of operation 2 ends with fault 000006f7"));
}

/// Changes a good conversation in a few places: whatever comes of it, the association answers with
/// packets or ends, and never looks where it must not (which the sanitizers watch).
TEST_F(AnAssociation, SurvivesDamagedConversations) {
    std::mt19937 random(20240229);
    const auto pick = [&random](std::size_t count) { return random() % count; };
    const std::string good = bindPacket() + requestPackets(kRepeat, std::string(300, 'x'), 100) +
                             Packet(kCancel).done() + bindPacket({Context{}}, false, kAlter) +
                             requestPackets(kFill, "y", 100, 2, false) +
                             fragment(0x83, kOrder, "z") + Packet(kOrphaned).done();
    for (int round = 0; round < 20'000; ++round) {
        std::string damaged = good;
        for (std::size_t i = pick(6) + 1; i > 0; --i) {
            const std::size_t at = pick(damaged.size());
            switch (pick(4)) {
                case 0:
                    damaged[at] = static_cast<char>(random());
                    break;
                case 1:
                    damaged.erase(at, pick(20));
                    break;
                case 2:
                    damaged.insert(at, pick(20), static_cast<char>(random()));
                    break;
                default:
                    damaged[at] = static_cast<char>(damaged[at] ^ (1 << pick(8)));
            }
            if (damaged.empty()) damaged = good;
        }
        Wire fresh(2000, 2000);
        fresh.feed(damaged, pick(2) == 0 ? pick(50) + 1 : damaged.size());
        ASSERT_NO_THROW(fresh.answers()) << round;
        fresh.association.reset();
        ASSERT_TRUE(fresh.shared.memory.take(2000)) << round;
    }
}

/// Writes down what it sees.
class Watch final : public ncs::CallWatch {
public:
    std::optional<std::string> before(const ncs::Call& call) override {
        seen += std::string("before ") + call.interface + " " + std::to_string(call.operation) +
                (call.littleEndian ? " little " : " big ") +
                std::string(reinterpret_cast<const char*>(call.data), call.length) + "\n";
        associations.push_back(call.association);
        if (throws) throw std::runtime_error("watch");
        return answer;
    }
    void after(const ncs::Call& call, const std::string& reply) noexcept override {
        seen += "after " + std::to_string(call.operation) + " [" + reply + "]\n";
    }
    void ended(std::uint64_t association) noexcept override {
        seen += "ended\n";
        associations.push_back(association);
    }

    std::string seen;
    std::vector<std::uint64_t> associations;
    std::optional<std::string> answer;
    bool throws = false;
};

class AWatchedAssociation : public AnAssociation {
protected:
    AWatchedAssociation() : watched(kLimit, 10 * kLimit, &watch) { watched.ask(bindPacket()); }

    Watch watch;
    Wire watched;
};

TEST_F(AWatchedAssociation, ShowsEachCallBeforeAndAfterItsStub) {
    EXPECT_EQ(stubOf(watched.ask(requestPackets(kRepeat, "text", 3))), "text");
    EXPECT_EQ(watch.seen, "before echo 0 little text\nafter 0 [text]\n");
    watched.ask(requestPackets(kRepeat, "text", 100, 2, false));
    EXPECT_THAT(watch.seen, testing::HasSubstr("before echo 0 big text\n"));
}

TEST_F(AWatchedAssociation, LetsTheWatchAnswerInTheStubsPlace) {
    watch.answer = "from the watch";
    EXPECT_EQ(stubOf(watched.ask(requestPackets(kRepeat, "text"))), "from the watch");
    EXPECT_EQ(callsOfRepeat(), 0);
    EXPECT_EQ(watched.shared.calls, 0U);
    EXPECT_EQ(watch.seen, "before echo 0 little text\n");
}

TEST_F(AWatchedAssociation, AnswersWithAFaultWhenTheWatchThrows) {
    watch.throws = true;
    const std::vector<Reply> answers = watched.ask(requestPackets(kRepeat, "text"));
    ASSERT_EQ(answers.size(), 1U);
    EXPECT_EQ(answers[0].type, kFault);
    EXPECT_EQ(callsOfRepeat(), 0);
}

TEST_F(AWatchedAssociation, ShowsACallThatEndsWithAFaultAsOneWithoutAReply) {
    watched.ask(requestPackets(kRefuse, ""));
    EXPECT_EQ(watch.seen, "before echo 2 little \nafter 2 []\n");
}

TEST_F(AWatchedAssociation, TellsItsEndUnderTheNumberOfItsCalls) {
    watched.ask(requestPackets(kRepeat, "a"));
    watched.ask(requestPackets(kRepeat, "b", 100, 2));
    watched.association.reset();
    EXPECT_EQ(watch.associations, (std::vector<std::uint64_t>{1, 1, 1}));
    EXPECT_THAT(watch.seen, testing::EndsWith("ended\n"));
}

TEST_F(AWatchedAssociation, SaysNothingOfItsEndWithoutACall) {
    watched.association.reset();
    EXPECT_EQ(watch.seen, "");
}

}  // namespace
