// ctest-label: threaded
// The stream of outcomes: identifiers, continuing, gaps, slow readers, ends of tasks.
#include "host/api/events/outcome_events.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <vector>

#include "host/server_fixture.h"

namespace {

using host::Task;
using host::TaskState;
using nlohmann::json;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::StartsWith;

std::vector<ColumnInfo> outcomeColumns() {
    return {{"originnode", 0, 8, OXA_TYPE_CHARACTER},   {"transid", 8, 12, OXA_TYPE_CHARACTER},
            {"command", 20, 16, OXA_TYPE_CHARACTER},    {"retval", 36, 4, OXA_TYPE_INTEGER},
            {"retmsgparm", 40, 32, OXA_TYPE_CHARACTER}, {"targetmsn", 72, 8, OXA_TYPE_CHARACTER}};
}

std::vector<ColumnInfo> requestColumns() {
    return {{"transid", 0, 12, OXA_TYPE_CHARACTER},
            {"command", 12, 16, OXA_TYPE_CHARACTER},
            {"product", 28, 4, OXA_TYPE_CHARACTER},
            {"retval", 32, 4, OXA_TYPE_INTEGER}};
}

/// One event as it came over the wire.
struct Received {
    std::string id;
    std::string name;
    json data;
};

Received readEvent(RawClient& client) {
    Received event;
    std::string text = client.readUntil("\n\n");
    while (text == ":\n\n")
        text = client.readUntil("\n\n");
    std::istringstream lines(text);
    for (std::string line; std::getline(lines, line) && !line.empty();) {
        const std::size_t colon = line.find(": ");
        const std::string field = line.substr(0, colon);
        const std::string value = line.substr(std::min(line.size(), colon + 2));
        if (field == "id") event.id = value;
        if (field == "event") event.name = value;
        if (field == "data") event.data = json::parse(value);
    }
    EXPECT_NE(event.data, nullptr) << text;
    return event;
}

class OutcomeEvents : public ServerTest {
protected:
    OutcomeEvents() {
        outcomes.RegisterWithManager();
        requests.RegisterWithManager();
        journal.directory = scratch.path("state");
    }
    ~OutcomeEvents() override { stop(); }

    static std::string outcome(const std::string& transid, const std::string& text = "") {
        return RowBuilder()
            .text("here", 8)
            .text(transid, 12)
            .text("START", 16)
            .integer(0)
            .text(text, 32)
            .text("", 8);
    }
    void publish(const std::string& transid, const std::string& text = "") {
        EXPECT_EQ(outcomes.publish(outcome(transid, text)), OXA_OK);
    }
    std::string idOf(int number) const {
        return services->journal.identity() + "-" + std::to_string(number);
    }
    /// A reader whose stream has begun. `field`: a line of the request's head.
    RawClient follow(const std::string& rest = "", const std::string& field = "") {
        RawClient client = connect();
        client.send("GET /v1/events?table=KAGDYST" + rest + " HTTP/1.1\r\nHost: x\r\n" +
                    (field.empty() ? "" : field + "\r\n") + "\r\n");
        head = client.readUntil("\r\n\r\n");
        EXPECT_THAT(head, StartsWith("HTTP/1.1 200 OK\r\n"));
        return client;
    }
    static std::string transidOf(const Received& event) { return event.data.value("TRANSID", ""); }
    static std::vector<std::string> transids(RawClient& client, int count) {
        std::vector<std::string> found;
        for (int i = 0; i < count; ++i)
            found.push_back(transidOf(readEvent(client)));
        return found;
    }
    void restart() {
        stop();
        start();
    }
    Task entered(const std::string& transid, const std::string& command = "STOP") {
        Task task;
        task.way = host::TaskWay::Journal;
        task.transid = transid;
        task.conditions = {{"TRANSID", OPER_EQ, transid},
                           {"COMMAND", OPER_EQ, command},
                           {"CONTEXT", OPER_EQ, "password=hunter2"}};
        task.request = {{"TRANSID", transid}, {"COMMAND", command}};
        task.accepted = host::WallClock::now();
        services->journal.enter(task);
        return task;
    }
    void end(Task task, TaskState state) {
        task.state = state;
        task.ended = host::WallClock::now();
        services->tasks.end(task);
    }

