#include "rpc/zavagts.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdint>
#include <cstring>
#include <new>
#include <string>
#include <vector>

namespace {

using ZAV::DataChunk;

/// The arguments of a call of the manager.
struct Call {
    int count = 0;
    std::int32_t unused1 = 0;
    std::string fileName;
    std::int32_t unused2 = 0;
    std::int32_t firstBatch = 0;
    std::int32_t lastIndex = 0;
    std::vector<std::string> chunks;
};
Call lastCall;
bool managerThrows = false;

extern "C" void recordCall(handle_t, std::int32_t unused1, const char* fileName,
                           std::int32_t unused2, std::int32_t firstBatch, std::int32_t lastIndex,
                           const DataChunk* chunks, std::int32_t* status) {
    if (managerThrows) throw std::bad_alloc();
    lastCall = {lastCall.count + 1, unused1, fileName, unused2, firstBatch, lastIndex, {}};
    for (std::int32_t i = 0; i <= lastIndex; ++i) {
        lastCall.chunks.emplace_back(reinterpret_cast<const char*>(chunks[i].data),
                                     chunks[i].length);
    }
    *status = 5;
}

constexpr QVS_Agent_v1_mgr_epv kRecorder = {recordCall};

/// Marshals requests, valid and invalid, in either byte order.
class RequestBuilder {
public:
    explicit RequestBuilder(bool littleEndian) : littleEndian_(littleEndian) {}

