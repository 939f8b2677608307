// ctest-label: threaded
// A server with a handler of the test's: answers of every kind, and when they come.
#include <gtest/gtest.h>

#include <atomic>
#include <future>
#include <optional>
#include <stdexcept>
#include <thread>

#include "host/peers/peer_of.h"
#include "host/process/socket_file.h"
#include "host/raw_client.h"
#include "http/responder.h"
#include "http/server.h"
#include "support/scratch_dir.h"

namespace {

using http::Answer;
using http::Job;
using http::Later;
using http::Reply;
using http::Request;
using http::Responder;
using std::chrono::milliseconds;
using std::chrono::seconds;

class TestHandler final : public http::Handler {
public:
    std::function<std::variant<http::Answer, http::Job>(const http::Request&)> answer;
    std::atomic<bool> isQuiet{true};

    std::variant<http::Answer, http::Job> handle(http::Request request) override {
        if (request.target == "/alive") return http::Answer(http::Reply{200, "alive"});
        return answer(request);
    }
    void prepareForEnd() override {}
    bool quiet() const override { return isQuiet; }
};

class Answers : public testing::Test {
protected:
    Answers() {
        server.emplace(socket.listen(), host::doorFor(), handler, counts);
        serving = std::thread([this] {
            server->run();
            ended = true;
        });
    }
    ~Answers() override { stop(); }
    void stop() {
        if (!serving.joinable()) return;
        server->stop();
        serving.join();
        server.reset();
    }
    RawClient connect() { return RawClient(scratch.path("s")); }
    std::string aliveness() { return connect().get("/alive").body; }

    /// Answers with `later`, and keeps the responder.
    http::Later keepResponder(milliseconds limit, std::function<http::Answer()> atLimit) {
        return {[this](const http::Responder& given) { responder.set_value(given); }, limit,
                std::move(atLimit)};
    }
    static http::Answer inTime() { return http::Reply{200, "the time is over"}; }

