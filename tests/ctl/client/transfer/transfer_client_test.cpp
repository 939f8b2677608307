// ctest-label: threaded
#include "ctl/client/transfer/transfer_client.h"

#include <fcntl.h>
#include <gtest/gtest.h>

#include <functional>

#include "ctl/client/chunks.h"
#include "ctl/client/failure.h"
#include "ctl/client/transfer/made_up_host.h"
#include "support/host/program.h"
#include "support/scratch_dir.h"

namespace {

using ctl::ChunkBatch;
using ctl::Failure;
using ctl::TransferClient;
using ctl_test::contentOf;
using ctl_test::Descriptor;
using ctl_test::HostConnection;
using ctl_test::MadeUpHost;
using ctl_test::numberAt;
using ctl_test::pattern;

constexpr std::chrono::seconds kLong{20};

/// Status and text of the failure that an action ends with.
std::pair<int, std::string> failureOf(const std::function<void()>& action) {
    try {
        action();
    } catch (const Failure& failure) {
        return {failure.status(), failure.what()};
    }
    return {0, ""};
}

ChunkBatch batchOf(const std::string& content) {
    const ScratchDir scratch;
    const Descriptor file(::open(scratch.write("file", content).c_str(), O_RDONLY));
    ChunkBatch batch;
    batch.read(file.get(), "file");
    return batch;
}

TEST(TransferClient, KeepsToTheFragmentSizeOfTheHost) {
    const std::string content = pattern(30'000);
    std::vector<std::string> fragments;
    MadeUpHost host([&](HostConnection& self) {
        self.bind(1500);
        do {
            fragments.push_back(self.packet());
        } while (!fragments.back().empty() && (fragments.back()[3] & 2) == 0);
        self.answer(2, 0);
    });
    TransferClient client(host.path(), kLong);
    client.send("name", true, batchOf(content));
    EXPECT_EQ(client.receive().status, 0);
    host.join();

    std::string data;
    for (std::size_t i = 0; i < fragments.size(); ++i) {
        const int flags = (i == 0 ? 1 : 0) | (i + 1 == fragments.size() ? 2 : 0);
        EXPECT_EQ(fragments[i][3], flags) << i;
        EXPECT_LE(fragments[i].size(), 1500U);
        EXPECT_EQ(numberAt(fragments[i], 12), 2U) << "the call";
        data += fragments[i].substr(24);
    }
    const std::vector<unsigned char> head = ctl::rpc::transferHead("name", true, 8);
    EXPECT_EQ(data.substr(0, head.size()), std::string(head.begin(), head.end()));
    EXPECT_TRUE(contentOf(data.substr(head.size())) == content);
    EXPECT_EQ(numberAt(fragments[0], 16), data.size()) << "the allocation hint";
}

TEST(TransferClient, SendsSmallAndLargeBatchesInTheirOrder) {
    const std::vector<std::string> contents = {"a", pattern(5000),   pattern(ChunkBatch::kMostData),
                                               "b", pattern(70'000), "c"};
    const std::size_t headSize = ctl::rpc::transferHead("n", true, 1).size();
    for (const unsigned largestFragment : {65528U, 5000U}) {
        std::vector<std::string> arrived;
        MadeUpHost host([&](HostConnection& self) {
            self.bind(largestFragment);
            for (std::size_t i = 0; i < contents.size(); ++i) {
                arrived.push_back(contentOf(self.request().substr(headSize)));
                self.answer(2, static_cast<std::uint32_t>(i));
            }
        });
        TransferClient client(host.path(), kLong);
        for (const std::string& content : contents)
            client.send("n", true, batchOf(content));
        for (std::size_t i = 0; i < contents.size(); ++i)
            EXPECT_EQ(client.receive().status, static_cast<std::int32_t>(i));
        host.join();
        EXPECT_TRUE(arrived == contents) << largestFragment;
    }
}

TEST(TransferClient, TakesAnswersOneByOneHoweverTheyCome) {
    constexpr std::uint32_t kAnswers = 200;  // fit into the socket, but not into one read
    MadeUpHost host([](HostConnection& self) {
        self.bind(65528);
        for (std::uint32_t i = 0; i < kAnswers; ++i)
            self.answer(2, i);
    });
    TransferClient client(host.path(), kLong);
    host.join();
    for (std::uint32_t i = 0; i < kAnswers; ++i)
        EXPECT_EQ(client.receive().status, static_cast<std::int32_t>(i));
}

TEST(TransferClient, ReportsStatusValuesAndFaults) {
    MadeUpHost host([](HostConnection& self) {
        self.bind(65528);
        self.answer(2, 6);
        self.answer(2, 0xFFFFFFFF);
        self.answer(3, 0x1C00001B);
    });
    TransferClient client(host.path(), kLong);
    EXPECT_EQ(client.receive().status, 6);
    EXPECT_EQ(client.receive().status, -1);
    EXPECT_EQ(client.receive().fault, 0x1C00001BU);
}

TEST(TransferClient, AHostThatHangsUpIsNoHost) {
    MadeUpHost host([](HostConnection& self) { self.bind(65528); });
    TransferClient client(host.path(), kLong);
    host.join();
    const auto failure = failureOf([&] { client.receive(); });
    EXPECT_EQ(failure.first, ctl::kNoHost);
    EXPECT_EQ(failure.second, "the host closed the connection");
}

TEST(TransferClient, AHostThatSaysNothingRunsIntoTheTimeOut) {
    MadeUpHost host([](HostConnection& self) {
        self.bind(65528);
        self.packet();  // comes when the client has gone
    });
    {
        TransferClient client(host.path(), std::chrono::seconds(1));
        const auto failure = failureOf([&] { client.receive(); });
        EXPECT_EQ(failure.first, ctl::kNoOutcome);
        EXPECT_EQ(failure.second, "the host did not take the file within the time-out");
    }
}

TEST(TransferClient, AnAnswerThatComesByteByByteRunsIntoTheTimeOut) {
    MadeUpHost host([](HostConnection& self) {
        self.bind(65528);
        self.send(std::string("\5\0\2\3\x10\0\0\0\xff\xff\0\0\2\0\0\0", 16));
        // Each byte comes in time, and the answer in five minutes.
        while (self.trySend("\0"))
            sleepBriefly();
    });
    TransferClient client(host.path(), std::chrono::milliseconds(200));
    const auto failure = failureOf([&] { client.receive(); });
    EXPECT_EQ(failure.first, ctl::kNoOutcome);
}

TEST(TransferClient, AHostThatRefusesTheBindOffersNoFileTransfer) {
    const std::string nak("\5\0\x0d\3\x10\0\0\0\x15\0\0\0\1\0\0\0\0\0\1\5\0", 21);
    MadeUpHost host([&](HostConnection& self) {
        self.packet();
        self.send(nak);
    });
    const auto failure = failureOf([&] { TransferClient(host.path(), kLong); });
    EXPECT_EQ(failure.first, ctl::kNoHost);
    EXPECT_EQ(failure.second, "the host does not offer file transfer");
}

TEST(TransferClient, AnswersThatMakeNoSenseAreSaid) {
    for (const std::string& answer :
         {std::string("HTTP/1.1 400 Bad Request\r\n\r\n"),
          std::string("\5\0\2\3\x10\0\0\0\x10\0\0\0\2\0\0\0", 16),
          std::string("\5\0\x0c\3\x10\0\0\0\x1c\0\0\0\2\0\0\0", 16) + std::string(12, '\0')}) {
        MadeUpHost host([&](HostConnection& self) {
            self.bind(65528);
            self.send(answer);
        });
        TransferClient client(host.path(), kLong);
        const auto failure = failureOf([&] { client.receive(); });
        EXPECT_EQ(failure.first, ctl::kNoHost);
        EXPECT_EQ(failure.second, "the host's answer makes no sense");
    }
}

TEST(TransferClient, ASocketWithoutAHostOrWithAPathTooLongIsSaid) {
    const ScratchDir scratch;
    const std::string path = scratch.path("none");
    EXPECT_EQ(failureOf([&] { TransferClient(path, kLong); }),
              std::make_pair(int{ctl::kNoHost},
                             "no host reached at " + path + ": No such file or directory"));
    const std::string longPath = "/" + std::string(200, 'p');
    EXPECT_EQ(failureOf([&] { TransferClient(longPath, kLong); }),
              std::make_pair(int{ctl::kWrongUsage}, "the socket's path is too long: " + longPath));
}

}  // namespace
