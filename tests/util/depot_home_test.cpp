// Finding the central server's package depot.

#include <gmock/gmock.h>

#include <string>

#include "support/scoped_env.h"
#include "support/scratch_dir.h"
#include "support/trace_capture.h"
#include "util/zavutil.h"

using namespace ZAV;
using ::testing::Contains;
using ::testing::ElementsAre;

namespace {

class DepotHome : public ::testing::Test {
protected:
    DepotHome() { scratch.write("config/.ConfigData/kmsenv", "SRV|CELLNAME|x|\n"); }

    /// Asks for the depot home of the scratch directory and stores the answer.
    int find(bool addPackages = false, bool create = false) {
        String dir((scratch.path() + "/").c_str());
        const int rc = Util::getDepotHome(dir, addPackages, create);
        found = static_cast<const char*>(dir.c_str());
        return rc;
    }
    /// The lines traced by the search itself.
    std::vector<std::string> own(char level) const {
        std::vector<std::string> texts;
        for (const TraceLine& line : traces.lines()) {
            if (line.level == level && line.function == "getDepotHome") texts.push_back(line.text);
        }
        return texts;
    }
    std::string command() const {
        return "/bin/sh -c \"grep CELLNAME " + scratch.path() +
               "/config/.ConfigData/kmsenv | grep -v default\"";
    }
    std::string tables(const std::string& below) const {
        return scratch.path("tables/SRV" + below);
    }

