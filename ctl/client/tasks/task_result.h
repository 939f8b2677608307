/// What became of a command that the host queues, and who wants to know on the way.
#pragma once

#include <chrono>
#include <functional>
#include <nlohmann/json.hpp>
#include <string>

#include "ctl/client/deadline.h"

namespace ctl {

/// How much of a command is waited for.
enum class Await {
    Reply,         ///< the host has accepted it
    FirstOutcome,  ///< an install that restarts the host has begun by then
    End,
};

/// What became of a queued command.
struct TaskResult {
    enum class End {
        Refused,   ///< the reply says why
        Accepted,  ///< nobody waited for more
        Outcome,   ///< the last of the events says how the task ended
        Over,      ///< no row says how the task ended; the record's state does
        HostGone,  ///< after the reply, and the task with it
        TimedOut,  ///< after the reply
    };
    End end = End::Accepted;
    nlohmann::json reply;  ///< null when the plug-in has not given one, or not yet
    nlohmann::json events = nlohmann::json::array();
    std::chrono::milliseconds elapsed{0};
    /// What the host keeps of the task, with the commands that ran; null if there is none.
    nlohmann::json record = nullptr;
    /// What a look afterwards found that belies a success; empty if nothing.
    std::string doubt = {};
    /// Why there was no such look although one was wanted; empty if there was.
    std::string note = {};
    /// The row with the own result of an install that restarted the host and was awaited to its
    /// end; null if there is none.
    nlohmann::json completion = nullptr;
};

/// Who wants to know how a command proceeds. All functions may be empty.
struct TaskWatch {
    Ticker tick;
    /// The command was accepted, and the plug-in has not replied yet if the reply is null; or it
    /// was refused.
    std::function<void(const nlohmann::json& reply)> onReply = {};
    /// The host has the task under this identifier.
    std::function<void(const std::string& id)> onAccepted = {};
    /// An install that restarts the host has begun.
    std::function<void()> onBegun = {};
    /// A sentence about what holds things up.
    std::function<void(const std::string& text)> onNote = {};
    /// What the task's commands write, as it comes; `stream` is "stdout" or "stderr". If this is
    /// empty, the host is not asked for it.
    std::function<void(const std::string& stream, const std::string& text)> onOutput = {};
};

}  // namespace ctl
