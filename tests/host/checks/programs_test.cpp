#include <sched.h>
#include <sys/mount.h>
#include <sys/stat.h>

#include <filesystem>

#include "host/checks/check_fixture.h"

namespace {

using host::Verdict;

TEST_F(CheckTest, AHomeThatLacksNothingPassesEveryCheck) {
    for (const host::CheckResult& result : run())
        EXPECT_STREQ(nameOf(result.finding.verdict), "ok") << lineOf(result);
}

class ProgramChecks : public CheckTest {
protected:
    void expectErrorWithout(const std::string& check, const std::string& program) {
        const std::string path = home + "/" + program;
        ASSERT_EQ(::chmod(path.c_str(), 0644), 0);
        expectFinding(check, Verdict::Error, path + " is not executable");
        EXPECT_EQ(find(check).remedy, "chmod +x " + path);
        std::filesystem::remove(path);
        expectFinding(check, Verdict::Error, path + " is missing");
        scratch.makeDir("home/" + program);
        expectFinding(check, Verdict::Error, path + " is not a file");
    }
};

TEST_F(ProgramChecks, TheAgentScriptMustBeThere) {
    expectErrorWithout("agent-script", "bin/TovrinAgent");
}

TEST_F(ProgramChecks, TheInventoryProgramMustBeThere) {
    expectErrorWithout("inventory", "bin/cinfo");
}

TEST_F(ProgramChecks, TheUninstallerMustBeThere) {
    expectErrorWithout("uninstaller", "bin/uninstall.sh");
}

TEST_F(ProgramChecks, TheTranslatorMustBeThereOnceTheSharedComponentIsInstalled) {
    expectErrorWithout("translator", "agtqvs6/lx8266/bin/zav_xa");
    installed({"ux"});
    expectFinding("translator", Verdict::Warning, "the shared component ax is not installed");
}

TEST_F(ProgramChecks, TheConsoleMustBeThereOnceTheUniversalAgentIsInstalled) {
    std::filesystem::remove(home + "/bin/um_console");
    expectFinding("console", Verdict::Ok, "only the universal agent um needs it");
    installed({"ax", "um"});
    expectFinding("console", Verdict::Error, "is missing");
}

TEST_F(ProgramChecks, AnInventoryThatFailsIsAWarning) {
    scratch.script("home/bin/cinfo", "exit 3");
    expectFinding("inventory", Verdict::Warning, "bin/cinfo -d ended with exit code 3");
}

TEST_F(ProgramChecks, AShellThatCannotBeExecutedIsAWarning) {
    expectFinding("shell", Verdict::Ok, "/bin/ksh");
    if (::unshare(CLONE_NEWNS) != 0) GTEST_SKIP() << "no file can be mounted here";
    ASSERT_EQ(::mount("none", "/", nullptr, MS_REC | MS_PRIVATE, nullptr), 0);
    const std::string file = scratch.write("file", "");
    ASSERT_EQ(::mount(file.c_str(), "/bin/ksh", nullptr, MS_BIND, nullptr), 0);
    expectFinding("shell", Verdict::Warning, "/bin/ksh is not executable");
    EXPECT_EQ(::umount2("/bin/ksh", MNT_DETACH), 0);
    ASSERT_EQ(::mount("/dev/null", "/bin/ksh", nullptr, MS_BIND, nullptr), 0);
    expectFinding("shell", Verdict::Warning, "/bin/ksh is not a file");
    EXPECT_EQ(::umount2("/bin/ksh", MNT_DETACH), 0);
    expectFinding("shell", Verdict::Ok, "/bin/ksh");
}

}  // namespace