    ScratchDir scratch;
    TraceCapture traces;
    std::string found;
};

TEST_F(DepotHome, IsWhatTheServersEnvironmentSays) {
    const std::string depot = scratch.makeDir("elsewhere");
    scratch.write("tables/SRV/KBBENV", "* DEPOTHOME=/wrong\nDEPOTHOME = " + depot + " \n");
    EXPECT_EQ(find(), 0);
    EXPECT_EQ(found, depot);
    EXPECT_THAT(own('D'), ElementsAre("Running command: " + command(), "CMS name found: SRV",
                                      "Depot home is: " + depot));
    EXPECT_THAT(own('E'), ElementsAre());
}

TEST_F(DepotHome, WithoutTheEntryItIsBesideTheEnvironment) {
    scratch.write("tables/SRV/KBBENV", "*DEPOTHOME=/wrong\nOTHER=1\n");
    scratch.makeDir("tables/SRV/depot");
    EXPECT_EQ(find(), 0);
    EXPECT_EQ(found, tables("/depot"));
    EXPECT_THAT(own('E'),
                ElementsAre("No DEPOTHOME in KBBENV, defaulting DEPOTHOME to " + tables("/depot")));
}

TEST_F(DepotHome, PackagesAreBelowIt) {
    scratch.write("tables/SRV/KBBENV", "");
    scratch.makeDir("tables/SRV/depot/PACKAGES");
    EXPECT_EQ(find(true), 0);
    EXPECT_EQ(found, tables("/depot/PACKAGES/"));
}

TEST_F(DepotHome, WithoutAnEnvironmentItIsTheUsualOne) {
    scratch.makeDir("tables/SRV/depot");
    EXPECT_EQ(find(), 0);
    EXPECT_EQ(found, tables("/depot"));
    EXPECT_THAT(own('E'), ElementsAre("Can't find " + tables("/KBBENV") +
                                      ", defaulting DEPOTHOME to " + tables("/depot")));
}

TEST_F(DepotHome, EnvironmentThatCannotBeReadLeavesTheUsualOne) {
    scratch.makeDir("tables/SRV/KBBENV");
    scratch.makeDir("tables/SRV/depot");
    EXPECT_EQ(find(), 0);
    EXPECT_EQ(found, tables("/depot"));
    EXPECT_THAT(own('E'), ElementsAre("Caught ResourceBundleException, defaulting DEPOTHOME to " +
                                      tables("/depot")));
}

TEST_F(DepotHome, MissingDirectoryIsReported) {
    EXPECT_EQ(find(), 1);
    EXPECT_EQ(found, tables("/depot"));
    EXPECT_EQ(own('E').back(), "Path [" + tables("/depot") + "] does not exist");
    EXPECT_EQ(own('D').back(), "Depot home is: " + tables("/depot"));
}

TEST_F(DepotHome, MissingDirectoryIsCreatedOnDemand) {
    EXPECT_EQ(find(true, true), 0);
    EXPECT_EQ(found, tables("/depot/PACKAGES/"));
    EXPECT_TRUE(scratch.exists("tables/SRV/depot/PACKAGES"));
    EXPECT_THAT(own('D'),
                ElementsAre("Running command: " + command(), "CMS name found: SRV",
                            "Path [" + tables("/depot/PACKAGES/") +
                                "] does not exist, attempting to create",
                            "Depot directory [" + tables("/depot/PACKAGES/") + "] created",
                            "Depot home is: " + tables("/depot/PACKAGES/")));
}

TEST_F(DepotHome, DirectoryThatCannotBeCreatedIsReported) {
    scratch.write("tables", "");
    EXPECT_EQ(find(false, true), 1);
    EXPECT_EQ(own('E').back(), "Could not create depot dir [" + tables("/depot") + "]");
}

TEST_F(DepotHome, NameEndsAtTheFirstBar) {
    scratch.write("config/.ConfigData/kmsenv",
                  "default|CELLNAME|d|\nHUB_1|CELLNAME|y|\nOTHER|x|z|\n");
    EXPECT_EQ(find(), 1);
    EXPECT_EQ(found, scratch.path("tables/HUB_1/depot"));
}

TEST_F(DepotHome, EmptyNameIsAName) {
    scratch.write("config/.ConfigData/kmsenv", "|CELLNAME\n");
    EXPECT_EQ(find(), 1);
    EXPECT_EQ(found, scratch.path("tables//depot"));
}

TEST_F(DepotHome, LineWithoutABarHasNoName) {
    scratch.write("config/.ConfigData/kmsenv", "CELLNAME=SRV\n");
    EXPECT_EQ(find(), 2);
    EXPECT_EQ(found, scratch.path() + "/");
    EXPECT_THAT(own('E'), ElementsAre("Unable to determine CMS name from kmsenv, "
                                      "stdout=[CELLNAME=SRV\n]"));
    EXPECT_EQ(own('D').back(), "Depot home is: " + scratch.path() + "/");
}

TEST_F(DepotHome, MissingConfigurationIsReportedInTheCommandsWords) {
    scratch.write("config/.ConfigData/kmsenv", "nothing of the kind\n");
    EXPECT_EQ(find(), 2);
    EXPECT_THAT(own('E'), ElementsAre("Error running command, retCode = 1", "Error message is: ",
                                      "Unable to determine CMS name, error running command"));
    traces.clear();
    std::remove(scratch.path("config/.ConfigData/kmsenv").c_str());
    EXPECT_EQ(find(), 2);
    const std::vector<std::string> errors = own('E');
    ASSERT_EQ(errors.size(), 3u);
    EXPECT_THAT(errors[1], ::testing::StartsWith("Error message is: grep: "));
    EXPECT_THAT(errors[1], ::testing::HasSubstr("kmsenv"));
}

TEST_F(DepotHome, LongErrorMessageIsReadWhole) {
    // To the command each word of a home with blanks is a separate file.
    std::string words;
    for (int i = 0; i < 200; ++i)
        words += "/none" + std::to_string(i) + " ";
    String dir(words.c_str());
    EXPECT_EQ(Util::getDepotHome(dir, false, false), 2);
    const std::vector<std::string> errors = own('E');
    ASSERT_EQ(errors.size(), 3u);
    EXPECT_GT(errors[1].size(), 2048u);
    EXPECT_THAT(errors[1], ::testing::HasSubstr("/none199"));
}

TEST_F(DepotHome, CommandThatRunsPastTheTimeOutGivesNoName) {
    const ScopedEnv noTime("TIMEOUT", "0");
    // The home becomes part of the shell command; this one keeps the pipes open for a while.
    String dir((scratch.path() + "/none; sleep 5 #").c_str());
    EXPECT_EQ(Util::getDepotHome(dir, false, false), 2);
    EXPECT_EQ(own('E').front(), "Error running command, retCode = 0");
    EXPECT_EQ(own('E').back(), "Unable to determine CMS name, error running command");
}

}  // namespace
