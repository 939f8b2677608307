// ctest-label: threaded
// The directories that the library works in, and the host's name.
#include <gmock/gmock.h>
#include <sys/utsname.h>

#include <atomic>
#include <cstdlib>
#include <cstring>
#include <thread>
#include <vector>

#include "platform/bss1.h"
#include "support/scoped_env.h"
#include "support/scratch_dir.h"
#include "support/trace_capture.h"
#include "util/zavutil.h"

namespace {

/// While set, the base services report every variable as unset.
std::atomic<bool> baseServicesAreBlind{false};

}  // namespace

// Replaces the platform's function.
const char* BSS1_GetEnv(const char* name, const char* fallback) {
    const char* const value = baseServicesAreBlind ? nullptr : std::getenv(name);
    return value != nullptr ? value : fallback;
}

using namespace ZAV;
using ::testing::Contains;
using ::testing::ElementsAre;

namespace {

std::string narrow(const String& text) {
    return static_cast<const char*>(text.c_str());
}

class Directories : public ::testing::Test {
protected:
    Directories() { forget(); }
    ~Directories() override {
        baseServicesAreBlind = false;
        forget();
    }

    static void forget() {
        Util::_homeDir.clear();
        Util::_configDir.clear();
        Util::_agentDepotDir.clear();
    }

