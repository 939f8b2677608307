// The host's RPC socket and port seen by clients of any kind: who gets in, what garbage does, and a
// transfer drawn byte by byte.
// ctest-label: threaded

#include <arpa/inet.h>
#include <gmock/gmock.h>
#include <netinet/in.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <algorithm>
#include <cstring>

#include "e2e/transfers/push_fixture.h"
#include "support/free_port.h"

namespace {

/// A connection without any knowledge of the protocol.
class RawClient {
public:
    explicit RawClient(const std::string& path) : descriptor_(::socket(AF_UNIX, SOCK_STREAM, 0)) {
        sockaddr_un address{};
        address.sun_family = AF_UNIX;
        std::strncpy(address.sun_path, path.c_str(), sizeof address.sun_path - 1);
        connect(reinterpret_cast<const sockaddr*>(&address), sizeof address);
    }
    explicit RawClient(std::uint16_t port, const char* host = "127.0.0.1")
        : descriptor_(::socket(AF_INET, SOCK_STREAM, 0)) {
        sockaddr_in address{};
        address.sin_family = AF_INET;
        address.sin_port = htons(port);
        ::inet_pton(AF_INET, host, &address.sin_addr);
        connect(reinterpret_cast<const sockaddr*>(&address), sizeof address);
    }
    ~RawClient() { ::close(descriptor_); }
    RawClient(const RawClient&) = delete;
    RawClient& operator=(const RawClient&) = delete;

