// What a long history costs the host: little memory and a short start.
// ctest-label: timing

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

#include "host/journal/journal.h"
#include "host/raw_client.h"
#include "support/host/managed_host.h"
#include "support/host/script_home.h"
#include "support/process/growth.h"

namespace {

using host::Journal;
using host::Task;
using host::TaskState;

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr bool kMeasures = false;
#else
constexpr bool kMeasures = true;
#endif

Task queued(int number) {
    Task task;
    task.way = host::TaskWay::Journal;
    task.transid = "task " + std::to_string(number);
    task.asker = "somebody";
    task.conditions = {{"TRANSID", OPER_EQ, task.transid},
                       {"COMMAND", OPER_EQ, "START"},
                       {"PRODUCT", OPER_EQ, "ux"}};
    task.accepted = host::WallClock::now();
    return task;
}

Task finished(int number) {
    Task task = queued(number);
    task.state = TaskState::Done;
    task.started = task.ended = task.accepted;
    task.reply = std::string(1200, ' ');
    task.outcomes = {"here" + std::string(500, ' ')};
    host::Command& command = task.commands.emplace_back();
    command.line = "/home/bin/TovrinAgent start ux";
    command.started = task.accepted;
    command.ended = task.accepted;
    command.exit = 0;
    command.out.append("started\n");
    return task;
}

/// A journal in this directory with so many tasks, left as by a kill.
template <typename Make>
void writeJournal(const std::string& directory, int tasks, Make make) {
    Journal journal(Journal::Settings{directory});
    for (int i = 1; i <= tasks; ++i) {
        journal.enterSoon(make(i));
        if (i % 1000 == 0) journal.find("nothing");  // writes what can wait
    }
    journal.find("nothing");
}

TEST(LongHistory, TenThousandQueuedTasksAreThereAgainWithinTwoSeconds) {
    if (!kMeasures) GTEST_SKIP() << "the sanitizer takes its time";
    const ScratchDir scratch;
    writeJournal(scratch.path("state"), 10'000, queued);
    const double start = processorSeconds();
    Journal journal(Journal::Settings{scratch.path("state")});
    EXPECT_LT(processorSeconds() - start, 2.0);
    EXPECT_FALSE(journal.recovered().clean) << "the check of the whole file is part of it";
    EXPECT_EQ(journal.waiting(), 10'000);
    EXPECT_EQ(journal.nextInLine()->transid, "task 1");
}

TEST(LongHistory, AHundredThousandTasksLeaveTheHostSmall) {
    if (!kMeasures) GTEST_SKIP() << "the sanitizer keeps freed memory";
    ScriptHome home;
    const std::string state = home.files().path("state");
    writeJournal(state, 100'000, finished);
    const ManagedHost host(home.path(), {}, {"--state", state, "--keep-rows", "100000"},
                           ManagedHost::Guards::On);
    RawClient client(host.socket());
    const auto page = nlohmann::json::parse(client.get("/v1/tasks?limit=1000").body);
    EXPECT_EQ(page["tasks"].size(), 1000U);
    const std::string journal = page["tasks"][0]["id"].get<std::string>().substr(0, 16);
    // Everything once more, to a reader that does not stop.
    client.send("GET /v1/events?table=KAGDYST&tasks=1&after=" + journal + "-0 HTTP/1.1\r\n\r\n");
    client.readUntil("id: " + journal + "-200000\n", std::chrono::minutes(5));
    EXPECT_NE(client.readUntil("\n\n").find("\"task 100000\""), std::string::npos);
    EXPECT_LT(host.residentKiB(), 20 * 1024);
}

}  // namespace
