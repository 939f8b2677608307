/// How a queued command went, for people and as a document.
#pragma once

#include <chrono>
#include <nlohmann/json_fwd.hpp>
#include <string>

#include "ctl/client/tasks/task_result.h"
#include "ctl/show/page.h"

namespace ctl {

/// "start ux: accepted", or how the host refused it. A null reply, which is still to come, is no
/// refusal. `title` names the command here and below.
std::string replyLine(const std::string& title, const nlohmann::json& reply);

/// "start ux: done after 3 s", or how it failed.
std::string outcomeLine(const std::string& title, const nlohmann::json& row,
                        std::chrono::milliseconds elapsed);

/// The exit status that a row of results means.
ExitStatus statusOf(const nlohmann::json& row);

/// How a command that is answered at once ended.
Page showOutcome(const std::string& title, const nlohmann::json& row,
                 std::chrono::milliseconds elapsed, Format format);

/// {"reply": {...}, "events": [...]}, with "task" and "details" when the host keeps a record, and
/// with "doubt" when a look afterwards belies the success.
nlohmann::json taskDocument(const TaskResult& result);

/// "start ux: cancelled after 3 s", for a task that is over and whose end no row tells.
std::string stateLine(const std::string& title, const nlohmann::json& record,
                      std::chrono::milliseconds elapsed);

/// How to look at a task later: "zavctl task show T tells how it ended".
std::string laterText(const std::string& transid);

/// What the host's record of a task says against its success, such as "the command was killed by
/// signal 9"; empty if nothing. Without a record, or when the host takes the task for done, nothing
/// does.
std::string faultOf(const nlohmann::json& record);

/// Adds what a look afterwards found to a page that says how the task ended.
void addDoubts(Page& page, const std::string& title, const TaskResult& result);

/// How a queued command ended. As text it is what follows the reply line, which is printed as soon
/// as the reply is there.
Page showTask(const std::string& title, const TaskResult& result, Format format);

}  // namespace ctl
