// ctest-label: threaded
// Clients that speak TLS, the front, and behind it an HTTP server or a test that plays one.
#include "fleet/https/front/tls_front.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <openssl/x509v3.h>
#include <poll.h>
#include <sys/resource.h>

#include <atomic>
#include <csignal>
#include <deque>
#include <filesystem>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <thread>
#include <vector>

#include "fleet/https/front/front_error.h"
#include "fleet/https/front/identity_file.h"
#include "fleet/https/tls_client.h"
#include "http/server.h"
#include "support/host/program.h"

namespace {

using fleet::FrontSettings;
using fleet::TlsFront;
using fleet_test::TcpClient;
using fleet_test::TlsClient;
using std::chrono::milliseconds;
using std::chrono::seconds;

class FrontTest : public testing::Test {
protected:
    FrontTest() { ::signal(SIGPIPE, SIG_IGN); }  // of the clients here; the front needs it not

    FrontSettings settings(const fleet::FrontLimits& limits = {}) const {
        return {"127.0.0.1", 0, identity_.path(), limits};
    }

    const fleet_test::IdentityFiles identity_;
    const std::string identityFile_ = identity_.write(identity_.content());
};

// ---------------------------------------------------------------------------------------------
// With an HTTP server behind it.

/// Answers with the body of the request, or with many bytes.
class Echo final : public http::Handler {
public:
    static constexpr std::size_t kManyBytes = 8'000'000;
    std::variant<http::Answer, http::Job> handle(http::Request request) override {
        if (request.target == "/many") {
            return http::Answer(http::Reply{200, std::string(kManyBytes, 'm'), "text/plain"});
        }
        return http::Answer(http::Reply{200, request.method + ' ' + request.body, "text/plain"});
    }
    void prepareForEnd() override {}
    bool quiet() const override { return true; }
};

class FrontOfAServer : public FrontTest {
protected:
    ~FrontOfAServer() override { stop(); }
    void start(const fleet::FrontLimits& limits = {}) {
        http::ServerLimits serverLimits;
        serverLimits.connections = 1000;
        server_.emplace(-1,
                        http::Door{[](int) {
                                       return http::Peer{0, 0, 0, http::Access::Act, "TLS"};
                                   },
                                   "go away"},
                        handler_, counts_, serverLimits);
        serving_ = std::thread([this] { server_->run(); });
        front_.emplace(settings(limits), [this](sys::FileDescriptor connection) {
            server_->adopt(std::move(connection));
        });
    }
    void stop() {
        if (!serving_.joinable()) return;
        front_.reset();
        server_->stop();
        serving_.join();
    }

