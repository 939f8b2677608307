// ctest-label: threaded
// Requests, good and bad, and connections.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/wait.h>

#include <atomic>
#include <stdexcept>
#include <vector>

#include "host/server_fixture.h"

namespace {

using std::chrono::milliseconds;

class Requests : public ServerTest {};
class BadRequests : public ServerTest {};
class Connections : public ServerTest {};
class Samples : public ServerTest {};

/// A valid query of exactly `length` bytes.
std::string paddedQuery(std::size_t length) {
    std::string body = R"({"table":"PLAIN"})";
    body.resize(length, ' ');
    return body;
}

TEST_F(Requests, TablesAndHealth) {
    start();
    RawClient client = connect();
    const auto tables = client.get("/v1/tables");
    EXPECT_EQ(tables.status, 200);
    EXPECT_NE(tables.head.find("Content-Type: application/json\r\n"), std::string::npos);
    EXPECT_EQ(
        tables.body.find(R"({"tables":[{"application":"TEST","name":"PLAIN","columns":[{"name":)"),
        0U);
    const auto health = client.get("/v1/health");
    EXPECT_EQ(health.status, 200);
    EXPECT_NE(health.body.find(R"("home":"/home/of/it")"), std::string::npos);
    EXPECT_NE(health.body.find(R"("subscriptions":0)"), std::string::npos);
}

TEST_F(Requests, QueryAnswersTheRowsThatTheConditionsTake) {
    table.sampler = [](rtoxa& request) {
        for (int i = 1; i <= 3; ++i)
            insert(request, plainRow("n" + std::to_string(i), i, ""));
        return static_cast<int>(OXA_OK);
    };
    start();
    RawClient client = connect();
    const auto answer = client.post(
        "/v1/query", R"({"table":"PLAIN","where":[{"column":"NUMBER","op":">","value":1},)"
                     R"({"column":"NAME","op":"!=","value":"n3"}]})");
    EXPECT_EQ(answer.status, 200);
    EXPECT_EQ(answer.body, "{\"rows\":[{\"NAME\":\"n2\",\"NUMBER\":2,\"TEXT\":\"\"}]}\n");
}

TEST_F(Requests, SentTogetherAreAnsweredInOrder) {
    start();
    RawClient client = connect();
    const std::string query = plainQuery();
    const std::string one =
        "POST /v1/query HTTP/1.1\r\nHost: x\r\nContent-Length: " + std::to_string(query.size()) +
        "\r\n\r\n" + query;
    ASSERT_TRUE(client.send(one + "GET /v1/nothing HTTP/1.1\r\n\r\n" + one +
                            "GET /v1/health HTTP/1.1\r\nConnection: close\r\n\r\n"));
    EXPECT_EQ(client.readAnswer().status, 200);
    EXPECT_EQ(client.readAnswer().status, 404);
    EXPECT_EQ(client.readAnswer().status, 200);
    const auto last = client.readAnswer();
    EXPECT_NE(last.body.find("uptime_seconds"), std::string::npos);
    EXPECT_NE(last.head.find("Connection: close\r\n"), std::string::npos);
    EXPECT_TRUE(client.isClosed());
}

TEST_F(Requests, MayComeByteByByte) {
    start();
    RawClient client = connect();
    const std::string query = plainQuery();
    for (const char byte : "POST /v1/query HTTP/1.1\r\nContent-Length: " +
                               std::to_string(query.size()) + "\r\n\r\n" + query) {
        ASSERT_TRUE(client.send(std::string(1, byte)));
    }
    EXPECT_EQ(client.readAnswer().status, 200);
}

TEST_F(Requests, OfHttp10AreAnsweredAndClosed) {
    start();
    RawClient client = connect();
    client.send("GET /v1/tables HTTP/1.0\r\n\r\n");
    EXPECT_EQ(client.readAnswer().status, 200);
    EXPECT_TRUE(client.isClosed());
}

TEST_F(Requests, MayBeChunked) {
    start();
    RawClient client = connect();
    client.send(
        "POST /v1/query HTTP/1.1\r\nTransfer-Encoding: chunked\r\n\r\n"
        "8\r\n{\"table\"\r\n9\r\n:\"PLAIN\"}\r\n0\r\n\r\n");
    EXPECT_EQ(client.readAnswer().status, 200);
}

TEST_F(Requests, OfAClientThatHasEndedItsSideAreAnswered) {
    start();
    RawClient client = connect();
    client.sendPost("/v1/query", plainQuery());
    client.endSending();
    EXPECT_EQ(client.readAnswer().status, 200);
    EXPECT_TRUE(client.isClosed());
}

TEST_F(Requests, ThatWaitForLeaveToSendGetIt) {
    start();
    RawClient client = connect();
    const std::string query = plainQuery();
    client.send("POST /v1/query HTTP/1.1\r\nExpect: 100-continue\r\nContent-Length: " +
                std::to_string(query.size()) + "\r\n\r\n");
    EXPECT_EQ(client.readUntil("\r\n\r\n"), "HTTP/1.1 100 Continue\r\n\r\n");
    client.send(query);
    EXPECT_EQ(client.readAnswer().status, 200);
}

TEST_F(Requests, OfTheGreatestSizePass) {
    start();
    RawClient client = connect();
    EXPECT_EQ(client.post("/v1/query", paddedQuery(1024 * 1024)).status, 200);
    EXPECT_EQ(client.get("/v1/health").status, 200);
}

TEST_F(BadRequests, GetAnErrorThatSaysWhatIsWrong) {
    start();
    RawClient client = connect();
    const auto unknown = client.post("/v1/query", R"({"table":"NOPE"})");
    EXPECT_EQ(unknown.status, 404);
    EXPECT_EQ(unknown.body, "{\"error\":\"there is no table \\\"NOPE\\\"\"}\n");
    const auto method = client.get("/v1/query");
    EXPECT_EQ(method.status, 405);
    EXPECT_NE(method.head.find("Allow: POST\r\n"), std::string::npos);
    EXPECT_EQ(client.post("/v1/query", "nonsense").status, 400);
    EXPECT_EQ(client.get("/v1/events").status, 400);
    EXPECT_EQ(client.get("/v1/health").status, 200) << "the connection is still good";
}

TEST_F(Requests, ForAHeadGetTheFieldsOfTheWholeAnswerAndNoBody) {
    start();
    RawClient client = connect();
    const auto whole = client.get("/v1/tables");
    client.send(
        "HEAD /v1/tables HTTP/1.1\r\n\r\n"
        "HEAD /v1/query HTTP/1.1\r\n\r\n"
        "GET /v1/health HTTP/1.1\r\n\r\n");
    EXPECT_EQ(client.readUntil("\r\n\r\n"), whole.head);
    EXPECT_NE(client.readUntil("\r\n\r\n").find("405"), std::string::npos);
    EXPECT_EQ(client.readUntil("\r\n").find("HTTP/1.1 200 OK"), 0U);
}

TEST_F(Requests, ForTheHeadOfAStreamOpenNone) {
    start();
    RawClient client = connect();
    client.send("HEAD /v1/events?table=PLAIN HTTP/1.1\r\n\r\n");
    const std::string head = client.readUntil("\r\n\r\n");
    EXPECT_EQ(head.find("HTTP/1.1 200 OK"), 0U);
    EXPECT_NE(head.find("Content-Type: text/event-stream\r\n"), std::string::npos);
    EXPECT_EQ(head.find("Content-Length"), std::string::npos);
    EXPECT_EQ(client.get("/v1/health").status, 200) << "the connection goes on";
    EXPECT_EQ(table.liveObjects(), 0U);
}

TEST_F(Requests, ForOptionsGetTheMethodsAndNothingElse) {
    start();
    RawClient client = connect();
    client.send("OPTIONS /v1/tables HTTP/1.1\r\n\r\n");
    const std::string head = client.readUntil("\r\n\r\n");
    EXPECT_EQ(head.find("HTTP/1.1 204 "), 0U);
    EXPECT_NE(head.find("Allow: GET, HEAD\r\n"), std::string::npos);
    EXPECT_EQ(head.find("Content-"), std::string::npos);
    EXPECT_EQ(client.get("/v1/health").status, 200);
}

TEST_F(BadRequests, ThatAreNotHttpGet400AndAreClosed) {
    start();
    for (const std::string& bytes :
         {std::string("nonsense\r\n\r\n"), std::string("GET /v1/tables\r\n\r\n"),
          std::string("GET /v1/tables HTTP/9.9\r\n\r\n"),
          std::string("GET /v1/tables HTTP/1.1\r\nno colon\r\n\r\n"),
          std::string("POST /v1/query HTTP/1.1\r\nContent-Length: x\r\n\r\n"),
          std::string("POST /v1/query HTTP/1.1\r\nContent-Length: -1\r\n\r\n"),
          std::string("POST /v1/query HTTP/1.1\r\nContent-Length: 1\r\nContent-Length: 2\r\n\r\n"),
          std::string("POST /v1/query HTTP/1.1\r\nTransfer-Encoding: chunked\r\n\r\nzz\r\n"),
          std::string("\0\0\0\0\0\0\0\0", 8), std::string("\x16\x03\x01\x02\x00\x01\x00\x01", 8)}) {
        RawClient client = connect();
        client.send(bytes);
        const auto answer = client.readAnswer();
        EXPECT_EQ(answer.status, 400) << bytes;
        EXPECT_EQ(answer.body.find("{\"error\":\""), 0U) << bytes;
        EXPECT_TRUE(client.isClosed()) << bytes;
    }
    EXPECT_EQ(connect().get("/v1/health").status, 200);
}

TEST_F(BadRequests, WithALongHeadAreRefused) {
    start();
    RawClient client = connect();
    client.send("GET /v1/tables HTTP/1.1\r\nX: " + std::string(20'000, 'x') + "\r\n\r\n");
    const auto answer = client.readAnswer();
    EXPECT_EQ(answer.status, 400);
    EXPECT_EQ(answer.body, "{\"error\":\"the request's head is larger than 16384 bytes\"}\n");
    EXPECT_TRUE(client.isClosed());
}

TEST_F(BadRequests, WithAnEndlessHeadAreRefused) {
    start();
    RawClient client = connect();
    while (client.send(std::string(1000, 'x'))) {
    }
    EXPECT_EQ(connect().get("/v1/health").status, 200);
}

TEST_F(BadRequests, WithALargeBodyAreRefused) {
    start();
    RawClient client = connect();
    const auto answer = client.post("/v1/query", paddedQuery(1024 * 1024 + 1));
    EXPECT_EQ(answer.status, 413);
    EXPECT_EQ(answer.body, "{\"error\":\"the body is larger than 1048576 bytes\"}\n");
}

TEST_F(BadRequests, ThatOnlyAnnounceALargeBodyAreRefusedAtOnce) {
    start();
    for (const char* length : {"1048577", "18446744073709551615"}) {
        RawClient client = connect();
        client.send("POST /v1/query HTTP/1.1\r\nExpect: 100-continue\r\nContent-Length: " +
                    std::string(length) + "\r\n\r\n");
        EXPECT_EQ(client.readAnswer().status, 413);
    }
}

TEST_F(BadRequests, WhoseChunksAddUpToALargeBodyAreRefused) {
    start();
    RawClient client = connect();
    client.send("POST /v1/query HTTP/1.1\r\nTransfer-Encoding: chunked\r\n\r\n");
    const std::string chunk = "10000\r\n" + std::string(65536, ' ') + "\r\n";
    for (int i = 0; i < 17; ++i)
        client.send(chunk);
    EXPECT_EQ(client.readAnswer().status, 413);
}

TEST_F(BadRequests, ThatEndEarlyAreRefused) {
    start();
    for (const char* bytes : {"POST /v1/query HTTP/1.1\r\nContent-Length: 100\r\n\r\n{\"table\":",
                              "GET /v1/tables HT", "GET /v1/tables HTTP/1.1\r\nHost: x"}) {
        RawClient client = connect();
        client.send(bytes);
        client.endSending();
        const auto answer = client.readAnswer();
        EXPECT_EQ(answer.status, 400) << bytes;
        EXPECT_EQ(answer.body, "{\"error\":\"the request ended before it was complete\"}\n");
    }
}

TEST_F(Connections, OfSlowClientsEnd) {
    http::ServerLimits limits;
    limits.requestTime = milliseconds(150);
    start(limits);
    std::vector<RawClient> clients;
    for (const char* bytes : {"G", "GET /v1/tables HTTP/1.1\r\n",
                              "POST /v1/query HTTP/1.1\r\nContent-Length: 10\r\n\r\n{"}) {
        clients.push_back(connect());
        clients.back().send(bytes);
    }
    for (RawClient& client : clients)
        EXPECT_TRUE(client.isClosed());
}

TEST_F(Connections, ThatDripBytesEndTooBecauseTheTimeIsForTheWholeRequest) {
    http::ServerLimits limits;
    limits.requestTime = milliseconds(300);
    start(limits);
    RawClient client = connect();
    client.send("GET /v1/tables HTTP/1.1\r\nX: ");
    EXPECT_TRUE(eventually([&client] { return !client.send("x"); }));
}

TEST_F(Connections, ThatAreIdleEnd) {
    http::ServerLimits limits;
    limits.idleTime = milliseconds(1000);
    start(limits);
    RawClient fresh = connect();
    RawClient used = connect();
    EXPECT_EQ(used.get("/v1/health").status, 200);
    EXPECT_TRUE(fresh.isClosed());
    EXPECT_TRUE(used.isClosed());
}

TEST_F(Connections, OfClientsThatDoNotReadEnd) {
    table.sampler = [](rtoxa& request) {
        for (int i = 0; i < 20'000; ++i)
            insert(request, plainRow("row", i, "filling text"));
        return static_cast<int>(OXA_OK);
    };
    http::ServerLimits limits;
    limits.answerTime = milliseconds(200);
    limits.connections = 1;
    start(limits);
    RawClient client = connect();
    client.sendPost("/v1/query", plainQuery());
    EXPECT_TRUE(eventually([&] { return connect().get("/v1/health").status == 200; }));
}

TEST_F(Connections, BeyondTheLimitGet503UntilOneIsFree) {
    start();
    std::vector<RawClient> clients;
    for (int i = 0; i < 256; ++i) {
        clients.push_back(connect());
        ASSERT_TRUE(clients.back().connected());
    }
    EXPECT_EQ(clients.back().get("/v1/health").status, 200);
    RawClient refused = connect();
    const auto answer = refused.get("/v1/health");
    EXPECT_EQ(answer.status, 503);
    EXPECT_EQ(answer.body, "{\"error\":\"too many connections are open\"}\n");
    EXPECT_TRUE(refused.isClosed());
    EXPECT_EQ(clients.front().get("/v1/health").status, 200) << "the others go on";
    clients.front().close();
    EXPECT_TRUE(eventually([&] { return connect().get("/v1/health").status == 200; }));
}

TEST_F(Connections, ThatAreIdleBeyondTheLimitAllGet503) {
    start();
    std::vector<RawClient> clients;
    for (int i = 0; i < 600; ++i) {
        clients.push_back(connect());
        ASSERT_TRUE(clients.back().connected()) << i;
    }
    for (std::size_t i = 256; i < clients.size(); ++i) {
        const auto answer = clients[i].readAnswer();
        EXPECT_EQ(answer.status, 503) << i;
        EXPECT_EQ(answer.body, "{\"error\":\"too many connections are open\"}\n") << i;
        clients[i].close();
    }
    for (std::size_t i = 0; i < 256; ++i)
        EXPECT_EQ(clients[i].get("/v1/health").status, 200) << i;
}

TEST_F(Connections, BeyondTheLimitGet503WhateverTheySend) {
    http::ServerLimits limits;
    limits.connections = 1;
    limits.refusals = 0;
    start(limits);
    RawClient first = connect();
    EXPECT_EQ(first.get("/v1/health").status, 200);
    for (int i = 0; i < 300; ++i)
        EXPECT_EQ(connect().get("/v1/health").status, 503) << i;
}

TEST_F(Connections, FarBeyondTheLimitCostNothing) {
    http::ServerLimits limits;
    limits.connections = 2;
    limits.refusals = 3;
    start(limits);
    RawClient first = connect();
    RawClient second = connect();
    EXPECT_EQ(second.get("/v1/health").status, 200);
    const std::size_t before = openDescriptors();
    std::vector<RawClient> flood;
    for (int i = 0; i < 500; ++i)
        flood.push_back(connect());
    EXPECT_EQ(first.get("/v1/health").status, 200);
    EXPECT_LE(openDescriptors(), before + 500 + 3);
}

TEST_F(Connections, LeaveNoDescriptorBehind) {
    start();
    EXPECT_EQ(connect().get("/v1/health").status, 200);
    std::size_t before = 0;  // perhaps with that connection, which is closed a moment later
    ASSERT_TRUE(eventually([&] {
        const std::size_t now = openDescriptors();
        return std::exchange(before, now) == now;
    }));
    for (int i = 0; i < 300; ++i) {
        RawClient client = connect();
        if (i % 3 == 0) client.get("/v1/health");
        if (i % 3 == 1) client.send("GET /v1/ta");
        if (i % 3 == 2) client.sendPost("/v1/query", plainQuery());
    }
    EXPECT_TRUE(eventually([&] { return openDescriptors() <= before; }));
}

TEST_F(Connections, AreNotInheritedByChildren) {
    start();
    RawClient client = connect();
    EXPECT_EQ(client.get("/v1/health").status, 200);
    int checked = 0;
    for (const auto& entry : std::filesystem::directory_iterator("/proc/self/fd")) {
        const int descriptor = std::stoi(entry.path().filename());
        std::error_code error;
        const std::string target = std::filesystem::read_symlink(entry.path(), error).string();
        if (error || (target.find("socket:") != 0 && target.find("anon_inode:") != 0)) continue;
        // What the test program was started with is not ours.
        if (descriptor < 3) continue;
        EXPECT_NE(::fcntl(descriptor, F_GETFD) & FD_CLOEXEC, 0) << target;
        ++checked;
    }
    EXPECT_GE(checked, 4) << "listener, both ends of the connection, event loop";
}

TEST_F(Connections, OfOtherUsersAreRefused) {
    if (::geteuid() != 0) GTEST_SKIP() << "only root can become another user";
    start();
    ASSERT_EQ(::chmod(scratch.path().c_str(), 0755), 0);
    ASSERT_EQ(::chmod(scratch.path("s").c_str(), 0666), 0);
    const pid_t child = ::fork();
    if (child == 0) {
        if (::setgid(65534) != 0 || ::setuid(65534) != 0) ::_exit(1);
        RawClient client = connect();
        const auto answer = client.get("/v1/health");
        const bool refused = answer.status == 403 &&
                             answer.body.find("serves its own user only") != std::string::npos;
        ::_exit(refused && client.isClosed() ? 0 : 2);
    }
    int status = -1;
    ASSERT_EQ(::waitpid(child, &status, 0), child);
    EXPECT_EQ(status, 0);
}

TEST_F(Connections, OfReadersShutNobodyElseOut) {
    if (::geteuid() != 0) GTEST_SKIP() << "only root can become another user";
    http::ServerLimits limits;
    limits.readers = 2;
    host::AccessGroups groups;
    groups.read = host::Group{"nogroup", 65534};
    start(limits, groups);
    ASSERT_EQ(::chmod(scratch.path().c_str(), 0755), 0);
    ASSERT_EQ(::chmod(scratch.path("s").c_str(), 0666), 0);
    const pid_t child = ::fork();
    if (child == 0) {
        if (::setgid(65534) != 0 || ::setuid(65534) != 0) ::_exit(1);
        RawClient first = connect();
        if (first.get("/v1/health").status != 200) ::_exit(2);
        RawClient second = subscribe();
        const auto third = connect().get("/v1/health");
        if (third.status != 503) ::_exit(3);
        if (third.body.find("for reading only") == std::string::npos) ::_exit(4);
        first.close();
        const bool served = eventually([&] { return connect().get("/v1/health").status == 200; });
        ::_exit(served ? 0 : 5);
    }
    int status = -1;
    ASSERT_EQ(::waitpid(child, &status, 0), child);
    EXPECT_EQ(status, 0);
    EXPECT_EQ(connect().get("/v1/health").status, 200);
}

TEST_F(Samples, ThatTakeLongHoldUpNobodyElse) {
    OpeningGate gate;
    std::atomic<int> running{0};
    table.sampler = [&](rtoxa& request) {
        FLT1_FILTERINFO entry{};
        if (request.GetFilterInfo(&entry) != OXA_OK) return static_cast<int>(OXA_OK);
        ++running;
        gate.wait();
        insert(request, plainRow("slow", 1, ""));
        return static_cast<int>(OXA_OK);
    };
    start();
    std::vector<RawClient> slow;
    for (int i = 0; i < 31; ++i) {
        slow.push_back(connect());
        slow.back().sendPost(
            "/v1/query",
            R"({"table":"PLAIN","where":[{"column":"NAME","op":"=","value":"slow"}]})");
    }
    ASSERT_TRUE(eventually([&] { return running == 31; }));
    RawClient quick = connect();
    EXPECT_EQ(quick.get("/v1/health").status, 200);
    EXPECT_EQ(quick.post("/v1/query", plainQuery()).status, 200);
    RawClient events = subscribe();
    table.publish(plainRow("event", 1, ""));
    EXPECT_NE(events.readUntil("\n\n").find("event"), std::string::npos);
    gate.open();
    for (RawClient& client : slow)
        EXPECT_NE(client.readAnswer().body.find(R"("NAME":"slow")"), std::string::npos);
}

TEST_F(Samples, BeyondThoseThatMayWaitGet503) {
    OpeningGate gate;
    std::atomic<int> running{0};
    table.sampler = [&](rtoxa&) {
        ++running;
        gate.wait();
        return static_cast<int>(OXA_OK);
    };
    http::ServerLimits limits;
    limits.workers = 2;
    limits.waitingRequests = 1;
    start(limits);
    std::vector<RawClient> clients;
    for (int i = 0; i < 2; ++i) {
        clients.push_back(connect());
        clients.back().sendPost("/v1/query", plainQuery());
    }
    ASSERT_TRUE(eventually([&] { return running == 2; }));
    clients.push_back(connect());
    clients.back().sendPost("/v1/query", plainQuery());
    RawClient late = connect();
    EXPECT_TRUE(eventually([&] {
        if (late.get("/v1/health").status != 200) return false;
        RawClient probe = connect();
        probe.sendPost("/v1/query", plainQuery());
        return probe.readAnswer(milliseconds(200)).status == 503;
    }));
    const auto answer = late.post("/v1/query", plainQuery());
    EXPECT_EQ(answer.status, 503);
    EXPECT_EQ(answer.body, "{\"error\":\"too many requests are waiting\"}\n");
    EXPECT_EQ(late.get("/v1/health").status, 200);
    gate.open();
    for (RawClient& client : clients)
        EXPECT_EQ(client.readAnswer().status, 200);
}

TEST_F(Samples, OfClientsThatVanishedHarmNobody) {
    OpeningGate gate;
    std::atomic<int> begun{0};
    std::atomic<int> finished{0};
    table.sampler = [&](rtoxa& request) {
        ++begun;
        gate.wait();
        for (int i = 0; i < 1000; ++i)
            insert(request, plainRow("row", i, ""));
        ++finished;
        return static_cast<int>(OXA_OK);
    };
    start();
    for (int i = 0; i < 20; ++i)
        connect().sendPost("/v1/query", plainQuery());
    ASSERT_TRUE(eventually([&] { return begun == 20; }));
    gate.open();
    EXPECT_TRUE(eventually([&] { return finished == 20; }));
    EXPECT_EQ(connect().get("/v1/health").status, 200);
}

TEST_F(Samples, ThatFailGet500) {
    int kind = 0;
    table.sampler = [&](rtoxa&) -> int {
        if (kind == 1) throw std::runtime_error("x");
        if (kind == 2) throw 1;
        return 0x21060099;
    };
    start();
    RawClient client = connect();
    EXPECT_EQ(client.post("/v1/query", plainQuery()).body,
              "{\"error\":\"table PLAIN failed with status 0x21060099\"}\n");
    for (kind = 1; kind <= 2; ++kind)
        EXPECT_EQ(client.post("/v1/query", plainQuery()).status, 500);
}

TEST_F(Samples, WithTextThatIsNoUtf8AreAnswered) {
    table.sampler = [](rtoxa& request) {
        insert(request, plainRow("\xFF\xFE", 1, std::string(15, 'x') + "\xC3\xA4"));
        return static_cast<int>(OXA_OK);
    };
    start();
    RawClient client = connect();
    const auto answer = client.post("/v1/query", plainQuery());
    EXPECT_EQ(answer.status, 200);
    EXPECT_NE(answer.body.find("xxx\xEF\xBF\xBD\""), std::string::npos);
}

}  // namespace
