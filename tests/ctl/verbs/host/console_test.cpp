#include "ctl/verbs/host/console.h"

#include <gtest/gtest.h>

#include "ctl/command_line.h"

namespace {

using Words = std::vector<std::string>;

Words consoleWordsOf(const Words& words) {
    const ctl::CommandLine line = ctl::parseCommandLine(words);
    EXPECT_NE(line.verb, nullptr) << line.page.err;
    return line.verb == nullptr ? Words() : ctl::consoleWords(line.given);
}

TEST(TheConsolesProgram, GetsWhatIsGivenAndNothingElse) {
    EXPECT_EQ(consoleWordsOf({"console"}), (Words{"zavctl-console", "console"}));
    EXPECT_EQ(consoleWordsOf({"console", "--port", "8080", "--socket", "/a b", "--json"}),
              (Words{"zavctl-console", "--socket", "/a b", "--json", "console", "--port", "8080"}));
    EXPECT_EQ(consoleWordsOf({"--host-user", "zav", "--rpc-socket", "x", "console"}),
              (Words{"zavctl-console", "--rpc-socket", "x", "--host-user", "zav", "console"}));
}

TEST(TheConsolesProgram, GetsATimeOutThatItUnderstands) {
    const Words words = consoleWordsOf({"console", "--timeout", "1.5"});
    const ctl::CommandLine line = ctl::parseCommandLine({words.begin() + 1, words.end()});
    ASSERT_NE(line.verb, nullptr) << line.page.err;
    EXPECT_EQ(ctl::consoleWords(line.given), words);
}

TEST(TheConsole, ListensOnAPortOfTcp) {
    EXPECT_EQ(ctl::parseCommandLine({"console", "--port", "65536"}).verb, nullptr);
    EXPECT_EQ(ctl::parseCommandLine({"console", "--port", "-1"}).verb, nullptr);
}

}  // namespace
