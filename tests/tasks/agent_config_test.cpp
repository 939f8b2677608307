#include "tasks/agent_config.h"

#include <gmock/gmock.h>

#include "support/trace_capture.h"
#include "tasks/task_home.h"

using testing::ElementsAre;
using testing::IsEmpty;
using ZAV::String;

namespace {

constexpr const char* kTranslator = TaskHome::kTranslator;

class AgentConfig : public testing::Test {
protected:
    static TaskQueueElem taskFor(const char* command, const char* target,
                                 const std::string& context = "") {
        TaskQueueElem task;
        task.setCommand(command);
        task.setProduct("ux");
        task.setTargetmsn(target);
        task.setContext(context.c_str());
        return task;
    }
    std::string command(const std::string& options) const {
        return home_.home() + "/" + kTranslator + options;
    }

    TaskHome home_;
    TraceCapture trace_{"ERROR (UNIT:zavtasks ALL)"};
};

// ---- SETCONFIG ----------------------------------------------------------------------------------

class SetConfig : public AgentConfig {
protected:
    Outcome run(const std::string& context = "A=1", const char* target = "inst1:hostA:UX") {
        TaskQueueElem task = taskFor("SETCONFIG", target, context);
        const TASK_RC rc = setConfig(task);
        EXPECT_EQ(narrow(task.getContext()), context);
        return outcomeOf(task, rc);
    }
};

TEST_F(SetConfig, HandsTheContextToTheTranslator) {
    home_.translator("echo printed; echo warned >&2");
    EXPECT_EQ(run("INSTANCE=inst1\nPORT=\"80\"\n"), kSuccess);
    EXPECT_THAT(home_.calls(kTranslator), ElementsAre("[-p][inst1:hostA:UX][-pc][ux]"));
    EXPECT_EQ(home_.input(kTranslator), "INSTANCE=inst1\nPORT=\"80\"\n");
    EXPECT_EQ(trace_.count('D', "Return code is 0"), 1);
    EXPECT_THAT(trace_.errors(), IsEmpty());
}

TEST_F(SetConfig, ContextsOfTheColumnsWidthAndMoreAreHandedOverWhole) {
    home_.translator("true");
    std::string all;
    for (const unsigned length : {3072u, 3073u}) {
        const std::string context(length, 'x');
        all += context;
        TaskQueueElem task = taskFor("SETCONFIG", "", context);
        EXPECT_EQ(setConfig(task), TASK_OK);
    }
    EXPECT_EQ(home_.input(kTranslator), all);
}

TEST_F(SetConfig, WithoutATargetTheOptionsFollowEachOther) {
    home_.translator("exit 1");
    EXPECT_EQ(run("A=1", ""),
              (Outcome{1008, "ZAV1008E", "SETCONFIG,ux,1," + command(" -p  -pc ux") + ","}));
    EXPECT_THAT(home_.calls(kTranslator), ElementsAre("[-p][-pc][ux]"));
}

TEST_F(SetConfig, NeedsATranslator) {
    EXPECT_EQ(run(), (Outcome{1007, "ZAV1007E", "SETCONFIG,ux"}));
    EXPECT_EQ(trace_.count('E', "ZAV1007E No two-way translator found for product code [ux]"), 1);
    EXPECT_EQ(trace_.count('D', "Return code is 1007"), 1);
}

TEST_F(SetConfig, ReportsWhatAFailedTranslatorSays) {
    home_.translator("printf 'bad value' >&2; exit 3");
    const std::string line = command(" -p inst1:hostA:UX -pc ux");
    EXPECT_EQ(run(), (Outcome{1008, "ZAV1008E", "SETCONFIG,ux,3," + line + ",bad value"}));
    EXPECT_EQ(trace_.count('E',
                           "ZAV1008E Received bad return code [3] from two-way translator "
                           "command [" +
                               line + "], STDERR=[bad value]"),
              1);
    EXPECT_EQ(trace_.count('D', "Return code is 1008"), 1);
}

TEST_F(SetConfig, ATranslatorThatCannotRunIsAFailure) {
    home_.translator("true");
    home_.notExecutable(kTranslator);
    const std::string line = command(" -p inst1:hostA:UX -pc ux");
    EXPECT_EQ(run(), (Outcome{1009, "ZAV1009E", "SETCONFIG,ux," + line}));
    EXPECT_EQ(trace_.count(
                  'E', "ZAV1009E Failed to start two way translator using command [" + line + "]"),
              1);
    EXPECT_EQ(trace_.count('D', "Return code is 1009"), 1);
}

TEST_F(SetConfig, ATranslatorThatHangsIsAFailure) {
    const ScopedEnv timeout("TIMEOUT", "1");
    home_.translator("exec sleep 20");
    EXPECT_EQ(run(),
              (Outcome{1009, "ZAV1009E", "SETCONFIG,ux," + command(" -p inst1:hostA:UX -pc ux")}));
}

// ---- GETCONFIG ----------------------------------------------------------------------------------

class GetConfig : public AgentConfig {
protected:
    /// The context after a run that succeeds.
    std::string configuration() {
        TaskQueueElem task = taskFor("GETCONFIG", "inst1:hostA:UX", "before");
        EXPECT_EQ(outcomeOf(task, getConfig(task)), kSuccess);
        return narrow(task.getContext());
    }
    Outcome failure(const char* target = "inst1:hostA:UX") {
        TaskQueueElem task = taskFor("GETCONFIG", target, "before");
        const TASK_RC rc = getConfig(task);
        EXPECT_EQ(narrow(task.getContext()), "before");
        return outcomeOf(task, rc);
    }
};

TEST_F(GetConfig, ReturnsWhatTheTranslatorPrints) {
    home_.translator("printf 'INSTANCE=inst1\\nPORT=80\\n'");
    EXPECT_EQ(configuration(), "INSTANCE=inst1\nPORT=80\n");
    EXPECT_THAT(home_.calls(kTranslator), ElementsAre("[-g][inst1:hostA:UX][-pc][ux]"));
    EXPECT_EQ(home_.input(kTranslator), "");
    EXPECT_EQ(trace_.count('D', "Return code is 0"), 1);
    EXPECT_THAT(trace_.errors(), IsEmpty());
}

TEST_F(GetConfig, DropsWhatStandsBeforeTheFirstMarker) {
    home_.translator("printf 'a banner\\nxINSTANCE=1\\nINSTANCE=2'");
    EXPECT_EQ(configuration(), "INSTANCE=1\nINSTANCE=2");
    home_.translator("printf 'noise INSTANCE='");
    EXPECT_EQ(configuration(), "INSTANCE=");
}

TEST_F(GetConfig, IsEmptyWithoutTheMarker) {
    for (const char* body :
         {"true", "echo", "printf '\\n\\n'", "echo instance=1", "echo INSTANCE"}) {
        home_.translator(body);
        EXPECT_EQ(configuration(), "") << body;
    }
}

TEST_F(GetConfig, MayBeEightMegabytes) {
    home_.translator("echo noise; echo INSTANCE=1; head -c 8388608 /dev/zero | tr '\\0' x");
    const TraceCapture quiet("ERROR");
    EXPECT_EQ(
        [this] {
            TaskQueueElem task = taskFor("GETCONFIG", "", "");
            EXPECT_EQ(getConfig(task), TASK_OK);
            return narrow(task.getContext());
        }(),
        "INSTANCE=1\n" + std::string(8 << 20, 'x'));
}

TEST_F(GetConfig, NeedsATranslator) {
    EXPECT_EQ(failure(), (Outcome{1007, "ZAV1007E", "GETCONFIG,ux"}));
    EXPECT_EQ(trace_.count('E', "ZAV1007E No two-way translator found for product code [ux]"), 1);
    EXPECT_EQ(trace_.count('D', "Return code is 1007"), 1);
}

TEST_F(GetConfig, ATranslatorThatFailsIsAFailure) {
    home_.translator("echo INSTANCE=1; echo bad >&2; exit 3");
    const std::string line = command(" -g  -pc ux");
    EXPECT_EQ(failure(""), (Outcome{1008, "ZAV1008E", "GETCONFIG,ux,3," + line}));
    EXPECT_EQ(trace_.count('E',
                           "ZAV1008E Received bad return code [3] from two-way translator "
                           "command [" +
                               line + "]"),
              1);
    EXPECT_EQ(trace_.count('D', "Return code is 1008"), 1);
}

TEST_F(GetConfig, ATranslatorThatCannotRunIsAFailure) {
    home_.translator("true");
    home_.notExecutable(kTranslator);
    const std::string line = command(" -g inst1:hostA:UX -pc ux");
    EXPECT_EQ(failure(), (Outcome{1009, "ZAV1009E", "GETCONFIG,ux," + line}));
    EXPECT_EQ(trace_.count(
                  'E', "ZAV1009E Failed to start two way translator using command [" + line + "]"),
              1);
    EXPECT_EQ(trace_.count('D', "Return code is 1009"), 1);
}

TEST_F(GetConfig, ATranslatorThatHangsIsAFailure) {
    const ScopedEnv timeout("TIMEOUT", "1");
    home_.translator("exec sleep 20");
    EXPECT_EQ(failure(),
              (Outcome{1009, "ZAV1009E", "GETCONFIG,ux," + command(" -g inst1:hostA:UX -pc ux")}));
}

TEST_F(GetConfig, LeavesNoDescriptorOpen) {
    home_.translator("echo INSTANCE=1");
    configuration();
    const auto before = openDescriptors();
    configuration();
    home_.translator("exit 1");
    failure();
    home_.notExecutable(kTranslator);
    failure();
    EXPECT_EQ(openDescriptors(), before);
}

// ---- Instance names -----------------------------------------------------------------------------

class InstanceName : public AgentConfig {
protected:
    std::string instance(const char* product, const char* name) {
        return narrow(getInstanceName(product, name));
    }
    int returned(const std::string& instance, const std::string& name) const {
        return trace_.count(
            'D', "Returning instance [" + instance + "] for managed system name [" + name + "]");
    }
};

TEST_F(InstanceName, IsWhatTheTranslatorPrintsTrimmed) {
    home_.translator("echo '  inst1 '; echo");
    EXPECT_EQ(instance("ux", "inst1:hostA:UX"), "inst1");
    EXPECT_THAT(home_.calls(kTranslator), ElementsAre("[-i][inst1:hostA:UX][-pc][ux]"));
    EXPECT_EQ(home_.input(kTranslator), "");
    EXPECT_EQ(returned("inst1", "inst1:hostA:UX"), 1);
    EXPECT_THAT(trace_.errors(), IsEmpty());
}

TEST_F(InstanceName, MayBeNothing) {
    for (const char* body : {"true", "echo", "printf '\\n\\n \\n'"}) {
        home_.translator(body);
        EXPECT_EQ(instance("ux", "hostA:UX"), "") << body;
    }
    EXPECT_EQ(returned("", "hostA:UX"), 3);
}

TEST_F(InstanceName, OfNoManagedSystemIsEmpty) {
    home_.translator("echo inst1");
    EXPECT_EQ(instance("ux", ""), "");
    EXPECT_EQ(instance("um", ""), "");
    EXPECT_THAT(home_.calls("bin/cinfo"), IsEmpty());
    EXPECT_EQ(returned("", ""), 2);
}

TEST_F(InstanceName, OfTheUniversalAgentIsInTheManagedSystemName) {
    home_.translator("echo other");
    EXPECT_EQ(instance("um", "inst1:hostA:UA"), "inst1");
    EXPECT_EQ(instance("um", "hostA:UA"), "");
    EXPECT_THAT(home_.calls("bin/cinfo"), IsEmpty());
    EXPECT_EQ(returned("inst1", "inst1:hostA:UA"), 1);
}

TEST_F(InstanceName, OfAnUpperCaseProductIsTheTranslatorsToSay) {
    home_.translator("echo other");
    EXPECT_EQ(instance("UM", "inst1:hostA:UA"), "other");
    EXPECT_THAT(home_.calls(kTranslator), ElementsAre("[-i][inst1:hostA:UA][-pc][UM]"));
}

TEST_F(InstanceName, IsEmptyWithoutATranslator) {
    EXPECT_EQ(instance("ux", "hostA:UX"), "");
    EXPECT_EQ(trace_.count('E', "No two-way translator found for product code [ux]"), 1);
    EXPECT_EQ(returned("", "hostA:UX"), 1);
}

TEST_F(InstanceName, IsEmptyWhenTheTranslatorFails) {
    home_.translator("echo inst1; exit 4");
    EXPECT_EQ(instance("ux", "hostA:UX"), "");
    EXPECT_EQ(trace_.count('E', "Received bad return code [4] from two-way translator command [" +
                                    command(" -i hostA:UX -pc ux") + "]"),
              1);
    home_.notExecutable(kTranslator);
    EXPECT_EQ(instance("ux", "hostA:UX"), "");
    EXPECT_EQ(trace_.count('E', "Failed to start two way translator using command [" +
                                    command(" -i hostA:UX -pc ux") + "]"),
              1);
    EXPECT_EQ(returned("", "hostA:UX"), 2);
}

}  // namespace
