// ctest-label: threaded
// What the host hears of commands that the plug-in runs.
#include "host/commands/ear.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <thread>

#include "host/commands/plugin_threads.h"
#include "support/host/program.h"
#include "support/process/left_running.h"
#include "support/process/vfork.h"
#include "support/scoped_env.h"
#include "support/scratch_dir.h"
#include "support/trace_capture.h"
#include "util/zavutil.h"

namespace {

using host::Command;
using host::Heard;
using host::ThreadEar;
using ZAV::String;
using ZAV::Util;

struct Outcome {
    bool ran = false;
    int rc = -99;
};

Outcome run(const std::string& command) {
    Outcome outcome;
    String out;
    String err;
    outcome.ran = Util::runCommand(String(command.c_str()), outcome.rc, out, err, String(), false);
    return outcome;
}

class Ear : public testing::Test {
protected:
    Ear() { host::hearCommands(); }
    ~Ear() override {
        // Everything was reaped by the one who started it.
        EXPECT_TRUE(::waitpid(-1, nullptr, WNOHANG) == -1 && errno == ECHILD);
    }

    /// Runs a script with this body; what was heard.
    Heard hear(const std::string& body, std::size_t outputBytes = 0) {
        ThreadEar ear(outputBytes);
        outcome = run(scratch.script("script", body));
        return ear.take();
    }
    Command hearOne(const std::string& body) {
        Heard heard = hear(body);
        EXPECT_EQ(heard.commands.size(), 1U);
        return heard.commands.empty() ? Command{} : heard.commands.front();
    }

