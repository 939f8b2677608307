// ctest-label: threaded
// How a server ends: what is under way is finished, nothing new begins.
#include <gtest/gtest.h>
#include <unistd.h>

#include <atomic>
#include <vector>

#include "host/server_fixture.h"
#include "support/process/thread_state.h"

namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;

std::vector<ColumnInfo> taskColumns() {
    return {{"transid", 0, 8, OXA_TYPE_CHARACTER},
            {"command", 8, 16, OXA_TYPE_CHARACTER},
            {"retval", 24, 4, OXA_TYPE_INTEGER}};
}

std::string taskRow(const std::string& transid) {
    return RowBuilder().text(transid, 8).text("START", 16).integer(0);
}

class End : public ServerTest {
protected:
    bool hasEnded() {
        return eventually([&] { return ended.load(); });
    }
};

TEST_F(End, IsAtOnceWhenNothingIsUnderWay) {
    start();
    RawClient idle = connect();
    EXPECT_EQ(idle.get("/v1/health").status, 200);
    RawClient stream = subscribe();
    server->end(seconds(60));
    EXPECT_TRUE(hasEnded());
    EXPECT_TRUE(idle.isClosed());
    EXPECT_FALSE(connect().connected());
}

TEST_F(End, LeavesAListenerOpenThatSomebodyElseGoesOnWith) {
    socket.emplace(scratch.path("s"));
    services.emplace(oxa::tables(), host::CodePage("UTF-8"), "/home/of/it");
    api.emplace(*services, host::routes());
    const int listener = socket->listen();
    server = std::make_unique<http::HttpServer>(listener, host::doorFor(), *api, services->counts);
    server->leaveListenerOpen();
    server->end(seconds(60));
    server->run();
    RawClient waiting = connect();
    ASSERT_TRUE(waiting.connected());
    server = std::make_unique<http::HttpServer>(listener, host::doorFor(), *api, services->counts);
    serving = std::thread([this] { server->run(); });
    EXPECT_EQ(waiting.get("/v1/health").status, 200);
}

TEST_F(End, SaysThatItBegins) {
    socket.emplace(scratch.path("s"));
    services.emplace(oxa::tables(), host::CodePage("UTF-8"), "/home/of/it");
    api.emplace(*services, host::routes());
    server = std::make_unique<http::HttpServer>(socket->listen(), host::doorFor(), *api,
                                                services->counts);
    int ends[2];
    ASSERT_EQ(::pipe(ends), 0);
    const sys::FileDescriptor reader(ends[0]);
    sys::FileDescriptor writer(ends[1]);
    int begun = 0;
    server->endWhenReadable(reader.get(), seconds(60), [&begun] { ++begun; });
    writer.reset();
    server->run();
    EXPECT_EQ(begun, 1);
}

TEST_F(End, WhatIsRegularGoesOnWhileItWaits) {
    OpeningGate gate;
    std::atomic<bool> running{false};
    table.sampler = [&](rtoxa&) {
        running = true;
        gate.wait();
        return static_cast<int>(OXA_OK);
    };
    socket.emplace(scratch.path("s"));
    services.emplace(oxa::tables(), host::CodePage("UTF-8"), "/home/of/it");
    api.emplace(*services, host::routes());
    server = std::make_unique<http::HttpServer>(socket->listen(), host::doorFor(), *api,
                                                services->counts);
    std::atomic<int> times{0};
    server->every(milliseconds(1), [&times] { ++times; });
    serving = std::thread([this] {
        server->run();
        ended = true;
    });
    RawClient client = connect();
    client.sendPost("/v1/query", plainQuery());
    ASSERT_TRUE(eventually([&] { return running.load(); }));
    server->end(seconds(60));
    ASSERT_TRUE(eventually([&] { return !connect().connected(); }));
    const int before = times;
    EXPECT_TRUE(eventually([&] { return times > before + 2; }));
    EXPECT_FALSE(ended);
    gate.open();
    EXPECT_TRUE(hasEnded());
}

TEST_F(End, WaitsForASampleAndSendsItsAnswer) {
    OpeningGate gate;
    std::atomic<bool> running{false};
    table.sampler = [&](rtoxa& request) {
        running = true;
        gate.wait();
        insert(request, plainRow("late", 1, ""));
        return static_cast<int>(OXA_OK);
    };
    start();
    RawClient client = connect();
    client.sendPost("/v1/query", plainQuery());
    ASSERT_TRUE(eventually([&] { return running.load(); }));
    server->end(seconds(60));
    ASSERT_TRUE(eventually([&] { return !connect().connected(); }));
    EXPECT_FALSE(ended);
    gate.open();
    const auto answer = client.readAnswer();
    EXPECT_NE(answer.body.find("late"), std::string::npos);
    EXPECT_NE(answer.head.find("Connection: close"), std::string::npos);
    EXPECT_TRUE(hasEnded());
}