    Echo handler_;
    http::ServerCounts counts_;
    std::optional<http::HttpServer> server_;
    std::thread serving_;
    std::optional<TlsFront> front_;
};

TEST_F(FrontOfAServer, TakesRequestsToItAndBringsItsAnswers) {
    start();
    TlsClient client(front_->port());
    EXPECT_EQ(client.get("/").body, "GET ");
    const std::string body(1'000'000, 'b');
    EXPECT_EQ(client.post("/", body).body, "POST " + body);
    EXPECT_EQ(client.get("/").body, "GET ");
    EXPECT_EQ(counts_.accepted.value(), 1U);
}

TEST_F(FrontOfAServer, ProvesWhoItIsWithTheAuthoritysCertificateBehindItsOwn) {
    start();
    TlsClient client(front_->port());
    ASSERT_TRUE(client.isOpen());
    STACK_OF(X509)* const chain = SSL_get_peer_cert_chain(client.session());
    ASSERT_EQ(sk_X509_num(chain), 2);
    X509* const authority = sk_X509_value(chain, 1);
    EXPECT_EQ(X509_verify(sk_X509_value(chain, 0), X509_get0_pubkey(authority)), 1);
    EXPECT_EQ(X509_check_ip_asc(sk_X509_value(chain, 0), "127.0.0.1", 0), 1);
}

TEST_F(FrontOfAServer, SpeaksNoVersionBefore1_2) {
    start();
    EXPECT_FALSE(TlsClient(TcpClient(front_->port()), TLS1_1_VERSION).isOpen());
    TlsClient of12(TcpClient(front_->port()), TLS1_2_VERSION);
    EXPECT_EQ(of12.get("/").status, 200);
    EXPECT_STREQ(SSL_get_version(of12.session()), "TLSv1.2");
    TlsClient of13(front_->port());
    EXPECT_EQ(of13.get("/").status, 200);
    EXPECT_STREQ(SSL_get_version(of13.session()), "TLSv1.3");
}

TEST_F(FrontOfAServer, DoesNotBeginAnewWithinAConnection) {
    start();
    TlsClient client(TcpClient(front_->port()), TLS1_2_VERSION);
    ASSERT_EQ(client.get("/").status, 200);
    const bool isRenegotiated =
        SSL_renegotiate(client.session()) == 1 && SSL_do_handshake(client.session()) == 1;
    EXPECT_FALSE(isRenegotiated);
}

TEST_F(FrontOfAServer, TakesNewKeysOfAClientInBetween) {
    start();
    TlsClient client(front_->port());
    for (int turn = 0; turn < 50; ++turn) {
        ASSERT_EQ(SSL_key_update(client.session(), SSL_KEY_UPDATE_REQUESTED), 1);
        ASSERT_EQ(client.post("/", "x").body, "POST x");
    }
}

TEST_F(FrontOfAServer, ShowsTheNextCertificateToNewClientsAndKeepsTheOthers) {
    start();
    TlsClient early(front_->port());
    ASSERT_EQ(early.get("/").status, 200);
    testing::internal::CaptureStderr();
    identity_.scratch().write("next.pem", identity_.content(), 0600);
    std::filesystem::rename(identity_.scratch().path("next.pem"), identityFile_);
    TlsClient late(front_->port());
    EXPECT_EQ(late.get("/").status, 200);
    EXPECT_EQ(early.get("/").status, 200);
    EXPECT_NE(testing::internal::GetCapturedStderr().find("has changed"), std::string::npos);
    EXPECT_NE(X509_cmp(SSL_get0_peer_certificate(early.session()),
                       SSL_get0_peer_certificate(late.session())),
              0);
}

TEST_F(FrontOfAServer, EndsWithWhoSpeaksNoTls) {
    start();
    for (const std::string& garbage :
         {std::string("GET / HTTP/1.1\r\nHost: x\r\n\r\n"), std::string(100'000, '\0'),
          std::string("\x16\x03\x01\xff\xff", 5) + std::string(70'000, 'x')}) {
        TcpClient client(front_->port());
        client.sendPlain(garbage);
        EXPECT_TRUE(client.isEnded());
    }
    EXPECT_TRUE(eventually([&] { return front_->counts().failedHandshakes.value() == 3; }));
    EXPECT_EQ(counts_.accepted.value(), 0U) << "the server hears nothing of it";
    EXPECT_EQ(TlsClient(front_->port()).get("/").status, 200);
}

TEST_F(FrontOfAServer, EndsWithWhoNeverSpeaks) {
    fleet::FrontLimits limits;
    limits.handshakeTime = milliseconds(2'000);
    start(limits);
    TcpClient silent(front_->port());
    TcpClient half(front_->port());
    half.sendPlain(std::string("\x16\x03\x01", 3));
    TlsClient good(front_->port());
    EXPECT_TRUE(silent.isEnded());
    EXPECT_TRUE(half.isEnded());
    EXPECT_EQ(front_->counts().failedHandshakes.value(), 2U);
    EXPECT_EQ(good.get("/").status, 200) << "the limit is that of the handshake only";
}

std::size_t threadsOfThisProcess() {
    const std::filesystem::directory_iterator tasks("/proc/self/task");
    return static_cast<std::size_t>(std::distance(begin(tasks), end(tasks)));
}

TEST_F(FrontOfAServer, ServesHundredsAtOnceWithoutFurtherThreads) {
    constexpr std::size_t kClients = 500;
    start();
    ASSERT_EQ(TlsClient(front_->port()).get("/").status, 200);
    const std::size_t threads = threadsOfThisProcess();
    std::vector<TcpClient> silent;
    for (int i = 0; i < 10; ++i)
        silent.emplace_back(front_->port());
    std::deque<TlsClient> clients;
    for (std::size_t i = 0; i < kClients; ++i)
        clients.emplace_back(front_->port());
    for (TlsClient& client : clients)
        client.send("POST / HTTP/1.1\r\nContent-Length: 2\r\n\r\nhi");
    for (TlsClient& client : clients)
        ASSERT_EQ(client.readAnswer().body, "POST hi");
    EXPECT_EQ(front_->counts().connections.value(), kClients + silent.size());
    EXPECT_EQ(threadsOfThisProcess(), threads);
    clients.clear();
    EXPECT_TRUE(eventually([&] { return counts_.connections.value() == 0; }));
    EXPECT_EQ(front_->counts().connections.value(), silent.size());
}

TEST_F(FrontOfAServer, WaitsForASlowReaderAndForNobodyElse) {
    start();
    constexpr int kSmall = 4096;
    TlsClient slow(TcpClient(front_->port(), "127.0.0.1", "", kSmall));
    TlsClient quick(front_->port());
    slow.send("GET /many HTTP/1.1\r\n\r\n");
    ASSERT_NE(slow.readUntil("\r\n\r\n").find("Content-Length: 8000000"), std::string::npos);
    constexpr std::size_t kPiece = Echo::kManyBytes / 20;
    for (std::size_t read = 0; read < Echo::kManyBytes; read += kPiece) {
        ASSERT_EQ(slow.read(kPiece), std::string(kPiece, 'm'));
        ASSERT_EQ(quick.get("/").status, 200);
    }
    EXPECT_EQ(slow.get("/").status, 200) << "nothing was added";
}

TEST_F(FrontOfAServer, ClosesWhatIsOpenWhenItGoes) {
    start();
    TlsClient client(front_->port());
    TcpClient silent(front_->port());
    ASSERT_EQ(client.get("/").status, 200);
    ASSERT_TRUE(eventually([&] { return front_->counts().connections.value() == 2; }));
    front_.reset();
    EXPECT_EQ(client.readAll(), "");
    EXPECT_TRUE(silent.isEnded());
    EXPECT_TRUE(eventually([&] { return counts_.connections.value() == 0; }));
}

// ---------------------------------------------------------------------------------------------
// With a test behind it.

/// The server's end of a connection.
class ServerEnd {
public:
    explicit ServerEnd(sys::FileDescriptor connection) : connection_(std::move(connection)) {
        ::fcntl(connection_.get(), F_SETFL, 0);  // the test may wait
        constexpr timeval kWait{20, 0};
        ::setsockopt(connection_.get(), SOL_SOCKET, SO_RCVTIMEO, &kWait, sizeof kWait);
        ::setsockopt(connection_.get(), SOL_SOCKET, SO_SNDTIMEO, &kWait, sizeof kWait);
    }
    bool send(const std::string& bytes) const {
        return ::send(connection_.get(), bytes.data(), bytes.size(), MSG_NOSIGNAL) ==
               static_cast<ssize_t>(bytes.size());
    }
    /// Tells how much that was.
    std::size_t sendUntilNobodyTakesIt() const {
        const std::string piece(10'000, 'x');
        std::size_t sent = 0;
        pollfd writable{connection_.get(), POLLOUT, 0};
        while (::poll(&writable, 1, 2'000) == 1) {
            const ssize_t took =
                ::send(connection_.get(), piece.data(), piece.size(), MSG_NOSIGNAL | MSG_DONTWAIT);
            sent += took < 0 ? 0 : static_cast<std::size_t>(took);
        }
        return sent;
    }
    std::string read(std::size_t bytes) const {
        std::string all(bytes, '\0');
        const ssize_t got = ::recv(connection_.get(), all.data(), bytes, MSG_WAITALL);
        all.resize(got < 0 ? 0 : static_cast<std::size_t>(got));
        return all;
    }
    bool isEnded() const {
        char byte = 0;
        return ::recv(connection_.get(), &byte, 1, 0) == 0;
    }
    void endSending() const { ::shutdown(connection_.get(), SHUT_WR); }
    void close() { connection_.reset(); }

private:
    sys::FileDescriptor connection_;
};

class FrontOfATest : public FrontTest {
protected:
    void start(const fleet::FrontLimits& limits = {}) {
        front_.emplace(settings(limits), [this](sys::FileDescriptor connection) {
            const std::lock_guard lock(mutex_);
            taken_.push_back(std::move(connection));
        });
    }
    std::size_t waiting() {
        const std::lock_guard lock(mutex_);
        return taken_.size();
    }
    /// The server's end of the next connection.
    ServerEnd accept() {
        EXPECT_TRUE(eventually([&] { return waiting() > 0; }));
        const std::lock_guard lock(mutex_);
        sys::FileDescriptor first = std::move(taken_.front());
        taken_.pop_front();
        return ServerEnd(std::move(first));
    }
    bool areConnections(std::size_t count) {
        return eventually([&] { return front_->counts().connections.value() == count; });
    }

    std::mutex mutex_;
    std::deque<sys::FileDescriptor> taken_;
    std::optional<TlsFront> front_;
};

TEST_F(FrontOfATest, BringsAllThatTheServerSentBeforeItClosed) {
    start();
    TlsClient client(front_->port());
    ServerEnd server = accept();
    const std::string text(50'000, 't');
    EXPECT_TRUE(server.send(text));
    server.close();
    EXPECT_EQ(client.readAll(), text);
    EXPECT_TRUE(client.hasEndedWell());
    client.connection().close();
    EXPECT_TRUE(areConnections(0));
}

TEST_F(FrontOfATest, BringsItAlsoToAClientThatStillSends) {
    start();
    TlsClient client(front_->port());
    ServerEnd server = accept();
    EXPECT_TRUE(server.send("no more"));
    server.close();
    for (int turn = 0; turn < 20; ++turn)
        EXPECT_TRUE(client.send(std::string(16'000, 's')));
    EXPECT_EQ(client.readAll(), "no more");
    EXPECT_TRUE(client.hasEndedWell());
}

TEST_F(FrontOfATest, GivesAClientThatDoesNotReadLimitedTimeAfterTheServer) {
    fleet::FrontLimits limits;
    limits.drainTime = milliseconds(100);
    start(limits);
    TlsClient client(TcpClient(front_->port(), "127.0.0.1", "", 4096));
    ServerEnd server = accept();
    EXPECT_GT(server.sendUntilNobodyTakesIt(), 0U);
    EXPECT_EQ(front_->counts().connections.value(), 1U);
    server.close();
    EXPECT_TRUE(areConnections(0));
    client.readAll();
    EXPECT_FALSE(client.hasEndedWell());
}

TEST_F(FrontOfATest, ReadsNoMoreFromAClientThanTheServerTakes) {
    start();
    TlsClient client(front_->port());
    const ServerEnd server = accept();
    constexpr std::size_t kPiece = 10'000;
    ::fcntl(client.connection().descriptor(), F_SETFL, O_NONBLOCK);
    SSL_set_mode(client.session(), SSL_MODE_ACCEPT_MOVING_WRITE_BUFFER);
    std::size_t sent = 0;
    pollfd writable{client.connection().descriptor(), POLLOUT, 0};
    // It ends because somewhere the bytes are not taken any more.
    while (sent < 200'000'000 && ::poll(&writable, 1, 300) == 1) {
        if (client.send(std::string(kPiece, static_cast<char>('a' + sent / kPiece % 26))))
            sent += kPiece;
    }
    ASSERT_LT(sent, 20'000'000U) << "what the system's own buffers hold";
    for (std::size_t read = 0; read < sent; read += kPiece) {
        ASSERT_EQ(server.read(kPiece),
                  std::string(kPiece, static_cast<char>('a' + read / kPiece % 26)));
    }
}

TEST_F(FrontOfATest, LetsAClientThatSendsNoMoreReadOn) {
    start();
    TlsClient client(front_->port());
    ServerEnd server = accept();
    EXPECT_TRUE(client.send("question"));
    client.endSending();
    EXPECT_EQ(server.read(8), "question");
    EXPECT_TRUE(server.isEnded());
    EXPECT_TRUE(server.send("answer"));
    EXPECT_EQ(client.read(6), "answer");
    server.close();
    EXPECT_EQ(client.readAll(), "");
    EXPECT_TRUE(areConnections(0));
}

TEST_F(FrontOfATest, LetsAServerThatSendsNoMoreReadOn) {
    start();
    TlsClient client(front_->port());
    ServerEnd server = accept();
    EXPECT_TRUE(server.send("bye"));
    server.endSending();
    EXPECT_EQ(client.readAll(), "bye");
    EXPECT_TRUE(client.send("wait"));
    EXPECT_EQ(server.read(4), "wait");
    client.endSending();
    EXPECT_TRUE(server.isEnded());
    EXPECT_TRUE(areConnections(0));
}

TEST_F(FrontOfATest, EndsBothSidesWhenAClientBreaksOff) {
    start();
    TlsClient client(front_->port());
    const ServerEnd server = accept();
    EXPECT_TRUE(client.send("half a requ"));
    client.connection().close();
    EXPECT_EQ(server.read(11), "half a requ");
    EXPECT_TRUE(server.isEnded());
    EXPECT_TRUE(areConnections(0));
}

TEST_F(FrontOfATest, EndsOnlyTheConnectionThatWasNotTaken) {
    std::atomic<int> calls{0};
    front_.emplace(settings(), [&](sys::FileDescriptor connection) {
        if (++calls == 1) throw std::bad_alloc();
        const std::lock_guard lock(mutex_);
        taken_.push_back(std::move(connection));
    });
    TlsClient refused(front_->port());
    EXPECT_EQ(refused.readAll(), "");
    TlsClient client(front_->port());
    EXPECT_TRUE(accept().send("hello"));
    EXPECT_EQ(client.read(5), "hello");
}

TEST_F(FrontOfATest, TurnsAwayWhoComesTooOftenFromOnePlace) {
    fleet::FrontLimits limits;
    limits.fromOneOrigin = 2;
    start(limits);
    std::optional<TlsClient> first(front_->port());
    const TlsClient second(front_->port());
    ASSERT_TRUE(first->isOpen() && second.isOpen());
    EXPECT_FALSE(TlsClient(front_->port()).isOpen());
    EXPECT_EQ(front_->counts().turnedAway.value(), 1U);
    first.reset();
    EXPECT_TRUE(eventually([&] { return TlsClient(front_->port()).isOpen(); }));
}

TEST_F(FrontOfATest, LetsFurtherClientsWaitWhileItIsFull) {
    fleet::FrontLimits limits;
    limits.connections = 2;
    start(limits);
    TlsClient first(front_->port());
    TlsClient second(front_->port());
    ASSERT_TRUE(first.isOpen() && second.isOpen());
    std::atomic<bool> isServed{false};
    std::thread third([&] { isServed = TlsClient(front_->port()).isOpen(); });
    const ServerEnd one = accept();
    const ServerEnd two = accept();
    EXPECT_TRUE(first.send("x"));
    EXPECT_EQ(one.read(1), "x");
    EXPECT_EQ(front_->counts().accepted.value(), 2U);
    second.connection().close();
    third.join();
    EXPECT_TRUE(isServed);
    EXPECT_EQ(front_->counts().accepted.value(), 3U);
}

/// Nothing can be opened while it lives.
class NoDescriptors {
public:
    NoDescriptors() {
        ::getrlimit(RLIMIT_NOFILE, &before_);
        const rlimit none{0, before_.rlim_max};
        ::setrlimit(RLIMIT_NOFILE, &none);
    }
    ~NoDescriptors() { ::setrlimit(RLIMIT_NOFILE, &before_); }

private:
    rlimit before_{};
};

TEST_F(FrontOfATest, TakesClientsAgainOnceThereAreDescriptors) {
    start();
    TlsClient before(front_->port());
    const ServerEnd server = accept();
    const sys::FileDescriptor waiting(::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0));
    {
        const NoDescriptors none;
        sockaddr_in at{};
        at.sin_family = AF_INET;
        at.sin_port = htons(front_->port());
        at.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        ASSERT_EQ(::connect(waiting.get(), reinterpret_cast<const sockaddr*>(&at), sizeof at), 0);
        EXPECT_TRUE(before.send("still here"));
        EXPECT_EQ(server.read(10), "still here");
        EXPECT_EQ(front_->counts().accepted.value(), 1U);
    }
    EXPECT_TRUE(eventually([&] { return front_->counts().accepted.value() == 2; }));
}

TEST_F(FrontOfATest, EndsWhenItsClientsHaveWhatTheServerSends) {
    start();
    TlsClient client(front_->port());
    TcpClient silent(front_->port());
    ServerEnd server = accept();
    ASSERT_TRUE(areConnections(2));
    std::atomic<bool> hasEnded{false};
    std::thread ending([&] {
        front_->end(seconds(60));
        hasEnded = true;
    });
    EXPECT_TRUE(silent.isEnded());
    EXPECT_FALSE(TcpClient(front_->port()).isConnected());
    EXPECT_FALSE(hasEnded);
    EXPECT_TRUE(server.send("the last words"));
    server.close();
    EXPECT_EQ(client.readAll(), "the last words");
    client.connection().close();
    ending.join();
}

TEST_F(FrontOfATest, EndsWithinItsGraceWhateverTheServerDoes) {
    start();
    TlsClient client(front_->port());
    const ServerEnd server = accept();
    front_->end(milliseconds(50));
    front_.reset();
    EXPECT_EQ(client.readAll(), "");
    EXPECT_TRUE(server.isEnded());
}

TEST_F(FrontTest, SaysWhatIsWrongWithItsSettings) {
    const auto take = [](sys::FileDescriptor) {};
    EXPECT_THROW(TlsFront({"nowhere", 0, identity_.path(), {}}, take), fleet::FrontError);
    EXPECT_THROW(TlsFront({"127.0.0.1", 0, identity_.scratch().path("none"), {}}, take),
                 fleet::FrontError);
}

}  // namespace
