// ctest-label: threaded
#include "host/commands/command_ending.h"

#include <gtest/gtest.h>
#include <signal.h>

#include <optional>
#include <thread>

#include "host/commands/ear.h"
#include "host/process/children/process_table.h"
#include "support/host/program.h"
#include "support/scratch_dir.h"
#include "util/zavutil.h"

namespace {

using host::Command;
using host::CommandEnding;

bool isRunning(pid_t pid) {
    for (const host::ProcessEntry& process : host::readProcesses()) {
        if (process.pid == pid) return process.isAlive;
    }
    return false;
}

/// Scripts that a thread of the plug-in runs.
class Ending : public testing::Test {
protected:
    Ending() { host::hearCommands(); }

    std::string script(const std::string& name, const std::string& body) const {
        return scratch.script(name, body);
    }
    /// A script that says that it has begun and does not end by itself.
    std::string endless(const std::string& name, const std::string& before = "") const {
        return script(
            name, before + "\necho >'" + scratch.path("begun") + "'\nwhile :; do sleep 0.05; done");
    }
    bool awaitBegin() const {
        return eventually([this] { return scratch.exists("begun"); });
    }
    /// Runs them one after the other on a thread, as a task does, while `body` runs on this one;
    /// what was heard of them.
    template <typename Body>
    std::vector<Command> during(const std::vector<std::string>& commands, Body body) {
        host::Heard heard;
        std::thread executor([&] {
            for (const std::string& command : commands) {
                int rc = 0;
                ZAV::String out;
                ZAV::String err;
                ZAV::Util::runCommand(ZAV::String(command.c_str()), rc, out, err, ZAV::String(),
                                      false);
            }
            heard = host::takeOfPluginThread();
        });
        body();
        executor.join();
        return heard.commands;
    }

    const ScratchDir scratch;
};

TEST_F(Ending, TheCommandInHandGetsTheSignalToEnd) {
    std::optional<CommandEnding> ending;
    const auto commands = during({endless("one")}, [&] {
        ASSERT_TRUE(awaitBegin());
        ending.emplace();
    });
    EXPECT_TRUE(ending->finish());
    ASSERT_EQ(commands.size(), 1U);
    EXPECT_EQ(commands[0].signal, SIGTERM);
}

TEST_F(Ending, EachFurtherCommandIsEndedBeforeItDoesAnything) {
    std::optional<CommandEnding> ending;
    const std::string next = script("next", "echo >'" + scratch.path("ran") + "'");
    const auto commands = during({endless("one"), next, next}, [&] {
        ASSERT_TRUE(awaitBegin());
        ending.emplace();
    });
    EXPECT_TRUE(ending->finish());
    ASSERT_EQ(commands.size(), 3U);
    EXPECT_EQ(commands[1].signal, SIGKILL);
    EXPECT_EQ(commands[2].signal, SIGKILL);
    EXPECT_FALSE(scratch.exists("ran"));
}

TEST_F(Ending, WhatTheCommandHasStartedEndsToo) {
    std::optional<CommandEnding> ending;
    const std::string below = endless("below", "echo $$ >'" + scratch.path("pid") + "'");
    during({script("one", below + " &\nwait")}, [&] {
        ASSERT_TRUE(awaitBegin());
        ending.emplace();
    });
    EXPECT_TRUE(ending->finish());
    EXPECT_FALSE(isRunning(std::stoi(scratch.read("pid"))));
}

TEST_F(Ending, WhatIgnoresTheSignalIsKilledWhenItsTimeIsOver) {
    std::optional<CommandEnding> ending;
    const auto commands = during({endless("one", "trap '' TERM")}, [&] {
        ASSERT_TRUE(awaitBegin());
        ending.emplace(std::chrono::milliseconds(200));
    });
    EXPECT_TRUE(ending->finish());
    ASSERT_EQ(commands.size(), 1U);
    EXPECT_EQ(commands[0].signal, SIGKILL);
}

TEST_F(Ending, ASessionOfItsOwnIsLeftAlone) {
    std::optional<CommandEnding> ending;
    const std::string agent = endless("agent", "echo $$ >'" + scratch.path("pid") + "'");
    during({script("one", "setsid " + agent + " >/dev/null 2>&1 &\nwhile :; do sleep 0.05; done")},
           [&] {
               ASSERT_TRUE(awaitBegin());
               ending.emplace();
           });
    EXPECT_TRUE(ending->finish());
    const pid_t pid = std::stoi(scratch.read("pid"));
    EXPECT_TRUE(isRunning(pid));
    ::kill(pid, SIGKILL);
}

TEST_F(Ending, NothingIsReachedWhereNothingRuns) {
    CommandEnding ending;
    EXPECT_FALSE(ending.finish());
}

TEST_F(Ending, AfterItCommandsRunAgain) {
    { const CommandEnding ending; }
    const auto commands = during({script("one", "exit 7")}, [] {});
    ASSERT_EQ(commands.size(), 1U);
    EXPECT_EQ(commands[0].exit, 7);
}

}  // namespace
