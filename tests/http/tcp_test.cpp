// ctest-label: threaded
// Clients that come over TCP, fields that an application asks for and adds, and bodies in pieces.
#include "http/tcp_client.h"

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <functional>
#include <memory>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>
#include <thread>
#include <utility>
#include <vector>

#include "http/server.h"

namespace {

using http_test::tcpClient;

constexpr std::uint64_t kMostTaken = 3'000'000;
/// Beyond this, HttpServer takes no other body.
constexpr unsigned kMostHeld = 1024 * 1024;

/// A body of which only the length is kept.
class CountedBody final : public http::BodyTaker {
public:
    explicit CountedBody(std::atomic<int>& living) : living_(living) { ++living_; }
    ~CountedBody() override { --living_; }

    std::uint64_t mostBytes() const override { return kMostTaken; }
    std::optional<http::Reply> take(std::string_view piece) override {
        if (piece.find("refuse") != std::string_view::npos) return http::errorReply(507, "full");
        if (piece.find("throw") != std::string_view::npos) throw std::runtime_error("out of order");
        bytes_ += piece.size();
        return std::nullopt;
    }
    http::Answer answer() override { return http::Reply{200, std::to_string(bytes_)}; }

private:
    std::atomic<int>& living_;
    std::size_t bytes_ = 0;
};

/// Never has anything to send.
class SilentSource final : public http::EventSource {
public:
    explicit SilentSource(std::atomic<int>& living) : living_(living) { ++living_; }
    ~SilentSource() override { --living_; }
    void start(std::function<void()>) override {}
    std::string take() override { return {}; }
    bool empty() const override { return true; }

private:
    std::atomic<int>& living_;
};

class Application final : public http::Handler {
public:
    std::variant<http::Answer, http::Job> handle(http::Request request) override {
        if (request.target == "/events") {
            return http::Answer(std::make_unique<SilentSource>(living));
        }
        if (request.target == "/same") return http::Answer(http::Reply{304, ""});
        std::string text = request.method + '|' + request.body;
        for (const auto& [name, value] : request.fields)
            text += '|' + name + '=' + value;
        http::Reply reply{200, text};
        if (request.target == "/own") reply.fields.emplace_back("X-Everywhere", "its own");
        return http::Answer(std::move(reply));
    }
    http::BodyPlan planFor(const http::Request& head) override {
        if (head.target == "/refused") return http::errorReply(403, "no body of yours");
        if (head.target == "/taken") return std::make_unique<CountedBody>(living);
        return {};
    }
    const std::vector<std::string>& wantedFields() const override { return wanted_; }
    const http::Fields& commonFields() const override { return common_; }
    void prepareForEnd() override {}
    bool quiet() const override { return true; }

    std::atomic<int> living{0};

private:
    const std::vector<std::string> wanted_{"Cookie", "X-Wanted"};
    const http::Fields common_{{"X-Everywhere", "yes"}};
};

bool waitFor(const std::function<bool()>& holds) {
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(20);
    while (!holds()) {
        if (std::chrono::steady_clock::now() > deadline) return false;
        std::this_thread::yield();
    }
    return true;
}

class OverTcp : public testing::Test {
protected:
    OverTcp() { start({}); }
    ~OverTcp() override { stop(); }
    void start(const http::ServerLimits& limits) {
        stop();
        listener = http_test::listener();
        server.emplace(listener.get(), http::Door{[this](int) { return peer; }, "go away"},
                       application, counts, limits);
        serving = std::thread([this] { server->run(); });
    }
    void stop() {
        if (!serving.joinable()) return;
        server->stop();
        serving.join();
        server.reset();
    }
    RawClient connect() { return tcpClient(http_test::portOf(listener)); }
    RawClient::Answer ask(const std::string& request) {
        RawClient client = connect();
        client.send(request);
        return client.readAnswer();
    }