TEST_F(End, TakesNoFurtherRequest) {
    OpeningGate gate;
    std::atomic<int> samples{0};
    table.sampler = [&](rtoxa&) {
        ++samples;
        gate.wait();
        return static_cast<int>(OXA_OK);
    };
    start();
    RawClient busy = connect();
    busy.sendPost("/v1/query", plainQuery());
    RawClient half = connect();
    half.send("GET /v1/health HTTP/1.1\r\n");
    RawClient both = connect();
    both.sendPost("/v1/query", plainQuery());
    both.sendPost("/v1/query", plainQuery());
    ASSERT_TRUE(eventually([&] { return samples == 2; }));
    server->end(seconds(60));
    ASSERT_TRUE(eventually([&] { return !connect().connected(); }));
    half.send("\r\n");
    EXPECT_EQ(half.readAnswer().status, 503);
    gate.open();
    EXPECT_EQ(busy.readAnswer().status, 200);
    EXPECT_EQ(both.readAnswer().status, 200);
    EXPECT_TRUE(hasEnded());
    EXPECT_EQ(samples, 2);
}

TEST_F(End, ComesAfterTheGraceWhateverHangs) {
    OpeningGate gate;
    std::atomic<bool> running{false};
    table.sampler = [&](rtoxa&) {
        running = true;
        gate.wait();
        return static_cast<int>(OXA_OK);
    };
    start();
    RawClient client = connect();
    client.sendPost("/v1/query", plainQuery());
    ASSERT_TRUE(eventually([&] { return running.load(); }));
    const auto begin = std::chrono::steady_clock::now();
    server->end(milliseconds(200));
    EXPECT_TRUE(hasEnded());
    EXPECT_GE(std::chrono::steady_clock::now() - begin, milliseconds(200));
    gate.open();
    stop();  // the sample uses what stands here
}

class TaskEnd : public End {
protected:
    TaskEnd() {
        requests.sampler = [](rtoxa& request) {
            FLT1_FILTERINFO entry{};
            while (request.GetFilterInfo(&entry) == OXA_OK)
                insert(request, taskRow(entry.value));
            return static_cast<int>(OXA_OK);
        };
        requests.RegisterWithManager();
        outcomes.RegisterWithManager();
    }
    ~TaskEnd() override { letExecutorGo(); }
    /// At the end of a test whose executor uses what stands in the test.
    void letExecutorGo() {
        stop();
        if (executor.joinable()) executor.join();
    }
    void accept(const std::string& transid) {
        const auto answer = connect().post(
            "/v1/query", R"({"table":"KAGREQT","where":[{"column":"TRANSID","op":"=","value":")" +
                             transid + "\"}]}");
        EXPECT_NE(answer.body.find(transid), std::string::npos);
    }
    RawClient subscribeToOutcomes() {
        RawClient client = connect();
        client.send("GET /v1/events?table=KAGDYST HTTP/1.1\r\n\r\n");
        EXPECT_NE(client.readUntil("\r\n\r\n").find("200"), std::string::npos);
        return client;
    }

    /// Sends more to each subscriber than its connection holds unread.
    void flood() {
        for (int batch = 0; batch < 60; ++batch) {
            for (int i = 0; i < 200; ++i)
                outcomes.publish(taskRow("flood"));
            connect().get("/v1/health");  // the streams have been written to when this is answered
        }
    }

    MadeUpTable requests{"KAGREQT", taskColumns()};
    MadeUpTable outcomes{"KAGDYST", taskColumns()};
    std::thread executor;
};

TEST_F(TaskEnd, FollowsTheTaskInHandWhoseOutcomeIsSentAndNoOtherBegins) {
    start();
    RawClient events = subscribeToOutcomes();
    accept("t1");
    accept("t2");
    OpeningGate first;
    std::atomic<bool> secondBegun{false};
    executor = std::thread([&] {
        first.wait();
        outcomes.publish(taskRow("t1"));
        secondBegun = true;
        outcomes.publish(taskRow("t2"));
    });
    server->end(seconds(60));
    ASSERT_TRUE(eventually([&] { return !connect().connected(); }));
    // That the server does not end shows only in time. It would look several times meanwhile.
    EXPECT_FALSE(eventually([&] { return ended.load(); }, milliseconds(50)));
    first.open();
    EXPECT_TRUE(hasEnded());
    EXPECT_FALSE(secondBegun);
    EXPECT_NE(events.readUntil("\n\n").find("t1"), std::string::npos);
    letExecutorGo();
}

TEST_F(TaskEnd, DoesNotWaitForASubscriberThatDoesNotRead) {
    start();
    RawClient events = subscribeToOutcomes();
    flood();
    accept("t1");
    executor = std::thread([&] { outcomes.publish(taskRow("t1")); });
    server->end(seconds(60));
    EXPECT_TRUE(hasEnded());
}

TEST_F(TaskEnd, SurvivesSubscribersThatLeaveWhileTheExecutorIsHeld) {
    start();
    std::vector<RawClient> subscribers;
    for (int i = 0; i < 20; ++i)
        subscribers.push_back(subscribeToOutcomes());
    RawClient half = connect();
    half.send("GET /v1/health HTTP/1.1\r\n");
    flood();
    accept("t1");
    server->end(seconds(60));
    ASSERT_TRUE(eventually([&] { return !connect().connected(); }));
    half.send("\r\n");
    ASSERT_EQ(half.readAnswer().status, 503) << "everything is prepared for the end";
    std::atomic<pid_t> executorId{0};
    executor = std::thread([&] {
        executorId = ::gettid();
        outcomes.publish(taskRow("t1"));
    });
    ASSERT_TRUE(eventually([&] { return executorId != 0 && isAsleep(executorId); }));
    subscribers.clear();
    EXPECT_TRUE(hasEnded());
}

}  // namespace
