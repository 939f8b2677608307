#include "tasks/uninstall.h"

#include <gmock/gmock.h>

#include "support/trace_capture.h"
#include "tasks/task_home.h"

using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;
using ZAV::String;

namespace {

constexpr const char* kUninstall = "bin/uninstall.sh";
constexpr const char* kTranslator = TaskHome::kTranslator;

class Removal : public testing::Test {
protected:
    static TaskQueueElem taskFor(const char* command, const char* product, const char* target = "",
                                 const char* context = "") {
        TaskQueueElem task;
        task.setCommand(command);
        task.setProduct(product);
        task.setTargetmsn(target);
        task.setContext(context);
        return task;
    }

    TaskHome home_;
    TraceCapture trace_{"ERROR (UNIT:zavtasks ALL)"};
};

// ---- UNINSTALL ----------------------------------------------------------------------------------

class Uninstall : public Removal {
protected:
    Uninstall() {
        home_.inventory(TaskHome::listHeader() + TaskHome::listLine("ux", "li6263") +
                        TaskHome::listLine("ux", "aix543"));
    }
    Outcome run(const char* product = "ux") {
        TaskQueueElem task = taskFor("UNINSTALL", product);
        return outcomeOf(task, uninstall(task));
    }
    std::string command() const { return home_.home() + "/bin/uninstall.sh -i ux li6263"; }

