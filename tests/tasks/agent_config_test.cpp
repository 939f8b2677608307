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
        EXPECT_EQ(context, narrow(task.getContext()));
        return outcomeOf(task, rc);
    }
};

TEST_F(SetConfig, HandsTheContextToTheTranslator) {
    home_.translator("echo printed; echo warned >&2");
    EXPECT_EQ(kSuccess, run("INSTANCE=inst1\nPORT=\"80\"\n"));
    EXPECT_THAT(home_.calls(kTranslator), ElementsAre("[-p][inst1:hostA:UX][-pc][ux]"));
    EXPECT_EQ("INSTANCE=inst1\nPORT=\"80\"\n", home_.input(kTranslator));
    EXPECT_EQ(1, trace_.count('D', "Return code is 0"));
    EXPECT_THAT(trace_.errors(), IsEmpty());
}

TEST_F(SetConfig, ContextsOfTheColumnsWidthAndMoreAreHandedOverWhole) {
    home_.translator("true");
    std::string all;
    for (const unsigned length : {3072u, 3073u}) {
        const std::string context(length, 'x');
        all += context;
        TaskQueueElem task = taskFor("SETCONFIG", "", context);
        EXPECT_EQ(TASK_OK, setConfig(task));
    }
    EXPECT_EQ(all, home_.input(kTranslator));
}

TEST_F(SetConfig, WithoutATargetTheOptionsFollowEachOther) {
    home_.translator("exit 1");
    EXPECT_EQ((Outcome{1008, "ZAV1008E", "SETCONFIG,ux,1," + command(" -p  -pc ux") + ","}),
              run("A=1", ""));
    EXPECT_THAT(home_.calls(kTranslator), ElementsAre("[-p][-pc][ux]"));
}

TEST_F(SetConfig, NeedsATranslator) {
    EXPECT_EQ((Outcome{1007, "ZAV1007E", "SETCONFIG,ux"}), run());
    EXPECT_EQ(1, trace_.count('E', "ZAV1007E No two-way translator found for product code [ux]"));
    EXPECT_EQ(1, trace_.count('D', "Return code is 1007"));
}

TEST_F(SetConfig, ReportsWhatAFailedTranslatorSays) {
    home_.translator("printf 'bad value' >&2; exit 3");
    const std::string line = command(" -p inst1:hostA:UX -pc ux");
    EXPECT_EQ((Outcome{1008, "ZAV1008E", "SETCONFIG,ux,3," + line + ",bad value"}), run());
    EXPECT_EQ(1, trace_.count('E',
                              "ZAV1008E Received bad return code [3] from two-way translator "
                              "command [" +
                                  line + "], STDERR=[bad value]"));
    EXPECT_EQ(1, trace_.count('D', "Return code is 1008"));
}

TEST_F(SetConfig, ATranslatorThatCannotRunIsAFailure) {
    home_.translator("true");
    home_.notExecutable(kTranslator);
    const std::string line = command(" -p inst1:hostA:UX -pc ux");
    EXPECT_EQ((Outcome{1009, "ZAV1009E", "SETCONFIG,ux," + line}), run());
    EXPECT_EQ(1, trace_.count('E', "ZAV1009E Failed to start two way translator using command [" +
                                       line + "]"));
    EXPECT_EQ(1, trace_.count('D', "Return code is 1009"));
}

TEST_F(SetConfig, ATranslatorThatHangsIsAFailure) {
    const ScopedEnv timeout("TIMEOUT", "1");
    home_.translator("exec sleep 20");
    EXPECT_EQ((Outcome{1009, "ZAV1009E", "SETCONFIG,ux," + command(" -p inst1:hostA:UX -pc ux")}),
              run());
}

// ---- GETCONFIG ----------------------------------------------------------------------------------

class GetConfig : public AgentConfig {
protected:
    /// The context after a run that succeeds.
    std::string configuration() {
        TaskQueueElem task = taskFor("GETCONFIG", "inst1:hostA:UX", "before");
        EXPECT_EQ(kSuccess, outcomeOf(task, getConfig(task)));
        return narrow(task.getContext());
    }
    Outcome failure(const char* target = "inst1:hostA:UX") {
        TaskQueueElem task = taskFor("GETCONFIG", target, "before");
        const TASK_RC rc = getConfig(task);
        EXPECT_EQ("before", narrow(task.getContext()));
        return outcomeOf(task, rc);
    }
};

TEST_F(GetConfig, ReturnsWhatTheTranslatorPrints) {
    home_.translator("printf 'INSTANCE=inst1\\nPORT=80\\n'");
    EXPECT_EQ("INSTANCE=inst1\nPORT=80\n", configuration());
    EXPECT_THAT(home_.calls(kTranslator), ElementsAre("[-g][inst1:hostA:UX][-pc][ux]"));
    EXPECT_EQ("", home_.input(kTranslator));
    EXPECT_EQ(1, trace_.count('D', "Return code is 0"));
    EXPECT_THAT(trace_.errors(), IsEmpty());
}

TEST_F(GetConfig, DropsWhatStandsBeforeTheFirstMarker) {
    home_.translator("printf 'a banner\\nxINSTANCE=1\\nINSTANCE=2'");
    EXPECT_EQ("INSTANCE=1\nINSTANCE=2", configuration());
    home_.translator("printf 'noise INSTANCE='");
    EXPECT_EQ("INSTANCE=", configuration());
}

TEST_F(GetConfig, IsEmptyWithoutTheMarker) {
    for (const char* body :
         {"true", "echo", "printf '\\n\\n'", "echo instance=1", "echo INSTANCE"}) {
        home_.translator(body);
        EXPECT_EQ("", configuration()) << body;
    }
}

