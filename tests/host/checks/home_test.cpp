#include <sys/stat.h>
#include <unistd.h>

#include <clocale>
#include <cstdio>

#include "base/zavrunas.h"
#include "host/checks/check_fixture.h"

namespace {

using host::Verdict;

class HomeChecks : public CheckTest {};

TEST_F(HomeChecks, APathThatThePlugInWouldSplitIsAWarning) {
    options.home = scratch.makeDir("home with blanks");
    expectFinding("home", Verdict::Warning, "splits its command lines");
}

TEST_F(HomeChecks, APathThatThePlugInWouldCutIsAnError) {
    options.home = scratch.makeDir("gr\u00f6\u00dfe/h\u00f6m\u00e9");
    expectFinding("home", Verdict::Error, "here by at least 3 bytes");
    options.home = scratch.makeDir("\u20ac home");
    expectFinding("home", Verdict::Error, "here by at least 1 byte");
}

TEST_F(HomeChecks, APathThatThePlugInWouldCutWhereItStandsTwiceIsAWarning) {
    options.home = scratch.makeDir("h\u00f6me");
    expectFinding("home", Verdict::Warning, "in which the path stands twice");
}

TEST_F(HomeChecks, WhetherAPathIsCutDependsOnTheCodePage) {
    if (std::setlocale(LC_CTYPE, "C") == nullptr) GTEST_SKIP();
    options.home = scratch.makeDir("gr\u00f6\u00dfe");
    EXPECT_STREQ(nameOf(find("home").verdict), "warning") << "it lacks directories, no more";
}

TEST_F(HomeChecks, MissingDirectoriesAreNamed) {
    options.home = scratch.makeDir("bare");
    expectFinding("home", Verdict::Warning, "lacks the directories bin, config, logs");
}

TEST_F(HomeChecks, WhatOthersMayWriteToIsAWarning) {
    const std::string script = home + "/bin/TovrinAgent";
    ASSERT_EQ(::chmod(script.c_str(), 0777), 0);
    expectFinding("owners", Verdict::Warning, script);
}

TEST_F(HomeChecks, WhatGroupOrOthersMayChangeIsAWarningInEveryDirectoryThatTheHostTrusts) {
    expectFinding("owners", Verdict::Ok, "belong to its user or to root");
    const std::string file = scratch.write("home/lib/common.sh", "");
    const std::string parameters = scratch.write("home/config/.ConfigData/kumenv", "");
    for (const std::string& path :
         {home, home + "/bin", home + "/lib", file, home + "/config", parameters, home + "/tmp",
          scratch.path("depot"), scratch.makeDir("home/zavhost"), home + "/bin/cinfo"}) {
        struct stat before {};
        ASSERT_EQ(::stat(path.c_str(), &before), 0) << path;
        for (const mode_t bit : {mode_t{S_IWGRP}, mode_t{S_IWOTH}}) {
            ASSERT_EQ(::chmod(path.c_str(), before.st_mode | bit), 0);
            expectFinding("owners", Verdict::Warning, "may write to " + path);
        }
        ASSERT_EQ(::chmod(path.c_str(), before.st_mode), 0);
    }
    expectFinding("owners", Verdict::Ok, "belong to its user or to root");
}

TEST_F(HomeChecks, ARunAsDatabaseMustParse) {
    const std::string file = runAsFile();
    scratch.write(file, "<runas>\n</runas>\n");
    expectFinding("run-as", Verdict::Ok, file);
    scratch.write(file, "<runas>\n<agent></runas>\n");
    expectFinding("run-as", Verdict::Error, "it does not parse: ");
    EXPECT_NE(find("run-as").text.find("in line 2"), std::string::npos) << find("run-as").text;
    scratch.write(file, "<runas>");
    expectFinding("run-as", Verdict::Error, "it ends before its elements do");
    scratch.write(file, "");
    expectFinding("run-as", Verdict::Error, "it does not parse: ");
}

TEST_F(HomeChecks, ARunAsDatabaseThatCannotBeReadIsAnError) {
    const std::string file = scratch.path(runAsFile());
    ASSERT_EQ(::symlink("nowhere", file.c_str()), 0);
    expectFinding("run-as", Verdict::Error, "it cannot be read: No such file or directory");
    ASSERT_EQ(::unlink(file.c_str()), 0);
    ASSERT_EQ(::mkfifo(file.c_str(), 0600), 0);
    expectFinding("run-as", Verdict::Error, "it is not a file");
    ASSERT_EQ(::unlink(file.c_str()), 0);
    ASSERT_EQ(std::rename((home + "/config").c_str(), (home + "/other").c_str()), 0);
    ASSERT_EQ(::symlink("config", (home + "/config").c_str()), 0);
    expectFinding("run-as", Verdict::Error, "it cannot be read: Too many levels");
}

TEST_F(HomeChecks, EntriesOfTheRunAsDatabaseThatWouldBeOverlookedAreAnError) {
    const std::string file = runAsFile();
    const std::string instance = "<instance><name>a</name><user>root</user></instance>";
    scratch.write(file, "<runas><agent>" + instance + "</agent></runas>");
    expectFinding("run-as", Verdict::Error, "it has an agent without a productCode");
    scratch.write(file, "<runas><agent><o><productCode>ux</productCode></o></agent></runas>");
    expectFinding("run-as", Verdict::Error, "it has an agent without a productCode");
    for (const char* part : {"<name>a</name>", "<user>root</user>", "<o><name/><user/></o>", ""}) {
        scratch.write(file, "<runas><agent><productCode>ux</productCode><instance>" +
                                std::string(part) + "</instance></agent></runas>");
        expectFinding("run-as", Verdict::Error, "it has an instance without a name or a user");
    }
    scratch.write(file, "<runas><agent><productCode>ux</productCode>" + instance +
                            "<instance><name/><user/></instance></agent><note/></runas>");
    expectFinding("run-as", Verdict::Ok, file);

    const auto agent = [&instance](const std::string& code) {
        return "<agent><productCode>" + code + "</productCode>" + instance + "</agent>";
    };
    const std::string ux = "<agent><productCode>ux</productCode>";
    const struct {
        std::string list;
        std::string fault;
    } rows[] = {
        {agent("ux") + agent("lz") + agent(" ux\n"), "more than one agent with the productCode ux"},
        {agent("ux</productCode><productCode>lz"), "an agent with more than one productCode"},
        {agent(""), "an empty productCode"},
        {agent(" \n"), "an empty productCode"},
        {"<agent><productCode/>" + instance + "</agent>", "an empty productCode"},
        {agent("UX"), "not lower-case letters and digits"},
        {agent("u x"), "not lower-case letters and digits"},
        {"<Agent><productCode>ux</productCode>" + instance + "</Agent>", "something like <agent>"},
        {"<o:agent xmlns:o='o'>" + instance + "</o:agent>", "something like <agent>"},
        {"<agents>" + agent("ux") + "</agents>", "something like <agent>"},
        {"<productCode>ux</productCode>", "something like <productCode>"},
        {instance, "something like <instance>"},
        {ux + "<Instance><name>a</name><user>root</user></Instance></agent>",
         "something like <instance>"},
        {ux + "<all>" + instance + "</all></agent>", "something like <instance>"},
        {ux + "<name>a</name><user>root</user></agent>", "something like <name>"},
        {ux + "<instance><name>a</name><User>x</User><user>root</user></instance></agent>",
         "something like <user>"},
        {ux + instance + "<instance><name> a\n</name><user>root</user></instance></agent>",
         "more than one instance of the same name"},
        {ux + "<instance><name>b</name><name>a</name><user>root</user></instance></agent>",
         "an instance with more than one name or user"},
        {ux + "<instance><name>a</name><user/><user>root</user></instance></agent>",
         "an instance with more than one name or user"},
        {agent("u<x/>x"), "elements in a productCode"},
        {"<agent>u<productCode>x</productCode></agent>", "a text between its entries"},
    };
    for (const auto& row : rows) {
        scratch.write(file, "<runas>" + row.list + "</runas>");
        expectFinding("run-as", Verdict::Error, row.fault);
    }
    scratch.write(file, agent("ux"));
    expectFinding("run-as", Verdict::Error, "something like <agent>");
}

TEST_F(HomeChecks, ARunAsDatabaseAsThePlugInWritesItIsWhole) {
    const std::string file = runAsFile();
    {
        ZAV::StartupDB database(scratch.path(file).c_str());
        for (const char* const code : {"ux", "u2"}) {
            auto* const agent = new ZAV::AgentEntry(code);
            database.addAgent(agent);
            agent->addInstance(new ZAV::InstanceEntry("", ""));
            agent->addInstance(new ZAV::InstanceEntry("a", "root"));
            agent->addInstance(new ZAV::InstanceEntry("b", ""));
        }
        ASSERT_EQ(database.save(), 1);
    }
    expectFinding("run-as", Verdict::Ok, file);
}

TEST_F(HomeChecks, UsersOfTheRunAsDatabaseWhoDoNotExistAreNamed) {
    std::string instances;
    for (const char* user : {" root\n", "no-such-user", "-c id", "no-such-&amp;"}) {
        instances += "<instance><name>" + std::to_string(instances.size()) + "</name><user>" +
                     user + "</user></instance>";
    }
    scratch.write(runAsFile(),
                  "<runas><agent><productCode>ux</productCode>" + instances + "</agent></runas>");
    expectFinding("run-as", Verdict::Warning,
                  "names users who do not exist here: -c id, no-such-&, no-such-user;");
}

TEST_F(HomeChecks, AListOfUsersUnderAnotherHostsNameIsNamedWhereThereIsNoOwnOne) {
    expectFinding("run-as", Verdict::Ok, "does not exist; every agent runs as the host's user");
    const std::string users =
        "<runas><agent><productCode>ux</productCode><instance><name/><user>daemon</user></instance>"
        "</agent></runas>";
    const std::string before = scratch.write("home/config/before0_zavrunas.cfg", users);
    expectFinding("run-as", Verdict::Warning,
                  "so every agent runs as the host's user; there is " + before);
    const std::string broken = scratch.write("home/config/before1_zavrunas.cfg", "<runas>");
    expectFinding("run-as", Verdict::Warning, broken);
    scratch.write(runAsFile(), "<runas>\n</runas>\n");
    expectFinding("run-as", Verdict::Ok, runAsFile());
}

TEST_F(HomeChecks, AListOfAnotherHostThatNamesNobodyDoesNotMatter) {
    scratch.write("home/config/before_zavrunas.cfg", "<runas>\n</runas>\n");
    scratch.write("home/config/before_zavrunas.cfg.saved", "<runas>");
    expectFinding("run-as", Verdict::Ok, "does not exist");
}

}  // namespace
