#include <gtest/gtest.h>

#include <cstdlib>
#include <string>

#include "fleet/bus/nats/certificates.h"
#include "fleet/bus/nats/connecting.h"
#include "support/scratch_dir.h"

using certificates::Authority;
using connecting::kPatience;
using fleet::Connection;
using Failure = fleet::Connection::Result::Failure;

#if defined(__SANITIZE_ADDRESS__)
/// The client library leaves some KiB behind where a server breaks a handshake off, which happens
/// when a connection is made again while the server starts. What is left is OpenSSL's.
extern "C" const char* __lsan_default_suppressions();
extern "C" const char* __lsan_default_suppressions() {
    return "leak:libcrypto.so\n";
}
#endif

namespace {

class BusConnectionByTls : public testing::Test {
protected:
    /// The configuration of a server with a certificate for that name.
    std::string serverOf(const Authority& authority, const std::string& name) {
        const auto pair = authority.issue(name);
        return "tls { cert_file: \"" + dir_.write("server.pem", pair.certificate) +
               "\"\n key_file: \"" + dir_.write("server.key", pair.key) + "\" }";
    }
    fleet::ConnectionOptions trusting(const NatsServer& server, const Authority& authority) {
        fleet::ConnectionOptions options = connecting::optionsFor(server);
        options.tls = fleet::TlsOptions{dir_.write("ca.pem", authority.pem()), "bus.example"};
        return options;
    }

    const ScratchDir dir_;
    const Authority authority_;
};

}  // namespace

TEST_F(BusConnectionByTls, IsMadeWithAServerThatTheAuthorityVouchesFor) {
    const NatsServer server(serverOf(authority_, "bus.example"));
    const auto result = Connection::connect(trusting(server, authority_));
    ASSERT_TRUE(result.connection) << result.text;
    EXPECT_TRUE(result.connection->flush(kPatience).done());
}

TEST_F(BusConnectionByTls, IsNotMadeWithAServerOfAnotherAuthority) {
    const NatsServer server(serverOf(Authority(), "bus.example"));
    const auto result = Connection::connect(trusting(server, authority_));
    EXPECT_EQ(result.failure, Failure::NotTrusted) << result.text;
}

TEST_F(BusConnectionByTls, IsNotMadeWithAServerForWhichOnlyTheSystemsAuthoritiesVouch) {
    const Authority ofTheSystem;
    ::setenv("SSL_CERT_FILE", dir_.write("system.pem", ofTheSystem.pem()).c_str(), 1);
    const NatsServer server(serverOf(ofTheSystem, "bus.example"));
    const auto result = Connection::connect(trusting(server, authority_));
    EXPECT_EQ(result.failure, Failure::NotTrusted) << result.text;
}

TEST_F(BusConnectionByTls, IsNotMadeWithAServerOfAnotherName) {
    const NatsServer server(serverOf(authority_, "other.example"));
    const auto result = Connection::connect(trusting(server, authority_));
    EXPECT_EQ(result.failure, Failure::NotTrusted) << result.text;
}

TEST_F(BusConnectionByTls, IsNotMadeWithoutEncryptionIfThatIsWanted) {
    const NatsServer server;
    const auto result = Connection::connect(trusting(server, authority_));
    EXPECT_EQ(result.failure, Failure::NotTrusted) << result.text;
}

TEST_F(BusConnectionByTls, IsNotMadeWithoutAnAuthorityOrAName) {
    const NatsServer server(serverOf(authority_, "bus.example"));
    fleet::ConnectionOptions options = trusting(server, authority_);
    std::get<fleet::TlsOptions>(options.tls).serverName.clear();
    EXPECT_EQ(Connection::connect(options).failure, Failure::Misconfigured);
    options.tls = fleet::TlsOptions{dir_.path("missing.pem"), "bus.example"};
    EXPECT_NE(Connection::connect(options).failure, Failure::None);
}

TEST_F(BusConnectionByTls, IsNotMadeWithAServerThatWantsItAndDoesNotGetIt) {
    const NatsServer server(serverOf(authority_, "bus.example"));
    const auto result = Connection::connect(connecting::optionsFor(server));
    EXPECT_EQ(result.failure, Failure::NotTrusted) << result.text;
}

TEST_F(BusConnectionByTls, IsMadeAgainWhenTheServerIsBack) {
    NatsServer server(serverOf(authority_, "bus.example"));
    const auto result = Connection::connect(trusting(server, authority_));
    ASSERT_TRUE(result.connection) << result.text;
    server.kill();
    ASSERT_TRUE(eventually([&] { return result.connection->failedReconnects() > 0; }));
    server.start();
    EXPECT_TRUE(eventually([&] { return result.connection->connected(); }));
}
