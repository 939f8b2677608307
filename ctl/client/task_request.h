/// Commands of the request table: sending one and seeing how it ended.
#pragma once

#include <memory>
#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "ctl/client/host_client.h"
#include "ctl/client/options.h"
#include "ctl/show/running_clock.h"

namespace ctl {

/// One request; empty values are left out of it.
struct TaskRequest {
    std::string command;
    std::string transid;  ///< made when empty
    std::string product;
    std::string context;
    std::string optional;
    std::string uaconfig;
    std::string uascript;
    std::string version;
    std::string targetmsn;

    std::vector<Condition> conditions() const;
};

/// A transaction identifier that no other request has.
std::string makeTransid();

/// One request on its way, from the subscription to its outcomes.
class Task {
public:
    /// `title` names the task in what is printed, such as "start ux".
    Task(const Options& options, TaskRequest request, std::string title);

    /// Sends a request that is answered at once; returns its reply row.
    nlohmann::json askNow();

    /// Subscribes to the request's outcomes when asked to, sends it and keeps the reply. Returns
    /// false when the host refused the request.
    bool submit(bool subscribe);

    /// Waits for the next outcome row. Ended: the host went away.
    EventStream::Result awaitOutcome();

    const nlohmann::json& reply() const { return reply_; }
    const nlohmann::json& events() const { return events_; }
    const nlohmann::json& lastEvent() const { return events_.back(); }
    Deadline deadline() const { return deadline_; }
    RunningClock& clock() { return clock_; }

private:
    Options options_;
    TaskRequest request_;
    Deadline deadline_;
    RunningClock clock_;
    HostClient client_;
    std::unique_ptr<EventStream> stream_;
    nlohmann::json reply_;  ///< null until it is there
    nlohmann::json events_ = nlohmann::json::array();
};

/// How a queued command is run.
struct QueuedCommand {
    TaskRequest request;
    std::string title;
    bool wait = true;
};

/// Runs a queued command to its first outcome and prints reply and outcome. Returns the program's
/// exit status.
int runQueued(const Options& options, const QueuedCommand& command);

/// Prints an outcome row, or with --json nothing; returns the exit status that it means.
int reportOutcome(const Options& options, const std::string& title, const nlohmann::json& row,
                  const std::string& elapsed);

/// The document of a queued command.
void printTaskDocument(const Task& task);

}  // namespace ctl