TEST_F(GetConfig, MayBeEightMegabytes) {
    home_.translator("echo noise; echo INSTANCE=1; head -c 8388608 /dev/zero | tr '\\0' x");
    const TraceCapture quiet("ERROR");
    EXPECT_EQ("INSTANCE=1\n" + std::string(8 << 20, 'x'), [this] {
        TaskQueueElem task = taskFor("GETCONFIG", "", "");
        EXPECT_EQ(TASK_OK, getConfig(task));
        return narrow(task.getContext());
    }());
}

TEST_F(GetConfig, NeedsATranslator) {
    EXPECT_EQ((Outcome{1007, "ZAV1007E", "GETCONFIG,ux"}), failure());
    EXPECT_EQ(1, trace_.count('E', "ZAV1007E No two-way translator found for product code [ux]"));
    EXPECT_EQ(1, trace_.count('D', "Return code is 1007"));
}

TEST_F(GetConfig, ATranslatorThatFailsIsAFailure) {
    home_.translator("echo INSTANCE=1; echo bad >&2; exit 3");
    const std::string line = command(" -g  -pc ux");
    EXPECT_EQ((Outcome{1008, "ZAV1008E", "GETCONFIG,ux,3," + line}), failure(""));
    EXPECT_EQ(1, trace_.count('E',
                              "ZAV1008E Received bad return code [3] from two-way translator "
                              "command [" +
                                  line + "]"));
    EXPECT_EQ(1, trace_.count('D', "Return code is 1008"));
}

TEST_F(GetConfig, ATranslatorThatCannotRunIsAFailure) {
    home_.translator("true");
    home_.notExecutable(kTranslator);
    const std::string line = command(" -g inst1:hostA:UX -pc ux");
    EXPECT_EQ((Outcome{1009, "ZAV1009E", "GETCONFIG,ux," + line}), failure());
    EXPECT_EQ(1, trace_.count('E', "ZAV1009E Failed to start two way translator using command [" +
                                       line + "]"));
    EXPECT_EQ(1, trace_.count('D', "Return code is 1009"));
}

TEST_F(GetConfig, ATranslatorThatHangsIsAFailure) {
    const ScopedEnv timeout("TIMEOUT", "1");
    home_.translator("exec sleep 20");
    EXPECT_EQ((Outcome{1009, "ZAV1009E", "GETCONFIG,ux," + command(" -g inst1:hostA:UX -pc ux")}),
              failure());
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
    EXPECT_EQ(before, openDescriptors());
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
    EXPECT_EQ("inst1", instance("ux", "inst1:hostA:UX"));
    EXPECT_THAT(home_.calls(kTranslator), ElementsAre("[-i][inst1:hostA:UX][-pc][ux]"));
    EXPECT_EQ("", home_.input(kTranslator));
    EXPECT_EQ(1, returned("inst1", "inst1:hostA:UX"));
    EXPECT_THAT(trace_.errors(), IsEmpty());
}

TEST_F(InstanceName, MayBeNothing) {
    for (const char* body : {"true", "echo", "printf '\\n\\n \\n'"}) {
        home_.translator(body);
        EXPECT_EQ("", instance("ux", "hostA:UX")) << body;
    }
    EXPECT_EQ(3, returned("", "hostA:UX"));
}

TEST_F(InstanceName, OfNoManagedSystemIsEmpty) {
    home_.translator("echo inst1");
    EXPECT_EQ("", instance("ux", ""));
    EXPECT_EQ("", instance("um", ""));
    EXPECT_THAT(home_.calls("bin/cinfo"), IsEmpty());
    EXPECT_EQ(2, returned("", ""));
}

TEST_F(InstanceName, OfTheUniversalAgentIsInTheManagedSystemName) {
    home_.translator("echo other");
    EXPECT_EQ("inst1", instance("um", "inst1:hostA:UA"));
    EXPECT_EQ("", instance("um", "hostA:UA"));
    EXPECT_THAT(home_.calls("bin/cinfo"), IsEmpty());
    EXPECT_EQ(1, returned("inst1", "inst1:hostA:UA"));
}

TEST_F(InstanceName, OfAnUpperCaseProductIsTheTranslatorsToSay) {
    home_.translator("echo other");
    EXPECT_EQ("other", instance("UM", "inst1:hostA:UA"));
    EXPECT_THAT(home_.calls(kTranslator), ElementsAre("[-i][inst1:hostA:UA][-pc][UM]"));
}

TEST_F(InstanceName, IsEmptyWithoutATranslator) {
    EXPECT_EQ("", instance("ux", "hostA:UX"));
    EXPECT_EQ(1, trace_.count('E', "No two-way translator found for product code [ux]"));
    EXPECT_EQ(1, returned("", "hostA:UX"));
}

TEST_F(InstanceName, IsEmptyWhenTheTranslatorFails) {
    home_.translator("echo inst1; exit 4");
    EXPECT_EQ("", instance("ux", "hostA:UX"));
    EXPECT_EQ(1,
              trace_.count('E', "Received bad return code [4] from two-way translator command [" +
                                    command(" -i hostA:UX -pc ux") + "]"));
    home_.notExecutable(kTranslator);
    EXPECT_EQ("", instance("ux", "hostA:UX"));
    EXPECT_EQ(1, trace_.count('E', "Failed to start two way translator using command [" +
                                       command(" -i hostA:UX -pc ux") + "]"));
    EXPECT_EQ(2, returned("", "hostA:UX"));
}

}  // namespace
