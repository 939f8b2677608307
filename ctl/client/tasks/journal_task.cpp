#include "ctl/client/tasks/journal_task.h"

#include <algorithm>
#include <optional>
#include <thread>
#include <utility>

#include "ctl/client/failure.h"
#include "ctl/client/http/bounded_json.h"
#include "ctl/client/http/event_stream.h"
#include "ctl/client/http/percent_encoding.h"
#include "ctl/client/row.h"

using nlohmann::json;

namespace ctl {
namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;

constexpr const char* kTasks = "/v1/tasks";
/// Between two attempts to reach a host that is not there. An attempt costs next to nothing.
constexpr milliseconds kRetryPause{200};
/// For one request. The host answers earlier when the task is over.
constexpr seconds kLongestLook{600};
/// How long the plug-in's reply to a task that nothing stands before may take.
constexpr seconds kLongestReply{1};

bool isServedLater(unsigned status) {
    constexpr unsigned kTooMany = 429;
    constexpr unsigned kServerError = 500;
    constexpr unsigned kNotImplemented = 501;
    return status == kTooMany || (status >= kServerError && status != kNotImplemented);
}

/// Of a host that knows no such path, or no such method of it.
bool isUnknownToHost(unsigned status) {
    return status == 404 || status == 405;
}

std::string lostText(const json& event) {
    return textOf(event, "lost") + " bytes of the output were lost: they came too fast";
}

Failure answerLost(const TaskRequest& request) {
    return {kNoHost,
            "the connection to the host broke before its answer came, so it is not known whether "
            "it accepted the request",
            "zavctl tasks lists what it accepted. With --once " + request.transid +
                " in place of --transid a repetition is harmless."};
}

}  // namespace

JournalTask::JournalTask(const HostAddress& host, const TaskWatch& watch)
    : client_(host.socket),
      socket_(host.socket),
      deadline_(deadlineIn(host.timeout)),
      watch_(watch) {}

milliseconds JournalTask::left() const {
    const auto left = deadline_ - std::chrono::steady_clock::now();
    return std::max(std::chrono::duration_cast<milliseconds>(left), milliseconds(0));
}

milliseconds JournalTask::elapsed() const {
    return std::chrono::duration_cast<milliseconds>(std::chrono::steady_clock::now() - begin_);
}

bool JournalTask::isOver() const {
    const std::string state = textOf(record_, "state");
    return !state.empty() && state != "queued" && state != "running";
}

bool JournalTask::hasReply() const {
    const auto reply = record_.find("reply");
    return reply != record_.end() && reply->is_object();
}

std::string JournalTask::path() const {
    return std::string(kTasks) + "/" + percentEncoded(textOf(record_, "id"));
}

void JournalTask::note(const std::string& text) {
    if (watch_.onNote) watch_.onNote(text);
}

void JournalTask::noteAway() {
    if (!isAway_) note("the host went away; waiting for it to come back");
    isAway_ = true;
}

void JournalTask::pause(milliseconds time) {
    const auto end = std::min(deadline_, std::chrono::steady_clock::now() + time);
    for (;;) {
        const auto rest = end - std::chrono::steady_clock::now();
        if (rest <= rest.zero()) return;
        std::this_thread::sleep_for(std::min<std::chrono::nanoseconds>(rest, seconds(1)));
        if (watch_.tick) watch_.tick();
    }
}

// ---- Being accepted -----------------------------------------------------------------------------

void JournalTask::acceptedAs(const Answer& answer) {
    record_ = answer.document();
    if (record_.is_object() && !textOf(record_, "id").empty()) return;
    throw Failure(kNoHost, "the host's answer is no task");
}

/// The host's answer. Nothing when there was none and the host may be asked again.
std::optional<Answer> JournalTask::send(const TaskRequest& request, Sending& sending) {
    try {
        Answer answer = client_.post(kTasks, request.document(), deadline_, watch_.tick);
        sending.isReached = true;
        return answer;
    } catch (const BrokenConnection&) {
        if (!request.isUnique && !request.isOnce) throw answerLost(request);
        if (left() <= kRetryPause) throw;
        sending.isLost = true;
    } catch (const Failure& failure) {
        // A host that was never there is not waited for.
        const bool wasThere = sending.isReached || sending.isLost;
        if (!wasThere || failure.status() != kNoHost || left() <= kRetryPause) throw;
    }
    noteAway();
    pause(kRetryPause);
    return std::nullopt;
}

bool JournalTask::submit(const TaskRequest& request, bool isPatient) {
    Sending sending;
    bool isToldToWait = false;
    for (;;) {
        const std::optional<Answer> answer = send(request, sending);
        if (!answer) continue;
        if (isUnknownToHost(answer->status) && !sending.isLost) return false;
        const bool isLater = isPatient && answer->retryAfter && isServedLater(answer->status);
        if (!isLater || left() <= *answer->retryAfter) {
            acceptedAs(*answer);
            isAway_ = false;
            return true;
        }
        if (!isToldToWait) note("the host has no room for the request now; asking again");
        isToldToWait = true;
        pause(std::max<milliseconds>(*answer->retryAfter, kRetryPause));
    }
}