    RequestBuilder& number(std::uint32_t value, unsigned size = 4) {
        while (bytes_.size() % size != 0)
            bytes_ += '\0';
        for (unsigned i = 0; i < size; ++i) {
            const unsigned shift = 8 * (littleEndian_ ? i : size - 1 - i);
            bytes_ += static_cast<char>(value >> shift & 0xFF);
        }
        return *this;
    }
    RequestBuilder& text(const std::string& value) {
        const auto length = static_cast<std::uint32_t>(value.size() + 1);
        number(length).number(0).number(length);
        bytes_ += value + '\0';
        return *this;
    }
    RequestBuilder& chunk(const std::string& data, std::uint32_t length) {
        number(length);
        bytes_ += data + std::string(4096 - data.size(), '\xEE');
        return *this;
    }
    const std::string& bytes() const { return bytes_; }

private:
    bool littleEndian_;
    std::string bytes_;
};

std::string request(bool littleEndian, const std::string& name,
                    const std::vector<std::string>& chunks) {
    RequestBuilder builder(littleEndian);
    builder.number(11).text(name).number(22).number(1);
    builder.number(static_cast<std::uint32_t>(chunks.size() - 1));
    builder.number(static_cast<std::uint32_t>(chunks.size()), 2);
    for (const std::string& chunk : chunks) {
        builder.chunk(chunk, static_cast<std::uint32_t>(chunk.size()));
    }
    return builder.bytes();
}

struct Result {
    std::uint32_t fault;
    std::string reply;
};

Result callStub(const std::string& bytes, bool littleEndian = true) {
    // A block of exactly this size, so that the sanitizers notice reads beyond it.
    const std::vector<unsigned char> data(bytes.begin(), bytes.end());
    unsigned char room[4096] = {};
    rpc__reply reply{room, sizeof room, 0};
    const rpc__request incoming{nullptr, data.data(), data.size(), littleEndian};
    const std::uint32_t fault = QVS_Agent_v1_BinaryDataTransfer_stub(&incoming, &kRecorder, &reply);
    return {fault, std::string(reinterpret_cast<char*>(room), reply.length)};
}

class StubTest : public testing::Test {
protected:
    StubTest() {
        lastCall = Call{};
        managerThrows = false;
    }
    static void expectRefused(const std::string& bytes, const char* what) {
        const Result result = callStub(bytes);
        EXPECT_EQ(result.fault, rpc__s_bad_stub_data) << what;
        EXPECT_EQ(lastCall.count, 0) << what;
    }
};

TEST_F(StubTest, DeliversTheParametersOfCallersOfBothByteOrders) {
    for (const bool littleEndian : {true, false}) {
        const Result result = callStub(
            request(littleEndian, "dir\\file", {"one", "", std::string(4096, 'x')}), littleEndian);
        EXPECT_EQ(result.fault, 0U);
        EXPECT_EQ(result.reply, std::string("\x05\0\0\0", 4));
        EXPECT_EQ(lastCall.unused1, 11);
        EXPECT_EQ(lastCall.fileName, "dir\\file");
        EXPECT_EQ(lastCall.unused2, 22);
        EXPECT_EQ(lastCall.firstBatch, 1);
        EXPECT_EQ(lastCall.lastIndex, 2);
        EXPECT_THAT(lastCall.chunks, testing::ElementsAre("one", "", std::string(4096, 'x')));
    }
}

TEST_F(StubTest, AlignsWhateverTheNamesLength) {
    for (std::size_t length = 0; length < 9; ++length) {
        EXPECT_EQ(callStub(request(true, std::string(length, 'n'), {"x"})).fault, 0U) << length;
        EXPECT_EQ(lastCall.fileName, std::string(length, 'n'));
        EXPECT_THAT(lastCall.chunks, testing::ElementsAre("x"));
    }
}

TEST_F(StubTest, RefusesEveryTruncationOfAValidRequest) {
    const std::string whole = request(true, "name", {"data", "more"});
    for (std::size_t length = 0; length < whole.size(); ++length) {
        ASSERT_EQ(callStub(whole.substr(0, length)).fault, rpc__s_bad_stub_data) << length;
    }
    EXPECT_EQ(lastCall.count, 0);
    EXPECT_EQ(callStub(whole).fault, 0U);
}

TEST_F(StubTest, RefusesCountsAndLengthsThatDoNotFit) {
    const auto head = [](std::uint32_t lastIndex, std::uint32_t count) {
        RequestBuilder builder(true);
        builder.number(0).text("f").number(0).number(1).number(lastIndex).number(count, 2);
        return builder;
    };
    expectRefused(head(0, 65535).chunk("x", 1).bytes(), "more chunks than there are");
    expectRefused(head(1, 1).chunk("x", 1).bytes(), "lastIndex behind the count");
    expectRefused(head(0, 0).bytes(), "no chunks at all");
    expectRefused(head(0xFFFFFFFF, 1).chunk("x", 1).bytes(), "a negative lastIndex");
    expectRefused(head(0x7FFFFFFF, 1).chunk("x", 1).bytes(), "the largest lastIndex");
    expectRefused(head(0, 1).chunk("x", 4097).bytes(), "a chunk that claims too much");
    expectRefused(head(0, 2).chunk("x", 1).chunk("x", 0xFFFFFFFF).bytes(),
                  "a chunk behind the last one that claims too much");
}

TEST_F(StubTest, RefusesNamesThatAreNone) {
    const auto withName = [](std::uint32_t room, std::uint32_t offset, std::uint32_t length,
                             const std::string& bytes) {
        RequestBuilder builder(true);
        builder.number(0).number(room).number(offset).number(length);
        RequestBuilder tail(true);
        tail.number(0).number(1).number(0).number(1, 2).chunk("x", 1);
        std::string padded = bytes;
        while (padded.size() % 4 != 0)
            padded += '\0';
        return builder.bytes() + padded + tail.bytes();
    };
    expectRefused(withName(4, 0, 4, "name"), "no terminator");
    expectRefused(withName(0, 0, 0, ""), "no name at all");
    expectRefused(withName(3, 0, 5, std::string("name\0", 5)), "longer than its room");
    expectRefused(withName(5, 1, 5, std::string("name\0", 5)), "an offset");
    expectRefused(withName(0xFFFFFFFF, 0, 0xFFFFFFFF, std::string("name\0", 5)), "a huge length");
    EXPECT_EQ(callStub(withName(5, 0, 5, std::string("na\0e\0", 5))).fault, 0U);
    EXPECT_EQ(lastCall.fileName, "na") << "a name ends at its first 0";
}

TEST_F(StubTest, AManagerThatThrowsIsAFault) {
    managerThrows = true;
    EXPECT_EQ(callStub(request(true, "name", {"x"})).fault, rpc__s_fault_unspec);
}

}  // namespace