    ScratchDir scratch;
    host::SocketFile socket{scratch.path("s")};
    TestHandler handler;
    http::ServerCounts counts;
    std::promise<http::Responder> responder;
    std::optional<http::HttpServer> server;
    std::thread serving;
    std::atomic<bool> ended{false};
};

TEST_F(Answers, CarryTypeAndFieldsOfTheirReply) {
    handler.answer = [](const http::Request& request) {
        return http::Answer(http::Reply{
            201, request.method + request.target + request.body, "text/plain", {{"X-Odd", "yes"}}});
    };
    RawClient client = connect();
    const auto answer = client.post("/a?b", "body");
    EXPECT_EQ(answer.status, 201);
    EXPECT_NE(answer.head.find("Content-Type: text/plain\r\n"), std::string::npos);
    EXPECT_NE(answer.head.find("X-Odd: yes\r\n"), std::string::npos);
    EXPECT_EQ(answer.body, "POST/a?bbody");
}

TEST_F(Answers, MayBeEmpty) {
    handler.answer = [](const http::Request&) { return http::Answer(http::Reply{}); };
    RawClient client = connect();
    EXPECT_NE(client.get("/").head.find("Content-Length: 0\r\n"), std::string::npos);
    EXPECT_EQ(client.get("/alive").body, "alive");
}

TEST_F(Answers, TellTheHandlerWhoAsks) {
    http::Peer peer;
    handler.answer = [&](const http::Request& request) {
        peer = request.peer;
        return http::Answer(http::Reply{});
    };
    EXPECT_EQ(connect().get("/").status, 200);
    EXPECT_EQ(peer.process, ::getpid());
    EXPECT_EQ(peer.user, ::geteuid());
    EXPECT_EQ(peer.group, ::getegid());
    EXPECT_EQ(peer.access, http::Access::Act);
}

TEST_F(Answers, OfAHandlerOrAJobThatThrowsAreErrors) {
    handler.answer = [](const http::Request& request) -> std::variant<http::Answer, http::Job> {
        if (request.target == "/handler") throw std::bad_alloc();
        return http::Job([]() -> http::Answer { throw std::runtime_error("x"); });
    };
    RawClient client = connect();
    for (const char* target : {"/handler", "/job"}) {
        const auto answer = client.get(target);
        EXPECT_EQ(answer.status, 500);
        EXPECT_EQ(answer.body, "{\"error\":\"the request failed for want of memory\"}\n");
    }
}

TEST_F(Answers, MayComeLaterWithoutAWorker) {
    handler.answer = [&](const http::Request&) {
        return http::Answer(keepResponder(seconds(60), inTime));
    };
    RawClient client = connect();
    client.send("GET /later HTTP/1.1\r\n\r\n");
    const http::Responder respond = responder.get_future().get();
    EXPECT_EQ(aliveness(), "alive");
    respond(http::Reply{200, "late"});
    respond(http::Reply{200, "too late"});
    EXPECT_EQ(client.readAnswer().body, "late");
    EXPECT_EQ(client.get("/alive").body, "alive") << "the second answer is dropped";
}

TEST_F(Answers, MayComeBeforeBeginReturns) {
    handler.answer = [&](const http::Request&) {
        return http::Answer(http::Later{[](const http::Responder& respond) {
                                            respond(http::Reply{200, "at once"});
                                        },
                                        seconds(60), inTime});
    };
    EXPECT_EQ(connect().get("/").body, "at once");
}

TEST_F(Answers, MayComeLaterAfterAJob) {
    handler.answer = [&](const http::Request&) {
        return http::Job([&]() -> http::Answer { return keepResponder(seconds(60), inTime); });
    };
    RawClient client = connect();
    client.send("GET /later HTTP/1.1\r\n\r\n");
    responder.get_future().get()(http::Reply{200, "late"});
    EXPECT_EQ(client.readAnswer().body, "late");
}

TEST_F(Answers, ThatNobodyWaitsForAnyMoreAreNotMade) {
    std::promise<void> gone;
    handler.answer = [&](const http::Request&) {
        http::Later later = keepResponder(seconds(60), inTime);
        later.onGone = [&] { gone.set_value(); };
        return http::Answer(std::move(later));
    };
    {
        RawClient client = connect();
        client.send("GET /later HTTP/1.1\r\n\r\n");
        responder.get_future().wait();
    }
    EXPECT_EQ(gone.get_future().wait_for(seconds(60)), std::future_status::ready);
    EXPECT_TRUE(eventually([&] { return counts.connections.value() == 0; }));
}

TEST_F(Answers, ComeToClientsThatAskForMoreMeanwhile) {
    std::atomic<bool> hasGone{false};
    handler.answer = [&](const http::Request&) {
        http::Later later = keepResponder(seconds(60), inTime);
        later.onGone = [&] { hasGone = true; };
        return http::Answer(std::move(later));
    };
    RawClient client = connect();
    client.send("GET /later HTTP/1.1\r\n\r\n");
    const http::Responder respond = responder.get_future().get();
    client.send("GET /alive HTTP/1.1\r\n\r\n");
    EXPECT_EQ(aliveness(), "alive");
    respond(http::Reply{200, "late"});
    EXPECT_EQ(client.readAnswer().body, "late");
    EXPECT_EQ(client.readAnswer().body, "alive");
    EXPECT_FALSE(hasGone);
}

TEST_F(Answers, ThatDoNotComeInTimeAreMadeAtTheLimit) {
    handler.answer = [&](const http::Request&) {
        return http::Answer(keepResponder(milliseconds(20), inTime));
    };
    RawClient client = connect();
    EXPECT_EQ(client.get("/later").body, "the time is over");
    responder.get_future().get()(http::Reply{200, "late"});
    EXPECT_EQ(client.get("/alive").body, "alive") << "the late answer belongs to no request";
}

TEST_F(Answers, ThatNobodyGaveYetAreMadeWhenTheServerEnds) {
    handler.answer = [&](const http::Request&) {
        return http::Answer(keepResponder(seconds(60), inTime));
    };
    RawClient client = connect();
    client.send("GET /later HTTP/1.1\r\n\r\n");
    responder.get_future().get();
    server->end(seconds(60));
    EXPECT_EQ(client.readAnswer().body, "the time is over");
    EXPECT_TRUE(eventually([&] { return ended.load(); }));
}

TEST_F(Answers, ForAClientOrAServerThatHasGoneAreDropped) {
    handler.answer = [&](const http::Request&) {
        return http::Answer(keepResponder(seconds(60), inTime));
    };
    RawClient client = connect();
    client.send("GET /later HTTP/1.1\r\n\r\n");
    const http::Responder respond = responder.get_future().get();
    client.close();
    respond(http::Reply{200, "nobody reads this"});
    EXPECT_EQ(aliveness(), "alive");
    stop();
    respond(http::Reply{200, "nobody sends this"});
}

TEST_F(Answers, OfAHandlerThatIsBusyDelayTheEnd) {
    handler.isQuiet = false;
    server->end(seconds(60));
    ASSERT_TRUE(eventually([&] { return !connect().connected(); }));
    EXPECT_FALSE(ended);
    handler.isQuiet = true;
    EXPECT_TRUE(eventually([&] { return ended.load(); }));
}

/// Events that are the test's.
class TestSource final : public http::EventSource {
public:
    explicit TestSource(std::string first, std::atomic<bool>& gone)
        : text_(std::move(first)), gone_(gone) {}
    ~TestSource() override { gone_ = true; }
    void start(std::function<void()> wake) override { wake(); }
    std::string take() override { return std::exchange(text_, ""); }
    bool empty() const override { return text_.empty(); }

private:
    std::string text_;
    std::atomic<bool>& gone_;
};

TEST_F(Answers, MayBeStreamsOfAnyKind) {
    std::atomic<bool> gone{false};
    handler.answer = [&](const http::Request&) -> std::variant<http::Answer, http::Job> {
        std::string text;
        http::appendEvent(text, {"7", "tick", "n-1"});
        return http::Answer(std::make_unique<TestSource>(text, gone));
    };
    RawClient client = connect();
    client.send("GET /ticks HTTP/1.1\r\n\r\n");
    EXPECT_NE(client.readUntil("\r\n\r\n").find("Content-Type: text/event-stream\r\n"),
              std::string::npos);
    EXPECT_EQ(client.readUntil("\n\n"), "id: n-1\nevent: tick\ndata: 7\n\n");
    EXPECT_EQ(counts.streams, 1U);
    EXPECT_FALSE(gone);
    client.close();
    EXPECT_TRUE(eventually([&] { return gone.load(); }));
    EXPECT_EQ(counts.streams, 0U);
}

TEST_F(Answers, ThatAreStreamsEndWithTheServer) {
    std::atomic<bool> gone{false};
    handler.answer = [&](const http::Request&) -> std::variant<http::Answer, http::Job> {
        return http::Answer(std::make_unique<TestSource>("data: x\n\n", gone));
    };
    RawClient client = connect();
    client.send("GET /ticks HTTP/1.1\r\n\r\n");
    EXPECT_NE(client.readUntil("data: x\n\n").find("data: x"), std::string::npos);
    stop();
    EXPECT_TRUE(gone);
    EXPECT_EQ(counts.streams, 0U);
    EXPECT_TRUE(client.isClosed());
}

}  // namespace
