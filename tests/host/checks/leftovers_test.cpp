#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/file.h>
#include <unistd.h>

#include <filesystem>

#include "host/checks/check_fixture.h"
#include "system/file_descriptor.h"

namespace {

using host::Verdict;
using ::testing::HasSubstr;
using ::testing::Not;

class LeftoversCheck : public CheckTest {
protected:
    /// That this one file, or folder, is a leftover, and nothing is when it is gone.
    void expectNamed(const std::string& file, const std::string& cause) {
        const std::string path = scratch.write(file, "");
        expectFinding("leftovers", Verdict::Warning, cause + path);
        std::filesystem::remove(path);
        expectNone();
    }
    void expectNone() { expectFinding("leftovers", Verdict::Ok, "nothing was interrupted"); }
};

/// A process that certainly is not there: numbers go up to 4,194,304.
const char* const kNoProcess = "9999999";

TEST_F(LeftoversCheck, WhatAnInterruptedConfigurationLeftIsNamed) {
    for (const char* name : {"um.config.copy", ".ConfigData/kumenv.copy"}) {
        expectNamed(std::string("home/config/") + name,
                    "an interrupted change of a configuration left ");
    }
}

TEST_F(LeftoversCheck, WhatAKilledProgramWasToPutInPlaceIsNamed) {
    for (const char* folder : {"bin", "config", "config/.ConfigData", "registry", "run"}) {
        expectNamed(std::string("home/") + folder + "/.ux.cfg." + kNoProcess + ".aB3xYz",
                    "a program that was killed left ");
    }
}

TEST_F(LeftoversCheck, FilesOfLiveProgramsAndOtherFilesAreLeftAlone) {
    const std::string gone = kNoProcess;
    for (const std::string& name :
         {".ux.cfg." + std::to_string(::getpid()) + ".aB3xYz", ".ux.cfg." + gone + ".aB3xY",
          "ux.cfg." + gone + ".aB3xYz", "." + gone + ".aB3xYz", std::string(".ux.cfg.12x4.aB3xYz"),
          std::string(".ux.cfg..aB3xYz"), std::string(".aB3xYz"), std::string("..aB3xYz"),
          std::string("ux.cfg")}) {
        scratch.write("home/config/" + name, "");
    }
    expectNone();
}

TEST_F(LeftoversCheck, PartsOfProductsAreNamed) {
    for (const char* name : {".ux.new", ".ux.old", ".ux.gone", ".bin.gone", ".ax.new"}) {
        expectNamed(std::string("home/agtqvs6/lx8266/") + name,
                    "an interrupted installation or removal left ");
    }
    for (const char* name : {"new", ".new", "ux.new", ".ux.newer"})
        scratch.write(std::string("home/agtqvs6/lx8266/") + name, "");
    expectNone();
}

TEST_F(LeftoversCheck, AProductWithoutItsEntryIsNamed) {
    scratch.write("home/agtqvs6/lx8266/um/bin/agent", "");
    expectNone();  // nobody knows how it came there
    scratch.write("home/agtqvs6/lx8266/um/.manifest", "");
    expectFinding("leftovers", Verdict::Warning, home + "/agtqvs6/lx8266/um");
    scratch.write("home/registry/umlx8266.ver", "");
    expectNone();
    scratch.write("home/agtqvs6/lx8266/bin/.manifest", "");
    expectFinding("leftovers", Verdict::Warning, home + "/agtqvs6/lx8266/bin");
    scratch.write("home/registry/axlx8266.ver", "");
    expectNone();
}

TEST_F(LeftoversCheck, AnInstallationThatGoesOnIsNoLeftover) {
    scratch.write("home/agtqvs6/lx8266/.ux.new", "");
    scratch.write("home/agtqvs6/lx8266/um/.manifest", "");
    for (const char* product : {"ux", "um"})
        scratch.write(std::string("home/run/.") + product + ".lock", "");
    expectFinding("leftovers", Verdict::Warning, ".ux.new");
    const auto hold = [this](const std::string& product) {
        sys::FileDescriptor lock(
            ::open((home + "/run/." + product + ".lock").c_str(), O_RDONLY | O_CLOEXEC));
        EXPECT_EQ(::flock(lock.get(), LOCK_EX | LOCK_NB), 0);
        return lock;
    };
    const sys::FileDescriptor ux = hold("ux");
    EXPECT_THAT(find("leftovers").text, Not(HasSubstr(".ux.new")));
    const sys::FileDescriptor um = hold("um");
    expectNone();
}

TEST_F(LeftoversCheck, AnInstallationWithoutAResultIsNamed) {
    expectNamed("depot/runcmd.sh", "an installation that was interrupted, or goes on, left ");
    scratch.write("depot/runcmd.sh", "");
    scratch.write("depot/rc.txt", "0");
    expectNone();
}

TEST_F(LeftoversCheck, WhatAnInterruptedTransferLeftIsNamed) {
    expectNamed("home/tmp/.zavtemp", "an interrupted transfer left ");
}

TEST_F(LeftoversCheck, OfSeveralKindsAreNamedTogetherAndFewOfMany) {
    for (int i = 1; i <= 7; ++i)
        scratch.write("home/agtqvs6/lx8266/.p" + std::to_string(i) + ".new", "");
    scratch.write("home/tmp/.zavtemp", "");
    const host::Finding finding = find("leftovers");
    EXPECT_THAT(finding.text, HasSubstr("/.p1.new, "));
    EXPECT_THAT(finding.text, HasSubstr("/.p5.new and 2 more; an interrupted transfer left "));
    EXPECT_THAT(finding.remedy, HasSubstr("install the product again"));
    EXPECT_THAT(finding.remedy, HasSubstr("; push the file"));
}

}  // namespace
