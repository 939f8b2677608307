#include "host/depot/depot_directory.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cstdlib>
#include <filesystem>

#include "host/process/start_error.h"
#include "support/scoped_env.h"
#include "support/scratch_dir.h"

namespace {

using host::depotDirectoryOf;

TEST(DepotDirectory, IsTheOneThatIsNamed) {
    EXPECT_EQ(depotDirectoryOf("/home", "/srv/depot", true).path, "/srv/depot");
    EXPECT_FALSE(depotDirectoryOf("/home", "/srv/depot", true).isOwnChoice);
    EXPECT_EQ(depotDirectoryOf("/home", "/srv/depot", false).path, "/srv/depot");
}

TEST(DepotDirectory, IsADirectoryOfItsOwnWithoutAName) {
    for (const char* named : {static_cast<const char*>(nullptr), ""}) {
        EXPECT_EQ(depotDirectoryOf("/home", named, true).path, "/home/depot");
        EXPECT_TRUE(depotDirectoryOf("/home", named, true).isOwnChoice);
    }
}

TEST(DepotDirectory, IsThePluginsChoiceWhenUnguarded) {
    EXPECT_EQ(depotDirectoryOf("/home", nullptr, false).path, "/home");
    EXPECT_FALSE(depotDirectoryOf("/home", nullptr, false).isOwnChoice);
}

TEST(DepotDirectory, IsMadeForItsOwnerAloneAndPassedOn) {
    const ScratchDir scratch;
    const ScopedEnv unset(host::kDepotVariable, nullptr);
    const std::string path = scratch.path("depot");
    for (int repeated = 0; repeated < 2; ++repeated) {
        testing::internal::CaptureStderr();
        host::provideDepotDirectory({path, true});
        EXPECT_EQ(testing::internal::GetCapturedStderr(),
                  "zavhost: QVSDEPLOY_AGENTDEPOT is not set; the depot is " + path + "\n");
        struct stat found {};
        ASSERT_EQ(::stat(path.c_str(), &found), 0);
        EXPECT_EQ(found.st_mode & 07777U, 0700U);
        EXPECT_STREQ(std::getenv(host::kDepotVariable), path.c_str());
    }
}

TEST(DepotDirectory, ThatSomebodyNamedIsLeftAlone) {
    const ScratchDir scratch;
    const ScopedEnv unset(host::kDepotVariable, nullptr);
    host::provideDepotDirectory({scratch.path("depot"), false});
    EXPECT_FALSE(scratch.exists("depot"));
    EXPECT_EQ(std::getenv(host::kDepotVariable), nullptr);
}

TEST(DepotDirectory, ThatCannotBeMadeIsAnErrorOfTheStart) {
    const ScratchDir scratch;
    const std::string path = scratch.write("depot", "a file");
    try {
        host::provideDepotDirectory({path, true});
        FAIL();
    } catch (const host::StartError& error) {
        EXPECT_EQ(std::string(error.what()),
                  "cannot make the depot directory " + path + ": Not a directory");
    }
}

TEST(DepotDirectory, HoldsTheHomeWhenItIsTheHomeOrAroundIt) {
    const ScratchDir scratch;
    const std::string home = scratch.makeDir("srv/home");
    std::filesystem::create_directory_symlink(home, scratch.path("link"));
    for (const std::string& depot : {home, home + "/", scratch.path("srv"), std::string("/"),
                                     scratch.path("link"), home + "/../home"}) {
        EXPECT_TRUE(host::holdsHome({depot, false}, home)) << depot;
    }
    for (const std::string& depot : {scratch.makeDir("srv/home/depot"), scratch.makeDir("other"),
                                     scratch.path("none"), std::string()}) {
        EXPECT_FALSE(host::holdsHome({depot, false}, home)) << depot;
    }
}

}  // namespace