    const ScratchDir scratch;
    Outcome outcome;
};

TEST_F(Ear, HearsLineProcessTimesEndAndOutput) {
    const auto before = host::WallClock::now();
    const Command command = hearOne("echo $$; echo two; echo bad >&2; exit 3");
    const auto after = host::WallClock::now();
    EXPECT_EQ(command.line, scratch.path("script"));
    EXPECT_EQ(command.out.text(), std::to_string(command.pid) + "\ntwo\n");
    EXPECT_EQ(command.err.text(), "bad\n");
    EXPECT_EQ(command.exit, 3);
    EXPECT_EQ(command.signal, std::nullopt);
    EXPECT_EQ(command.error, "");
    EXPECT_LE(before, command.started);
    ASSERT_TRUE(command.ended.has_value());
    EXPECT_LE(command.started, *command.ended);
    EXPECT_LE(*command.ended, after);
    EXPECT_TRUE(command.failed());
    EXPECT_FALSE(command.failedUnseen());
    EXPECT_EQ(outcome.rc, 3);
}

TEST_F(Ear, ASuccessIsOne) {
    const Command command = hearOne("exit 0");
    EXPECT_EQ(command.exit, 0);
    EXPECT_FALSE(command.failed());
    EXPECT_FALSE(command.failedUnseen());
}

TEST_F(Ear, KnowsTheSignalThatThePluginTakesForSuccess) {
    const Command command = hearOne("kill -9 $$");
    EXPECT_EQ(outcome.ran, true);
    EXPECT_EQ(outcome.rc, 0);
    EXPECT_EQ(command.signal, SIGKILL);
    EXPECT_EQ(command.exit, std::nullopt);
    EXPECT_TRUE(command.failedUnseen());
}

TEST_F(Ear, KnowsThatNothingWasExecuted) {
    if (!kVforkSharesMemory) GTEST_SKIP() << "the child shares no memory here";
    scratch.write("script", "#!/no/such/interpreter\n", 0755);
    ThreadEar ear;
    outcome = run(scratch.path("script"));
    const Heard heard = ear.take();
    ASSERT_EQ(heard.commands.size(), 1U);
    const Command& command = heard.commands.front();
    EXPECT_EQ(outcome.ran, true);
    EXPECT_EQ(outcome.rc, 0);
    EXPECT_EQ(command.error, "cannot be executed: No such file or directory");
    EXPECT_EQ(command.exit, std::nullopt);
    EXPECT_GT(command.pid, 0);
    EXPECT_TRUE(command.failedUnseen());
}

TEST_F(Ear, SaysWhyNoProcessWasStarted) {
    const std::string path = scratch.write("text", "no program", 0644);
    ThreadEar ear;
    EXPECT_FALSE(run(path + " -q").ran);
    EXPECT_FALSE(run("/no/such/program").ran);
    const Heard heard = ear.take();
    ASSERT_EQ(heard.commands.size(), 2U);
    EXPECT_EQ(heard.commands[0].error, path + ": Permission denied");
    EXPECT_EQ(heard.commands[1].error, "/no/such/program: No such file or directory");
    EXPECT_EQ(heard.commands[0].pid, 0);
    EXPECT_TRUE(heard.commands[0].failed());
    EXPECT_FALSE(heard.commands[0].failedUnseen()) << "the plug-in knows";
}

TEST_F(Ear, ACommandThatOutlastsItsTimeWasKilledByThePlugin) {
    const ScopedEnv timeout("TIMEOUT", "1");
    const Command command = hearOne("exec >&- 2>&-; exec sleep 600");
    EXPECT_FALSE(outcome.ran);
    EXPECT_TRUE(command.timedOut);
    EXPECT_EQ(command.signal, SIGKILL);
    EXPECT_FALSE(command.failedUnseen());
}

TEST_F(Ear, AnEndBehindAnOutputThatStaysOpenIsStillKnown) {
    const ScopedEnv timeout("TIMEOUT", "5");
    const LeftRunning left;
    const Command command = hearOne(left.command() + " echo started; exit 5");
    EXPECT_FALSE(outcome.ran);
    EXPECT_TRUE(command.timedOut);
    EXPECT_EQ(command.exit, 5);
    EXPECT_EQ(command.out.text(), "started\n");
}

TEST_F(Ear, WithoutAnyTimeNothingIsWaitedFor) {
    const ScopedEnv timeout("TIMEOUT", "0");
    const Command command = hearOne("exec sleep 600");
    EXPECT_TRUE(command.timedOut);
    EXPECT_EQ(command.signal, SIGKILL);
}

TEST_F(Ear, KeepsTheEndOfALongOutputAndAllOfItWhenAsked) {
    const std::string body = "i=0; while [ $i -lt 20000 ]; do echo line $i; i=$((i+1)); done";
    const Heard heard = hear(body, 1 << 20);
    ASSERT_EQ(heard.commands.size(), 1U);
    const std::string& tail = heard.commands[0].out.text();
    EXPECT_EQ(tail.size(), host::Tail::kBytes);
    EXPECT_THAT(tail, testing::EndsWith("line 19998\nline 19999\n"));
    EXPECT_THAT(heard.output, testing::StartsWith("line 0\nline 1\n"));
    EXPECT_THAT(heard.output, testing::EndsWith(tail));
    EXPECT_TRUE(heard.outputComplete);
}

TEST_F(Ear, HearsNoValuesOfPasswords) {
    ThreadEar ear(1000);
    outcome = run(scratch.script("script",
                                 "echo password=; printf 'hunter2 token='; sleep 0.1\n"
                                 "printf 'abc def\\n'; echo key: xyz >&2") +
                  " --secret=mellon");
    const Heard heard = ear.take();
    ASSERT_EQ(heard.commands.size(), 1U);
    const Command& command = heard.commands.front();
    EXPECT_EQ(command.line, scratch.path("script") + " --secret=***");
    EXPECT_EQ(command.out.text(), "password=\nhunter2 token=*** def\n");
    EXPECT_EQ(command.err.text(), "key: ***\n");
    EXPECT_EQ(heard.output, "password=\nhunter2 token=abc def\n") << "asked for, so as it came";
}

TEST_F(Ear, KeepsNoConfigurationThatTheTranslatorPrints) {
    scratch.script("zav_xa", "echo COLOUR=auburn; echo no such product >&2; exit 1");
    for (const char* verb : {" -g ux", " -p ux"}) {
        ThreadEar ear;
        outcome = run(scratch.path("zav_xa") + verb);
        const Heard heard = ear.take();
        ASSERT_EQ(heard.commands.size(), 1U);
        EXPECT_EQ(heard.commands.front().out.text(), "") << verb;
        EXPECT_EQ(heard.commands.front().err.text(), "no such product\n") << verb;
    }
}

TEST_F(Ear, SaysThatAnOutputIsLongerThanItIsKept) {
    const Heard heard = hear("echo 123456789", 5);
    EXPECT_EQ(heard.output, "12345");
    EXPECT_FALSE(heard.outputComplete);
    EXPECT_EQ(heard.commands.at(0).out.text(), "123456789\n");
}

TEST_F(Ear, OfVeryManyCommandsKeepsTheLast) {
    ThreadEar ear;
    for (int i = 0; i < 70; ++i)
        run("/no/such/program" + std::to_string(i));
    const Heard heard = ear.take();
    ASSERT_EQ(heard.commands.size(), 64U);
    EXPECT_EQ(heard.commands.back().line, "/no/such/program69");
    EXPECT_TRUE(ear.take().commands.empty());
}

TEST_F(Ear, LogsNothingThatTheSelectionDoesNotAskFor) {
    const TraceCapture log("ERROR");
    hear("echo out");
    EXPECT_TRUE(log.lines().empty());
}

TEST_F(Ear, LogsWhatTheSelectionAsksFor) {
    const TraceCapture log("ERROR (UNIT:zavutil DETAIL)");
    hear("echo out");
    EXPECT_EQ(log.count('D', "outbuf: out"), 1);
    EXPECT_TRUE(log.details("zavprnix").empty());
}

TEST_F(Ear, EachThreadIsHeardByItself) {
    std::vector<Heard> heard(4);
    std::vector<std::string> scripts;  // all there before any child could hold one open
    for (std::size_t i = 0; i < heard.size(); ++i)
        scripts.push_back(
            scratch.script("script" + std::to_string(i), "echo " + std::to_string(i)));
    std::vector<std::thread> threads;
    for (std::size_t i = 0; i < heard.size(); ++i) {
        threads.emplace_back([&heard, &scripts, i] {
            ThreadEar ear;
            for (int repeat = 0; repeat < 5; ++repeat)
                run(scripts[i]);
            heard[i] = ear.take();
        });
    }
    for (std::thread& thread : threads)
        thread.join();
    for (std::size_t i = 0; i < heard.size(); ++i) {
        ASSERT_EQ(heard[i].commands.size(), 5U);
        for (const Command& command : heard[i].commands) {
            EXPECT_EQ(command.out.text(), std::to_string(i) + "\n");
            EXPECT_EQ(command.exit, 0);
        }
    }
}

TEST_F(Ear, OtherThreadsSeeTheCommandThatAPluginThreadRuns) {
    scratch.script("script", "echo here; until [ -e " + scratch.path("go") +
                                 " ]; do sleep 0.02; done; exit 4");
    const ScopedEnv timeout("TIMEOUT", "3600");
    Heard heard;
    std::thread pluginThread([&] {
        run(scratch.path("script"));
        heard = host::takeOfPluginThread();
    });
    std::vector<Command> seen;
    EXPECT_TRUE(eventually([&] {
        seen = host::commandsOfPluginThreads();
        return seen.size() == 1 && seen[0].out.text() == "here\n";
    }));
    const auto deadline = host::PluginThreads::ofProcess().deadline();
    const auto now = std::chrono::steady_clock::now();
    scratch.write("go", "");
    pluginThread.join();
    ASSERT_TRUE(deadline);
    EXPECT_LE(*deadline, now + std::chrono::seconds(3600));
    EXPECT_GT(*deadline, now);
    EXPECT_FALSE(host::PluginThreads::ofProcess().deadline()) << "it is over";
    ASSERT_EQ(seen.size(), 1U);
    if (kVforkSharesMemory) {
        EXPECT_GT(seen[0].pid, 0);
    }
    EXPECT_EQ(seen[0].ended, std::nullopt);
    ASSERT_EQ(heard.commands.size(), 1U);
    if (kVforkSharesMemory) {
        EXPECT_EQ(heard.commands[0].pid, seen[0].pid);
    }
    EXPECT_EQ(heard.commands[0].exit, 4);
    EXPECT_TRUE(host::commandsOfPluginThreads().empty());
}

}  // namespace
