// Which requests are accepted, what the answers are and which handler is called. No executor runs
// here, so queued tasks stay in the queue.
#include <gtest/gtest.h>

#include <stdexcept>
#include <string>
#include <vector>

#include "base/zavindex.h"
#include "support/row_text.h"
#include "support/trace_capture.h"
#include "tasks/fake_handlers.h"
#include "tasks/zavtasks.h"

using fake_handlers::narrow;
using ZAV::String;

namespace {

using Texts = std::vector<std::string>;

const char* const kSupported =
    "Commands supported are: "
    "START,STOP,RESTART,INSTALL,UNINSTALL,GETCONFIG,SETCONFIG,COMPLETE_INSTALL,REMOVEINSTANCE";

class TaskDispatch : public testing::Test {
protected:
    TaskDispatch() {
        commands.clear();
        for (const char* command : {"START", "STOP", "RESTART", "INSTALL", "UNINSTALL", "GETCONFIG",
                                    "SETCONFIG", "COMPLETE_INSTALL", "REMOVEINSTANCE"}) {
            commands.push_back(command);
        }
        taskQueue = {};
        fake_handlers::reset();
    }

    /// A request with every value that any command requires.
    static TaskQueueElem complete(const char* command, const char* product = "ux") {
        return TaskQueueElem("node", "tx-1", command, product, "ctx", "", "", "", "0620",
                             "host:UX");
    }

    static zav_kagreqt_data_t answer(const TaskQueueElem& task) { return task.getReturnResults(); }

    static void expectAnswer(const TaskQueueElem& task, int rc, const std::string& messageId,
                             const std::string& parameter) {
        EXPECT_EQ(answer(task).retval, rc);
        EXPECT_EQ(fieldText(answer(task).retmsgid), padded(messageId, 16));
        EXPECT_EQ(fieldText(answer(task).retmsgparm), padded(parameter, 256));
    }

    static void expectRefused(TaskQueueElem task, int rc, const std::string& parameter = "") {
        EXPECT_EQ(runTask(task), rc);
        expectAnswer(task, rc, "ZAV" + std::to_string(rc) + "E", parameter);
        EXPECT_TRUE(taskQueue.empty());
        EXPECT_EQ(fake_handlers::calls(), Texts{});
    }

