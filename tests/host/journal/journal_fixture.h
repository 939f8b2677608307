/// Journals of a test's own.
#pragma once

#include <gtest/gtest.h>

#include <optional>
#include <string>

#include "host/journal/journal.h"
#include "support/scratch_dir.h"

class JournalTest : public testing::Test {
protected:
    host::Journal::Settings settings() const { return {scratch.path("state")}; }
    /// Opens the journal, after the last one has been closed as a kill would.
    host::Journal& open() { return open(settings()); }
    host::Journal& open(const host::Journal::Settings& settings) {
        journal.reset();
        return journal.emplace(settings);
    }

    /// A task as a request makes it. With a way other than Journal it has been handed over.
    static host::Task asked(const std::string& transid,
                            host::TaskWay way = host::TaskWay::Journal) {
        host::Task task;
        task.transid = transid;
        task.asker = "somebody";
        task.way = way;
        task.conditions = {{"TRANSID", OPER_EQ, transid},
                           {"COMMAND", OPER_EQ, "START"},
                           {"PRODUCT", OPER_EQ, "ux"}};
        task.accepted = host::WallClock::now();
        if (way == host::TaskWay::Query) task.run = 1;
        return task;
    }
    host::Task entered(const std::string& transid, host::TaskWay way = host::TaskWay::Journal) {
        host::Task task = asked(transid, way);
        if (way == host::TaskWay::Query) task.run = journal->run();
        journal->enter(task);
        return task;
    }
    static host::Task ended(host::Task task, host::TaskState state = host::TaskState::Done) {
        task.state = state;
        task.ended = host::WallClock::now();
        return task;
    }
    host::TaskState stateOf(const std::string& name) {
        const std::optional<host::Task> task = journal->find(name);
        EXPECT_TRUE(task.has_value()) << name;
        return task ? task->state : host::TaskState::Queued;
    }

    ScratchDir scratch;
    std::optional<host::Journal> journal;
};
