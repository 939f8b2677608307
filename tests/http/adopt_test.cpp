// ctest-label: threaded
// Connections that somebody else has accepted.
#include <gtest/gtest.h>
#include <sys/socket.h>

#include <atomic>
#include <functional>
#include <optional>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "host/raw_client.h"
#include "http/server.h"
#include "support/host/program.h"

namespace {

using std::chrono::seconds;

/// Answers with what the request holds.
class Mirror final : public http::Handler {
public:
    std::variant<http::Answer, http::Job> handle(http::Request request) override {
        if (hasJob) {
            return http::Job([this]() -> http::Answer {
                started = true;
                while (held)
                    sleepBriefly();
                return http::Reply{200, "job"};
            });
        }
        return http::Answer(http::Reply{
            200, request.method + '|' + request.authorization + '|' + request.peer.reason});
    }
    void prepareForEnd() override {}
    bool quiet() const override { return !held; }

    std::atomic<bool> hasJob{false};
    std::atomic<bool> held{false};
    std::atomic<bool> started{false};
};

class Adopted : public testing::Test {
protected:
    ~Adopted() override {
        handler.held = false;
        stop();
    }
    void start(const http::ServerLimits& limits = {}) {
        server.emplace(-1, http::Door{[this](int) { return peer; }, "go away"}, handler, counts,
                       limits);
        serving = std::thread([this] {
            server->run();
            ended = true;
        });
    }
    void stop() {
        if (!serving.joinable()) return;
        server->stop();
        serving.join();
    }
    /// The client's end of a connection whose other end the server has.
    RawClient connect() {
        int ends[2];
        EXPECT_EQ(::socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends), 0);
        server->adopt(sys::FileDescriptor(ends[0]));
        return RawClient(sys::FileDescriptor(ends[1]));
    }

    http::Peer peer{0, 0, 0, http::Access::Act, "brought"};
    Mirror handler;
    http::ServerCounts counts;
    std::optional<http::HttpServer> server;
    std::thread serving;
    std::atomic<bool> ended{false};
};

TEST_F(Adopted, ConnectionsAreServedThoughThereIsNoListener) {
    start();
    RawClient client = connect();
    EXPECT_EQ(client.get("/").body, "GET||brought");
    EXPECT_EQ(client.get("/").body, "GET||brought") << "one after the other";
    EXPECT_EQ(connect().get("/").status, 200);
    EXPECT_EQ(counts.accepted.value(), 2U);
}

TEST_F(Adopted, ConnectionsTellTheFieldOfAuthorization) {
    start();
    RawClient client = connect();
    client.send("GET / HTTP/1.1\r\nauthorization:  Bearer a.b \r\n\r\n");
    EXPECT_EQ(client.readAnswer().body, "GET|Bearer a.b|brought");
    EXPECT_EQ(client.get("/").body, "GET||brought") << "that of each request";
}

TEST_F(Adopted, ConnectionsPassTheDoor) {
    peer = {};
    start();
    const auto answer = connect().get("/");
    EXPECT_EQ(answer.status, 403);
    EXPECT_EQ(answer.body, "{\"error\":\"go away\"}\n");
}

TEST_F(Adopted, ConnectionsCountAmongThoseThatAreOpen) {
    http::ServerLimits limits;
    limits.connections = 2;
    start(limits);
    RawClient first = connect();
    EXPECT_EQ(first.get("/").status, 200);
    {
        RawClient second = connect();
        EXPECT_EQ(second.get("/").status, 200);
        EXPECT_EQ(connect().get("/").status, 503);
    }
    EXPECT_TRUE(eventually([&] { return connect().get("/").status == 200; }));
}

TEST_F(Adopted, ConnectionsOfAServerThatEndsAreClosed) {
    start();
    handler.hasJob = true;
    handler.held = true;
    RawClient busy = connect();
    busy.send("GET / HTTP/1.1\r\n\r\n");
    ASSERT_TRUE(eventually([&] { return handler.started.load(); }));
    server->end(seconds(60));
    RawClient late = connect();
    EXPECT_TRUE(late.isClosed());
    handler.held = false;
    EXPECT_EQ(busy.readAnswer().body, "job");
    EXPECT_TRUE(eventually([&] { return ended.load(); }));
}

TEST_F(Adopted, ConnectionsThatNobodyTookUpEndWithTheServer) {
    start();
    stop();
    RawClient client = connect();
    server.reset();
    EXPECT_TRUE(client.isClosed());
}

TEST_F(Adopted, ConnectionsComeFromManyThreads) {
    start();
    std::atomic<int> served{0};
    std::vector<std::thread> bringers;
    for (int i = 0; i < 8; ++i) {
        bringers.emplace_back([&] {
            for (int turn = 0; turn < 20; ++turn)
                served += connect().get("/").status == 200 ? 1 : 0;
        });
    }
    for (std::thread& bringer : bringers)
        bringer.join();
    EXPECT_EQ(served, 160);
}

}  // namespace
