// The guard of targets that nobody knows.
#include "host/guard/guard_fixture.h"
#include "host/guard/machine/system_name.h"

namespace {

class TargetGuard : public GuardTest {
protected:
    TargetGuard() { translator("[ \"$2\" = unknown:UX ] || printf '%s\\n' \"${2%%:*}\""); }

    std::string of(const std::string& name, const std::string& target,
                   const std::string& product = "ux") {
        return refuser(command(name, product, {{"TARGETMSN", target}}));
    }
    std::string calls() { return files.exists("calls") ? files.read("calls") : ""; }
    const std::string here = host::shortHostName();
};

const char* const kResolving[] = {"START", "STOP", "RESTART", "REMOVEINSTANCE"};

TEST_F(TargetGuard, TakesWhatTheTranslatorResolves) {
    for (const char* name : kResolving)
        EXPECT_EQ(of(name, "inst1:elsewhere:UX"), "") << name;
    EXPECT_EQ(calls(),
              "-i inst1:elsewhere:UX -pc ux\n-i inst1:elsewhere:UX -pc ux\n"
              "-i inst1:elsewhere:UX -pc ux\n-i inst1:elsewhere:UX -pc ux\n");
    EXPECT_EQ(inventories(), 4U) << "one each";
}

TEST_F(TargetGuard, RefusesWhatResolvesToNothing) {
    files.write("home/config/ux_inst1.cfg", "");
    files.write("home/config/ux.cfg", "");
    files.write("home/config/um_other.config", "");
    EXPECT_EQ(refusalOf(command("STOP", "ux", {{"TARGETMSN", "unknown:UX"}})),
              "target 409: \"unknown:UX\" names no instance of ux here; the default instance would "
              "be taken in its place; known are " +
                  here + ":UX, inst1:" + here + ":UX");
    for (const char* name : kResolving)
        EXPECT_EQ(of(name, "unknown:UX"), "target") << name;
}

TEST_F(TargetGuard, TheDefaultInstanceIsNamedByThisMachineOrItsNode) {
    translator("exit 0");
    const std::string node = oxa::originNode();
    EXPECT_EQ(of("STOP", here + ":UX"), "");
    EXPECT_EQ(of("STOP", here + ":ux"), "") << "case does not matter";
    EXPECT_EQ(of("STOP", here), "target") << "no managed system name";
    EXPECT_EQ(of("STOP", here + "x:UX"), "target");
    oxa::setOriginNode("Primary:node7:NT");
    EXPECT_EQ(of("STOP", "node7:UX"), "");
    EXPECT_EQ(of("STOP", "Primary:UX"), "target");
    oxa::setOriginNode("node8");
    EXPECT_EQ(of("STOP", "node8:UX"), "");
    EXPECT_EQ(of("STOP", "node7:UX"), "target");
    oxa::setOriginNode(node);
}

TEST_F(TargetGuard, AnotherCodeOrAnUnknownInstanceOfThisMachineIsNotTheDefaultInstance) {
    translator("exit 0");
    for (const char* const name : kResolving) {
        for (const std::string& target :
             {here + ":UM", here + ":", ":" + here + ":UX", "inst1:" + here + ":UX",
              "inst1:" + here + ":UY", "a:b:" + here + ":UX", here + ":UX:UX"})
            EXPECT_EQ(of(name, target), "target") << name << " " << target;
    }
    EXPECT_EQ(of("STOP", here + ":UM", "um"), "target");
    EXPECT_EQ(of("STOP", "inst1:" + here + ":UX", "um"), "target");
}

TEST_F(TargetGuard, SaysWhyTheTranslatorRefused) {
    translator("echo 'zav_xa: no such thing' >&2; exit 21");
    EXPECT_EQ(refusalOf(command("STOP", "ux", {{"TARGETMSN", "a:b:UX"}})),
              "target 409: \"a:b:UX\" names no instance of ux here; the default instance would be "
              "taken in its place (zav_xa: no such thing); known is " +
                  here + ":UX");
    translator("exit 21");
    EXPECT_NE(refusalOf(command("STOP", "ux", {{"TARGETMSN", "a:b:UX"}}))
                  .find("zav_xa ended with exit code 21)"),
              std::string::npos);
}

TEST_F(TargetGuard, TheUniversalAgentsNamesAreReadWithoutTheTranslator) {
    EXPECT_EQ(of("STOP", "inst1:host:UA", "um"), "");
    EXPECT_EQ(of("STOP", "typo:UA", "um"), "target");
    EXPECT_EQ(of("STOP", "inst1:host:UX", "um"), "target");
    EXPECT_EQ(of("STOP", here + ":UA", "um"), "");
    EXPECT_EQ(refusalOf(command("STOP", "um", {{"TARGETMSN", "typo:UA"}})),
              "target 409: \"typo:UA\" names no instance of um here; the default instance would be "
              "taken in its place; known is " +
                  here + ":UA");
    EXPECT_EQ(calls(), "");
}

TEST_F(TargetGuard, AsksNothingWhereNoTargetIsResolved) {
    EXPECT_EQ(of("STOP", ""), "");
    EXPECT_EQ(of("SETCONFIG", "unknown:UX"), "") << "it may be new";
    EXPECT_EQ(of("GETCONFIG", "unknown:UX"), "") << "it only reads";
    EXPECT_EQ(refuser(command("START", "ux", {{"TARGETMSN", "new"}, {"OPTIONAL", "INSTANCE"}})),
              "");
    EXPECT_EQ(of("REMOVEINSTANCE", "typo:UA", "um"), "") << "the plug-in refuses it itself";
    EXPECT_EQ(calls(), "");
}

TEST_F(TargetGuard, PassesBehindAnUnfinishedTaskOfTheSameProduct) {
    accept("SETCONFIG", "ux");
    EXPECT_EQ(of("START", "unknown:UX"), "");
    finish();
    EXPECT_EQ(of("START", "unknown:UX"), "target");
}

TEST_F(TargetGuard, WithoutATranslatorOnlyTheDefaultInstanceIsKnown) {
    install({"ux"});
    EXPECT_EQ(of("STOP", here + ":UX"), "");
    EXPECT_EQ(refusalOf(command("STOP", "ux", {{"TARGETMSN", "a:b:UX"}})),
              "target 409: \"a:b:UX\" names no instance of ux here; the default instance would be "
              "taken in its place (the home has no translator); known is " +
                  here + ":UX");
}

}  // namespace
