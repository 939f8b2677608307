/// A command as a query on the request table, and its outcome as a row of the outcome table.
#pragma once

#include <chrono>
#include <memory>
#include <nlohmann/json.hpp>
#include <string>

#include "ctl/client/address/host_address.h"
#include "ctl/client/deadline.h"
#include "ctl/client/host_client.h"
#include "ctl/client/http/event_stream.h"
#include "ctl/client/tasks/task_request.h"
#include "ctl/client/tasks/task_result.h"

namespace ctl {

/// One request on its way, from the subscription to its outcomes. Its deadline is the host's
/// time-out from when it is made. Operations throw Failure as HostClient does.
class Task {
public:
    /// Makes a transaction identifier when the request has none.
    Task(const HostAddress& host, TaskRequest request, Ticker tick = {});

    /// Sends a request that is answered at once; the reply is the answer's only row.
    QueryAnswer askNow();

    /// Subscribes to the request's outcomes when asked to, sends it and keeps the reply. Returns
    /// false when the host refused the request.
    bool submit(bool subscribe);

    /// Waits for the next outcome row and adds it to events(). Ended means that the host went away.
    /// Only after submit(true).
    EventStream::Result awaitOutcome();

    /// What the host knows of the task beyond its rows; null when it knows nothing, or cannot say.
    nlohmann::json record() const;

    const nlohmann::json& reply() const { return reply_; }
    const nlohmann::json& events() const { return events_; }
    Deadline deadline() const { return deadline_; }
    /// Time since the task was made.
    std::chrono::milliseconds elapsed() const;

private:
    std::chrono::steady_clock::time_point begin_ = std::chrono::steady_clock::now();
    std::string socket_;
    Deadline deadline_;
    TaskRequest request_;
    Ticker tick_;
    std::unique_ptr<EventStream> stream_;
    nlohmann::json reply_;  ///< null until the host has answered
    nlohmann::json events_ = nlohmann::json::array();
};

/// Runs a queued command on a host that keeps no tasks: its outcome comes as a row, and only while
/// the host stays there. The result's record is null unless the host knows the task all the same.
TaskResult runQueried(const HostAddress& host, const TaskRequest& request, Await await,
                      const TaskWatch& watch = {});

}  // namespace ctl
