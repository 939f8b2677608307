// ctest-label: threaded
#include "ctl/client/transfer_client.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cstring>
#include <functional>
#include <thread>

#include "chunks.h"
#include "ctl/client/failure.h"
#include "support/scratch_dir.h"

namespace {

using ctl::ChunkBatch;
using ctl::Failure;
using ctl::TransferClient;
using ctl_test::contentOf;
using ctl_test::Descriptor;
using ctl_test::numberAt;
using ctl_test::pattern;

/// Plays the host for one connection.
class MadeUpHost {
public:
    using Part = std::function<void(MadeUpHost&)>;

    explicit MadeUpHost(Part part) : listener_(::socket(AF_UNIX, SOCK_STREAM, 0)) {
        sockaddr_un address{};
        address.sun_family = AF_UNIX;
        std::strncpy(address.sun_path, path().c_str(), sizeof address.sun_path - 1);
        EXPECT_EQ(::bind(listener_.get(), reinterpret_cast<sockaddr*>(&address), sizeof address),
                  0);
        EXPECT_EQ(::listen(listener_.get(), 1), 0);
        thread_ = std::thread([this, part] {
            const Descriptor accepted(::accept(listener_.get(), nullptr, nullptr));
            connection_ = accepted.get();
            part(*this);
        });
    }
    ~MadeUpHost() { join(); }
    MadeUpHost(const MadeUpHost&) = delete;
    MadeUpHost& operator=(const MadeUpHost&) = delete;

    std::string path() const { return scratch_.path("host.rpc"); }
    void join() {
        if (thread_.joinable()) thread_.join();
    }

    /// The next packet of the client; empty at the end.
    std::string packet() const {
        std::string bytes = take(16);
        if (bytes.size() < 16) return "";
        return bytes + take((numberAt(bytes, 8) & 0xFFFF) - 16);
    }
    void send(const std::string& bytes) const {
        ::send(connection_, bytes.data(), bytes.size(), MSG_NOSIGNAL);
    }
    /// Takes a bind and accepts it, with the largest fragment that is taken.
    void bind(unsigned largest) const {
        packet();
        std::string ack("\5\0\x0c\3\x10\0\0\0\x38\0\0\0\1\0\0\0\0\x10", 18);
        ack += static_cast<char>(largest & 0xFFU);
        ack += static_cast<char>(largest >> 8);
        ack += std::string("\1\0\0\0\0\0\0\0\1\0\0\0\0\0\0\0", 16) + std::string(20, '\0');
        send(ack);
    }
    void answer(unsigned type, std::uint32_t value) const {
        std::string bytes("\5\0\0\3\x10\0\0\0\x1c\0\0\0\2\0\0\0\4\0\0\0\0\0\0\0", 24);
        bytes[2] = static_cast<char>(type);
        for (unsigned i = 0; i < 4; ++i)
            bytes += static_cast<char>(value >> (8 * i) & 0xFFU);
        send(bytes);
    }

private:
    std::string take(std::size_t count) const {
        std::string bytes(count, '\0');
        std::size_t got = 0;
        while (got < count) {
            const ssize_t length = ::recv(connection_, &bytes[got], count - got, 0);
            if (length <= 0) break;
            got += static_cast<std::size_t>(length);
        }
        bytes.resize(got);
        return bytes;
    }

    ScratchDir scratch_;
    Descriptor listener_;
    int connection_ = -1;
    std::thread thread_;
};

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
    MadeUpHost host([&](MadeUpHost& self) {
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

TEST(TransferClient, ReportsStatusValuesAndFaults) {
    MadeUpHost host([](MadeUpHost& self) {
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
    MadeUpHost host([](MadeUpHost& self) { self.bind(65528); });
    TransferClient client(host.path(), kLong);
    host.join();
    const auto failure = failureOf([&] { client.receive(); });
    EXPECT_EQ(failure.first, ctl::kNoHost);
    EXPECT_EQ(failure.second, "the host closed the connection");
}

TEST(TransferClient, AHostThatSaysNothingRunsIntoTheTimeOut) {
    MadeUpHost host([](MadeUpHost& self) {
        self.bind(65528);
        self.packet();  // comes when the client has gone
    });
    {
        TransferClient client(host.path(), std::chrono::milliseconds(100));
        const auto failure = failureOf([&] { client.receive(); });
        EXPECT_EQ(failure.first, ctl::kNoOutcome);
        EXPECT_EQ(failure.second, "the host did not take the file within the time-out");
    }
}

TEST(TransferClient, AHostThatRefusesTheBindOffersNoFileTransfer) {
    const std::string nak("\5\0\x0d\3\x10\0\0\0\x15\0\0\0\1\0\0\0\0\0\1\5\0", 21);
    MadeUpHost host([&](MadeUpHost& self) {
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
        MadeUpHost host([&](MadeUpHost& self) {
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
