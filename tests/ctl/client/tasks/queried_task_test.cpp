// ctest-label: threaded
#include "ctl/client/tasks/queried_task.h"

#include <gtest/gtest.h>

#include "ctl/client/canned_host.h"
#include "ctl/client/failure.h"

namespace {

using ctl::Await;
using ctl::runQueried;
using ctl::TaskResult;
using ctl_test::CannedHost;
using ctl_test::Peer;
using nlohmann::json;

constexpr const char* kAccepted = R"({"rows": [{"TRANSID": "T", "RETVAL": 0}]})";

ctl::TaskRequest request() {
    ctl::TaskRequest made;
    made.command = "START";
    made.transid = "T";
    made.product = "ux";
    return made;
}

ctl::HostAddress addressOf(const CannedHost& host) {
    return {host.path(), host.path() + ".rpc", std::chrono::seconds(20)};
}

/// What a host keeps of the task.
struct Record {
    int status = 404;
    std::string body = "{}";
    std::string request = {};  ///< what it was asked
};

/// Runs a command to its outcome; the host answers the request and then streams `events`. Only
/// then is it asked for its record.
TaskResult resultWith(const std::string& reply, const std::string& events, Record* record) {
    CannedHost host([&](const CannedHost& self) {
        const Peer stream = self.accept();
        stream.request();
        stream.beginStream();
        {
            const Peer peer = self.accept();
            peer.request();
            peer.answer(200, reply);
        }
        stream.send(events);
        if (record == nullptr) return;
        const Peer peer = self.accept();
        record->request = peer.request();
        peer.answer(record->status, record->body);
    });
    TaskResult result = runQueried(addressOf(host), request(), Await::FirstOutcome);
    host.join();
    return result;
}

TaskResult outcomeWith(const std::string& events) {
    Record none;
    return resultWith(kAccepted, events, &none);
}

TEST(Task, SubscribesBeforeItAsksAndEndsWithTheOutcome) {
    const TaskResult result = outcomeWith("data: {\"RETVAL\": 1024}\n\n");
    EXPECT_EQ(result.end, TaskResult::End::Outcome);
    EXPECT_EQ(result.reply, (json{{"TRANSID", "T"}, {"RETVAL", 0}}));
    EXPECT_EQ(result.events, (json{{{"RETVAL", 1024}}}));
}

TEST(Task, HasTheHostsRecordOnceTheTaskIsOver) {
    Record record{200, R"({"state": "done"})"};
    const TaskResult result = resultWith(kAccepted, "data: {\"RETVAL\": 0}\n\n", &record);
    EXPECT_EQ(result.record, (json{{"state", "done"}}));
    EXPECT_EQ(record.request.rfind("GET /v1/tasks/T?wait=5 HTTP/1.1\r\n", 0), 0U) << record.request;
}

TEST(Task, HasNoRecordWhereTheHostKeepsNoneOrCannotSay) {
    for (const Record& answer :
         {Record{404, "{}"}, Record{503, "{}"}, Record{200, "[1]"}, Record{200, "no JSON"}}) {
        Record record = answer;
        const TaskResult result = resultWith(kAccepted, "data: {\"RETVAL\": 0}\n\n", &record);
        EXPECT_EQ(result.end, TaskResult::End::Outcome);
        EXPECT_EQ(result.record, json()) << answer.body;
    }
}

TEST(Task, PassesOverEventsThatAreNoOutcome) {
    const TaskResult result = outcomeWith(
        "event: overflow\ndata: {}\n\ndata: no JSON\n\ndata: [1]\n\ndata: {\"RETVAL\": 0}\n\n");
    EXPECT_EQ(result.end, TaskResult::End::Outcome);
    EXPECT_EQ(result.events, (json{{{"RETVAL", 0}}}));
}

TEST(Task, ThatIsRefusedWaitsForNothing) {
    const TaskResult result = resultWith(R"({"rows": [{"RETVAL": 1003}]})", "", nullptr);
    EXPECT_EQ(result.end, TaskResult::End::Refused);
    EXPECT_EQ(result.events, json::array());
}

TEST(Task, WhoseHostGoesAwayHasNoOutcome) {
    const TaskResult result = resultWith(kAccepted, "", nullptr);
    EXPECT_EQ(result.end, TaskResult::End::HostGone);
    EXPECT_EQ(result.reply["RETVAL"], 0);
}

TEST(Task, ThatNobodyWaitsForEndsWithItsReply) {
    const CannedHost host([](const CannedHost& self) {
        const Peer peer = self.accept();
        peer.request();
        peer.answer(200, kAccepted);
    });
    json seen;
    const TaskResult result = runQueried(addressOf(host), request(), Await::Reply,
                                         {{}, [&seen](const json& reply) { seen = reply; }});
    EXPECT_EQ(result.end, TaskResult::End::Accepted);
    EXPECT_EQ(seen, result.reply);
}

TEST(Task, WhoseReplyIsFilteredOutIsAFailure) {
    const CannedHost host([](const CannedHost& self) {
        const Peer peer = self.accept();
        peer.request();
        peer.answer(200, R"({"rows": []})");
    });
    try {
        runQueried(addressOf(host), request(), Await::Reply);
        FAIL();
    } catch (const ctl::Failure& failure) {
        EXPECT_EQ(failure.status(), ctl::kHostReportedFailure);
    }
}

}  // namespace
