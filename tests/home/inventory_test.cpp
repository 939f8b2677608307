// Making a home, what it says is installed, and what it knows of the machine.
#include <gmock/gmock.h>

#include <algorithm>
#include <cstring>

#include "home/home_fixture.h"

using ::testing::HasSubstr;

namespace {

const char* const kHeader = "\"ProdCode\",\"Description\",\"Platform\",\"Version\",\"Release\"\n";

std::string entry(const std::string& code, const std::string& arch,
                  const std::string& description = "An agent") {
    return "ProdCode=" + code + "\nDescription=" + description + "\nPlatform=" + arch +
           "\nVersion=060100000\nRelease=100\n";
}

std::string afterHeader(const std::string& text) {
    const auto at = text.find(kHeader);
    return at == std::string::npos ? "no header" : text.substr(at + std::strlen(kHeader));
}

class Inventory : public PreparedHomeTest {
protected:
    Outcome cinfo(std::vector<std::string> words) const {
        words.insert(words.begin(), inHome("bin/cinfo"));
        return run(words);
    }
};

TEST_F(Inventory, ListsTheProductsOfAFreshHome) {
    const Outcome listed = cinfo({"-d"});
    EXPECT_EQ(listed.status, 0);
    EXPECT_EQ(afterHeader(listed.out),
              "\"ax\",\"Shared component\",\"lx8266\",\"010000000\",\"100\"\n"
              "\"um\",\"Universal agent for scripts and files\",\"lx8266\",\"010000000\",\"100\"\n"
              "\"ux\",\"Monitoring agent for load and memory and disk\",\"lx8266\",\"010000000\","
              "\"100\"\n");
}

TEST_F(Inventory, EmptyArgumentOfATrailingBlankChangesNothing) {
    EXPECT_EQ(cinfo({"-d", ""}).out, cinfo({"-d"}).out);
    EXPECT_EQ(cinfo({"-p", "ux", ""}).out, cinfo({"-p", "ux"}).out);
}

TEST_F(Inventory, WithoutProductsOnlyTheHeaderIsLeft) {
    for (const char* product : {"ax", "um", "ux"}) {
        std::filesystem::remove(inHome("registry/" + std::string(product) + "lx8266.ver"));
    }
    const Outcome listed = cinfo({"-d"});
    EXPECT_EQ(listed.status, 0);
    EXPECT_EQ(afterHeader(listed.out), "");
}

TEST_F(Inventory, PerProductReportNamesEachPlatform) {
    write("registry/uxli6263.ver", entry("ux", "li6263"));
    const Outcome report = cinfo({"-p", "ux"});
    EXPECT_EQ(report.status, 0);
    const auto at = report.out.find("Platform codes:\n");
    ASSERT_NE(at, std::string::npos);
    EXPECT_EQ(report.out.substr(at), "Platform codes:\nli6263 Product (ux)\nlx8266 Product (ux)\n");
}

TEST_F(Inventory, ReportOnWhatIsNotInstalledFails) {
    const Outcome report = cinfo({"-p", "zz"});
    EXPECT_EQ(report.status, 3);
    EXPECT_EQ(report.out, "");
    EXPECT_THAT(report.err, HasSubstr("zz is not installed"));
}

TEST_F(Inventory, WhatWouldSplitAFieldIsTakenOut) {
    write("registry/zzlx8266.ver", entry("zz", "lx8266", "One, two \"three\",\tfour\r"));
    EXPECT_THAT(cinfo({"-d"}).out, HasSubstr("\"zz\",\"One two three four\",\"lx8266\","));
}

TEST_F(Inventory, IncompleteEntryIsLeftOutAndNamed) {
    write("registry/zzlx8266.ver", "ProdCode=zz\nDescription=\n");
    write("registry/yylx8266.ver", "");
    const Outcome listed = cinfo({"-d"});
    EXPECT_EQ(listed.status, 0);
    EXPECT_THAT(listed.out, ::testing::Not(HasSubstr("zz")));
    EXPECT_THAT(listed.out, HasSubstr("\"ux\""));
    EXPECT_THAT(listed.err, HasSubstr("zzlx8266.ver: incomplete"));
    EXPECT_THAT(listed.err, HasSubstr("yylx8266.ver: incomplete"));
}

TEST_F(Inventory, FiveThousandEntriesAreListed) {
    for (int i = 0; i < 5000; ++i) {
        const std::string code = "p" + std::to_string(i);
        write("registry/" + code + "lx8266.ver", entry(code, "lx8266"));
    }
    const std::string listed = cinfo({"-d"}).out;
    EXPECT_EQ(std::count(listed.begin(), listed.end(), '\n'), 5005);
}

TEST_F(Inventory, WrongUsage) {
    for (const std::vector<std::string>& words :
         std::vector<std::vector<std::string>>{{},
                                               {""},
                                               {"-p"},
                                               {"-p", ""},
                                               {"-x"},
                                               {"-d", "ux"},
                                               {"-p", "ux", "um"},
                                               {"-p", "../ux"}}) {
        EXPECT_EQ(cinfo(words).status, 1) << ::testing::PrintToString(words);
    }
}

/// The architecture probe, run as the inventory table runs it.
class ArchitectureProbe : public PreparedHomeTest {
protected:
    std::string probe(const std::string& shell = "/bin/ksh") const {
        return run({shell, "-c",
                    ". " + inHome("bin/dynarch.shl") + " " + inHome("registry/archdsc.tbl") +
                        " >/dev/null 2>&1;echo ArchitectureHeader;echo $os;echo $cArch"},
                   "", {"PATH=" + scratch.path("bin") + ":/usr/bin:/bin"})
            .out;
    }
    void machine(const std::string& kernel, const std::string& name, const std::string& bits) {
        scratch.script("bin/uname",
                       "case $1 in -s) echo " + kernel + ";; *) echo " + name + ";; esac\n");
        scratch.script("bin/getconf", "echo " + bits + "\n");
    }
};

TEST_F(ArchitectureProbe, KnowsThisMachine) {
    EXPECT_THAT(probe(), ::testing::MatchesRegex("ArchitectureHeader\nLinux\nl[a-z][0-9]{4}\n"));
}

TEST_F(ArchitectureProbe, TellsMachinesApart) {
    machine("Linux", "x86_64", "64");
    EXPECT_EQ(probe(), "ArchitectureHeader\nLinux\nlx8266\n");
    machine("Linux", "x86_64", "32");
    EXPECT_EQ(probe(), "ArchitectureHeader\nLinux\nli6263\n");
    machine("Linux", "i686", "32");
    EXPECT_EQ(probe(), "ArchitectureHeader\nLinux\nli6263\n");
    machine("Linux", "aarch64", "64");
    EXPECT_EQ(probe(), "ArchitectureHeader\nLinux\nla8266\n");
}

TEST_F(ArchitectureProbe, UnknownMachineGivesEmptyValues) {
    machine("Plan9", "x86_64", "64");
    EXPECT_EQ(probe(), "ArchitectureHeader\n\n\n");
}

TEST_F(ArchitectureProbe, RowsThatAreTooLongOrTooShortAreSkipped) {
    machine("Linux", "x86_64", "64");
    write("registry/archdsc.tbl",
          "Linux x86_64 64 toolong good\nLinux x86_64 64 Linux elevenchars\nLinux x86_64 64 Linux\n"
          "Linux * 64 five5 tenletters\n");
    EXPECT_EQ(probe(), "ArchitectureHeader\nfive5\ntenletters\n");
}

TEST_F(ArchitectureProbe, MissingTableGivesEmptyValues) {
    std::filesystem::remove(inHome("registry/archdsc.tbl"));
    EXPECT_EQ(probe(), "ArchitectureHeader\n\n\n");
}

class PrepareHome : public HomeTest {};

TEST_F(PrepareHome, LaysTheProductsUnderTheMachinesOwnPlatform) {
    ASSERT_EQ(prepare({}).status, 0);
    const Outcome report = run({inHome("bin/cinfo"), "-p", "ux"});
    ASSERT_EQ(report.status, 0);
    const auto at = report.out.find("codes:\n") + 7;
    const std::string arch = report.out.substr(at, report.out.find(' ', at) - at);
    EXPECT_TRUE(exists("agtqvs6/" + arch + "/ux/bin/agent")) << arch;
    EXPECT_TRUE(exists("agtqvs6/" + arch + "/bin/zav_xa"));
    EXPECT_TRUE(exists("tmp"));
}

TEST_F(PrepareHome, ConfigurationHoldsAbsolutePathsOfTheHome) {
    ASSERT_EQ(prepare().status, 0);
    EXPECT_THAT(read("config/um.config"),
                HasSubstr("\nKUM_WORK_PATH='" + inHome("universal/work") + "'\n"));
    EXPECT_THAT(read("config/.ConfigData/kumenv"), HasSubstr("|DATAPROVIDER|FILE|\n"));
    EXPECT_EQ(read("config/.ConfigData/kmsenv").find("HUB_"), 0U);
}

TEST_F(PrepareHome, DirectoryThatIsNotEmptyIsRefusedAndLeftAsItIs) {
    scratch.write("home/file", "mine");
    EXPECT_EQ(prepare().status, 2);
    EXPECT_EQ(read("file"), "mine");
    EXPECT_FALSE(exists("bin"));
}

TEST_F(PrepareHome, EmptyDirectoryIsUsed) {
    scratch.makeDir("home");
    EXPECT_EQ(prepare().status, 0);
}

TEST_F(PrepareHome, ProductsAndServerCanBeChosen) {
    ASSERT_EQ(prepare({"--arch", "li6263", "--products", "", "--cms", "hub.1"}).status, 0);
    EXPECT_TRUE(exists("agtqvs6/li6263/bin/zav_xa"));
    EXPECT_FALSE(exists("agtqvs6/li6263/ux"));
    EXPECT_EQ(read("config/.ConfigData/kmsenv"), "hub.1|CELLNAME|hub.1|\n");
}

TEST_F(PrepareHome, WrongUsage) {
    for (const std::vector<std::string>& options :
         std::vector<std::vector<std::string>>{{"--arch"},
                                               {"--arch", "../x"},
                                               {"--products", "ne"},
                                               {"--products", "zz"},
                                               {"--cms", "default1"},
                                               {"--cms", "a b"},
                                               {"--what"},
                                               {"second"}}) {
        EXPECT_EQ(prepare(options).status, 1) << ::testing::PrintToString(options);
    }
    EXPECT_FALSE(exists("bin"));
}

TEST_F(PrepareHome, HomeThatCannotBeCompletedIsTakenBack) {
    EXPECT_EQ(prepare({"--arch", "lx8266", "--run-as-group", "no-such-group"}).status, 8);
    EXPECT_FALSE(exists("bin"));
}

TEST_F(PrepareHome, GroupMayReadTheConfigurationAndMakeFoldersOfItsOwn) {
    const std::string group = std::to_string(::getgid());
    ASSERT_EQ(prepare({"--arch", "lx8266", "--run-as-group", group}).status, 0);
    struct stat info {};
    for (const char* shared : {"run", "config", "config/.ConfigData", "universal/work"}) {
        ASSERT_EQ(::stat(inHome(shared).c_str(), &info), 0);
        EXPECT_EQ(info.st_mode & 07777U, 02750U) << shared;
    }
    ASSERT_EQ(::stat(inHome("users").c_str(), &info), 0);
    EXPECT_EQ(info.st_mode & 07777U, 03770U);
    ASSERT_EQ(::stat(inHome("config/um.config").c_str(), &info), 0);
    EXPECT_EQ(info.st_mode & 07777U, 0640U);
}

class PathOfHome : public PrepareHome {
protected:
    std::string home() const override { return scratch.path(name); }
    std::string name;
};

TEST_F(PathOfHome, BlanksAndQuotesAreRefused) {
    for (const char* odd : {"a b", "a\tb", "a'b", "a\"b", "a|b", "a\\b", "a\nb"}) {
        name = odd;
        EXPECT_EQ(prepare().status, 2) << odd;
    }
}

TEST_F(PathOfHome, OddCharactersWorkInEveryProgram) {
    name = "h&m$x;[1]*?(é)=,~#%s-o";
    const Outcome prepared = prepare();
    ASSERT_EQ(prepared.status, 0) << prepared.err;
    EXPECT_THAT(prepared.err, HasSubstr("note:"));
    EXPECT_THAT(run({inHome("bin/cinfo"), "-d", ""}).out, HasSubstr("\"ux\""));
    EXPECT_EQ(translate({"-p", "-pc", "ux"}, "START_SECONDS=0\n").status, 0);
    EXPECT_EQ(agent({"start", "ux"}).status, 0);
    EXPECT_TRUE(eventually([&] { return exists("data/ux/figures.csv"); }));
    EXPECT_EQ(run({inHome("bin/uninstall.sh"), "-i", "ux", "lx8266"}).status, 0);
    EXPECT_FALSE(exists("agtqvs6/lx8266/ux"));
    EXPECT_FALSE(exists("data/ux"));
    EXPECT_THAT(read("config/um.config"), HasSubstr("KUMP_RB_PATH='" + home() + "/universal/rb'"));
}

class JavaHome : public PreparedHomeTest {};

TEST_F(JavaHome, HomesOwnJavaComesFirst) {
    // The probe's platform, not the home's, names the folder.
    const std::string arch = run({"/bin/sh", "-c",
                                  "set -- " + inHome("registry/archdsc.tbl") + "; . " +
                                      inHome("bin/dynarch.shl") + "; printf %s \"$cArch\""})
                                 .out;
    write("JRE/" + arch + "/bin/java", "#!/bin/sh\n", 0755);
    const Outcome found = run({inHome("bin/TovrinGetJavaHome")});
    EXPECT_EQ(found.status, 0);
    EXPECT_EQ(found.out, inHome("JRE/" + arch) + "\n");
}

TEST_F(JavaHome, JavaOnTheSearchPathIsFollowedToItsDirectory) {
    scratch.script("jdk/bin/java", "");
    scratch.makeDir("links");
    std::filesystem::create_symlink(scratch.path("jdk/bin/java"), scratch.path("links/java"));
    const Outcome found = run({inHome("bin/TovrinGetJavaHome")}, "",
                              {"PATH=" + scratch.path("links") + ":/usr/bin:/bin"});
    EXPECT_EQ(found.status, 0);
    EXPECT_EQ(found.out, scratch.path("jdk") + "\n");
}

TEST_F(JavaHome, WithoutJavaNothingIsPrinted) {
    const Outcome elsewhere = run({"/bin/sh", "-c",
                                   "command -v java || ls -d /usr/lib/jvm/*/bin/java"
                                   " /usr/java/*/bin/java"});
    if (!elsewhere.out.empty()) GTEST_SKIP() << "this machine has a Java: " << elsewhere.out;
    const Outcome found = run({inHome("bin/TovrinGetJavaHome")});
    EXPECT_EQ(found.status, 1);
    EXPECT_EQ(found.out, "");
}

}  // namespace
