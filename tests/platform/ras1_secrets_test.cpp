// ctest-label: threaded
#include "ras1/secrets.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <string>
#include <thread>

#include "embedded/ras1_control.h"
#include "embedded/ras1_listener.h"
#include "platform/ras1.h"
#include "support/scratch_dir.h"

namespace {

using testing::EndsWith;
using testing::HasSubstr;
using testing::Not;

std::string shown(const std::string& text, const char* unit = "zavsample") {
    const ras1::Masking masking(unit, text.data(), text.size());
    if (!masking.changes()) return text;
    std::string out(masking.length(), '?');
    masking.put(out.data());
    return out;
}

TEST(Secrets, WhatFollowsASecretNameIsMasked) {
    EXPECT_EQ(shown("password=hunter2"), "password=***");
    EXPECT_EQ(shown("passwd: hunter2"), "passwd: ***");
    EXPECT_EQ(shown("pwd=x secret=y token=z apikey=1 key=2"),
              "pwd=*** secret=*** token=*** apikey=*** key=***");
    EXPECT_EQ(shown("a --password=abc b"), "a --password=*** b");
    EXPECT_EQ(shown("DB_PASSWORD = hunter2\nPORT=5"), "DB_PASSWORD = ***\nPORT=5");
    EXPECT_EQ(shown("{\"password\": \"a b\", \"port\": 5}"), "{\"password\": *** \"port\": 5}");
    EXPECT_EQ(shown("password='a b' c"), "password=*** c");
    EXPECT_EQ(shown("password=a\" b\"c d"), "password=*** d");
    EXPECT_EQ(shown("password=\"open\nnext=line"), "password=***\nnext=line");
    EXPECT_EQ(shown("key=abc"), "key=***") << "as long as before";
    EXPECT_EQ(shown("token==x"), "token==***");
    EXPECT_EQ(shown("token => x y"), "token => *** y");
}

TEST(Secrets, EverythingElseIsShown) {
    for (const char* text :
         {"", "=", ":", "password", "password is hunter2", "keys=1", "passwords: 2", "a=b c:d",
          "the key", "password=", "password: \nnext", "key=\n", "word=x"}) {
        EXPECT_EQ(shown(text), text);
    }
}

TEST(Secrets, AConfigurationIsSecretAsAWhole) {
    const std::string get = "Command to run is \"/home/bin/zav_xa -g  -pc ux\"";
    EXPECT_EQ(shown(get, "zavutil"), get);
    EXPECT_EQ(shown("outbuf: INSTANCE=one\nPORT=5\n", "zavutil"), "outbuf: ***");
    EXPECT_EQ(shown("outbuf: COLOUR=red\n", "zavutil"), "outbuf: ***");
    EXPECT_EQ(shown("STDOUT [31 characters] is: INSTANCE=one", "zavutil"),
              "STDOUT [31 characters] is: ***");
    EXPECT_EQ(shown("STDERR [5 characters] is: plain", "zavutil"),
              "STDERR [5 characters] is: plain");
    EXPECT_EQ(shown("Context [COLOUR=red] port", "zavtasks"), "Context [***");
}

TEST(Secrets, AnotherCommandsOutputIsNot) {
    shown("Command to run is \"/home/bin/zav_xa -g  -pc ux\"", "zavutil");
    shown("Command to run is \"/home/bin/cinfo -d \"", "zavutil");
    EXPECT_EQ(shown("outbuf: INSTANCE=one", "zavutil"), "outbuf: INSTANCE=one");
    shown("Bad return code (5) from command \"/home/bin/zav_xa -p t -pc ux\"", "zavutil");
    EXPECT_EQ(shown("STDOUT [12 characters] is: INSTANCE=one", "zavutil"),
              "STDOUT [12 characters] is: ***");
    shown("Return code (0) from command \"/home/bin/zav_xa -i t -pc ux\"", "zavutil");
    EXPECT_EQ(shown("STDOUT [3 characters] is: one", "zavutil"), "STDOUT [3 characters] is: one");
}

TEST(Secrets, EachThreadHasItsOwnCommand) {
    shown("Command to run is \"/home/bin/zav_xa -g  -pc ux\"", "zavutil");
    std::thread([] { EXPECT_EQ(shown("outbuf: one", "zavutil"), "outbuf: one"); }).join();
    EXPECT_EQ(shown("outbuf: one", "zavutil"), "outbuf: ***");
}

TEST(Secrets, TheRowOfAConfigurationIsMaskedAndThatOfAnotherCommandIsNot) {
    for (const char* command : {"GETCONFIG", "SETCONFIG"}) {
        shown(std::string("\t\tcommand=\"") + command + "\"\n", "zav01agt");
        EXPECT_EQ(shown("\t\tcontext=\"INSTANCE=one\"\n", "zav01agt"), "\t\tcontext=\"***");
    }
    shown("\t\tcommand=\"INSTALL\"\n", "zav01agt");
    EXPECT_EQ(shown("\t\tcontext=\"/bin/x password=y z\"\n", "zav01agt"),
              "\t\tcontext=\"/bin/x password=*** z\"\n");
}

/// What is shown of a text in two pieces, wherever it is cut.
std::string inPieces(const std::string& text, std::size_t cut) {
    shown("Command to run is \"x\"", "zavutil");
    const std::string head = "outbuf: ";
    const std::string first = shown(head + text.substr(0, cut), "zavutil");
    const std::string second = shown(head + text.substr(cut), "zavutil");
    return first.substr(head.size()) + "|" + second.substr(head.size());
}

TEST(Secrets, AreFoundWhereverTheOutputIsCut) {
    const std::string text = "a password = \"hun ter2\" b";
    for (std::size_t cut = 0; cut <= text.size(); ++cut) {
        const std::string out = inPieces(text, cut);
        EXPECT_THAT(out, Not(HasSubstr("hun"))) << cut;
        EXPECT_THAT(out, Not(HasSubstr("ter2"))) << cut;
        EXPECT_THAT(
            out, testing::AnyOf(EndsWith(" b"), EndsWith(" |b"), EndsWith("b|"), EndsWith("| b")))
            << cut;
    }
    EXPECT_EQ(inPieces("key=a", 4), "key=|***");
    EXPECT_EQ(inPieces("key=ab c", 5), "key=***|*** c");
}

TEST(Secrets, OutputAndErrorsAreCutOnTheirOwn) {
    shown("Command to run is \"x\"", "zavutil");
    shown("outbuf: password=", "zavutil");
    EXPECT_EQ(shown("errbuf: plain", "zavutil"), "errbuf: plain");
    EXPECT_EQ(shown("outbuf: hunter2", "zavutil"), "outbuf: ***");
    shown("outbuf: password=", "zavutil");
    shown("Command to run is \"y\"", "zavutil");
    EXPECT_EQ(shown("outbuf: plain", "zavutil"), "outbuf: plain");
}

TEST(Secrets, ErrnoStays) {
    errno = EDOM;
    shown("password=x");
    EXPECT_EQ(errno, EDOM);
}

RAS1_UNIT unit{"zavsample"};
const RAS1_BLOCK block{&unit, "doWork"};

class SecretsInTheLog : public testing::Test {
protected:
    SecretsInTheLog() { ras1::configure("ALL", scratch_.path("log")); }
    ~SecretsInTheLog() override {
        ras1::showSecrets(false);
        ras1::configureFromEnvironment();
    }
    static void trace(const char* text) { RAS1_Printf(&block, RAS1_DETAIL, 1, "%s", text); }