    const ScopedEnv noPreference_{"QVS_BINARCH", nullptr};
};

TEST_F(Uninstall, RunsTheHomesScript) {
    home_.program(kUninstall, "true");
    EXPECT_EQ(run(), kSuccess);
    EXPECT_THAT(home_.calls(kUninstall), ElementsAre("[-i][ux][li6263]"));
    EXPECT_EQ(home_.input(kUninstall), "");
    EXPECT_EQ(trace_.count('D', "UnInstall command is [" + command() + "]"), 1);
    EXPECT_EQ(trace_.count('D', "UnInstall returned 0 return code."), 1);
    EXPECT_EQ(trace_.count('D', "Return code is 0"), 1);
    EXPECT_THAT(trace_.errors(), IsEmpty());
}

TEST_F(Uninstall, PrefersTheArchitectureThatEndsLikeTheBinarys) {
    const ScopedEnv preference("QVS_BINARCH", "xyz943");
    home_.program(kUninstall, "true");
    EXPECT_EQ(run(), kSuccess);
    EXPECT_THAT(home_.calls(kUninstall), ElementsAre("[-i][ux][aix543]"));
}

TEST_F(Uninstall, NeedsAProductThatIsInstalled) {
    home_.program(kUninstall, "true");
    EXPECT_EQ(run("lz"), (Outcome{1034, "ZAV1034E", "lz"}));
    EXPECT_THAT(home_.calls(kUninstall), IsEmpty());
    EXPECT_EQ(trace_.count('E', "ZAV1034E No product architecture found for product [lz]"), 1);
    EXPECT_EQ(trace_.count('D', "Return code is 1034"), 0);
}

TEST_F(Uninstall, NeedsAnInventory) {
    for (const char* inventory : {"exit 1", "true", "echo"}) {
        home_.program("bin/cinfo", inventory);
        EXPECT_EQ(run(), (Outcome{1034, "ZAV1034E", "ux"})) << inventory;
    }
}

TEST_F(Uninstall, AnExitCodeBecomesOneCharacter) {
    for (const int code : {1, 65, 255}) {
        trace_.clear();
        home_.program(kUninstall, "exit " + std::to_string(code));
        const String parameter =
            String((command() + ",").c_str()).append(static_cast<unsigned short>(code));
        EXPECT_EQ(run(), (Outcome{1032, "ZAV1032E", narrow(parameter)}));
        EXPECT_EQ(trace_.count('E', "ZAV1032E Bad return code [" + std::to_string(code) +
                                        "] from uninstall command [" + command() + "]"),
                  1);
        EXPECT_EQ(trace_.count('D', "Return code is 1032"), 1);
    }
}

TEST_F(Uninstall, TheCharacterOf65IsALetter) {
    home_.program(kUninstall, "exit 65");
    EXPECT_EQ(run(), (Outcome{1032, "ZAV1032E", command() + ",A"}));
}

TEST_F(Uninstall, AScriptThatCannotRunIsAFailure) {
    const Outcome expected{1033, "ZAV1033E", command()};
    EXPECT_EQ(run(), expected);
    home_.notExecutable(kUninstall);
    EXPECT_EQ(run(), expected);
    EXPECT_EQ(trace_.count('E', "ZAV1033E Failed to start uninstall command [" + command() + "]"),
              2);
    EXPECT_EQ(trace_.count('D', "Return code is 1033"), 2);
}

TEST_F(Uninstall, AScriptThatHangsIsAFailure) {
    const ScopedEnv timeout("TIMEOUT", "1");
    home_.program(kUninstall, "exec sleep 20");
    EXPECT_EQ(run(), (Outcome{1033, "ZAV1033E", command()}));
}

TEST_F(Uninstall, LeavesNoDescriptorOpen) {
    home_.program(kUninstall, "true");
    run();
    const auto before = openDescriptors();
    run();
    home_.program(kUninstall, "exit 1");
    run();
    home_.notExecutable(kUninstall);
    run();
    run("lz");
    EXPECT_EQ(openDescriptors(), before);
}

// ---- REMOVEINSTANCE -----------------------------------------------------------------------------

class RemoveInstance : public Removal {
protected:
    Outcome run(const char* target = "inst1:hostA:UX", const char* context = "") {
        TaskQueueElem task = taskFor("REMOVEINSTANCE", "ux", target, context);
        return outcomeOf(task, removeInstance(task));
    }
    std::string command(const std::string& target = "inst1:hostA:UX") const {
        return home_.home() + "/" + kTranslator + " -r " + target + " -pc ux";
    }
};

TEST_F(RemoveInstance, AsksTheTranslator) {
    home_.translator("true");
    EXPECT_EQ(run(), kSuccess);
    EXPECT_THAT(home_.calls(kTranslator), ElementsAre("[-r][inst1:hostA:UX][-pc][ux]"));
    EXPECT_EQ(home_.input(kTranslator), "");
    EXPECT_EQ(trace_.count('D', "Return code is 0"), 1);
    EXPECT_THAT(trace_.errors(), IsEmpty());
}

TEST_F(RemoveInstance, TheContextIsTheTranslatorsInput) {
    home_.translator("true");
    EXPECT_EQ(run("inst1", "some context\nof two lines"), kSuccess);
    EXPECT_EQ(home_.input(kTranslator), "some context\nof two lines");
}

TEST_F(RemoveInstance, WithoutATargetTheOptionsFollowEachOther) {
    home_.translator("exit 2");
    EXPECT_EQ(run(""), (Outcome{1008, "ZAV1008E", "REMOVEINSTANCE,ux,2," + command("")}));
    EXPECT_EQ(command(""), home_.home() + "/" + kTranslator + " -r  -pc ux");
    EXPECT_THAT(home_.calls(kTranslator), ElementsAre("[-r][-pc][ux]"));
}

TEST_F(RemoveInstance, NeedsATranslator) {
    EXPECT_EQ(run(), (Outcome{1007, "ZAV1007E", "REMOVEINSTANCE,ux"}));
    EXPECT_EQ(trace_.count('E', "ZAV1007E No two-way translator found for product code [ux]"), 1);
    EXPECT_EQ(trace_.count('D', "Return code is 1007"), 1);
}

TEST_F(RemoveInstance, ATranslatorThatFailsIsAFailure) {
    home_.translator("exit 3");
    EXPECT_EQ(run(), (Outcome{1008, "ZAV1008E", "REMOVEINSTANCE,ux,3," + command()}));
    EXPECT_EQ(trace_.count('E',
                           "ZAV1008E Received bad return code [3] from two-way translator "
                           "command [" +
                               command() + "]"),
              1);
    EXPECT_EQ(trace_.count('D', "Return code is 1008"), 1);
}

TEST_F(RemoveInstance, ATranslatorThatCannotRunIsAFailure) {
    home_.translator("true");
    home_.notExecutable(kTranslator);
    EXPECT_EQ(run(), (Outcome{1009, "ZAV1009E", "REMOVEINSTANCE,ux," + command()}));
    EXPECT_EQ(trace_.count('E', "ZAV1009E Failed to start two way translator using command [" +
                                    command() + "]"),
              1);
    EXPECT_EQ(trace_.count('D', "Return code is 1009"), 1);
}

TEST_F(RemoveInstance, ATranslatorThatHangsIsAFailure) {
    const ScopedEnv timeout("TIMEOUT", "1");
    home_.translator("exec sleep 20");
    EXPECT_EQ(run(), (Outcome{1009, "ZAV1009E", "REMOVEINSTANCE,ux," + command()}));
}

}  // namespace