    static void expectQueued(TaskQueueElem task) {
        EXPECT_EQ(runTask(task), 0);
        expectAnswer(task, 0, "", "");
        ASSERT_EQ(taskQueue.size(), 1u);
        EXPECT_EQ(narrow(taskQueue.front().getTransid()), narrow(task.getTransid()));
        EXPECT_EQ(narrow(taskQueue.front().getContext()), narrow(task.getContext()));
        EXPECT_EQ(fake_handlers::calls(), Texts{});
    }
};

// ---- What every request needs -------------------------------------------------------------------

TEST_F(TaskDispatch, WithoutCommandAndTransidTheLastMissingOneIsReported) {
    TraceCapture trace;
    expectRefused(TaskQueueElem(), 1002);
    EXPECT_EQ(trace.errors(),
              (Texts{"ZAV1001E No [COMMAND] specified, it is a required parameter",
                     "ZAV1002E No [TRANSID] specified, it is a required parameter"}));
}

TEST_F(TaskDispatch, WithoutCommandItIs1001) {
    TaskQueueElem task = complete("");
    TraceCapture trace;
    expectRefused(task, 1001);
    EXPECT_EQ(trace.errors(),
              (Texts{"ZAV1001E No [COMMAND] specified, it is a required parameter"}));
}

TEST_F(TaskDispatch, WithoutTransidItIs1002WhateverTheCommand) {
    TaskQueueElem task = complete("NONSENSE");
    task.setTransid("");
    TraceCapture trace;
    expectRefused(task, 1002);
    EXPECT_EQ(trace.errors(),
              (Texts{"ZAV1002E No [TRANSID] specified, it is a required parameter"}));
}

TEST_F(TaskDispatch, AnUnknownCommandIsRefusedWithTheListOfThoseThatThereAre) {
    TraceCapture trace;
    expectRefused(complete("DANCE"), 1006, "DANCE");
    EXPECT_EQ(trace.errors(), (Texts{"Command DANCE is NOT supported",
                                     "ZAV1006E Command [DANCE] is not a supported command"}));
    const Texts details = trace.details("zavtasks");
    ASSERT_EQ(details.size(), 1u);
    EXPECT_EQ(details[0], kSupported);
}

TEST_F(TaskDispatch, TheListOfCommandsComesLastInTheTrace) {
    TaskQueueElem task = complete("DANCE");
    const TraceCapture trace("ERROR (UNIT:zavtasks ALL)");
    runTask(task);
    Texts texts;
    for (const TraceLine& line : trace.lines()) {
        if (line.level != 'F') texts.push_back(line.text);
    }
    EXPECT_EQ(texts, (Texts{"Command DANCE is NOT supported",
                            "ZAV1006E Command [DANCE] is not a supported command", kSupported}));
}

TEST_F(TaskDispatch, CommandsAreComparedExactly) {
    expectRefused(complete("start"), 1006, "start");
    expectRefused(complete("START "), 1006, "START ");
    expectRefused(complete("STAR"), 1006, "STAR");
}

TEST_F(TaskDispatch, WithoutCommandsEveryRequestIsRefused) {
    commands.clear();
    TraceCapture trace;
    expectRefused(complete("START"), 1006, "START");
    EXPECT_EQ(trace.count('D', "Commands supported are: "), 1);
}

TEST_F(TaskDispatch, ASupportedCommandIsTraced) {
    TaskQueueElem task = complete("STOP");
    TraceCapture trace;
    runTask(task);
    EXPECT_EQ(trace.details("zavtasks"),
              (Texts{"Command STOP is supported", "Going to run command STOP"}));
    EXPECT_TRUE(trace.errors().empty());
}

// ---- Required parameters ------------------------------------------------------------------------

struct Missing {
    const char* command;
    const char* product;
    const char* version;
    const char* context;
    const char* target;
    int rc;
    Texts names;  ///< in the order of checking
};

class MissingParameter : public TaskDispatch, public testing::WithParamInterface<Missing> {};

TEST_P(MissingParameter, IsAnsweredWithItsCode) {
    const Missing& missing = GetParam();
    const TaskQueueElem task("node", "tx-1", missing.command, missing.product, missing.context, "",
                             "", "", missing.version, missing.target);
    TraceCapture trace;
    expectRefused(task, missing.rc);
    Texts expected;
    for (const std::string& name : missing.names) {
        expected.push_back(name + "] specified, it is a required parameter");
    }
    Texts actual;
    for (const std::string& line : trace.errors())
        actual.push_back(line.substr(line.find('[') + 1));
    EXPECT_EQ(actual, expected);
}

INSTANTIATE_TEST_SUITE_P(
    AllCommands, MissingParameter,
    testing::Values(Missing{"START", "", "v", "c", "t", 1003, {"PRODUCT"}},
                    Missing{"STOP", "", "v", "c", "t", 1003, {"PRODUCT"}},
                    Missing{"RESTART", "", "v", "c", "t", 1003, {"PRODUCT"}},
                    Missing{"INSTALL", "", "v", "c", "t", 1003, {"PRODUCT"}},
                    Missing{"INSTALL", "p", "", "c", "t", 1029, {"VERSION"}},
                    Missing{"INSTALL", "p", "v", "", "t", 1004, {"CONTEXT"}},
                    Missing{"INSTALL", "", "", "c", "t", 1029, {"PRODUCT", "VERSION"}},
                    Missing{"INSTALL", "", "", "", "t", 1004, {"PRODUCT", "VERSION", "CONTEXT"}},
                    Missing{"UNINSTALL", "", "v", "c", "t", 1003, {"PRODUCT"}},
                    Missing{"GETCONFIG", "", "v", "c", "t", 1003, {"PRODUCT"}},
                    Missing{"SETCONFIG", "", "v", "c", "t", 1003, {"PRODUCT"}},
                    Missing{"SETCONFIG", "p", "v", "", "t", 1004, {"CONTEXT"}},
                    Missing{"SETCONFIG", "", "v", "", "t", 1004, {"PRODUCT", "CONTEXT"}},
                    Missing{"REMOVEINSTANCE", "", "v", "c", "t", 1003, {"PRODUCT"}},
                    Missing{"REMOVEINSTANCE", "p", "v", "c", "", 1005, {"TARGETMSN"}},
                    Missing{"REMOVEINSTANCE", "", "v", "c", "", 1005, {"PRODUCT", "TARGETMSN"}}));

TEST_F(TaskDispatch, OnlyTheRequiredParametersAreRequired) {
    const auto run = [](const char* command, const char* product, const char* version,
                        const char* context, const char* target) {
        taskQueue = {};
        expectQueued(
            TaskQueueElem("", "tx", command, product, context, "", "", "", version, target));
    };
    run("START", "ux", "", "", "");
    run("STOP", "ux", "", "", "");
    run("RESTART", "ux", "", "", "");
    run("INSTALL", "ux", "v", "c", "");
    run("UNINSTALL", "ux", "", "", "");
    run("SETCONFIG", "ux", "", "c", "");
    run("SETCONFIG", "um", "", "", "");
    run("SETCONFIG", "UM", "", "", "");
    run("REMOVEINSTANCE", "ux", "", "", "t");
}

// ---- The universal agent ------------------------------------------------------------------------

TEST_F(TaskDispatch, InstancesOfTheUniversalAgentAreNotRemoved) {
    TraceCapture trace;
    expectRefused(complete("REMOVEINSTANCE", "um"), 1006, "REMOVEINSTANCE");
    EXPECT_EQ(trace.errors(),
              (Texts{"ZAV1006E Command [REMOVEINSTANCE] is not a supported command for UA"}));
}

TEST_F(TaskDispatch, TheUniversalAgentMayBeWrittenInCapitals) {
    expectRefused(complete("REMOVEINSTANCE", "UM"), 1006, "REMOVEINSTANCE");
    expectRefused(complete("REMOVEINSTANCE", "Um"), 1006, "REMOVEINSTANCE");
}

TEST_F(TaskDispatch, ARefusalForTheUniversalAgentComesBeforeMissingParameters) {
    TaskQueueElem task = complete("REMOVEINSTANCE", "um");
    task.setTargetmsn("");
    expectRefused(task, 1006, "REMOVEINSTANCE");
}

// ---- Commands that run at once ------------------------------------------------------------------

TEST_F(TaskDispatch, GetconfigRunsAtOnce) {
    fake_handlers::behave([](const std::string&, TaskQueueElem& task) {
        task.setContext("INSTANCE=x");
        return TASK_OK;
    });
    TaskQueueElem task = complete("GETCONFIG");
    EXPECT_EQ(runTask(task), 0);
    EXPECT_EQ(fake_handlers::calls(), (Texts{"getConfig tx-1"}));
    EXPECT_TRUE(taskQueue.empty());
    expectAnswer(task, 0, "", "");
    EXPECT_EQ(trimmedField(answer(task).context), "INSTANCE=x");
}

TEST_F(TaskDispatch, CompleteInstallRunsAtOnceAndRequiresNothing) {
    fake_handlers::behave([](const std::string&, TaskQueueElem& task) {
        task.setRetmsgid("ZAV1031E");
        task.setRetmsgparm("rc.txt,3");
        return TASK_INSTALL_FAILED;
    });
    TaskQueueElem task("", "tx-1", "COMPLETE_INSTALL", "", "", "", "", "", "", "");
    EXPECT_EQ(runTask(task), 1031);
    EXPECT_EQ(fake_handlers::calls(), (Texts{"completeInstallAfterRestart tx-1"}));
    EXPECT_TRUE(taskQueue.empty());
    expectAnswer(task, 1031, "ZAV1031E", "rc.txt,3");
}

// ---- The queue ----------------------------------------------------------------------------------

TEST_F(TaskDispatch, TheQueueKeepsCopies) {
    TaskQueueElem task = complete("START");
    runTask(task);
    task.setTransid("changed");
    EXPECT_EQ(narrow(taskQueue.front().getTransid()), "tx-1");
}

TEST_F(TaskDispatch, TheQueueKeepsTheOrder) {
    for (const char* transid : {"1", "2", "3"}) {
        TaskQueueElem task = complete("START");
        task.setTransid(transid);
        queueTask(task);
    }
    std::string order;
    for (; !taskQueue.empty(); taskQueue.pop())
        order += narrow(taskQueue.front().getTransid());
    EXPECT_EQ(order, "123");
}

// ---- What the executor runs ---------------------------------------------------------------------

struct Dispatched {
    const char* command;
    const char* product;
    const char* optional;
    const char* target;
    Texts calls;
};

class Dispatch : public TaskDispatch, public testing::WithParamInterface<Dispatched> {};

TEST_P(Dispatch, ReachesTheHandler) {
    const Dispatched& dispatched = GetParam();
    TaskQueueElem task("node", "tx-1", dispatched.command, dispatched.product, "ctx",
                       dispatched.optional, "", "", "0620", dispatched.target);
    TaskQueueElem* seen = nullptr;
    fake_handlers::behave([&seen](const std::string&, TaskQueueElem& given) {
        seen = &given;
        return TASK_TRANSLATOR_FAILED;
    });
    TraceCapture trace;
    EXPECT_EQ(processAsyncTask(task), TASK_TRANSLATOR_FAILED);
    EXPECT_EQ(fake_handlers::calls(), dispatched.calls);
    EXPECT_EQ(seen, &task);
    EXPECT_EQ(trace.details("zavtasks"), (Texts{"Return code is 1008"}));
}

INSTANTIATE_TEST_SUITE_P(
    AllCommands, Dispatch,
    testing::Values(Dispatched{"START",
                               "ux",
                               "",
                               "m:UX",
                               {"getInstanceName ux [m:UX]", "startAgent ux [instance of m:UX]"}},
                    Dispatched{
                        "START", "ux", "", "", {"getInstanceName ux []", "startAgent ux []"}},
                    Dispatched{"START", "ux", "INSTANCE", "inst1", {"startAgent ux [inst1]"}},
                    Dispatched{"START",
                               "ux",
                               "instance",
                               "m:UX",
                               {"getInstanceName ux [m:UX]", "startAgent ux [instance of m:UX]"}},
                    Dispatched{"STOP",
                               "ux",
                               "INSTANCE",
                               "m:UX",
                               {"getInstanceName ux [m:UX]", "stopAgent ux [instance of m:UX]"}},
                    Dispatched{"RESTART",
                               "ux",
                               "INSTANCE",
                               "m:UX",
                               {"getInstanceName ux [m:UX]", "restartAgent ux [instance of m:UX]"}},
                    Dispatched{"INSTALL", "ux", "", "", {"install tx-1"}},
                    Dispatched{"UNINSTALL", "ux", "", "", {"uninstall tx-1"}},
                    Dispatched{"SETCONFIG", "ux", "", "", {"setConfig tx-1"}},
                    Dispatched{"SETCONFIG", "um", "", "", {"setUaconfig tx-1"}},
                    Dispatched{"SETCONFIG", "Um", "", "", {"setUaconfig tx-1"}},
                    Dispatched{"REMOVEINSTANCE", "ux", "", "m:UX", {"removeInstance tx-1"}}));

TEST_F(TaskDispatch, TheExecutorRunsNothingElse) {
    for (const char* command : {"GETCONFIG", "COMPLETE_INSTALL", "DANCE", ""}) {
        TaskQueueElem task = complete(command);
        TraceCapture trace;
        EXPECT_EQ(processAsyncTask(task), TASK_OK);
        EXPECT_EQ(trace.details("zavtasks"), (Texts{"Return code is 0"}));
    }
    EXPECT_EQ(fake_handlers::calls(), Texts{});
}

// ---- Handlers that throw ------------------------------------------------------------------------

struct Thrown {
    const char* command;
    const char* product;
    int rc;
};

class ThrowingHandler : public TaskDispatch, public testing::WithParamInterface<Thrown> {};

TEST_P(ThrowingHandler, EndsItsTaskWithTheCommandsOwnCode) {
    fake_handlers::behave([](const std::string&, TaskQueueElem& task) -> TASK_RC {
        task.setRetmsgid("stale");
        task.setRetmsgparm("stale");
        throw std::runtime_error("what it says");
    });
    const Thrown& thrown = GetParam();
    const std::string id = "ZAV" + std::to_string(thrown.rc) + "E";
    TaskQueueElem task = complete(thrown.command, thrown.product);
    TraceCapture trace;
    const bool atOnce = std::string(thrown.command) == "GETCONFIG" ||
                        std::string(thrown.command) == "COMPLETE_INSTALL";
    EXPECT_EQ(atOnce ? runTask(task) : processAsyncTask(task), thrown.rc);
    EXPECT_EQ(trace.errors(), (Texts{id + " Command [" + thrown.command +
                                     "] ended by an exception: what it says"}));
    task.ReturnStatus(thrown.rc);
    expectAnswer(task, thrown.rc, id, thrown.command);
}

INSTANTIATE_TEST_SUITE_P(
    AllCommands, ThrowingHandler,
    testing::Values(Thrown{"START", "ux", 1025}, Thrown{"STOP", "ux", 1025},
                    Thrown{"RESTART", "ux", 1025}, Thrown{"INSTALL", "ux", 1030},
                    Thrown{"UNINSTALL", "ux", 1033}, Thrown{"SETCONFIG", "ux", 1009},
                    Thrown{"SETCONFIG", "um", 1009}, Thrown{"REMOVEINSTANCE", "ux", 1009},
                    Thrown{"GETCONFIG", "ux", 1009}, Thrown{"COMPLETE_INSTALL", "ux", 1031}));

TEST_F(TaskDispatch, BadPositionsAreTracedWithTheirPlace) {
    fake_handlers::behave([](const std::string&, TaskQueueElem&) -> TASK_RC {
        throw ZAV::IndexOutOfBoundsException(12, "zavstr");
    });
    TaskQueueElem task = complete("GETCONFIG");
    TraceCapture trace;
    EXPECT_EQ(runTask(task), 1009);
    EXPECT_EQ(
        trace.errors(),
        (Texts{"ZAV1009E Command [GETCONFIG] ended by an exception: line: 12, file: zavstr"}));
    expectAnswer(task, 1009, "ZAV1009E", "GETCONFIG");
}

TEST_F(TaskDispatch, AnythingMayBeThrown) {
    fake_handlers::behave([](const std::string&, TaskQueueElem&) -> TASK_RC { throw 42; });
    TaskQueueElem task = complete("INSTALL");
    TraceCapture trace;
    EXPECT_EQ(processAsyncTask(task), TASK_INSTALL_NOT_STARTED);
    EXPECT_EQ(trace.errors(),
              (Texts{"ZAV1030E Command [INSTALL] ended by an exception: an exception without a "
                     "text"}));
}

}  // namespace
