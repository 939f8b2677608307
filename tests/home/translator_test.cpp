// The two-way translator: configuration as text, instances and managed system names.
#include "home/home_fixture.h"

#include <gmock/gmock.h>

using ::testing::HasSubstr;
using ::testing::Not;
using ::testing::StartsWith;

namespace {

class Translator : public PreparedHomeTest {};

TEST_F(Translator, DefaultInstanceHasTheProductsDefaults) {
    const Outcome got = translate({"-g", "-pc", "ux"});
    EXPECT_EQ(got.status, 0);
    EXPECT_THAT(got.out, StartsWith("INSTANCE=\n"));
    EXPECT_THAT(got.out, HasSubstr("\nINTERVAL=5\n"));
    EXPECT_EQ(translate({"-g", "hostA:UX", "-pc", "ux"}).out, got.out);
    EXPECT_EQ(translate({"-g", "", "-pc", "ux"}).out, got.out);
}

TEST_F(Translator, SetsAndGetsTheConfigurationOfAnInstance) {
    EXPECT_EQ(translate({"-p", "inst1:hostA:UX", "-pc", "ux"}, "INTERVAL=7\n# mine\n").status, 0);
    EXPECT_EQ(translate({"-g", "inst1:hostA:UX", "-pc", "ux"}).out,
              "INSTANCE=inst1\nINTERVAL=7\n# mine\n");
    EXPECT_EQ(read("config/ux_inst1.cfg"), "INSTANCE=inst1\nINTERVAL=7\n# mine\n");
    EXPECT_THAT(translate({"-g", "-pc", "ux"}).out, HasSubstr("INTERVAL=5"));
}

TEST_F(Translator, WhatWasGotCanBeSet) {
    const std::string got = translate({"-g", "-pc", "ux"}).out;
    EXPECT_EQ(translate({"-p", "-pc", "ux"}, got).status, 0);
    EXPECT_EQ(translate({"-g", "-pc", "ux"}).out, got);
}

TEST_F(Translator, TextNamesTheInstanceWhenTheRequestDoesNot) {
    EXPECT_EQ(translate({"-p", "-pc", "ux"}, "INSTANCE=b\nINTERVAL=9").status, 0);
    EXPECT_EQ(read("config/ux_b.cfg"), "INSTANCE=b\nINTERVAL=9\n");
    EXPECT_FALSE(exists("config/ux.cfg"));
}

TEST_F(Translator, TextForAnotherInstanceIsRefused) {
    EXPECT_EQ(translate({"-p", "a:hostA:UX", "-pc", "ux"}, "INSTANCE=b\nX=1\n").status, 23);
    EXPECT_EQ(translate({"-p", "hostA:UX", "-pc", "ux"}, "INSTANCE=b\nX=1\n").status, 23);
    EXPECT_EQ(translate({"-p", "-pc", "ux"}, "INSTANCE=../b\nX=1\n").status, 23);
    EXPECT_FALSE(exists("config/ux_a.cfg"));
    EXPECT_FALSE(exists("config/ux_b.cfg"));
}

TEST_F(Translator, CarriageReturnsAreDropped) {
    EXPECT_EQ(translate({"-p", "-pc", "ux"}, "INSTANCE=\r\nA=1\r\n\r\nB=2\r\n").status, 0);
    EXPECT_EQ(read("config/ux.cfg"), "INSTANCE=\nA=1\n\nB=2\n");
}

TEST_F(Translator, InvalidTextChangesNothing) {
    write("config/ux.cfg", "INSTANCE=\nA=1\n");
    for (const std::string& text :
         {std::string("A=1\nwhat\n"), std::string("=1\n"), std::string("A B=1\n"), std::string(""),
          std::string("\n"), std::string("# only this\n"), std::string("1A=2\n"),
          "A=" + std::string(65536, 'x')}) {
        const Outcome set = translate({"-p", "-pc", "ux"}, text);
        EXPECT_EQ(set.status, 23) << text.substr(0, 40);
        EXPECT_NE(set.err, "");
    }
    EXPECT_EQ(read("config/ux.cfg"), "INSTANCE=\nA=1\n");
    EXPECT_THAT(translate({"-p", "-pc", "ux"}, "A=1\nwhat\n").err, HasSubstr("line 2"));
}

TEST_F(Translator, ValuesAreTextAndNothingElse) {
    const std::string text =
        "INSTANCE=\nA=$(touch " + scratch.path("hacked") + ")\nB=x=y\nC=\nD= \n";
    EXPECT_EQ(translate({"-p", "-pc", "ux"}, text).status, 0);
    EXPECT_EQ(translate({"-g", "-pc", "ux"}).out, text);
    EXPECT_EQ(agent({"start", "ux"}).status, 0);
    EXPECT_EQ(agent({"stop", "ux"}).status, 0);
    EXPECT_FALSE(scratch.exists("hacked"));
}

TEST_F(Translator, ReaderNeverSeesHalfAConfiguration) {
    const std::string one = "INSTANCE=\nA=" + std::string(20000, '1') + "\n";
    const std::string two = "INSTANCE=\nA=" + std::string(30000, '2') + "\n";
    write("config/ux.cfg", one);
    for (int i = 0; i < 5; ++i) {
        std::vector<std::string> words{inHome("agtqvs6/lx8266/bin/zav_xa"), "-p", "-pc", "ux"};
        Program setter(words, i % 2 == 0 ? two : one);
        const std::string seen = translate({"-g", "-pc", "ux"}).out;
        EXPECT_TRUE(seen == one || seen == two) << seen.size();
        EXPECT_EQ(setter.wait().status, 0);
    }
    EXPECT_EQ(run({"/bin/sh", "-c", "ls -a " + inHome("config") + " | grep -c '^\\.ux'"}).out,
              "0\n");
}

TEST_F(Translator, NamesTheInstanceOfAManagedSystem) {
    const auto name = [&](const std::string& system, const std::string& product) {
        const Outcome outcome = translate({"-i", system, "-pc", product});
        EXPECT_EQ(outcome.status, 0) << system << outcome.err;
        return outcome.out;
    };
    EXPECT_EQ(name("inst1:hostA:UX", "ux"), "inst1\n");
    EXPECT_EQ(name("in-st_1.b:hostA:ux", "ux"), "in-st_1.b\n");
    EXPECT_EQ(name("hostA:UX", "ux"), "\n");
    EXPECT_EQ(name("X:hostA:UA", "um"), "X\n");
}

TEST_F(Translator, ManagedSystemNamesThatAreNotUnderstood) {
    for (const char* system : {"hostA", "inst1:hostA:UM", "a:b:c:UX", ":hostA:UX", "inst1::UX",
                               ":UX", "../x:hostA:UX", "inst1:hostA:", "my inst:hostA:UX"}) {
        for (const char* verb : {"-i", "-g", "-p", "-r"}) {
            EXPECT_EQ(translate({verb, system, "-pc", "ux"}, "A=1\n").status, 21) << system;
        }
    }
    // A command line splits such a name at its blank.
    EXPECT_EQ(translate({"-i", "my", "inst:hostA:UX", "-pc", "ux"}).status, 21);
}

TEST_F(Translator, UnknownInstanceHasNoConfiguration) {
    const Outcome got = translate({"-g", "b:hostA:UX", "-pc", "ux"});
    EXPECT_EQ(got.status, 22);
    EXPECT_EQ(got.out, "");
}

TEST_F(Translator, RemovesAnInstanceAndStopsIt) {
    ASSERT_EQ(translate({"-p", "b:hostA:UX", "-pc", "ux"}, "START_SECONDS=0\n").status, 0);
    ASSERT_EQ(agent({"start", "-o", "b", "ux"}).status, 0);
    const pid_t pid = pidOf("ux_b");
    EXPECT_EQ(translate({"-r", "b:hostA:UX", "-pc", "ux"}).status, 0);
    EXPECT_FALSE(lives(pid));
    EXPECT_FALSE(exists("config/ux_b.cfg"));
    EXPECT_FALSE(exists("run/ux_b.pid"));
    EXPECT_FALSE(exists("data/ux_b"));
    EXPECT_FALSE(exists("logs/ux_b.log"));
    EXPECT_EQ(translate({"-r", "b:hostA:UX", "-pc", "ux"}).status, 22);
}

TEST_F(Translator, RemovesAnInstanceThatWasNeverConfigured) {
    addAgent("tt", "exec sleep 600\n");
    ASSERT_EQ(agent({"start", "-o", "b", "tt"}).status, 0);
    ASSERT_EQ(agent({"-c", "-o", "b", "stop", "tt"}).status, 0);
    EXPECT_EQ(translate({"-r", "b:hostA:TT", "-pc", "tt"}).status, 0);
    EXPECT_FALSE(exists("logs/tt_b.log"));
    EXPECT_EQ(translate({"-r", "b:hostA:TT", "-pc", "tt"}).status, 22);
}

TEST_F(Translator, RemovesTheDefaultInstanceWhenNoneIsNamed) {
    write("config/ux.cfg", "INSTANCE=\n");
    write("config/ux_b.cfg", "INSTANCE=b\n");
    EXPECT_EQ(translate({"-r", "-pc", "ux"}).status, 0);
    EXPECT_FALSE(exists("config/ux.cfg"));
    EXPECT_TRUE(exists("config/ux_b.cfg"));
    EXPECT_EQ(translate({"-r", "-pc", "ux"}).status, 22);
}

TEST_F(Translator, StalePidFileDoesNotKeepAnInstanceFromBeingRemoved) {
    write("config/ux_b.cfg", "INSTANCE=b\n");
    write("run/ux_b.pid", "1 2 3 lx8266\n");
    EXPECT_EQ(translate({"-r", "b:hostA:UX", "-pc", "ux"}).status, 0);
    EXPECT_FALSE(exists("config/ux_b.cfg"));
}

TEST_F(Translator, TellsEveryInstanceTheServer) {
    write("config/.ConfigData/kmsenv", "x|CELLNAME|default\nhub1|CELLNAME|hub1|\nother|PORT|1|\n");
    write("config/ux_b.cfg", "INSTANCE=b\nCMS=old\nA=1\n");
    EXPECT_EQ(translate({"-setCMS", "ux"}).status, 0);
    EXPECT_EQ(read("config/ux_b.cfg"), "INSTANCE=b\nA=1\nCMS=hub1\n");
    EXPECT_THAT(read("config/ux.cfg"), StartsWith("INSTANCE=\n"));
    EXPECT_THAT(read("config/ux.cfg"), HasSubstr("INTERVAL=5\n"));
    EXPECT_THAT(read("config/ux.cfg"), HasSubstr("\nCMS=hub1\n"));

    EXPECT_EQ(translate({"-setCMS", "um"}).status, 0);
    EXPECT_THAT(read("config/um.config"), HasSubstr("\nCMS=hub1\n"));
    EXPECT_FALSE(exists("config/um.cfg"));
}

TEST_F(Translator, WithoutAServerNothingIsTold) {
    std::filesystem::remove(inHome("config/.ConfigData/kmsenv"));
    EXPECT_EQ(translate({"-setCMS", "ux"}).status, 24);
    EXPECT_FALSE(exists("config/ux.cfg"));
}

TEST_F(Translator, UniversalAgentsConfigurationIsItsOwnFile) {
    const Outcome got = translate({"-g", "-pc", "um"});
    EXPECT_EQ(got.status, 0);
    EXPECT_EQ(got.out, read("config/um.config"));
    EXPECT_EQ(translate({"-p", "X:hostA:UA", "-pc", "um"}, got.out.substr(10)).status, 0);
    EXPECT_THAT(read("config/um_X.config"), StartsWith("INSTANCE=X\n"));
}

TEST_F(Translator, ProductThatIsNotInstalledIsRefused) {
    for (const char* verb : {"-g", "-p", "-r"}) {
        EXPECT_EQ(translate({verb, "-pc", "zz"}, "A=1\n").status, 3) << verb;
    }
    EXPECT_EQ(translate({"-i", "a:hostA:ZZ", "-pc", "zz"}).status, 3);
    EXPECT_EQ(translate({"-setCMS", "zz"}).status, 3);
}

TEST_F(Translator, WrongUsage) {
    for (const std::vector<std::string>& words :
         std::vector<std::vector<std::string>>{{},
                                               {"-g"},
                                               {"-g", "-pc"},
                                               {"-g", "a:b:UX"},
                                               {"-g", "-pc", "ux", "um"},
                                               {"-i", "-pc", "ux"},
                                               {"-x", "-pc", "ux"},
                                               {"-setCMS"},
                                               {"-setCMS", "ux", "um"},
                                               {"-g", "-pc", "../ux"}}) {
        EXPECT_EQ(translate(words).status, 1) << ::testing::PrintToString(words);
    }
}

}  // namespace
