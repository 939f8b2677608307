#include "ctl/console/host/copied_command.h"

#include <gtest/gtest.h>

#include <filesystem>

#include "ctl/command_line.h"
#include "support/scoped_env.h"

namespace {

using Words = std::vector<std::string>;

Words commandOf(const Words& words) {
    const ctl::CommandLine line = ctl::parseCommandLine(words);
    EXPECT_NE(line.verb, nullptr) << line.page.err;
    return line.verb == nullptr ? Words() : console::copiedCommand(line.given);
}

TEST(ACopiedCommand, IsZavctlAloneForTheHostThatItFindsByItself) {
    const ScopedEnv none("ZAV_SOCKET", "");
    EXPECT_EQ(commandOf({"console", "--port", "8080", "--timeout", "5"}), (Words{"zavctl"}));
}

TEST(ACopiedCommand, LeadsToTheSameHostFromAnyTerminal) {
    const ScopedEnv named("ZAV_SOCKET", "/run/named.sock");
    EXPECT_EQ(commandOf({"console"}), (Words{"zavctl", "--socket", "/run/named.sock"}));
    EXPECT_EQ(commandOf({"console", "--socket", "here.sock", "--host-user", "zav"}),
              (Words{"zavctl", "--socket", std::filesystem::absolute("here.sock"), "--host-user",
                     "zav"}));
}

}  // namespace
