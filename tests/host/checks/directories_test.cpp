#include <filesystem>

#include "host/checks/check_fixture.h"

namespace {

namespace fs = std::filesystem;
using host::Verdict;

class DirectoryChecks : public CheckTest {};

TEST_F(DirectoryChecks, MissingDirectoriesThatCanBeMadeAreFine) {
    fs::remove(home + "/tmp");
    environment["QVSDEPLOY_AGENTDEPOT"] = scratch.path("new/depot");
    options.state = scratch.path("new/state");
    for (const char* const check : {"tmp", "depot", "state"}) {
        expectFinding(check, Verdict::Ok, "can be made");
    }
    EXPECT_FALSE(scratch.exists("new")) << "checks change nothing";
}

TEST_F(DirectoryChecks, FilesInTheirPlaceAreErrors) {
    fs::remove(home + "/tmp");
    scratch.write("home/tmp", "");
    environment["QVSDEPLOY_AGENTDEPOT"] = scratch.write("file", "");
    options.state = scratch.path("file/below");
    expectFinding("tmp", Verdict::Error, home + "/tmp cannot be used");
    expectFinding("depot", Verdict::Error, scratch.path("file") + " cannot be used");
    expectFinding("state", Verdict::Error, "cannot be made below " + scratch.path("file"));
}

TEST_F(DirectoryChecks, TheDepotIsTheHomesOwnUnlessOneIsNamed) {
    environment.erase("QVSDEPLOY_AGENTDEPOT");
    expectFinding("depot", Verdict::Ok, home + "/depot can be made");
    options.guarded = false;
    EXPECT_EQ(find("depot").text, home);
}

TEST_F(DirectoryChecks, DepotAndTmpOnDifferentFilesystemsAreAWarning) {
    expectFinding("filesystem", Verdict::Ok, "on one filesystem");
    // Every Linux machine has this filesystem, and it is none of the test's.
    environment["QVSDEPLOY_AGENTDEPOT"] = "/proc";
    expectFinding("filesystem", Verdict::Warning, "/proc and " + home + "/tmp");
}

TEST_F(DirectoryChecks, ADepotWhosePathThePlugInWouldCutIsAnError) {
    environment["QVSDEPLOY_AGENTDEPOT"] = scratch.makeDir("d\u00e9p\u00f4t\u00fc\u00fc");
    expectFinding("depot", Verdict::Error, "here by at least 3 bytes");
    environment["QVSDEPLOY_AGENTDEPOT"] = scratch.makeDir("d\u00e9pot");
    expectFinding("depot", Verdict::Warning, "in which the path stands twice");
}

}  // namespace
