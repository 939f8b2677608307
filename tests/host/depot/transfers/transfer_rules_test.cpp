#include "host/depot/transfers/transfer_rules.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <filesystem>
#include <optional>

#include "host/depot/real_path.h"
#include "support/scratch_dir.h"

namespace {

using host::CodePage;
using host::Depot;
using host::Objection;
using host::TransferRules;

class Rules : public testing::Test {
protected:
    Rules() {
        scratch_.makeDir("home/tmp");
        scratch_.makeDir("home/zavhost");
        scratch_.makeDir("home/depot");
    }
    TransferRules rules(bool guarded = true, const char* codePage = "UTF-8") const {
        return TransferRules(depot_, home_, CodePage(codePage), guarded);
    }
    static std::string guardOf(const TransferRules& rules, const std::string& name,
                               bool startsFile = true) {
        const auto objection = rules.objectionTo(name, rules.destination(name), startsFile);
        return objection ? "[" + objection->guard + "]" : "";
    }

    ScratchDir scratch_;
    std::string home_ = scratch_.path("home");
    Depot depot_{scratch_.path("home/depot"), {scratch_.path("home/zavhost")}};
    /// As without a depot of its own: the home itself.
    Depot homeDepot_{scratch_.path("home"), {scratch_.path("home/zavhost")}};
};

TEST_F(Rules, KnowUnderWhichNameATransferArrives) {
    const TransferRules utf8 = rules();
    EXPECT_EQ(utf8.arrivalName("a\\b/c"), "a/b/c");
    EXPECT_EQ(utf8.arrivalName("/a"), "a");
    EXPECT_EQ(utf8.arrivalName("\\a"), "a");
    EXPECT_EQ(utf8.arrivalName("\xC3\xA4"), "\xC3\xA4");
    EXPECT_EQ(utf8.arrivalName("bad\xFFname"), std::nullopt);
    EXPECT_EQ(rules(true, "ISO-8859-1").arrivalName("bad\xFFname"), "bad\xFFname");
    // The second byte of this letter is that of a backslash.
    EXPECT_EQ(rules(true, "CP932").arrivalName("\x95\x5C"), "\x95\x5C");
}

TEST_F(Rules, KnowWhereATransferEndsUp) {
    scratch_.makeDir("home/depot/real");
    ASSERT_EQ(::symlink("real", scratch_.path("home/depot/link").c_str()), 0);
    const std::string depot = host::realPath(depot_.directory());
    EXPECT_EQ(rules().destination("link\\a"), depot + "/real/a");
    EXPECT_EQ(rules().destination("new/sub/a"), depot + "/new/sub/a");
    EXPECT_EQ(rules().destination("real//./a"), depot + "/real/a");
}

TEST_F(Rules, KnowWhichFilesAreConverted) {
    const TransferRules known = rules();
    for (const char* name : {"install.sh", "preinstall.sh.tar.gz", "DeployLnk.sh", "a.mdl",
                             "a.mdl/b", "x\\install.sh"})
        EXPECT_TRUE(known.isConverted(name)) << name;
    for (const char* name : {"install_sh", "setup.sh", "a.md", "Install.sh"})
        EXPECT_FALSE(known.isConverted(name)) << name;
    const Depot depot(scratch_.makeDir("files.mdl"));
    EXPECT_TRUE(TransferRules(depot, home_, CodePage("UTF-8"), true).isConverted("any"))
        << "the depot's own name counts";
}

TEST_F(Rules, KnowWhichNamesLeadOut) {
    scratch_.makeDir("home/depot/sub");
    ASSERT_EQ(::symlink("sub", scratch_.path("home/depot/link").c_str()), 0);
    ASSERT_EQ(::symlink("../tmp", scratch_.path("home/depot/out").c_str()), 0);
    ASSERT_EQ(::symlink("/tmp", scratch_.path("home/depot/absolute").c_str()), 0);
    const TransferRules known = rules();
    const auto leadsOut = [&](const char* name) {
        return known.leadsOut(name, known.directoryOf(name));
    };
    for (const char* name : {"out/a", "out/new/sub/a", "absolute/a"})
        EXPECT_TRUE(leadsOut(name)) << name;
    EXPECT_FALSE(leadsOut("out")) << "the link itself is replaced";
    for (const char* name : {"..", "../a", "a/../../b", "..\\a", "/../a", "link/../a"})
        EXPECT_TRUE(leadsOut(name)) << name;
    for (const char* name : {"a", "sub/../a", "a/..b", "./a", "link/a"})
        EXPECT_FALSE(leadsOut(name)) << name;
}

TEST_F(Rules, LookADirectoryUpForAllOfItsFiles) {
    const TransferRules known = rules();
    const host::ArrivalDirectory sub = known.directoryOf("\\sub\\a");
    EXPECT_TRUE(known.isIn("sub/b", sub));
    for (const char* name : {"b", "sub/deeper/b", "subs/b"})
        EXPECT_FALSE(known.isIn(name, sub)) << name;
    EXPECT_EQ(known.fileOf("\\sub\\a"), "a");
    EXPECT_TRUE(known.mayBeOne("sub/a", "\\link\\a"));
    EXPECT_FALSE(known.mayBeOne("sub/a", "sub/b"));
}

TEST_F(Rules, LetNoTransferReachTheHostsOwnFiles) {
    ASSERT_EQ(::symlink("zavhost", scratch_.path("home/alias").c_str()), 0);
    for (const bool guarded : {true, false}) {
        const TransferRules known(homeDepot_, home_, CodePage("UTF-8"), guarded);
        for (const char* name : {"zavhost/journal", "zavhost", "alias/journal", "./zavhost//new/a",
                                 "tmp/../zavhost/a", "\\zavhost\\a"})
            EXPECT_EQ(guardOf(known, name), "[]") << name;
        EXPECT_EQ(guardOf(known, "zavhostess/a"), "");
        EXPECT_EQ(guardOf(known, "alias"), "") << "the link is replaced";
        EXPECT_EQ(guardOf(known, "alias", false), "[]") << "the link is followed";
    }
}

TEST_F(Rules, RefuseNamesThatAreNoText) {
    EXPECT_EQ(guardOf(rules(), "bad\xFFname"), "[depot-names]");
    EXPECT_EQ(guardOf(rules(false), "bad\xFFname"), "");
}

TEST_F(Rules, RefuseNamesThatThePlugInWouldCut) {
    for (const char* name : {"M\u00e4rz-\u00dc", "\u00e4/\u00e4", "\u20ac", "\U0001F600"}) {
        EXPECT_EQ(guardOf(rules(), name), "[depot-names]") << name;
        EXPECT_EQ(guardOf(rules(false), name), "") << name;
    }
    EXPECT_EQ(guardOf(rules(), "M\u00e4rz"), "");
    const TransferRules narrow(homeDepot_, home_, CodePage("ISO-8859-1"), true);
    EXPECT_EQ(guardOf(narrow, "\xE4\xE4\xE4"), "") << "a byte for each letter is what there is";
}

TEST_F(Rules, TakeWhatCanBeConverted) {
    EXPECT_EQ(rules().conversionProblem(), "");
    EXPECT_EQ(guardOf(rules(), "install.sh"), "");
    EXPECT_EQ(guardOf(rules(), "new/folder/install.sh"), "");
}

/// Another file system, which every machine has.
class RulesOfADepotElsewhere : public Rules {
protected:
    RulesOfADepotElsewhere() : elsewhere_("/dev/shm/zavmgmt-rules-" + std::to_string(::getpid())) {
        std::filesystem::create_directories(elsewhere_);
    }
    ~RulesOfADepotElsewhere() override { std::filesystem::remove_all(elsewhere_); }
    std::string elsewhere_;
};

TEST_F(RulesOfADepotElsewhere, RefuseWhatWouldBeLostInTheConversion) {
    const Depot depot(elsewhere_);
    const TransferRules known(depot, home_, CodePage("UTF-8"), true);
    EXPECT_THAT(known.conversionProblem(), testing::HasSubstr("on different file systems"));
    EXPECT_EQ(guardOf(known, "a.mdl"), "[depot-conversion]");
    EXPECT_EQ(guardOf(known, "a.tar"), "");
    const TransferRules unguarded(depot, home_, CodePage("UTF-8"), false);
    EXPECT_EQ(guardOf(unguarded, "a.mdl"), "");
}

TEST_F(RulesOfADepotElsewhere, SeeADirectoryOfTheDepotThatIsElsewhere) {
    ASSERT_EQ(::symlink(elsewhere_.c_str(), scratch_.path("home/depot/far").c_str()), 0);
    EXPECT_EQ(guardOf(rules(), "far/new/a.mdl"), "[depot-conversion]");
    EXPECT_EQ(guardOf(rules(), "near/a.mdl"), "");
}

TEST_F(Rules, RefuseConversionsWithoutAPlaceForTemporaries) {
    std::filesystem::remove(scratch_.path("home/tmp"));
    EXPECT_EQ(rules().conversionProblem(),
              "cannot write to " + home_ + "/tmp: No such file or directory");
    EXPECT_EQ(guardOf(rules(), "install.sh"), "[depot-conversion]");
}

TEST_F(Rules, LeaveNothingBehindFromTrying) {
    rules();
    EXPECT_TRUE(std::filesystem::is_empty(scratch_.path("home/tmp")));
    EXPECT_TRUE(std::filesystem::is_empty(scratch_.path("home/depot")));
}

}  // namespace
