#include "ctl/verbs/host/top.h"

#include <gmock/gmock.h>

namespace {

using ctl::showTop;
using ctl::TopFacts;
using nlohmann::json;
using testing::HasSubstr;
using testing::Not;

TopFacts facts() {
    TopFacts facts;
    facts.health = {
        {"version", "1.0"}, {"home", "/h"}, {"uptime_seconds", 7200}, {"guarded", true}};
    facts.ready = {{"ready", true}, {"reasons", json::array()}};
    facts.work = json::array();
    facts.instances = nullptr;
    facts.recent = json::array();
    return facts;
}
std::string shown(const TopFacts& facts, std::size_t lines = 0) {
    return showTop(facts, std::chrono::system_clock::now(), lines).out;
}

TEST(Top, SaysHowTheHostIs) {
    EXPECT_EQ(shown(facts()), "host 1.0 on /h, up 2 h, ready\n\nNothing is at work.\n");
    TopFacts bad = facts();
    bad.health["guarded"] = false;
    bad.ready = {{"ready", false}, {"reasons", {{{"part", "disk"}, {"text", "it is full"}}}}};
    EXPECT_THAT(shown(bad),
                HasSubstr("host 1.0 on /h, up 2 h, unguarded, not ready\n  disk: it is full\n"));
}

TEST(Top, ShowsTheEndOfWhatTheRunningTaskWrites) {
    TopFacts busy = facts();
    busy.work = {
        {{"transid", "T1"},
         {"command", "INSTALL"},
         {"product", "ux"},
         {"state", "running"},
         {"details",
          {{"commands", {{{"command", "setup"}, {"stdout", "1\n2\n3\n4\n5\n6\n\x1b[2J"}}}}}}}};
    const std::string text = shown(busy);
    EXPECT_THAT(text, HasSubstr("T1: INSTALL ux, running"));
    EXPECT_THAT(text, HasSubstr("  | 3\n  | 4\n  | 5\n  | 6\n  | \\x1B[2J\n"));
    EXPECT_THAT(text, Not(HasSubstr("| 2\n")));
}

TEST(Top, CountsWhatWaitsBeyondTheFirst) {
    TopFacts busy = facts();
    for (int i = 1; i <= 8; ++i) {
        busy.work.push_back({{"transid", "T" + std::to_string(i)},
                             {"command", "START"},
                             {"product", "ux"},
                             {"state", "queued"}});
    }
    EXPECT_THAT(shown(busy), HasSubstr("T5: START ux, queued\nand 3 more that wait\n"));
}

TEST(Top, ShowsInstancesAndTheNewestOutcomes) {
    TopFacts all = facts();
    all.instances = {{{"target", "h:UX"}, {"state", "missing"}, {"user", "root"}}};
    all.recent = {{{"id", "j-2"}, {"state", "queued"}, {"command", "STOP"}, {"product", "ux"}},
                  {{"id", "j-1"}, {"state", "failed"}, {"command", "START"}, {"product", "ux"}}};
    const std::string text = shown(all);
    EXPECT_THAT(text, HasSubstr("h:UX      should run, does not  root"));
    EXPECT_THAT(text, HasSubstr("j-1"));
    EXPECT_THAT(text, Not(HasSubstr("j-2")));
}

TEST(Top, KeepsToTheLinesThatThereAre) {
    EXPECT_EQ(shown(facts(), 1), "host 1.0 on /h, up 2 h, ready\n");
    EXPECT_EQ(shown(facts(), 100), shown(facts()));
}

TEST(Top, TakesAnyAnswer) {
    for (const json& odd : {json(), json(1), json("x"), json::array({1, "x", nullptr}),
                            json{{"ready", 1}, {"reasons", 1}, {"commands", 2}}}) {
        shown({odd, odd, odd, odd, odd});
    }
}

}  // namespace