    MadeUpTable outcomes{"KAGDYST", outcomeColumns()};
    MadeUpTable requests{"KAGREQT", requestColumns()};
    std::string head;
};

TEST_F(OutcomeEvents, HaveAnIdentifierBeforeTheirData) {
    start();
    RawClient client = follow();
    EXPECT_THAT(head, HasSubstr("\r\nLast-Event-ID: " + idOf(0) + "\r\n"))
        << "to continue from when no event comes at all";
    publish("a");
    EXPECT_THAT(
        client.readUntil("\n\n"),
        StartsWith("id: " + idOf(1) + "\ndata: {\"ORIGINNODE\":\"here\",\"TRANSID\":\"a\","));
    publish("b");
    EXPECT_EQ(readEvent(client).id, idOf(2));
}

TEST_F(OutcomeEvents, ContinueWhereTheReaderStopped) {
    start();
    for (const char* name : {"a", "b", "c"})
        publish(name);
    RawClient byParameter = follow("&after=" + idOf(1));
    EXPECT_THAT(transids(byParameter, 2), ElementsAre("b", "c"));
    RawClient byField = follow("", "Last-Event-ID: " + idOf(2));
    EXPECT_THAT(transids(byField, 1), ElementsAre("c"));
    RawClient byBoth = follow("&after=" + idOf(0), "last-event-id: " + idOf(2));
    EXPECT_THAT(transids(byBoth, 1), ElementsAre("c")) << "a client that reconnects by itself";
    RawClient fromNow = follow();
    publish("d");
    for (RawClient* client : {&byParameter, &byField, &byBoth, &fromNow})
        EXPECT_THAT(transids(*client, 1), ElementsAre("d"));
}

TEST_F(OutcomeEvents, ContinueAcrossARestart) {
    start();
    publish("a");
    publish("b");
    const std::string position = idOf(1);
    restart();
    publish("c");
    RawClient client = follow("&after=" + position);
    EXPECT_THAT(transids(client, 2), ElementsAre("b", "c"));
    publish("d");
    const Received last = readEvent(client);
    EXPECT_EQ(transidOf(last), "d");
    EXPECT_EQ(last.id, idOf(4));
}

TEST_F(OutcomeEvents, ContinueWithoutAJournalOnDiskToo) {
    journal.directory.clear();
    start();
    publish("a");
    publish("b");
    RawClient client = follow("&after=" + idOf(1));
    EXPECT_THAT(transids(client, 1), ElementsAre("b"));
}

TEST_F(OutcomeEvents, AreThoseThatEveryParameterTakesLiveAndRepeated) {
    start();
    for (const char* name : {"a", "b", "a", "c"})
        publish(name);
    restart();
    RawClient client = follow("&TRANSID=a&after=" + idOf(0));
    publish("b");
    publish("a");
    EXPECT_EQ(readEvent(client).id, idOf(1));
    EXPECT_EQ(readEvent(client).id, idOf(3));
    EXPECT_EQ(readEvent(client).id, idOf(6));
}

TEST_F(OutcomeEvents, AreAsGivenForThoseWhoAreThereAndMaskedWhenTheyAreRepeated) {
    start();
    RawClient there = follow();
    publish("key:a", "pwd=hunter2 is wrong");
    EXPECT_EQ(readEvent(there).data["RETMSGPARM"], "pwd=hunter2 is wrong");
    restart();
    RawClient later = follow("&TRANSID=key:a&after=" + idOf(0));
    EXPECT_EQ(readEvent(later).data["RETMSGPARM"], "pwd=*** is wrong");
}

TEST_F(OutcomeEvents, ThatAreNotKeptAnyMoreAreAGap) {
    start();
    for (int i = 1; i <= 10; ++i)
        publish(std::to_string(i));
    stop();
    journal.keepRows = 2;
    start();
    publish("11");  // what is too old goes with the next transaction
    RawClient client = follow("&after=" + idOf(3));
    const Received gap = readEvent(client);
    EXPECT_EQ(gap.name, "gap");
    EXPECT_EQ(gap.data, json({{"missing", 5}}));
    EXPECT_EQ(gap.id, idOf(8)) << "who continues there has no gap any more";
    EXPECT_THAT(transids(client, 3), ElementsAre("9", "10", "11"));
    RawClient inTime = follow("&after=" + idOf(8));
    EXPECT_THAT(transids(inTime, 3), ElementsAre("9", "10", "11"));
}

TEST_F(OutcomeEvents, OfWhichNoneIsLeftAreAGapToo) {
    journal.keepRows = 1;
    start();
    publish("1");
    publish("2");
    stop();
    journal.keepRows = 0;
    start();
    services->journal.newest({});  // writes what can wait
    RawClient client = follow("&after=" + idOf(0));
    const Received gap = readEvent(client);
    EXPECT_EQ(gap.data, json({{"missing", 2}}));
    EXPECT_EQ(gap.id, idOf(2));
    publish("3");
    EXPECT_EQ(readEvent(client).id, idOf(3));
}

TEST_F(OutcomeEvents, OfAnotherJournalAreAGapOfUnknownSize) {
    start();
    publish("a");
    publish("b");
    for (const std::string& position : {std::string("feedfeedfeedfeed-1"), idOf(77)}) {
        RawClient client = follow("&after=" + position);
        const Received gap = readEvent(client);
        EXPECT_EQ(gap.name, "gap") << position;
        EXPECT_EQ(gap.data, json({{"missing", nullptr}}));
        EXPECT_THAT(transids(client, 2), ElementsAre("a", "b"));
    }
    stop();
    std::filesystem::remove_all(scratch.path("state"));
    start();
    RawClient client = follow("&after=feedfeedfeedfeed-1");
    EXPECT_EQ(readEvent(client).id, idOf(0)) << "also when there is nothing yet";
}

TEST_F(OutcomeEvents, ASlowReaderLosesNone) {
    constexpr int kRows = 5000;
    journal.directory.clear();
    journal.keepRows = kRows;
    start();
    RawClient slow = follow();
    for (int i = 1; i <= kRows; ++i)
        publish(std::to_string(i), "text that fills the buffers");
    for (int i = 1; i <= kRows; ++i) {
        const Received event = readEvent(slow);
        ASSERT_EQ(transidOf(event), std::to_string(i));
        ASSERT_EQ(event.id, idOf(i));
    }
}

TEST_F(OutcomeEvents, ReachTwentyReadersOnceEachWhereverTheyBegin) {
    constexpr int kRows = 400;
    start();
    std::vector<RawClient> readers;
    std::vector<int> positions;
    for (int i = 1; i <= kRows; ++i) {
        if (i % 20 == 0) {
            positions.push_back(i % 40 == 0 ? i / 2 : i - 1);
            readers.push_back(follow("&after=" + idOf(positions.back())));
        }
        publish(std::to_string(i));
    }
    ASSERT_EQ(readers.size(), 20U);
    for (std::size_t reader = 0; reader < readers.size(); ++reader) {
        for (int i = positions[reader] + 1; i <= kRows; ++i)
            ASSERT_EQ(transidOf(readEvent(readers[reader])), std::to_string(i)) << reader;
    }
}

TEST_F(OutcomeEvents, TellTheEndsOfTasksToThoseWhoAsk) {
    start();
    RawClient both = follow("&tasks=1");
    RawClient rows = follow("&tasks=0");
    const Task task = entered("never");
    end(task, TaskState::Cancelled);
    publish("row");
    const Received told = readEvent(both);
    EXPECT_EQ(told.name, "task");
    EXPECT_EQ(told.id, idOf(1));
    EXPECT_EQ(told.data["id"], task.id);
    EXPECT_EQ(told.data["state"], "cancelled");
    EXPECT_EQ(told.data["context"], "password=***");
    EXPECT_EQ(readEvent(both).id, idOf(2));
    EXPECT_EQ(readEvent(rows).id, idOf(2)) << "the numbers are the same";
    restart();
    RawClient later = follow("&tasks=1&after=" + idOf(0));
    EXPECT_EQ(readEvent(later).data["state"], "cancelled");
}

TEST_F(OutcomeEvents, AreOneForEachEndHoweverOftenItIsWrittenDown) {
    start();
    RawClient client = follow("&tasks=1");
    const Task task = entered("a");
    end(task, TaskState::Expired);
    end(task, TaskState::Expired);
    publish("row");
    EXPECT_EQ(readEvent(client).name, "task");
    EXPECT_EQ(transidOf(readEvent(client)), "row");
}

TEST_F(OutcomeEvents, OfATaskAreChosenByWhatItHasInCommonWithRows) {
    start();
    for (const char* matching :
         {"&TRANSID=b", "&TRANSID=b&COMMAND=STOP", "&COMMAND=STOP", "&COMMAND=STOP&TARGETMSN="}) {
        SCOPED_TRACE(matching);
        RawClient client = follow("&tasks=1" + std::string(matching));
        end(entered("a", "START"), TaskState::Expired);
        end(entered("b"), TaskState::Refused);
        EXPECT_EQ(readEvent(client).data["transid"], "b");
    }
    RawClient results = follow("&tasks=1&RETVAL=0");
    end(entered("b"), TaskState::Interrupted);
    publish("row");
    EXPECT_EQ(transidOf(readEvent(results)), "row") << "a task without a row has no result";
}

TEST_F(OutcomeEvents, AreTakenByTheEndOfTheServer) {
    start();
    RawClient client = follow();
    publish("a");
    server->end(std::chrono::seconds(20));
    EXPECT_EQ(transidOf(readEvent(client)), "a");
    EXPECT_TRUE(eventually([this] { return ended.load(); }));
}

TEST_F(OutcomeEvents, AreRefusedWhenThePositionMakesNoSense) {
    start();
    const auto ask = [this](const std::string& rest, const std::string& field = "X: y") {
        RawClient client = connect();
        client.send("GET /v1/events?table=" + rest + " HTTP/1.1\r\nHost: x\r\n" + field +
                    "\r\n\r\n");
        return client.readAnswer();
    };
    for (const char* position : {"17", "abc-", "-1", "abc-x"}) {
        EXPECT_EQ(ask("KAGDYST&after=" + std::string(position)).status, 400) << position;
        EXPECT_EQ(ask("KAGDYST", "Last-Event-ID: " + std::string(position)).status, 400);
    }
    EXPECT_THAT(ask("KAGDYST&after=17").body,
                HasSubstr("\\\"17\\\" is not the identifier of an event"));
    EXPECT_EQ(ask("KAGDYST&tasks=2").status, 400);
    EXPECT_THAT(ask("PLAIN&after=" + idOf(0)).body, HasSubstr("goes with the table KAGDYST only"));
    EXPECT_EQ(ask("PLAIN&tasks=1").status, 400);
}

}  // namespace