    ScratchDir scratch_;
};

TEST_F(SecretsInTheLog, AreMaskedBeforeLineEndsAreEscaped) {
    trace("first\npassword=hunter2\nlast\n");
    EXPECT_THAT(scratch_.read("log"), EndsWith("doWork: first\\npassword=***\\nlast\n"));
}

TEST_F(SecretsInTheLog, AreShownWhenAskedFor) {
    ras1::showSecrets(true);
    trace("password=hunter2");
    EXPECT_THAT(scratch_.read("log"), EndsWith("doWork: password=hunter2\n"));
    ras1::showSecrets(false);
    trace("password=hunter2");
    EXPECT_THAT(scratch_.read("log"), EndsWith("doWork: password=***\n"));
}

TEST_F(SecretsInTheLog, LongTextsAreMaskedToo) {
    trace((std::string(100000, 'x') + " password=hunter2 " + std::string(100000, 'y')).c_str());
    const std::string log = scratch_.read("log");
    EXPECT_THAT(log, HasSubstr("x password=*** y"));
    EXPECT_THAT(log, EndsWith("y\n"));
}

class LastText final : public ras1::Listener {
public:
    void hear(const ras1::HeardLine& line) noexcept override {
        text.assign(line.text, line.length);
    }
    std::string text;
};

TEST_F(SecretsInTheLog, AListenerHearsTheTrueText) {
    LastText last;
    const ras1::Listening listening(last, {{"zavsample", RAS1_DETAIL}});
    RAS1_Sync(&unit);
    trace("password=hunter2");
    EXPECT_EQ(last.text, "password=hunter2");
    EXPECT_THAT(scratch_.read("log"), EndsWith("doWork: password=***\n"));
}

TEST_F(SecretsInTheLog, AChildThatSharesItsParentsMemoryMasksAsWell) {
    const pid_t child = ::vfork();
    if (child == 0) {
        RAS1_Printf(&block, RAS1_ERROR, 1, "%s", "cannot execute x key=hunter2");
        ::_exit(0);
    }
    int status = -1;
    ASSERT_EQ(::waitpid(child, &status, 0), child);
    EXPECT_EQ(status, 0);
    EXPECT_THAT(scratch_.read("log"), EndsWith("doWork: cannot execute x key=***\n"));
}

}  // namespace
