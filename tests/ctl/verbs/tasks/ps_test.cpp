// ctest-label: threaded
#include "ctl/verbs/tasks/ps.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

#include "ctl/client/canned_host.h"
#include "ctl/client/failure.h"
#include "ctl/verbs/arguments/global_arguments.h"
#include "ctl/verbs/invocation.h"

namespace {

using ctl::Format;
using ctl_test::CannedHost;
using ctl_test::Peer;
using nlohmann::json;
using Answers = std::vector<std::pair<int, std::string>>;

/// The work on a host that gives these answers, one to each connection.
json workWith(const Answers& answers) {
    const CannedHost host([&answers](const CannedHost& self) {
        for (const auto& [status, body] : answers) {
            const Peer peer = self.accept();
            peer.request();
            peer.answer(status, body);
        }
    });
    return ctl::askWork({{}, {host.path(), "", std::chrono::seconds(20)}, Format::Text});
}

TEST(Ps, GivesTheTasksThatRunAndThoseThatWaitOldestFirst) {
    EXPECT_EQ(workWith({{200, R"({"tasks": [{"id": "2"}, {"id": "1"}], "next": null})"},
                        {200, R"({"id": "1", "state": "running"})"},
                        {404, "{}"},
                        {200, R"({"tasks": [{"id": "4"}, {"id": "3"}], "next": null})"}}),
              (json{{{"id", "1"}, {"state", "running"}}, {{"id", "3"}}, {{"id", "4"}}}));
}

TEST(Ps, NeedsAHostThatListsItsTasks) {
    try {
        workWith({{404, R"({"error": "no such path"})"}});
        FAIL();
    } catch (const ctl::Failure& failure) {
        EXPECT_EQ(failure.status(), ctl::kHostReportedFailure);
        EXPECT_STREQ(failure.what(), "this host does not list its tasks");
    }
}

TEST(Ps, ShowsATaskAfterTheOtherAndSaysThatThereIsNone) {
    EXPECT_EQ(ctl::showWork(json::array(), {}, Format::Text).out, "Nothing is at work.\n");
    const json tasks = {{{"id", "1"}, {"command", "START"}, {"state", "running"}},
                        {{"id", "2"}, {"command", "STOP"}, {"state", "running"}}};
    EXPECT_EQ(ctl::showWork(tasks, {}, Format::Text).out, "1: START, running\n2: STOP, running\n");
    EXPECT_EQ(json::parse(ctl::showWork(tasks, {}, Format::Json).out), (json{{"tasks", tasks}}));
}

}  // namespace
