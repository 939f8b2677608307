/// Sending a command to the host and seeing how it ended.
#pragma once

#include <chrono>
#include <functional>
#include <memory>
#include <nlohmann/json.hpp>
#include <string>

#include "ctl/client/deadline.h"
#include "ctl/client/host_address.h"
#include "ctl/client/host_client.h"
#include "ctl/client/http/event_stream.h"
#include "ctl/client/task_request.h"

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

/// What became of a queued command.
struct TaskResult {
    enum class End {
        Refused,   ///< the reply says why
        Accepted,  ///< nobody waited for more
        Outcome,   ///< the last of the events says how the task ended
        HostGone,  ///< after the reply
        TimedOut,  ///< after the reply
    };
    End end = End::Accepted;
    nlohmann::json reply;
    nlohmann::json events = nlohmann::json::array();
    std::chrono::milliseconds elapsed{0};
    /// Task::record(), with the commands that ran, after an outcome; null if there is none.
    nlohmann::json record = nullptr;
    /// What a look afterwards found that belies a success; empty if nothing.
    std::string doubt = {};
    /// Why there was no such look although one was wanted; empty if there was.
    std::string note = {};
};

/// Who wants to know how a command proceeds. Both functions may be empty.
struct TaskWatch {
    Ticker tick;
    std::function<void(const nlohmann::json& reply)> onReply;
};

/// Runs a queued command: to its reply, or to its first outcome when `wait` is set.
TaskResult runTask(const HostAddress& host, const TaskRequest& request, bool wait,
                   const TaskWatch& watch = {});

}  // namespace ctl
