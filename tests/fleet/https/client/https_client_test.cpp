// ctest-label: threaded
#include "fleet/https/client/https_client.h"

#include <gtest/gtest.h>

#include <chrono>
#include <functional>
#include <future>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include "tests/fleet/https/tls_server.h"

namespace {

using fleet::CertificateAuthority;
using fleet::HttpsClient;
using fleet::HttpsError;
using fleet::ServerTrust;
using fleet_test::TlsPeer;
using fleet_test::TlsServer;
using Kind = HttpsError::Kind;

constexpr fleet::Moment kDay = std::chrono::hours(24);

HttpsClient::Deadline soon() {
    return std::chrono::steady_clock::now() + std::chrono::seconds(20);
}

/// What asking ends with when it must not succeed.
HttpsError errorOf(const std::function<void()>& ask) {
    try {
        ask();
    } catch (const HttpsError& error) {
        return error;
    }
    ADD_FAILURE() << "nothing was thrown";
    return {Kind::NoAnswer, ""};
}

class HttpsClientTest : public testing::Test {
protected:
    fleet::ServerCertificate certificateFor(const std::vector<std::string>& names) const {
        return authority_.issue(names, now_, now_ + kDay);
    }
    HttpsClient clientOf(const TlsServer& server) const {
        return {fleet::readServerUrl(server.url()), byAuthority()};
    }
    ServerTrust byAuthority() const { return ServerTrust::byAuthority(authority_.certificate()); }
    ServerTrust byFingerprint() const {
        return ServerTrust::byFingerprint(
            fleet::fingerprintOfCertificate(authority_.certificate()));
    }

