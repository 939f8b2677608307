// Who may do what: a host that serves two groups, and what their members, and strangers, can do
// with the real programs.
// ctest-label: threaded

#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>

#include "e2e/transfers/push_fixture.h"

namespace {

namespace fs = std::filesystem;
using nlohmann::json;
using testing::HasSubstr;
using testing::Not;
using Words = std::vector<std::string>;

/// Groups that every machine has.
constexpr const char* kOperators = "games";
constexpr const char* kReaders = "users";
constexpr const char* kOthers = "tty";

class Groups : public PushFixture {
protected:
    void SetUp() override {
        if (::geteuid() != 0) GTEST_SKIP() << "only root can become another user";
        // The program, where everybody may run it.
        fs::copy_file(zavctlPath(), program_.path("zavctl"));
        fs::permissions(program_.path(""), fs::perms(0755));
        home_.products({"ux"}, "exit 0");
        home_.agentScript("echo said-by-the-agent");
        start({"--group", kOperators, "--read-only-group", kReaders}, "depot",
              ManagedHost::Guards::On);
        fs::permissions(fs::path(host_->socket()).parent_path(), fs::perms(0755));
    }
    /// zavctl as a user without rights who is a member of this group.
    ProgramResult as(const std::string& group, const Words& words) const {
        Words argv = {"/usr/bin/setpriv",  "--reuid=nobody",        "--regid=nogroup",
                      "--groups=" + group, program_.path("zavctl"), "--socket",
                      host_->socket()};
        argv.insert(argv.end(), words.begin(), words.end());
        return runProgram(argv);
    }
    void expectRefused(const std::string& group, const Words& words, const std::string& reason) {
        SCOPED_TRACE(words.front());
        const ProgramResult result = as(group, words);
        EXPECT_EQ(result.status, 1) << result.out;
        EXPECT_THAT(result.err, HasSubstr(reason));
    }
    static mode_t modeOf(const std::string& path) {
        struct stat found {};
        return ::stat(path.c_str(), &found) == 0 ? found.st_mode & 07777U : 0;
    }

