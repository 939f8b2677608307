#include "ctl/verbs/commands/install.h"

#include <gtest/gtest.h>

namespace {

using ctl::joinedCommand;

TEST(InstallCommand, KeepsAWordWithBlanksOneWord) {
    EXPECT_EQ(joinedCommand({"/bin/sh", "-c", "exit 3"}), "/bin/sh -c \"exit 3\"");
    EXPECT_EQ(joinedCommand({"a", "b"}), "a b");
}

TEST(InstallCommand, LeavesQuotesThatAreThereToGroupWhatTheyDo) {
    EXPECT_EQ(joinedCommand({"run", "'d e'", "\"f g\"", "h\\ i"}), "run 'd e' \"f g\" h\\ i");
}

TEST(InstallCommand, IsASingleWordAsItStands) {
    EXPECT_EQ(joinedCommand({"/bin/sh -c 'exit 3'"}), "/bin/sh -c 'exit 3'");
    EXPECT_EQ(joinedCommand({"run it"}), "run it");
}

}  // namespace