    bool connected() const { return connected_; }
    void send(const std::string& bytes) const {
        // A host that has had enough may close the connection early.
        ::send(descriptor_, bytes.data(), bytes.size(), MSG_NOSIGNAL);
    }
    /// One packet of the host; empty when the host closes the connection, or says nothing.
    std::string packet() const {
        std::string bytes = take(16);
        if (bytes.size() < 16) return "";
        const auto length = static_cast<std::size_t>(static_cast<unsigned char>(bytes[8]) |
                                                     static_cast<unsigned char>(bytes[9]) << 8);
        return bytes + take(length - 16);
    }
    bool closedByHost() const {
        pollfd ready{descriptor_, POLLIN, 0};
        char byte = 0;
        return ::poll(&ready, 1, 10'000) == 1 && ::recv(descriptor_, &byte, 1, 0) <= 0;
    }

private:
    void connect(const sockaddr* address, socklen_t size) {
        connected_ = ::connect(descriptor_, address, size) == 0;
    }
    std::string take(std::size_t count) const {
        std::string bytes;
        while (bytes.size() < count) {
            pollfd ready{descriptor_, POLLIN, 0};
            if (::poll(&ready, 1, 10'000) != 1) break;
            char piece[4096];
            const ssize_t got =
                ::recv(descriptor_, piece, std::min(sizeof piece, count - bytes.size()), 0);
            if (got <= 0) break;
            bytes.append(piece, static_cast<std::size_t>(got));
        }
        return bytes;
    }

    int descriptor_;
    bool connected_ = false;
};

/// Puts packets together in the network's byte order.
class Packet {
public:
    Packet(unsigned type, unsigned flags, std::uint32_t callId) {
        n8(5).n8(0).n8(type).n8(flags).n32(0).n16(0).n16(0).n32(callId);
    }
    Packet& n8(unsigned value) {
        bytes_ += static_cast<char>(value);
        return *this;
    }
    Packet& n16(unsigned value) { return n8(value >> 8 & 0xFFU).n8(value & 0xFFU); }
    Packet& n32(std::uint32_t value) { return n16(value >> 16).n16(value & 0xFFFFU); }
    Packet& raw(const std::string& value) {
        bytes_ += value;
        return *this;
    }
    std::string bytes() const {
        std::string whole = bytes_;
        whole[8] = static_cast<char>(whole.size() >> 8);
        whole[9] = static_cast<char>(whole.size() & 0xFFU);
        return whole;
    }

private:
    std::string bytes_;
};

constexpr unsigned kFirst = 1;
constexpr unsigned kLast = 2;

std::string bindPacket(std::uint32_t interfaceStart = 0xb1fb0fb3) {
    Packet bind(11, kFirst | kLast, 1);
    bind.n16(4280).n16(4280).n32(0);
    bind.n8(1).n8(0).n16(0).n16(7).n8(1).n8(0);
    bind.n32(interfaceStart).n16(0x03c4).n16(0).n8(2).n8(0);
    bind.n8(0).n8(9).n8(0x35).n8(0x18).n8(0x3d).n8(0).n32(1);
    bind.n32(0x8a885d04).n16(0x1ceb).n16(0x11c9).n8(0x9f).n8(0xe8);
    bind.n8(8).n8(0).n8(0x2b).n8(0x10).n8(0x48).n8(0x60).n32(2);
    return bind.bytes();
}

/// The parameters of a transfer of one chunk to the file "big".
std::string parameters(const std::string& data) {
    Packet stub(0, 0, 0);
    stub.n32(0).n32(4).n32(0).n32(4).raw(std::string("big\0", 4));
    stub.n32(0).n32(1).n32(0).n16(1).n16(0);
    stub.n32(static_cast<std::uint32_t>(data.size())).raw(data);
    stub.raw(std::string(4096 - data.size(), '\0'));
    return stub.bytes().substr(16);
}

std::string request(unsigned flags, const std::string& stub) {
    return Packet(0, flags, 2).n32(0).n16(7).n16(0).raw(stub).bytes();
}

class RpcSocket : public PushFixture {
protected:
    std::string rpcPath() const { return host_->socket() + ".rpc"; }

    void transferThrough(const RawClient& client) const {
        ASSERT_TRUE(client.connected());
        client.send(bindPacket());
        const std::string bound = client.packet();
        ASSERT_GE(bound.size(), 30U);
        ASSERT_EQ(bound[2], 12);
        const std::string stub = parameters("a big-endian caller");
        client.send(request(kFirst, stub.substr(0, 1000)));
        client.send(request(0, stub.substr(1000, 2000)));
        client.send(request(kLast, stub.substr(3000)));
        const std::string response = client.packet();
        ASSERT_EQ(response.size(), 28U);
        EXPECT_EQ(response[2], 2);
        EXPECT_EQ(response.substr(20, 2), std::string("\7\0", 2)) << "the context of the bind";
        EXPECT_EQ(response.substr(24), std::string(4, '\0'));
        EXPECT_EQ(depot("big"), "a big-endian caller");
    }
};

TEST_F(RpcSocket, BelongsToItsOwnerAlone) {
    start();
    EXPECT_EQ(modeOf(rpcPath()), 0600U);
}

TEST_F(RpcSocket, ThatIsServedIsLeftAloneAndIsGoneWithItsHost) {
    start();
    const std::string path = rpcPath();
    const ProgramResult second =
        runProgram({zavhostPath(), "--unguarded", "--home", home_.path(), "--socket",
                    files_.path("other.sock"), "--rpc-socket", path});
    EXPECT_EQ(second.status, 1);
    EXPECT_THAT(second.err, testing::HasSubstr(path));
    EXPECT_EQ(push(files_.write("file", "x")).status, 0) << "the first host still serves";
    EXPECT_EQ(host_->stop().status, 0);
    EXPECT_FALSE(std::filesystem::exists(path));
    host_->start();
}

TEST_F(RpcSocket, TakesATransferInFragmentsInTheOtherByteOrder) {
    start();
    transferThrough(RawClient(rpcPath()));
}

TEST_F(RpcSocket, SurvivesGarbage) {
    start();
    std::string truncated = bindPacket();
    truncated[9] = 20;
    std::string manyContexts = bindPacket();
    manyContexts[24] = '\xff';
    const std::string notAVersion = "\x09" + bindPacket().substr(1);
    for (const std::string& garbage :
         {std::string("GET / HTTP/1.1\r\nHost: localhost\r\n\r\n"), randomBytes(100'000),
          std::string(100'000, '\0'), std::string(64, '\xff'), truncated, manyContexts, notAVersion,
          request(kFirst | kLast, parameters("not bound"))}) {
        const RawClient client(rpcPath());
        client.send(garbage);
        client.packet();
        EXPECT_TRUE(client.closedByHost()) << testing::PrintToString(garbage.substr(0, 30));
    }
    EXPECT_FALSE(inDepot("big"));
    transferThrough(RawClient(rpcPath()));
}

TEST_F(RpcSocket, AnswersRequestsItCannotUnderstandWithAFaultAndGoesOn) {
    start();
    const RawClient client(rpcPath());
    client.send(bindPacket());
    ASSERT_EQ(client.packet()[2], 12);
    client.send(request(kFirst | kLast, parameters("x").substr(0, 100)));
    const std::string fault = client.packet();
    ASSERT_EQ(fault.size(), 32U);
    EXPECT_EQ(fault[2], 3);
    EXPECT_EQ(fault.substr(24, 4), std::string("\xF7\x06\0\0", 4));
    EXPECT_FALSE(inDepot("big"));
    client.send(request(kFirst | kLast, parameters("understood")));
    EXPECT_EQ(client.packet()[2], 2);
    EXPECT_EQ(depot("big"), "understood");
}

TEST_F(RpcSocket, RejectsAnInterfaceItDoesNotHave) {
    start();
    const RawClient client(rpcPath());
    client.send(bindPacket(0x12345678));
    const std::string answer = client.packet();
    ASSERT_EQ(answer.size(), 56U);
    EXPECT_EQ(answer[2], 12);
    EXPECT_EQ(answer.substr(32, 4), std::string("\2\0\1\0", 4)) << "provider, abstract syntax";
}

TEST_F(RpcSocket, AManyTimesRepeatedHalfRequestDoesNotStarveOthers) {
    start();
    std::vector<std::unique_ptr<RawClient>> clients;
    for (int i = 0; i < 40; ++i) {
        clients.push_back(std::make_unique<RawClient>(rpcPath()));
        clients.back()->send(bindPacket() + request(kFirst, parameters("x").substr(0, 1000)));
    }
    EXPECT_EQ(push(files_.write("file", "x")).status, 0);
}

TEST_F(RpcSocket, APortIsServedOnLoopbackWhenAskedFor) {
    const std::uint16_t port = freePort();
    start({"--rpc-port", std::to_string(port)});
    transferThrough(RawClient(port));
    EXPECT_FALSE(RawClient(port, "127.0.0.2").connected());
}

TEST_F(RpcSocket, APortThatIsTakenIsSaid) {
    const std::uint16_t port = freePort();
    start({"--rpc-port", std::to_string(port)});
    const ProgramResult second =
        runProgram({zavhostPath(), "--unguarded", "--home", home_.path(), "--socket",
                    files_.path("other.sock"), "--rpc-port", std::to_string(port)});
    EXPECT_EQ(second.status, 1);
    EXPECT_THAT(second.err,
                testing::HasSubstr("zavhost: cannot listen on the loopback port " +
                                   std::to_string(port) + ": Address already in use\n"));
}

TEST_F(RpcSocket, NoPortIsServedUnlessAskedFor) {
    start();
    const ProgramResult sockets =
        runProgram({"/bin/sh", "-c",
                    "ls -l /proc/" + std::to_string(host_->pid()) +
                        "/fd | sed -n 's/.*socket:.\\([0-9]*\\).*/\\1/p' | while read -r inode; do "
                        "awk -v inode=$inode '$10 == inode' /proc/net/tcp /proc/net/tcp6; done"});
    EXPECT_EQ(sockets.out, "");
}

}  // namespace
