#include "host/process/configuration/options.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <map>
#include <vector>

#include "host/process/start_error.h"
#include "support/scratch_dir.h"

namespace {

using host::HostOptions;

class Options : public testing::Test {
protected:
    std::optional<HostOptions> read(std::vector<const char*> arguments) {
        arguments.insert(arguments.begin(), "zavhost");
        return host::readOptions(
            static_cast<int>(arguments.size()), arguments.data(), [this](const char* name) {
                const auto found = environment.find(name);
                return found == environment.end() ? nullptr : found->second.c_str();
            });
    }
    std::string errorOf(const std::vector<const char*>& arguments) {
        try {
            read(arguments);
        } catch (const host::StartError& error) {
            return error.what();
        }
        return "";
    }

    ScratchDir scratch;
    const std::string home = scratch.makeDir("home");
    std::map<std::string, std::string> environment;
};

TEST_F(Options, AllAreTaken) {
    const auto options =
        read({"--home", home.c_str(), "--socket", "/s", "--rpc-socket", "/r", "--rpc-port", "135",
              "--origin-node", "n", "--plugin", "p.so", "--state", "/d", "--task-timeout", "60",
              "--check", "--unguarded", "--trace-secrets"});
    ASSERT_TRUE(options);
    EXPECT_EQ(options->home, home);
    EXPECT_EQ(options->socket, "/s");
    EXPECT_EQ(options->rpcSocket, "/r");
    EXPECT_EQ(options->rpcPort, 135);
    EXPECT_EQ(options->originNode, "n");
    EXPECT_EQ(options->plugin, "p.so");
    EXPECT_EQ(options->state, "/d");
    EXPECT_EQ(options->taskTimeout, 60);
    EXPECT_TRUE(options->check);
    EXPECT_TRUE(options->traceSecrets);
    EXPECT_FALSE(options->guarded);
}

TEST_F(Options, WithoutThemTheHostIsGuardedAndRuns) {
    environment["TOVRINHOME"] = home;
    EXPECT_TRUE(read({})->guarded);
    EXPECT_FALSE(read({})->check);
    EXPECT_FALSE(read({})->traceSecrets);
    EXPECT_FALSE(read({})->taskTimeout);
    EXPECT_FALSE(read({})->rpcPort);
}

TEST_F(Options, TheJournalKeepsWhatItIsToldToKeep) {
    environment["TOVRINHOME"] = home;
    const auto usual = read({});
    EXPECT_TRUE(usual->journal);
    EXPECT_EQ(usual->maxQueued, 1000);
    EXPECT_EQ(usual->keepDays, 30);
    EXPECT_EQ(usual->keepRows, 10'000);
    EXPECT_FALSE(usual->rerunInterrupted);
    EXPECT_EQ(usual->orphanWait, std::chrono::seconds(300));
    const auto given = read({"--max-queued", "7", "--keep-tasks", "8", "--keep-rows", "9",
                             "--on-interrupt", "rerun", "--orphan-wait", "10"});
    EXPECT_EQ(given->maxQueued, 7);
    EXPECT_EQ(given->keepDays, 8);
    EXPECT_EQ(given->keepRows, 9);
    EXPECT_TRUE(given->rerunInterrupted);
    EXPECT_EQ(given->orphanWait, std::chrono::seconds(10));
    EXPECT_EQ(usual->grace, std::chrono::seconds(10));
    EXPECT_EQ(usual->logSize, 10 << 20);
    EXPECT_EQ(read({"--log-size", "4096"})->logSize, 4096);
    EXPECT_EQ(read({})->logFormat, host::LogFormat::Text);
    EXPECT_EQ(read({"--log-format", "json"})->logFormat, host::LogFormat::Json);
    EXPECT_EQ(usual->maxOutput, 16 * 1024 * 1024);
    const auto bounded = read({"--grace", "3", "--max-output", "1000"});
    EXPECT_EQ(bounded->grace, std::chrono::seconds(3));
    EXPECT_EQ(bounded->maxOutput, 1000);
    EXPECT_FALSE(read({"--no-journal"})->journal);
    EXPECT_EQ(read({"--task-timeout", "60"})->orphanWait, std::chrono::seconds(60));
}

TEST_F(Options, CommandsOfAnEarlierRunHaveAsLongAsACommandMayRun) {
    environment["TOVRINHOME"] = home;
    environment["TIMEOUT"] = "45";
    EXPECT_EQ(read({})->orphanWait, std::chrono::seconds(45));
    EXPECT_EQ(read({"--task-timeout", "60"})->orphanWait, std::chrono::seconds(60));
    EXPECT_EQ(read({"--orphan-wait", "10"})->orphanWait, std::chrono::seconds(10));
    environment["TIMEOUT"] = "soon";
    EXPECT_EQ(read({})->orphanWait, std::chrono::seconds(300)) << "it is refused elsewhere";
}

TEST_F(Options, OfTheJournalThatMakeNoSenseAreRefused) {
    environment["TOVRINHOME"] = home;
    EXPECT_THROW(read({"--max-queued", "0"}), host::StartError);
    EXPECT_THROW(read({"--keep-tasks", "1d"}), host::StartError);
    EXPECT_THROW(read({"--keep-rows", "-1"}), host::StartError);
    EXPECT_THROW(read({"--orphan-wait", ""}), host::StartError);
    EXPECT_THROW(read({"--grace", "0"}), host::StartError);
    EXPECT_THROW(read({"--max-output", "16M"}), host::StartError);
    EXPECT_THROW(read({"--log-size", "4095"}), host::StartError);
    EXPECT_THROW(read({"--log-format", "xml"}), host::StartError);
    EXPECT_THROW(read({"--on-interrupt", "maybe"}), host::StartError);
    EXPECT_THROW(read({"--no-journal", "--state", "/s"}), host::StartError);
}

TEST_F(Options, HomeComesFromTheEnvironmentWhenItIsNotGiven) {
    environment["TOVRINHOME"] = home;
    EXPECT_EQ(read({})->home, home);
    const std::string other = scratch.makeDir("other");
    EXPECT_EQ(read({"--home", other.c_str()})->home, other);
}

TEST_F(Options, HomeMustBeADirectory) {
    const std::string complaint = "no home: give --home DIR or set TOVRINHOME";
    EXPECT_EQ(errorOf({}), complaint);
    environment["TOVRINHOME"] = "";
    EXPECT_EQ(errorOf({}), complaint);
    EXPECT_EQ(errorOf({"--home", ""}), complaint);
    const std::string lost = scratch.path("lost");
    EXPECT_EQ(errorOf({"--home", lost.c_str()}), "home " + lost + ": No such file or directory");
    const std::string file = scratch.write("file", "");
    EXPECT_EQ(errorOf({"--home", file.c_str()}), "home " + file + " is not a directory");
}

TEST_F(Options, ARelativeHomeBecomesAbsolute) {
    const std::string relative = std::filesystem::relative(home).string();
    const std::string absolute = read({"--home", relative.c_str()})->home;
    EXPECT_EQ(absolute.at(0), '/');
    EXPECT_TRUE(std::filesystem::equivalent(home, absolute));
}

TEST_F(Options, SocketsHaveDefaults) {
    environment["TOVRINHOME"] = home;
    EXPECT_EQ(read({})->socket, "/run/zavhost.sock");
    EXPECT_EQ(read({})->rpcSocket, "/run/zavhost.sock.rpc");
    environment["XDG_RUNTIME_DIR"] = "/run/user/1";
    EXPECT_EQ(read({})->socket, "/run/user/1/zavhost.sock");
    environment["ZAV_SOCKET"] = "/z";
    EXPECT_EQ(read({})->socket, "/z");
    EXPECT_EQ(read({})->rpcSocket, "/z.rpc");
    EXPECT_EQ(read({"--socket", "/s"})->rpcSocket, "/s.rpc");
}

TEST_F(Options, TheStateDirectoryHasDefaults) {
    environment["TOVRINHOME"] = home;
    EXPECT_EQ(read({})->state, home + "/zavhost");
    environment["STATE_DIRECTORY"] = "/var/lib/one:/var/lib/two";
    EXPECT_EQ(read({})->state, "/var/lib/one");
    EXPECT_EQ(read({"--state", "/s"})->state, "/s");
    EXPECT_EQ(read({"--state", "relative"})->state.at(0), '/');
    EXPECT_EQ(errorOf({"--state", ""}), "the name of the state directory is empty");
}

TEST_F(Options, EmptyOrEqualSocketsAreRefused) {
    environment["TOVRINHOME"] = home;
    EXPECT_EQ(errorOf({"--socket", ""}), "the name of a socket is empty");
    EXPECT_EQ(errorOf({"--rpc-socket", ""}), "the name of a socket is empty");
    EXPECT_EQ(errorOf({"--socket", "/s", "--rpc-socket", "/s"}),
              "--socket and --rpc-socket name the same file /s");
}

TEST_F(Options, MistakesAreOneLine) {
    environment["TOVRINHOME"] = home;
    for (const std::vector<const char*>& arguments : {std::vector<const char*>{"--nonsense"},
                                                      {"stray"},
                                                      {"--rpc-port", "0"},
                                                      {"--rpc-port", "65536"},
                                                      {"--rpc-port", "-1"},
                                                      {"--rpc-port", "x"},
                                                      {"--home"}}) {
        const std::string error = errorOf(arguments);
        EXPECT_NE(error, "") << arguments.front();
        EXPECT_EQ(error.find('\n'), std::string::npos) << error;
    }
}

TEST_F(Options, AnUnknownOneSuggestsTheNearest) {
    environment["TOVRINHOME"] = home;
    EXPECT_EQ(
        errorOf({"--unguraded"}),
        "there is no option --unguraded; did you mean --unguarded? (--help shows the options)");
    EXPECT_EQ(errorOf({"--task-timout=5"}),
              "there is no option --task-timout; did you mean --task-timeout? (--help shows the "
              "options)");
    EXPECT_EQ(errorOf({"--nonsense"}), "there is no option --nonsense (--help shows the options)");
    EXPECT_EQ(errorOf({"stray"}), "the argument \"stray\" has no place (--help shows the options)");
}

TEST_F(Options, NumbersAreExplainedInWords) {
    environment["TOVRINHOME"] = home;
    EXPECT_EQ(errorOf({"--rpc-port", "70000"}),
              "--rpc-port takes a number from 1 to 65535, not \"70000\"");
    EXPECT_EQ(errorOf({"--task-timeout", "5m"}),
              "--task-timeout takes a number of seconds from 1 to 2147483646, not \"5m\"");
}

TEST_F(Options, TheConfigurationFileGivesWhatTheCommandLineLeavesOut) {
    environment["TOVRINHOME"] = scratch.makeDir("other");
    environment["TIMEOUT"] = "45";
    const std::string file = scratch.write("zavhost.conf", "home = \"" + home +
                                                               "\"\ngrace = 7\nkeep-rows = 8\n"
                                                               "task-timeout = 60\n"
                                                               "unguarded = true\n");
    const auto options = read({"--config", file.c_str(), "--grace", "9"});
    EXPECT_EQ(options->home, home) << "it overrides the environment";
    EXPECT_EQ(options->taskTimeout, 60);
    EXPECT_EQ(options->grace, std::chrono::seconds(9)) << "the command line overrides it";
    EXPECT_EQ(options->keepRows, 8);
    EXPECT_FALSE(options->guarded);
    EXPECT_TRUE(read({"--config", file.c_str(), "--unguarded=false"})->guarded);
}

TEST_F(Options, ComplaintsAboutTheConfigurationFileNameItsLine) {
    const std::string file = scratch.path("zavhost.conf");
    const auto complaint = [&](const std::string& lines) {
        scratch.write("zavhost.conf", lines);
        return errorOf({"--home", home.c_str(), "--config", file.c_str()});
    };
    EXPECT_EQ(complaint("\nrpc-port = 70000\n"),
              file + ":2: rpc-port takes a number from 1 to 65535, not \"70000\"");
    EXPECT_EQ(complaint("task-timeout = 0\n"),
              file + ":1: task-timeout takes a number of seconds from 1 to 2147483646, not \"0\"");
    EXPECT_EQ(complaint("on-interrupt = \"maybe\"\n"),
              file + ":1: on-interrupt takes keep or rerun, not \"maybe\"");
    EXPECT_EQ(complaint("state = \"\"\n"), file + ":1: the name of the state directory is empty");
    EXPECT_EQ(complaint("socket = \"\"\n"), file + ":1: the name of a socket is empty");
    EXPECT_EQ(complaint("no-journal = true\nstate = \"/s\"\n"),
              file + ":1: no-journal and " + file + ":2: state exclude each other");
    scratch.write("zavhost.conf", "home = \"/lost\"\n");
    EXPECT_EQ(errorOf({"--config", file.c_str()}),
              file + ":1: home /lost: No such file or directory");
}

TEST_F(Options, TheListingSaysWhatHoldsAndWhereItComesFrom) {
    environment["STATE_DIRECTORY"] = "/var/lib/zavhost";
    environment["TIMEOUT"] = "45";
    const std::string file =
        scratch.write("zavhost.conf", "home = \"" + home + "\"\nsocket = \"/a\\\\b\"\n");
    const std::string listing =
        read({"--config", file.c_str(), "--print-config", "--grace", "9"})->listing.value_or("");
    EXPECT_EQ(listing, "home = \"" + home + "\"  # " + file +
                           ":1\n"
                           "socket = \"/a\\\\b\"  # " +
                           file +
                           ":2\n"
                           "rpc-socket = \"/a\\\\b.rpc\"  # default\n"
                           "# rpc-port has no value  # default\n"
                           "# group has no value  # default\n"
                           "# read-only-group has no value  # default\n"
                           "# origin-node has no value  # default\n"
                           "# plugin has no value  # default\n"
                           "state = \"/var/lib/zavhost\"  # environment, STATE_DIRECTORY\n"
                           "no-journal = false  # default\n"
                           "max-queued = 1000  # default\n"
                           "keep-tasks = 30  # default\n"
                           "keep-rows = 10000  # default\n"
                           "orphan-wait = 45  # default\n"
                           "on-interrupt = \"keep\"  # default\n"
                           "task-timeout = 45  # environment, TIMEOUT\n"
                           "grace = 9  # command line\n"
                           "max-output = 16777216  # default\n"
                           "log-format = \"text\"  # default\n"
                           "log-size = 10485760  # default\n"
                           "trace-secrets = false  # default\n"
                           "unguarded = false  # default\n");
}

TEST_F(Options, TheListingIsAConfigurationFileThatSaysTheSame) {
    environment["TOVRINHOME"] = home;
    const std::string listing =
        read({"--print-config", "--rpc-port", "135", "--origin-node", "a\"\\\x01n"})
            ->listing.value_or("");
    const std::string file = scratch.write("zavhost.conf", listing);
    environment.clear();
    const auto options = read({"--config", file.c_str()});
    EXPECT_EQ(options->home, home);
    EXPECT_EQ(options->rpcPort, 135);
    EXPECT_EQ(options->originNode, "a\"\\\x01n");
    EXPECT_FALSE(options->listing);
}

TEST_F(Options, HelpAndVersionRunNothing) {
    EXPECT_FALSE(read({"--help"}));
    EXPECT_FALSE(read({"--version"}));
}

}  // namespace
