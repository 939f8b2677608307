/// What the user sees while a task is waited for.
#pragma once

#include <string>

#include "ctl/client/interruption.h"
#include "ctl/client/tasks/task_result.h"
#include "ctl/show/page.h"
#include "ctl/show/tasks/output_page.h"
#include "ctl/show/tasks/running_clock.h"
#include "ctl/verbs/invocation.h"

namespace ctl {

/// What Ctrl-C says, as long as the object exists, of a task that is answered at once.
InterruptNote interruptNote(const std::string& transid, Format format);

/// A clock on a terminal, what holds things up, the output of the commands if the user wants it,
/// and what Ctrl-C says. Lives as long as the wait.
class Waiting {
public:
    /// `title` names the command, `transid` the task.
    Waiting(const Invocation& invocation, const std::string& title, std::string transid);
    Waiting(const Waiting&) = delete;
    Waiting& operator=(const Waiting&) = delete;

    /// For runTask(). It refers to this object. Its onReply and onBegun are the caller's to set.
    TaskWatch watch();

    /// Shows a page in the middle of the wait.
    void show(const Page& page);

private:
    void accepted(const std::string& id);
    void showOutput(const std::string& stream, const std::string& text);

    Format format_;
    bool isVerbose_;
    std::string transid_;
    RunningClock clock_;
    OutputPages output_;
    bool hasOutput_ = false;  ///< the clock would stand in the middle of it
    InterruptNote note_;
};

}  // namespace ctl