    ScratchDir scratch;
    ScopedEnv home{"TOVRINHOME", nullptr};
    ScopedEnv depot{"QVSDEPLOY_AGENTDEPOT", nullptr};
    TraceCapture traces;
    String dir{"as before"};
};

TEST_F(Directories, PathExistsSaysSoInTheTrace) {
    EXPECT_TRUE(Util::pathExists(scratch.path().c_str()));
    EXPECT_FALSE(Util::pathExists(scratch.path("no").c_str()));
    EXPECT_FALSE(Util::pathExists(""));
    EXPECT_THAT(
        traces.details("zavutil"),
        ElementsAre("Path [" + scratch.path() + "] exists",
                    "Path [" + scratch.path("no") + "] does not exist", "Path [] does not exist"));
}

TEST_F(Directories, HostNameIsTheNodeNameUpToItsFirstDot) {
    struct utsname names;
    ASSERT_EQ(uname(&names), 0);
    names.nodename[std::strcspn(names.nodename, ".")] = '\0';
    EXPECT_EQ(narrow(Util::getHostName()), names.nodename);
}

TEST_F(Directories, HomeIsTrimmedAndEndsWithASlash) {
    home.set((" \t" + scratch.path() + " ").c_str());
    EXPECT_TRUE(Util::getTovrinHomeDir(dir));
    EXPECT_EQ(narrow(dir), scratch.path() + "/");
    EXPECT_EQ(narrow(Util::_homeDir), scratch.path() + "/");
    EXPECT_THAT(traces.errors(), ElementsAre());
}

TEST_F(Directories, HomeThatEndsWithASlashGetsNoSecondOne) {
    home.set((scratch.path() + "/").c_str());
    EXPECT_TRUE(Util::getTovrinHomeDir(dir));
    EXPECT_EQ(narrow(dir), scratch.path() + "/");
}

TEST_F(Directories, MissingHomeFailsAndIsTriedAgain) {
    home.set(scratch.path("later").c_str());
    EXPECT_FALSE(Util::getTovrinHomeDir(dir));
    EXPECT_EQ(dir.length(), 0u);
    EXPECT_THAT(traces.errors("zavutil"), ElementsAre("Tovrin Home directory, " +
                                                      scratch.path("later") + ", does not exist"));
    scratch.makeDir("later");
    EXPECT_TRUE(Util::getTovrinHomeDir(dir));
    EXPECT_EQ(narrow(dir), scratch.path("later") + "/");
}

TEST_F(Directories, UnsetHomeFails) {
    EXPECT_FALSE(Util::getTovrinHomeDir(dir));
    EXPECT_EQ(dir.length(), 0u);
    EXPECT_THAT(traces.errors("zavutil"),
                ElementsAre("Environment variable TOVRINHOME, does not exist"));
}

TEST_F(Directories, HomeThatTheBaseServicesDoNotKnowIsInTheEnvironment) {
    scratch.makeDir("config");
    home.set(scratch.path().c_str());
    depot.set(scratch.path("depot").c_str());
    baseServicesAreBlind = true;
    EXPECT_TRUE(Util::getTovrinHomeDir(dir));
    EXPECT_EQ(narrow(dir), scratch.path() + "/");
    EXPECT_TRUE(Util::getTovrinConfigDir(dir));
    EXPECT_EQ(narrow(dir), scratch.path("config") + "/");
    EXPECT_TRUE(Util::getAgentDepotDir(dir));
    EXPECT_EQ(narrow(dir), scratch.path() + "/") << "the depot is the base services' to know";
}

TEST_F(Directories, EmptyHomeNamesNothing) {
    home.set("  ");
    EXPECT_FALSE(Util::getTovrinHomeDir(dir));
    EXPECT_THAT(traces.errors("zavutil"), ElementsAre("Tovrin Home directory, , does not exist"));
}

TEST_F(Directories, HomeIsKeptOnceFound) {
    home.set(scratch.path().c_str());
    ASSERT_TRUE(Util::getTovrinHomeDir(dir));
    home.set("/nowhere");
    EXPECT_TRUE(Util::getTovrinHomeDir(dir));
    EXPECT_EQ(narrow(dir), scratch.path() + "/");
}

TEST_F(Directories, ConfigIsBelowHome) {
    scratch.makeDir("config");
    home.set((" " + scratch.path() + "/ ").c_str());
    EXPECT_TRUE(Util::getTovrinConfigDir(dir));
    EXPECT_EQ(narrow(dir), scratch.path("config") + "/");
    EXPECT_EQ(narrow(Util::_configDir), scratch.path("config") + "/");
}

TEST_F(Directories, MissingConfigFailsAndIsTriedAgain) {
    home.set(scratch.path().c_str());
    EXPECT_FALSE(Util::getTovrinConfigDir(dir));
    EXPECT_EQ(dir.length(), 0u);
    EXPECT_THAT(
        traces.errors("zavutil"),
        ElementsAre("Tovrin Config directory, " + scratch.path("config") + "/, does not exist"));
    scratch.makeDir("config");
    EXPECT_TRUE(Util::getTovrinConfigDir(dir));
}

TEST_F(Directories, ConfigWithoutHomeFails) {
    EXPECT_FALSE(Util::getTovrinConfigDir(dir));
    EXPECT_EQ(dir.length(), 0u);
    EXPECT_THAT(traces.errors("zavutil"),
                ElementsAre("Environment variable TOVRINHOME, does not exist"));
}

TEST_F(Directories, DepotIsCreatedWhereTheVariableSays) {
    depot.set(scratch.path("a/b").c_str());
    EXPECT_TRUE(Util::getAgentDepotDir(dir));
    EXPECT_EQ(narrow(dir), scratch.path("a/b") + "/");
    EXPECT_TRUE(scratch.exists("a/b"));
    EXPECT_THAT(traces.details("zavutil"),
                Contains("Successfully created staging dir " + scratch.path("a/b")));
    EXPECT_EQ(traces.details("zavutil").back(),
              "Agent depot dir is \"" + scratch.path("a/b") + "/\"");
    EXPECT_THAT(traces.errors(), ElementsAre());
}

TEST_F(Directories, ExistingDepotIsTakenAsItIs) {
    depot.set((scratch.makeDir("depot") + "/").c_str());
    EXPECT_TRUE(Util::getAgentDepotDir(dir));
    EXPECT_EQ(narrow(dir), scratch.path("depot") + "/");
    EXPECT_EQ(narrow(Util::_agentDepotDir), scratch.path("depot") + "/");
}

TEST_F(Directories, WithoutADepotHomeIsTheStagingDirectory) {
    home.set(scratch.path().c_str());
    EXPECT_TRUE(Util::getAgentDepotDir(dir));
    EXPECT_EQ(narrow(dir), scratch.path() + "/");
    EXPECT_THAT(
        traces.errors("zavutil"),
        ElementsAre("Staging dir environment variable \"QVSDEPLOY_AGENTDEPOT\" is not set"));
}

TEST_F(Directories, NeitherDepotNorHomeFails) {
    EXPECT_FALSE(Util::getAgentDepotDir(dir));
    EXPECT_EQ(dir.length(), 0u);
    EXPECT_THAT(traces.errors("zavutil"),
                ElementsAre("Staging dir environment variable \"QVSDEPLOY_AGENTDEPOT\" is not set",
                            "Environment variable TOVRINHOME, does not exist",
                            "TOVRINHOME not set. No idea what to use as a staging dir"));
    EXPECT_EQ(traces.details("zavutil").back(), "Agent depot dir is \"\"");
}

TEST_F(Directories, DepotThatCannotBeCreatedFailsAndIsTriedAgain) {
    const std::string below = scratch.write("file", "") + "/depot";
    depot.set(below.c_str());
    EXPECT_FALSE(Util::getAgentDepotDir(dir));
    EXPECT_EQ(dir.length(), 0u);
    EXPECT_EQ(traces.errors("zavutil").back(),
              "Failed to create staging dir " + below + " Return Code was 20");
    depot.set(scratch.path("depot").c_str());
    EXPECT_TRUE(Util::getAgentDepotDir(dir));
}

TEST_F(Directories, EmptyDepotVariableNamesNothingToCreate) {
    depot.set("");
    EXPECT_FALSE(Util::getAgentDepotDir(dir));
    EXPECT_EQ(traces.errors("zavutil").back(), "Failed to create staging dir  Return Code was 1");
}

TEST_F(Directories, InitialisationsReplaceWhatTheArgumentHeld) {
    home.set(scratch.path().c_str());
    EXPECT_TRUE(Util::initTovrinHomeDir(dir));
    EXPECT_EQ(narrow(dir), scratch.path() + "/");
    EXPECT_FALSE(Util::initTovrinConfigDir(dir));
    EXPECT_EQ(dir.length(), 0u);
    EXPECT_TRUE(Util::initAgentDepotDir(dir));
    EXPECT_EQ(narrow(dir), scratch.path() + "/");
    EXPECT_EQ(Util::_agentDepotDir.length(), 0u);
}

TEST_F(Directories, OfSeveralFirstCallersOneCreatesTheDepot) {
    depot.set(scratch.path("x/y/depot").c_str());
    std::atomic<int> succeeded{0};
    std::vector<std::thread> callers;
    for (int i = 0; i < 8; ++i) {
        callers.emplace_back([&] {
            String found;
            if (Util::getAgentDepotDir(found) && narrow(found) == scratch.path("x/y/depot") + "/") {
                ++succeeded;
            }
        });
    }
    for (std::thread& caller : callers)
        caller.join();
    EXPECT_EQ(succeeded, 8);
    EXPECT_EQ(traces.count('D', "Successfully created staging dir " + scratch.path("x/y/depot")),
              1);
    EXPECT_THAT(traces.errors(), ElementsAre());
}

}  // namespace
