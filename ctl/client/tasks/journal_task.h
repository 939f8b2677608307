/// A task in the host's journal, followed to its end whatever becomes of the connection.
#pragma once

#include <chrono>
#include <nlohmann/json.hpp>
#include <optional>
#include <string>

#include "ctl/client/address/host_address.h"
#include "ctl/client/deadline.h"
#include "ctl/client/host_client.h"
#include "ctl/client/http/event_parser.h"
#include "ctl/client/tasks/task_request.h"
#include "ctl/client/tasks/task_result.h"

namespace ctl {

/// Its deadline is the host's time-out from when the object is made. While the host is not there,
/// or does not serve for now, the object asks again until the deadline. Operations throw Failure
/// for what no waiting mends.
class JournalTask {
public:
    enum class Wait {
        Reached,
        TimedOut,
        Forgotten,  ///< the host is there, but without this task
    };

    /// `watch` outlives the object. It calls `tick` and `onNote` while it waits.
    JournalTask(const HostAddress& host, const TaskWatch& watch);

    /// Has the host accept a request. Returns false when the host accepts no tasks: nothing was
    /// done then. A host that has no room for now is asked again if `isPatient`. When the answer is
    /// lost the host is asked again, unless it could take that for another request.
    bool submit(const TaskRequest& request, bool isPatient);

    /// Takes a task that the host has already, by its identifier or TRANSID.
    void find(const std::string& name);

    /// Waits until the task is over.
    Wait awaitEnd();
    /// The same for a second at most: Reached says no more than that the task is there.
    Wait glance();
    /// Waits until the first outcome is there, or the task is over without one.
    Wait awaitFirstOutcome();
    /// Waits until the plug-in has seen the task. Returns at once when others are before it.
    void awaitReply();

    /// Passes on what the commands write until the task is over. Returns false when the host went
    /// away before that: when it is back it may be asked for the rest.
    bool streamOutput();

    bool isOver() const;
    bool hasReply() const;
    /// What the host said last; an object.
    const nlohmann::json& record() const { return record_; }
    std::chrono::milliseconds left() const;
    std::chrono::milliseconds elapsed() const;

private:
    enum class Look { Seen, NotThere, TooLate, Forgotten };

    /// How far a request has come.
    struct Sending {
        bool isReached = false;  ///< the host has answered once
        bool isLost = false;     ///< an answer was lost: the host may have the task
    };

    std::optional<Answer> send(const TaskRequest& request, Sending& sending);
    void acceptedAs(const Answer& answer);
    Look look(std::chrono::seconds wait);
    bool isFirstInLine();
    void pause(std::chrono::milliseconds time);
    void note(const std::string& text);
    void noteAway();
    std::string path() const;
    std::string outputTarget() const;
    void passOn(const ServerEvent& event);

    std::chrono::steady_clock::time_point begin_ = std::chrono::steady_clock::now();
    HostClient client_;
    std::string socket_;
    Deadline deadline_;
    const TaskWatch& watch_;
    nlohmann::json record_ = nlohmann::json::object();
    std::string outputPosition_;  ///< behind what has been passed on; empty: the host names none
    bool isAway_ = false;
};

}  // namespace ctl
