#include <sys/stat.h>

#include <filesystem>

#include "host/checks/check_fixture.h"

namespace {

using host::Verdict;

class HomeChecks : public CheckTest {};

TEST_F(HomeChecks, APathThatThePlugInWouldSplitIsAWarning) {
    options.home = scratch.makeDir("home with blanks");
    expectFinding("home", Verdict::Warning, "splits its command lines");
}

TEST_F(HomeChecks, MissingDirectoriesAreNamed) {
    options.home = scratch.makeDir("bare");
    expectFinding("home", Verdict::Warning, "lacks the directories bin, config, logs");
}

TEST_F(HomeChecks, WhatOthersMayWriteToIsAWarning) {
    const std::string script = home + "/bin/TovrinAgent";
    ASSERT_EQ(::chmod(script.c_str(), 0777), 0);
    expectFinding("owners", Verdict::Warning, script);
}

TEST_F(HomeChecks, ARunAsDatabaseMustParse) {
    const std::string file = runAsFile();
    scratch.write(file, "<runas>\n</runas>\n");
    expectFinding("run-as", Verdict::Ok, file);
    scratch.write(file, "<runas>\n<agent></runas>\n");
    expectFinding("run-as", Verdict::Error, "it does not parse: ");
    EXPECT_NE(find("run-as").text.find("in line 2"), std::string::npos) << find("run-as").text;
    scratch.write(file, "<runas>");
    expectFinding("run-as", Verdict::Error, "it ends before its elements do");
    scratch.write(file, "");
    expectFinding("run-as", Verdict::Error, "it does not parse: ");
}

TEST_F(HomeChecks, WhatAnInterruptedConfigurationLeftIsNamed) {
    for (const char* name : {"home/config/um.config.copy", "home/config/.ConfigData/kumenv.copy"}) {
        const std::string copy = scratch.write(name, "");
        expectFinding("leftovers", Verdict::Warning, copy);
        std::filesystem::remove(copy);
    }
    expectFinding("leftovers", Verdict::Ok, "no change of a configuration was interrupted");
}

}  // namespace