    http::Peer peer{0, 0, 0, http::Access::Act, "anybody"};
    Application application;
    http::ServerCounts counts;
    sys::FileDescriptor listener;
    std::optional<http::HttpServer> server;
    std::thread serving;
};

std::string put(const std::string& target, const std::string& body) {
    return "PUT " + target +
           " HTTP/1.1\r\nHost: x\r\nContent-Length: " + std::to_string(body.size()) + "\r\n\r\n" +
           body;
}

TEST_F(OverTcp, RequestsAreAnsweredOnAConnectionThatStays) {
    RawClient client = connect();
    EXPECT_EQ(client.get("/a").body, "GET|");
    EXPECT_EQ(client.post("/b", "text").body, "POST|text");
}

TEST_F(OverTcp, RequestsHoldTheFieldsThatAreWantedAsOftenAsTheyAreThere) {
    const auto answer = ask(
        "GET / HTTP/1.1\r\nHost: x\r\ncookie: a\r\nX-Other: b\r\nX-Wanted: c\r\nCookie: d\r\n\r\n");
    EXPECT_EQ(answer.body, "GET||Cookie=a|Cookie=d|X-Wanted=c");
}

TEST_F(OverTcp, FieldsBehindAChunkedBodyCountForNothing) {
    const auto answer =
        ask("PUT / HTTP/1.1\r\nHost: x\r\nTransfer-Encoding: chunked\r\nX-Wanted: head\r\n\r\n"
            "1\r\nz\r\n0\r\nX-Wanted: trailer\r\n\r\n");
    EXPECT_EQ(answer.body, "PUT|z|X-Wanted=head");
}

TEST_F(OverTcp, EveryAnswerHasTheCommonFieldsUnlessItHasItsOwn) {
    EXPECT_NE(ask("GET / HTTP/1.1\r\n\r\n").head.find("X-Everywhere: yes\r\n"), std::string::npos);
    EXPECT_NE(ask("nonsense\r\n\r\n").head.find("X-Everywhere: yes\r\n"), std::string::npos);
    const std::string own = ask("GET /own HTTP/1.1\r\n\r\n").head;
    EXPECT_NE(own.find("X-Everywhere: its own\r\n"), std::string::npos);
    EXPECT_EQ(own.find("yes"), std::string::npos);
    RawClient client = connect();
    client.send("GET /events HTTP/1.1\r\n\r\n");
    const std::string stream = client.readUntil("\r\n\r\n");
    EXPECT_NE(stream.find("X-Everywhere: yes\r\n"), std::string::npos) << stream;
}

TEST_F(OverTcp, ThoseWhoAreTurnedAwayGetTheCommonFieldsToo) {
    http::ServerLimits limits;
    limits.connections = 0;
    limits.refusals = 0;
    start(limits);
    const std::string answer = connect().readAll();
    EXPECT_EQ(answer.substr(0, 12), "HTTP/1.1 503");
    EXPECT_NE(answer.find("X-Everywhere: yes\r\n"), std::string::npos) << answer;
}

TEST_F(OverTcp, WhatHasNotChangedIsSaidWithoutABody) {
    RawClient client = connect();
    client.send("GET /same HTTP/1.1\r\nHost: x\r\n\r\n");
    const std::string head = client.readUntil("\r\n\r\n");
    EXPECT_EQ(head.substr(0, 12), "HTTP/1.1 304");
    EXPECT_EQ(head.find("Content-"), std::string::npos) << head;
    EXPECT_EQ(client.get("/next").body, "GET|");
}

TEST_F(OverTcp, AStreamEndsWhenItsClientClosesTheConnection) {
    {
        RawClient client = connect();
        client.send("GET /events HTTP/1.1\r\nHost: x\r\n\r\n");
        client.readUntil("\r\n\r\n");
        EXPECT_EQ(application.living, 1);
    }
    EXPECT_TRUE(waitFor([this] { return application.living == 0; }));
}

TEST_F(OverTcp, ABodyLargerThanMemoryShallHoldIsTakenInPieces) {
    RawClient client = connect();
    client.send(put("/taken", std::string(kMostTaken, 'x')));
    EXPECT_EQ(client.readAnswer().body, std::to_string(kMostTaken));
    client.send(put("/taken", ""));
    EXPECT_EQ(client.readAnswer().body, "0");
    client.send(
        "PUT /taken HTTP/1.1\r\nHost: x\r\nTransfer-Encoding: chunked\r\n\r\n"
        "5\r\nabcde\r\n3\r\nfgh\r\n0\r\n\r\n");
    EXPECT_EQ(client.readAnswer().body, "8");
    EXPECT_EQ(client.get("/next").body, "GET|");
    EXPECT_TRUE(waitFor([this] { return application.living == 0; }));
}

TEST_F(OverTcp, AClientThatAsksFirstIsToldToSendABodyThatIsTakenInPieces) {
    RawClient client = connect();
    client.send(
        "PUT /taken HTTP/1.1\r\nHost: x\r\nExpect: 100-continue\r\nContent-Length: 3\r\n\r\n");
    EXPECT_EQ(client.readUntil("\r\n\r\n").substr(0, 12), "HTTP/1.1 100");
    client.send("abc");
    EXPECT_EQ(client.readAnswer().body, "3");
}

TEST_F(OverTcp, ABodyIsRefusedBeforeItIsRead) {
    RawClient client = connect();
    client.send("PUT /refused HTTP/1.1\r\nHost: x\r\nContent-Length: 1000000000000\r\n\r\n");
    EXPECT_EQ(client.readAnswer().status, 403);
    client.endSending();
    EXPECT_TRUE(client.isClosed());
}

TEST_F(OverTcp, EachKindOfBodyHasItsLimit) {
    const std::string length = std::to_string(kMostTaken + 1);
    EXPECT_EQ(ask("PUT /taken HTTP/1.1\r\nContent-Length: " + length + "\r\n\r\n").status, 413);
    EXPECT_EQ(ask("PUT /taken HTTP/1.1\r\nTransfer-Encoding: chunked\r\n\r\n2dc6c1\r\n").status,
              413);
    const std::string held = std::to_string(kMostHeld + 1);
    EXPECT_EQ(ask("PUT / HTTP/1.1\r\nContent-Length: " + held + "\r\n\r\n").status, 413);
    EXPECT_EQ(ask("PUT / HTTP/1.1\r\nTransfer-Encoding: chunked\r\n\r\n100001\r\n").status, 413);
}

TEST_F(OverTcp, ATakerMayRefuseTheRestOrFail) {
    EXPECT_EQ(ask(put("/taken", "refuse")).status, 507);
    EXPECT_EQ(ask(put("/taken", "throw")).status, 500);
    EXPECT_TRUE(waitFor([this] { return application.living == 0; }));
}

TEST_F(OverTcp, ABodyThatBreaksOffIsNotTaken) {
    RawClient client = connect();
    client.send("PUT /taken HTTP/1.1\r\nHost: x\r\nContent-Length: 100\r\n\r\nbeginning");
    EXPECT_TRUE(waitFor([this] { return application.living == 1; }));
    client.close();
    EXPECT_TRUE(waitFor([this] { return application.living == 0; }));
}

}  // namespace
