#include <sys/resource.h>
#include <sys/stat.h>
#include <utime.h>

#include <clocale>
#include <ctime>
#include <filesystem>

#include "host/checks/check_fixture.h"

namespace {

using host::Verdict;

class MachineChecks : public CheckTest {};

TEST_F(MachineChecks, SocketsMustBePossible) {
    options.rpcSocket = scratch.path(std::string(200, 'x'));
    expectFinding("sockets", Verdict::Warning, "is longer than 107 bytes");
    options.rpcSocket = scratch.write("file", "");
    expectFinding("sockets", Verdict::Warning, "exists and is not a socket");
    options.rpcSocket = scratch.path("lost/socket");
    expectFinding("sockets", Verdict::Warning, "No such file or directory");
}

TEST_F(MachineChecks, SocketsThatOthersCouldReplaceAreAWarning) {
    const std::string folder = scratch.makeDir("shared");
    options.socket = scratch.write("shared/taken", "");
    ASSERT_EQ(::chmod(folder.c_str(), 0770), 0);
    expectFinding("sockets", Verdict::Warning, "others may write to its directory " + folder);
    ASSERT_EQ(::chmod(folder.c_str(), 01770), 0);
    expectFinding("sockets", Verdict::Warning, "exists and is not a socket");
}

TEST_F(MachineChecks, ATimeOutThatIsNoneIsAnError) {
    environment["TIMEOUT"] = "60";
    expectFinding("time-out", Verdict::Ok, "60 seconds, from TIMEOUT");
    environment["TIMEOUT"] = "1h";
    expectFinding("time-out", Verdict::Error, "not \"1h\"");
    options.taskTimeout = 5;
    expectFinding("time-out", Verdict::Ok, "5 seconds");
}

TEST_F(MachineChecks, ALocaleWithoutOtherLettersIsAWarning) {
    ASSERT_NE(std::setlocale(LC_CTYPE, "C"), nullptr);
    expectFinding("locale", Verdict::Warning, "text outside ASCII");
    ASSERT_NE(std::setlocale(LC_CTYPE, "C.UTF-8"), nullptr);
    expectFinding("locale", Verdict::Ok, "C.UTF-8, code page UTF-8");
}

TEST_F(MachineChecks, JavaIsMissedWhenABundleNeedsIt) {
    expectFinding("java", Verdict::Ok, "needs it");
    scratch.write("depot/jx/010000000/agent.jar", "");
    expectFinding("java", Verdict::Warning, "there is no Java");
    scratch.script("java/bin/java", "exit 0");
    environment["JAVAHOME"] = scratch.path("java");
    expectFinding("java", Verdict::Ok, scratch.path("java"));
    scratch.script("other/bin/java", "exit 0");
    scratch.script("home/bin/TovrinGetJavaHome", "echo '" + scratch.path("other") + "'");
    expectFinding("java", Verdict::Ok, scratch.path("other"));
}

TEST_F(MachineChecks, AClockBehindTheHomesFilesIsAWarning) {
    const utimbuf future{std::time(nullptr) + 86'400, std::time(nullptr) + 86'400};
    ASSERT_EQ(::utime((home + "/config").c_str(), &future), 0);
    expectFinding("clock", Verdict::Warning, home + "/config was changed in the future");
}

TEST_F(MachineChecks, FewDescriptorsAreAWarning) {
    struct rlimit before {};
    ASSERT_EQ(::getrlimit(RLIMIT_NOFILE, &before), 0);
    const struct rlimit few { 100, before.rlim_max };
    ASSERT_EQ(::setrlimit(RLIMIT_NOFILE, &few), 0);
    expectFinding("descriptors", Verdict::Warning, "100 open files are few");
    ASSERT_EQ(::setrlimit(RLIMIT_NOFILE, &before), 0);
}

}  // namespace
