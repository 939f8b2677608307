// Every script of the starter home is sh that the strictest shells read.
#include "home/home_fixture.h"

#include <gtest/gtest.h>

namespace {

std::vector<std::string> scripts() {
    std::vector<std::string> found;
    for (const auto& file : std::filesystem::recursive_directory_iterator(ZAV_SOURCE_DIR "/home")) {
        std::ifstream in(file.path());
        std::string line;
        if (!file.is_regular_file() || !std::getline(in, line)) continue;
        if (line == "#!/bin/sh" || line == "# shellcheck shell=sh") found.push_back(file.path());
    }
    return found;
}

void checkAll(const std::vector<std::string>& command) {
    const auto files = scripts();
    ASSERT_GE(files.size(), 15U);
    for (const auto& file : files) {
        std::vector<std::string> one(command);
        one.push_back(file);
        const Outcome outcome = run(one);
        EXPECT_EQ(outcome.status, 0) << file << "\n" << outcome.out << outcome.err;
    }
}

TEST(HomeScripts, AreReadByDash) {
    if (!std::filesystem::exists("/bin/dash")) GTEST_SKIP() << "no dash here";
    checkAll({"/bin/dash", "-n"});
}

TEST(HomeScripts, AreReadByTheKornShell) {
    checkAll({"/bin/ksh", "-n"});
}

TEST(HomeScripts, AreCleanForShellcheck) {
    if (!std::filesystem::exists("/usr/bin/shellcheck")) GTEST_SKIP() << "no shellcheck here";
    checkAll({"/usr/bin/shellcheck", "-x", "-P", ZAV_SOURCE_DIR});
}

}  // namespace