    ScratchDir program_;
};

TEST_F(Groups, HaveSocketsThatEverybodyMayConnectTo) {
    EXPECT_EQ(modeOf(host_->socket()), 0666U);
    EXPECT_EQ(modeOf(host_->socket() + ".rpc"), 0666U);
    EXPECT_EQ(modeOf(host_->socket() + ".lock"), 0600U);
}

TEST_F(Groups, OfOperatorsMayDoEverything) {
    EXPECT_EQ(as(kOperators, {"whoami"}).out,
              "You are nobody and may do everything, because you are a member of the group "
              "games.\n");
    const ProgramResult started = as(kOperators, {"--json", "start", "ux"});
    EXPECT_EQ(started.status, 0) << started.err;
    EXPECT_EQ(json::parse(started.out).at("task").at("asker"), "nobody");
    program_.write("file", "content");
    fs::permissions(program_.path("file"), fs::perms(0644));
    const ProgramResult pushed = as(kOperators, {"push", program_.path("file")});
    EXPECT_EQ(pushed.status, 0) << pushed.err;
    EXPECT_EQ(depot("file"), "content");
    EXPECT_EQ(as(kOperators, {"depot", "rm", "file"}).status, 0);
    EXPECT_FALSE(inDepot("file"));
}

TEST_F(Groups, OfReadersMayLook) {
    EXPECT_EQ(as(kReaders, {"whoami"}).out,
              "You are nobody and may only read, because you are a member of the read-only group "
              "users.\n");
    for (const Words& words : {Words{"status"},
                               {"agents"},
                               {"tasks"},
                               {"ps"},
                               {"depot", "ls"},
                               {"query", "KINAGT", "PRODUCT=ux"}}) {
        const ProgramResult result = as(kReaders, words);
        EXPECT_EQ(result.status, 0) << words.front() << ": " << result.err;
    }
}

TEST_F(Groups, OfReadersSeeNothingOfWhatCommandsWrite) {
    const json started = json::parse(host_->zavctl({"--json", "start", "ux"}).out);
    const std::string id = started.at("task").at("id");
    const json shown = json::parse(as(kReaders, {"--json", "task", "show", id}).out);
    const json& commands = shown.at("details").at("commands");
    ASSERT_GE(commands.size(), 1U);
    for (const json& command : commands) {
        EXPECT_TRUE(command.contains("exit"));
        EXPECT_FALSE(command.contains("stdout"));
        EXPECT_FALSE(command.contains("stderr"));
    }
    EXPECT_EQ(shown.dump().find("said-by-the-agent"), std::string::npos);
    expectRefused(kReaders, {"task", "output", id}, "you may only read from this host");
    const ProgramResult operators = as(kOperators, {"--json", "task", "show", id});
    EXPECT_THAT(operators.out, HasSubstr("said-by-the-agent"));
}

TEST_F(Groups, OfReadersSeeNothingOfWhatCommandsThatFailWrite) {
    // A failed SETCONFIG has the translator's errors among its values, a failed INSTALL its
    // command.
    home_.products({"ux"}, "echo said-by-the-translator >&2; exit 3");
    host_->zavctl({"config", "set", "ux", "INSTANCE=ux password=secret-one"});
    host_->zavctl({"install", "ux", "7.1", "--", "/bin/false", "password=secret-two"});
    const json tasks = json::parse(host_->zavctl({"--json", "tasks"}).out).at("tasks");
    ASSERT_EQ(tasks.size(), 2U);
    for (const json& task : tasks) {
        const std::string id = task.at("id");
        const json shown = json::parse(as(kReaders, {"--json", "task", "show", id}).out);
        ASSERT_EQ(shown.at("state"), "failed") << shown;
        EXPECT_EQ(shown.dump().find("said-by-the-translator"), std::string::npos) << shown;
        EXPECT_EQ(shown.dump().find("secret-"), std::string::npos) << shown;
        EXPECT_EQ(shown.at("events").at(0).at("RETMSGPARM"), "");
        EXPECT_NE(shown.at("events").at(0).at("RETMSGID"), "");
    }
    const auto events = [this](const std::string& group) {
        return as(group, {"--json", "--timeout", "20", "events", "--since", "0-0", "--count", "2"});
    };
    const ProgramResult seen = events(kReaders);
    EXPECT_EQ(seen.status, 0) << seen.err;
    EXPECT_THAT(seen.out, HasSubstr("SETCONFIG"));
    EXPECT_THAT(seen.out, Not(HasSubstr("said-by-the-translator")));
    EXPECT_THAT(seen.out, Not(HasSubstr("secret-")));
    EXPECT_THAT(events(kOperators).out, HasSubstr("said-by-the-translator"));
    EXPECT_THAT(events(kOperators).out, HasSubstr("secret-two"));  // as the plug-in gave it
}

TEST_F(Groups, OfReadersChangeNothing) {
    files_.write("depot/there", "x");
    for (const Words& words : {Words{"start", "ux"},
                               {"install", "ux", "7.1", "--", "true"},
                               {"config", "get", "ux"},
                               {"query", "--yes", "KAGREQT", "COMMAND=STOP", "PRODUCT=ux"},
                               {"depot", "rm", "there"}}) {
        expectRefused(kReaders, words, "you may only read from this host");
    }
    EXPECT_TRUE(inDepot("there"));
    EXPECT_EQ(home_.agentCalls(), Words());
    EXPECT_THAT(host_->exchange("GET /v1/tasks HTTP/1.0\r\n\r\n"), HasSubstr("{\"tasks\":[],"));
}

TEST_F(Groups, OfReadersSendNoFiles) {
    program_.write("file", "content");
    fs::permissions(program_.path("file"), fs::perms(0644));
    EXPECT_NE(as(kReaders, {"push", program_.path("file")}).status, 0);
    EXPECT_FALSE(inDepot("file"));
}

TEST_F(Groups, OfOthersAreRefusedWithTheGroupsThatAreServed) {
    for (const Words& words : {Words{"status"}, {"whoami"}, {"agents"}, {"start", "ux"}}) {
        expectRefused(kOthers, words,
                      "this host serves root, its own user, the group games and, for reading, the "
                      "group users only");
    }
}

TEST_F(Groups, AreAskedForByNameAndInAPrivateDirectory) {
    const auto startError = [&](const Words& more) {
        Words argv = {zavhostPath(), "--home", home_.path(), "--unguarded"};
        argv.insert(argv.end(), more.begin(), more.end());
        const ProgramResult result = runProgram(argv);
        EXPECT_EQ(result.status, 1);
        return result.err;
    };
    EXPECT_THAT(startError({"--group", "no-such-group"}),
                HasSubstr("--group: there is no group \"no-such-group\""));
    const std::string open = files_.makeDir("open");
    fs::permissions(open, fs::perms(01777));
    EXPECT_THAT(
        startError({"--group", kOperators, "--socket", open + "/s"}),
        HasSubstr("everybody is to connect to it, and others may write to its directory " + open));
    EXPECT_FALSE(fs::exists(open + "/s"));
}

TEST_F(Groups, MakeNoDifferenceToAHostThatNamesNone) {
    host_.reset();
    start();
    fs::permissions(fs::path(host_->socket()).parent_path(), fs::perms(0755));
    EXPECT_EQ(modeOf(host_->socket()), 0600U);
    fs::permissions(host_->socket(), fs::perms(0666));
    expectRefused(kOperators, {"status"}, "this host serves its own user only");
    EXPECT_EQ(host_->zavctl({"whoami"}).out,
              "You are root and may do everything, because you are root.\n");
}

}  // namespace