void JournalTask::find(const std::string& name) {
    const std::string target = std::string(kTasks) + "/" + percentEncoded(name);
    acceptedAs(client_.ask(target, deadline_, watch_.tick));
}

// ---- Waiting ------------------------------------------------------------------------------------

/// Asks the host once. It answers when the task is over, or after `wait`.
JournalTask::Look JournalTask::look(seconds wait) {
    const std::string target =
        path() + (wait.count() > 0 ? "?wait=" + std::to_string(wait.count()) : std::string());
    Answer answer;
    try {
        answer = client_.ask(target, deadline_, watch_.tick);
    } catch (const Failure& failure) {
        if (failure.status() == kNoOutcome) return Look::TooLate;
        if (failure.status() != kNoHost) throw;
        noteAway();
        pause(kRetryPause);
        return Look::NotThere;
    }
    if (answer.status == 404) return Look::Forgotten;
    if (isServedLater(answer.status)) {
        pause(kRetryPause);
        return Look::NotThere;
    }
    acceptedAs(answer);
    isAway_ = false;
    return Look::Seen;
}

JournalTask::Wait JournalTask::awaitEnd() {
    while (!isOver()) {
        if (left() == milliseconds(0)) return Wait::TimedOut;
        // The host counts in whole seconds.
        const Look result = look(std::min(std::chrono::ceil<seconds>(left()), kLongestLook));
        if (result == Look::TooLate) return Wait::TimedOut;
        if (result == Look::Forgotten) return Wait::Forgotten;
    }
    return Wait::Reached;
}

JournalTask::Wait JournalTask::glance() {
    if (isOver()) return Wait::Reached;
    switch (look(seconds(1))) {
        case Look::TooLate:
            return Wait::TimedOut;
        case Look::Forgotten:
            return Wait::Forgotten;
        case Look::Seen:
        case Look::NotThere:
            break;
    }
    return Wait::Reached;
}

JournalTask::Wait JournalTask::awaitFirstOutcome() {
    const auto hasOutcome = [this] {
        const auto events = record_.find("events");
        return events != record_.end() && events->is_array() && !events->empty();
    };
    while (!hasOutcome() && !isOver()) {
        // The host tells of the end by itself, and of the first outcome when it is asked.
        const Look result = look(seconds(1));
        if (result == Look::Forgotten) return Wait::Forgotten;
        if (result == Look::TooLate || left() == milliseconds(0)) return Wait::TimedOut;
    }
    return Wait::Reached;
}

/// Whether no other task is in hand, so that this one is handed over next, or soon.
bool JournalTask::isFirstInLine() {
    const std::string target = std::string(kTasks) + "?state=running&limit=1";
    const json answer = client_.getIfThere(target, deadline_);
    const auto tasks = answer.find("tasks");
    if (tasks == answer.end() || !tasks->is_array() || tasks->empty()) return true;
    return textOf(tasks->front(), "id") == textOf(record_, "id");
}

void JournalTask::awaitReply() {
    constexpr milliseconds kLongestPause{50};
    const auto until = std::min(deadline_, std::chrono::steady_clock::now() + kLongestReply);
    milliseconds time{1};
    try {
        while (!hasReply() && !isOver() && std::chrono::steady_clock::now() < until) {
            if (look(seconds(0)) != Look::Seen || hasReply() || isOver()) return;
            if (!isFirstInLine()) return;
            pause(time);
            time = std::min(time * 2, kLongestPause);
        }
    } catch (const Failure&) {
        // The host has the task, whatever the plug-in says of it later.
    }
}

// ---- Output -------------------------------------------------------------------------------------

/// Where the rest of the output is, or all of it if none has come.
std::string JournalTask::outputTarget() const {
    const std::string target = path() + "/output?follow=1";
    return outputPosition_.empty() ? target : target + "&after=" + percentEncoded(outputPosition_);
}

void JournalTask::passOn(const ServerEvent& event) {
    const json piece = objectIn(event.data);
    if (event.type == "overflow") note(lostText(piece));
    const std::string text = textOf(piece, "text");
    if (!text.empty()) watch_.onOutput(textOf(piece, "stream"), text);
}

bool JournalTask::streamOutput() {
    // A host that names no positions would begin anew.
    bool isToBeContinued = true;
    try {
        EventStream stream(socket_, outputTarget(), deadline_);
        ServerEvent event;
        for (;;) {
            const auto result = stream.next(deadline_, event, watch_.tick);
            if (result == EventStream::Result::TimedOut) return true;
            if (result == EventStream::Result::Ended) break;
            if (event.type == "end") return true;
            passOn(event);
            outputPosition_ = stream.position();
            isToBeContinued = !outputPosition_.empty();
        }
    } catch (const Failure& failure) {
        // How the task ends is known without its output.
        if (failure.status() != kNoHost) return true;
    }
    if (!isToBeContinued) return true;
    noteAway();
    // A host that ends each stream at once is not asked all the time.
    pause(kRetryPause);
    return false;
}

}  // namespace ctl
