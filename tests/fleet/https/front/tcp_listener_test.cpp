#include "fleet/https/front/tcp_listener.h"

#include <gtest/gtest.h>

#include <string>

#include "fleet/https/front/front_error.h"
#include "fleet/https/tls_client.h"
#include "support/host/program.h"

namespace {

using fleet::acceptClient;
using fleet::listenOn;
using fleet::portOf;
using fleet_test::TcpClient;

/// `from` is the client's own address; "" is what the system chooses.
std::string originOfClientAt(const sys::FileDescriptor& listener, const std::string& address,
                             const std::string& from = "") {
    const TcpClient client(portOf(listener), address, from);
    EXPECT_TRUE(client.isConnected()) << address;
    fleet::AcceptedClient accepted;
    EXPECT_TRUE(eventually([&] {
        accepted = acceptClient(listener.get());
        return static_cast<bool>(accepted.connection);
    }));
    return accepted.origin;
}

TEST(TcpListener, TakesClientsAtItsAddress) {
    const auto v4 = listenOn("127.0.0.1", 0);
    EXPECT_EQ(originOfClientAt(v4, "127.0.0.1"), std::string("\x7f\0\0\1", 4));
    const auto v6 = listenOn("::1", 0);
    EXPECT_EQ(originOfClientAt(v6, "::1"), std::string(8, '\0'));
}

TEST(TcpListener, TakesClientsOfBothKindsEverywhere) {
    for (const char* const address : {"", "::"}) {
        const auto listener = listenOn(address, 0);
        EXPECT_EQ(originOfClientAt(listener, "127.0.0.1"), std::string("\x7f\0\0\1", 4));
        EXPECT_EQ(originOfClientAt(listener, "::1"), std::string(8, '\0'));
    }
}

TEST(TcpListener, TellsClientsOfDifferentAddressesApart) {
    const auto listener = listenOn("", 0);
    EXPECT_NE(originOfClientAt(listener, "127.0.0.1", "127.0.0.2"),
              originOfClientAt(listener, "127.0.0.1", "127.0.0.3"));
}

TEST(TcpListener, DoesNotWaitWhenNobodyIsThere) {
    const auto listener = listenOn("127.0.0.1", 0);
    EXPECT_FALSE(acceptClient(listener.get()).connection);
    EXPECT_EQ(errno, EAGAIN);
}

TEST(TcpListener, SaysWhyItCannotListen) {
    const auto refusalOf = [](const std::string& address, std::uint16_t port) -> std::string {
        try {
            listenOn(address, port);
        } catch (const fleet::FrontError& error) {
            return error.what();
        }
        return "";
    };
    EXPECT_EQ(refusalOf("localhost", 1),
              "cannot listen on localhost port 1: \"localhost\" is no IP address");
    const auto first = listenOn("127.0.0.1", 0);
    const std::uint16_t port = portOf(first);
    EXPECT_EQ(refusalOf("127.0.0.1", port), "cannot listen on 127.0.0.1 port " +
                                                std::to_string(port) + ": Address already in use");
    EXPECT_EQ(refusalOf("192.0.2.1", 1),
              "cannot listen on 192.0.2.1 port 1: Cannot assign requested address");
}

}  // namespace