    const fleet::Moment now_ = fleet_test::wallTime();
    const CertificateAuthority authority_ = CertificateAuthority::make("demo", now_, now_ + kDay);
    const CertificateAuthority other_ = CertificateAuthority::make("demo", now_, now_ + kDay);
    const fleet::ServerCertificate certificate_ = certificateFor({"centre.example", "127.0.0.1"});
};

TEST_F(HttpsClientTest, SendsARequestAndReadsItsAnswer) {
    std::string seen;
    TlsServer server(certificate_, [&](TlsServer& self) {
        TlsPeer peer = self.accept();
        seen = peer.request();
        peer.answer(409, "{\"error\":\"no\"}");
    });
    HttpsClient client = clientOf(server);
    const auto answer = client.ask({"POST", "/v1/a?b=c", "body", "text/plain", "s3"}, soon());
    server.join();
    EXPECT_EQ(answer.status, 409U);
    EXPECT_EQ(answer.body, "{\"error\":\"no\"}");
    EXPECT_EQ(seen, "POST /v1/a?b=c HTTP/1.1\r\nHost: 127.0.0.1:" + server.port() +
                        "\r\nAccept: application/json\r\nAuthorization: Bearer s3\r\n"
                        "Content-Type: text/plain\r\nContent-Length: 4\r\n\r\nbody");
}

TEST_F(HttpsClientTest, UsesAConnectionAgain) {
    std::vector<std::string> seen;
    TlsServer server(certificate_, [&](TlsServer& self) {
        TlsPeer peer = self.accept();
        for (int i = 0; i < 3; ++i) {
            seen.push_back(peer.request());
            peer.answer(200, std::to_string(i));
        }
    });
    HttpsClient client = clientOf(server);
    EXPECT_EQ(client.ask({"GET", "/a"}, soon()).body, "0");
    EXPECT_EQ(client.ask({"POST", "/b", "x"}, soon()).body, "1");
    EXPECT_EQ(client.ask({"GET", "/c"}, soon()).body, "2");
    server.join();
    EXPECT_EQ(seen.size(), 3U);
}

TEST_F(HttpsClientTest, AsksAgainOnANewConnectionWhenTheServerHasClosedTheOldOne) {
    TlsServer server(certificate_, [](TlsServer& self) {
        for (const char* const body : {"first", "second"}) {
            TlsPeer peer = self.accept();
            peer.request();
            peer.answer(200, body);
            peer.endSession();
        }
    });
    HttpsClient client = clientOf(server);
    EXPECT_EQ(client.ask({"GET", "/"}, soon()).body, "first");
    EXPECT_EQ(client.ask({"GET", "/"}, soon()).body, "second");
}

TEST_F(HttpsClientTest, SendsNothingTwiceThatCouldBeDoneTwice) {
    int posts = 0;
    TlsServer server(certificate_, [&](TlsServer& self) {
        TlsPeer peer = self.accept();
        peer.request();
        peer.answer(200, "");
        posts += peer.request().rfind("POST", 0) == 0 ? 1 : 0;
    });
    HttpsClient client = clientOf(server);
    client.ask({"GET", "/"}, soon());
    const HttpsError error = errorOf([&] { client.ask({"POST", "/", "x"}, soon()); });
    server.join();
    EXPECT_EQ(error.kind(), Kind::NoAnswer);
    EXPECT_EQ(posts, 1);
}

TEST_F(HttpsClientTest, OpensANewConnectionAfterOneThatIsNotToBeKept) {
    TlsServer server(certificate_, [](TlsServer& self) {
        for (int i = 0; i < 2; ++i) {
            TlsPeer peer = self.accept();
            peer.request();
            peer.answer(200, "", "Connection: close\r\n");
        }
    });
    HttpsClient client = clientOf(server);
    EXPECT_EQ(client.ask({"POST", "/", "x"}, soon()).status, 200U);
    EXPECT_EQ(client.ask({"POST", "/", "x"}, soon()).status, 200U);
}

TEST_F(HttpsClientTest, TrustsTheAuthorityWithAFingerprintAndTellsItsCertificate) {
    TlsServer server(certificate_, [](TlsServer& self) {
        TlsPeer peer = self.accept();
        peer.request();
        peer.answer(200, "");
    });
    HttpsClient client(fleet::readServerUrl(server.url()), byFingerprint());
    EXPECT_EQ(client.authority(), "");
    EXPECT_EQ(client.ask({"GET", "/"}, soon()).status, 200U);
    EXPECT_EQ(client.authority(), authority_.certificate());
}

/// A server that nobody should believe, and what became of its connection.
class DistrustedServer : public HttpsClientTest {
protected:
    void expectDistrust(const fleet::ServerCertificate& certificate, const ServerTrust& trust,
                        const std::string& reason) {
        std::string seen = "nothing";
        TlsServer server(certificate, [&](TlsServer& self) { seen = self.accept().request(); });
        HttpsClient client(fleet::readServerUrl(server.url()), trust);
        const HttpsError error = errorOf([&] { client.ask({"GET", "/secret"}, soon()); });
        server.join();
        EXPECT_EQ(error.kind(), Kind::NotTrusted);
        EXPECT_EQ(std::string(error.what()),
                  "the server at " + server.url() + " is not trusted: " + reason);
        EXPECT_EQ(seen, "");
    }
};

TEST_F(DistrustedServer, OfAnotherAuthority) {
    expectDistrust(other_.issue({"centre.example", "127.0.0.1"}, now_, now_ + kDay), byAuthority(),
                   "another authority vouches for it than the one that is trusted");
}

TEST_F(DistrustedServer, OfAnotherAuthorityThanTheFingerprintTells) {
    expectDistrust(other_.issue({"centre.example", "127.0.0.1"}, now_, now_ + kDay),
                   byFingerprint(),
                   "another authority vouches for it than the one that is trusted");
}

TEST_F(DistrustedServer, ThatSendsTheRightAuthorityWhichHasNotVouchedForIt) {
    auto made = other_.issue({"centre.example", "127.0.0.1"}, now_, now_ + kDay);
    const std::string end = "-----END CERTIFICATE-----\n";
    made.chain = made.chain.substr(0, made.chain.find(end) + end.size()) + authority_.certificate();
    expectDistrust(made, byFingerprint(), "unable to get local issuer certificate");
}

TEST_F(DistrustedServer, WithACertificateForAnotherName) {
    expectDistrust(certificateFor({"centre.example"}), byAuthority(), "IP address mismatch");
    expectDistrust(certificateFor({"centre.example"}), byFingerprint(), "IP address mismatch");
}

TEST_F(DistrustedServer, WithACertificateThatHasEnded) {
    const auto past =
        authority_.issue({"centre.example", "127.0.0.1"}, now_ - 2 * kDay, now_ - kDay);
    expectDistrust(past, byAuthority(), "certificate has expired");
    expectDistrust(past, byFingerprint(), "certificate has expired");
}

TEST_F(HttpsClientTest, InsistsOnTheNameThatWasAskedFor) {
    TlsServer server(certificateFor({"localhost"}), [](TlsServer& self) {
        TlsPeer peer = self.accept();
        peer.request();
        peer.answer(200, "");
        self.accept();
    });
    HttpsClient byName(fleet::readServerUrl("https://localhost:" + server.port()), byAuthority());
    EXPECT_EQ(byName.ask({"GET", "/"}, soon()).status, 200U);
    HttpsClient byAddress(fleet::readServerUrl(server.url()), byAuthority());
    EXPECT_EQ(errorOf([&] { byAddress.ask({"GET", "/"}, soon()); }).kind(), Kind::NotTrusted);
}

TEST_F(HttpsClientTest, RefusesOldVersionsOfTls) {
    std::promise<void> isLimited;
    TlsServer server(certificate_, [&](TlsServer& self) {
        SSL_CTX_set_security_level(self.context(), 0);
        SSL_CTX_set_max_proto_version(self.context(), TLS1_1_VERSION);
        isLimited.set_value();
        self.accept();
    });
    isLimited.get_future().wait();
    HttpsClient client = clientOf(server);
    EXPECT_EQ(errorOf([&] { client.ask({"GET", "/"}, soon()); }).kind(), Kind::NotReached);
}

TEST_F(HttpsClientTest, TrustsNobodyWithoutAnAuthority) {
    const auto url = fleet::readServerUrl("https://127.0.0.1:1");
    for (const ServerTrust& trust : {ServerTrust{}, ServerTrust::byAuthority("no certificate")}) {
        EXPECT_EQ(errorOf([&] { HttpsClient(url, trust); }).kind(), Kind::NotTrusted);
    }
}

TEST_F(HttpsClientTest, GivesUpAtTheDeadline) {
    std::promise<void> isOver;
    bool gaveUpFirst = false;
    {
        TlsServer server(certificate_, [&](TlsServer& self) {
            TlsPeer peer = self.accept();
            peer.request();
            gaveUpFirst =
                isOver.get_future().wait_for(std::chrono::seconds(60)) == std::future_status::ready;
        });
        HttpsClient client = clientOf(server);
        const auto deadline = std::chrono::steady_clock::now() + std::chrono::milliseconds(300);
        const HttpsError error = errorOf([&] { client.ask({"GET", "/"}, deadline); });
        isOver.set_value();
        EXPECT_EQ(error.kind(), Kind::TooLate);
    }
    EXPECT_TRUE(gaveUpFirst) << "the server had to close the connection";
}

TEST_F(HttpsClientTest, TellsThatNobodyListens) {
    std::string url;
    {
        const TlsServer gone(certificate_, [](TlsServer&) {});
        url = gone.url();
    }
    HttpsClient client(fleet::readServerUrl(url), byAuthority());
    EXPECT_EQ(errorOf([&] { client.ask({"GET", "/"}, soon()); }).kind(), Kind::NotReached);
}

/// A server that sends these bytes for an answer, and what the client makes of them.
class OddAnswer : public HttpsClientTest {
protected:
    Kind kindOf(const std::string& bytes) {
        TlsServer server(certificate_, [&](TlsServer& self) {
            TlsPeer peer = self.accept();
            peer.request();
            peer.send(bytes);
        });
        HttpsClient client = clientOf(server);
        return errorOf([&] { client.ask({"GET", "/"}, soon()); }).kind();
    }
};

TEST_F(OddAnswer, IsNoHttp) {
    EXPECT_EQ(kindOf("hello there\r\n\r\n"), Kind::WrongAnswer);
}

TEST_F(OddAnswer, IsTooLong) {
    EXPECT_EQ(kindOf("HTTP/1.1 200 OK\r\nContent-Length: 99999999999\r\n\r\n"), Kind::WrongAnswer);
    EXPECT_EQ(kindOf("HTTP/1.1 200 OK\r\nX: " + std::string(20'000, 'x') + "\r\n\r\n"),
              Kind::WrongAnswer);
}

TEST_F(HttpsClientTest, TakesNoLongerAnswerThanIsAskedFor) {
    TlsServer server(certificate_, [](TlsServer& self) {
        for (int i = 0; i < 2; ++i) {
            TlsPeer peer = self.accept();
            while (!peer.request().empty())
                peer.answer(200, std::string(1001, 'x'), "Retry-After: 7\r\n");
        }
    });
    HttpsClient client = clientOf(server);
    fleet::HttpsRequest request{"GET", "/"};
    request.mostBytes = 1000;
    EXPECT_EQ(errorOf([&] { client.ask(request, soon()); }).kind(), HttpsError::Kind::WrongAnswer);
    request.mostBytes = 1001;
    const fleet::HttpsAnswer answer = client.ask(request, soon());
    EXPECT_EQ(answer.body.size(), 1001U);
    EXPECT_EQ(answer.retryAfter, "7");
}

TEST_F(OddAnswer, HasAChunkExtensionWithoutEnd) {
    TlsServer server(certificate_, [](TlsServer& self) {
        TlsPeer peer = self.accept();
        peer.request();
        peer.send("HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n1;");
        const std::string piece(16'384, 'x');
        for (int i = 0; i < 1024 && peer.send(piece); ++i)
            continue;
    });
    HttpsClient client = clientOf(server);
    EXPECT_EQ(errorOf([&] { client.ask({"GET", "/"}, soon()); }).kind(), Kind::WrongAnswer);
}

TEST_F(OddAnswer, EndsTooSoon) {
    EXPECT_EQ(kindOf("HTTP/1.1 200 OK\r\nContent-Length: 5\r\n\r\nab"), Kind::NoAnswer);
    EXPECT_EQ(kindOf("HTTP/1.1 200"), Kind::NoAnswer);
    EXPECT_EQ(kindOf(""), Kind::NoAnswer);
}

constexpr std::chrono::seconds kQuiet{20};
constexpr const char* kStreamHead =
    "HTTP/1.1 200 OK\r\nContent-Type: text/event-stream\r\nConnection: close\r\n\r\n";

TEST_F(HttpsClientTest, HandsAStreamOnPieceByPieceAsItComes) {
    std::string seen;
    std::promise<void> gotFirst;
    TlsServer server(certificate_, [&](TlsServer& self) {
        TlsPeer peer = self.accept();
        seen = peer.request();
        peer.send(std::string(kStreamHead) + "data: 1\n\n");
        // The second piece is sent only when the first one has arrived.
        gotFirst.get_future().wait_for(kQuiet);
        peer.send("data: 2\n\n");
        peer.endSession();
    });
    HttpsClient client = clientOf(server);
    std::vector<std::string> pieces;
    fleet::HttpsRequest request{"GET", "/v1/events"};
    request.lastEventId = "run-7";
    const auto answer = client.read(request, soon(), kQuiet, [&](std::string_view piece) {
        if (pieces.empty()) gotFirst.set_value();
        pieces.emplace_back(piece);
        return true;
    });
    server.join();
    EXPECT_EQ(answer.status, 200U);
    EXPECT_EQ(pieces, (std::vector<std::string>{"data: 1\n\n", "data: 2\n\n"}));
    EXPECT_NE(seen.find("Last-Event-ID: run-7\r\n"), std::string::npos) << seen;
}

TEST_F(HttpsClientTest, ReadsNoFurtherWhenItsReaderHasEnough) {
    TlsServer server(certificate_, [&](TlsServer& self) {
        TlsPeer peer = self.accept();
        peer.request();
        while (peer.send(std::string(kStreamHead) + "data: 1\n\n")) {
        }
    });
    HttpsClient client = clientOf(server);
    int pieces = 0;
    client.read({"GET", "/v1/events"}, soon(), kQuiet, [&](std::string_view) {
        ++pieces;
        return false;
    });
    EXPECT_EQ(pieces, 1);
}

TEST_F(HttpsClientTest, GivesAnAnswerThatIsNoStreamAsAWhole) {
    TlsServer server(certificate_, [&](TlsServer& self) {
        TlsPeer peer = self.accept();
        peer.request();
        peer.answer(401, "{\"error\":\"no\"}");
    });
    HttpsClient client = clientOf(server);
    const auto answer =
        client.read({"GET", "/v1/events"}, soon(), kQuiet,
                    [](std::string_view) -> bool { throw std::logic_error("there is no stream"); });
    EXPECT_EQ(answer.status, 401U);
    EXPECT_EQ(answer.body, "{\"error\":\"no\"}");
}

TEST_F(HttpsClientTest, TakesAStreamThatIsQuietForTooLongAsBroken) {
    std::promise<void> isOver;
    std::atomic<bool> gaveUpFirst{false};
    TlsServer server(certificate_, [&](TlsServer& self) {
        TlsPeer peer = self.accept();
        peer.request();
        peer.send(std::string(kStreamHead) + ":\n\n");
        isOver.get_future().wait_for(kQuiet);
    });
    HttpsClient client = clientOf(server);
    const HttpsError error = errorOf([&] {
        client.read({"GET", "/v1/events"}, soon(), std::chrono::milliseconds(50),
                    [](std::string_view) { return true; });
    });
    isOver.set_value();
    EXPECT_EQ(error.kind(), Kind::TooLate);
}

TEST_F(HttpsClientTest, WaitsForTheHeadOfAStreamUntilTheDeadlineOnly) {
    std::promise<void> isOver;
    std::atomic<bool> gaveUpFirst{false};
    TlsServer server(certificate_, [&](TlsServer& self) {
        TlsPeer peer = self.accept();
        peer.request();
        isOver.get_future().wait_for(kQuiet);
    });
    HttpsClient client = clientOf(server);
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::milliseconds(500);
    const HttpsError error = errorOf([&] {
        client.read({"GET", "/v1/events"}, deadline, kQuiet, [](std::string_view) { return true; });
    });
    isOver.set_value();
    EXPECT_EQ(error.kind(), Kind::TooLate);
}

TEST_F(HttpsClientTest, EndsAStreamThatIsCancelledFromElsewhere) {
    std::promise<void> hasBegun, isOver;
    TlsServer server(certificate_, [&](TlsServer& self) {
        TlsPeer peer = self.accept();
        peer.request();
        peer.send(std::string(kStreamHead) + ":\n\n");
        isOver.get_future().wait_for(kQuiet);
    });
    HttpsClient client = clientOf(server);
    auto canceller = std::async(std::launch::async, [&] {
        hasBegun.get_future().wait_for(kQuiet);
        client.cancel();
    });
    const HttpsError error = errorOf([&] {
        client.read({"GET", "/v1/events"}, soon(), kQuiet, [&](std::string_view) {
            hasBegun.set_value();
            return true;
        });
    });
    canceller.get();
    isOver.set_value();
    EXPECT_EQ(error.kind(), Kind::Cancelled);
    EXPECT_EQ(errorOf([&] { client.ask({"GET", "/"}, soon()); }).kind(), Kind::Cancelled);
}

}  // namespace
