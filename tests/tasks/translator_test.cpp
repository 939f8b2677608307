#include "tasks/translator.h"

#include <gmock/gmock.h>

#include "support/trace_capture.h"
#include "tasks/task_home.h"

using testing::ElementsAre;
using testing::IsEmpty;
using ZAV::String;

namespace {

class Translator : public testing::Test {
protected:
    std::string replaced(const std::string& text, const char* product = "ux",
                         const char* version = "060100000") {
        return narrow(replaceTokens(text.c_str(), product, version));
    }

    TaskHome home_;
    TraceCapture trace_{"ERROR (UNIT:zavtasks ALL)"};
};

TEST_F(Translator, LiesInTheSharedComponentsDirectory) {
    const std::string expected = home_.translator("true");
    String path;
    EXPECT_TRUE(getTwoWayTranslator(path));
    EXPECT_EQ(narrow(path), expected);
    EXPECT_EQ(trace_.count('D', "Using default two-way translator [" + expected + "]"), 1);
    EXPECT_THAT(home_.calls(TaskHome::kTranslator), IsEmpty());
}

TEST_F(Translator, IsLookedForInTheRootWithoutASharedComponent) {
    String path("before");
    EXPECT_FALSE(getTwoWayTranslator(path));
    EXPECT_TRUE(path == "");
    EXPECT_EQ(trace_.count('E',
                           "No two-way translator found, default translator [/zav_xa] does "
                           "not exist"),
              1);
}

TEST_F(Translator, MayBeMissingFromTheSharedComponent) {
    const std::string expected = home_.translator("true");
    std::filesystem::remove(expected);
    String path("before");
    EXPECT_FALSE(getTwoWayTranslator(path));
    EXPECT_TRUE(path == "");
    EXPECT_EQ(trace_.count('E', "No two-way translator found, default translator [" + expected +
                                    "] does not exist"),
              1);
}

TEST_F(Translator, TextsWithoutTokensStayAsTheyAre) {
    for (const char* text :
         {"", "./install.sh -q", "|", "||", "|OTHER|", "|depotdir|", "|DEPOTDIR"}) {
        EXPECT_EQ(replaced(text), text);
    }
    EXPECT_EQ(trace_.count('D', "Received String is [|OTHER|]"), 1);
    EXPECT_EQ(trace_.count('D', "Resolved String is [|OTHER|]"), 1);
    EXPECT_THAT(trace_.errors(), IsEmpty());
}

TEST_F(Translator, TokensBecomeDirectories) {
    EXPECT_EQ(replaced("|DEPLOYDIR|"), home_.depot() + "ux/060100000");
    EXPECT_EQ(replaced("|TOVRINHOME|"), home_.home());
    EXPECT_EQ(replaced("|DEPOTDIR|"), home_.depot());
}

TEST_F(Translator, EveryTokenIsReplaced) {
    EXPECT_EQ(replaced("|DEPLOYDIR|/i.sh -h |TOVRINHOME| -d |DEPOTDIR| |TOVRINHOME||TOVRINHOME|"),
              home_.depot() + "ux/060100000/i.sh -h " + home_.home() + " -d " + home_.depot() +
                  " " + home_.home() + home_.home());
}

TEST_F(Translator, TheCommonInstallerHasNoVersion) {
    EXPECT_EQ(replaced("|DEPLOYDIR|", "ci"), home_.depot() + "ci");
    EXPECT_EQ(replaced("|DEPLOYDIR|", "CI"), home_.depot() + "CI/060100000");
    EXPECT_EQ(replaced("|DEPLOYDIR|", "ux", ""), home_.depot() + "ux/");
}

TEST_F(Translator, WhatIsPutInIsSearchedForTheLaterTokens) {
    depotDir = "/depot/|TOVRINHOME|/";
    EXPECT_EQ(replaced("|DEPLOYDIR|", "ux", "1"), "/depot/" + home_.home() + "/ux/1");
    EXPECT_EQ(replaced("|DEPOTDIR|"), "/depot/|TOVRINHOME|/");
}

TEST_F(Translator, ProductsAndVersionsAreTakenAsTheyAre) {
    EXPECT_EQ(replaced("|DEPLOYDIR|", "|DEPOTDIR|", "|TOVRINHOME|"),
              home_.depot() + home_.depot() + "/" + home_.home());
}

}  // namespace
