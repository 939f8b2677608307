#include "fleet/operator/console/runs/verb_runs.h"

#include <exception>
#include <memory>
#include <nlohmann/json.hpp>
#include <optional>
#include <utility>

#include "ctl/client/http/bounded_json.h"
#include "fleet/bus/messages/document.h"
#include "fleet/operator/centre/answers.h"
#include "fleet/operator/console/runs/child_program.h"
#include "http/responder.h"

using nlohmann::json;

namespace fleet {
namespace {

/// Longer than a run takes, so that its own end comes first.
constexpr std::chrono::seconds kMargin{10};

json outputOf(const ChildEnd& end, const RunRequest& request) {
    json output = ctl::parseBounded(end.out).document;
    const std::string id = memberText(output, "id");
    if (request.beginsRollout && !id.empty()) output["rollout"] = id;
    return output;
}

std::chrono::seconds timeFor(const RunRequest& request, const RunLimits& limits) {
    return request.file ? limits.pushTime : limits.time;
}

http::Reply replyFor(const ChildEnd& end, const RunRequest& request, std::chrono::seconds time) {
    const std::string begun = request.command + " ";
    switch (end.kind) {
        case ChildEnd::Kind::TooLate:
            return http::errorReply(504, begun + "was not over after " +
                                             std::to_string(time.count()) +
                                             " seconds and was ended");
        case ChildEnd::Kind::TooMuch:
            return http::errorReply(502, begun + "has more to say than the console takes");
        case ChildEnd::Kind::Stopped:
            return http::errorReply(503, begun + "was ended with the console");
        case ChildEnd::Kind::Ended:
            break;
    }
    return http::jsonReply(200, textOf({{"exit", end.status},
                                        {"command", request.command},
                                        {"output", outputOf(end, request)},
                                        {"messages", end.err}}));
}

}  // namespace

/// One run, and who waits for its answer. Any thread.
class VerbRuns::Run {
public:
    /// Throws std::system_error if the program cannot be started.
    Run(const std::string& program, RunRequest request, const RunLimits& limits)
        : request_(std::move(request)),
          time_(timeFor(request_, limits)),
          mostBytes_(limits.bytes),
          child_({program, request_.words, request_.input, request_.hosts,
                  request_.file ? &request_.file->descriptor() : nullptr}) {}

    /// Until the program is over, on the run's thread.
    void follow() {
        try {
            const ChildEnd end = child_.wait(time_, mostBytes_);
            request_.file.reset();  // it takes room on the disk
            answer(replyFor(end, request_, time_));
        } catch (const std::exception& error) {
            child_.stop();
            answer(http::errorReply(500, error.what()));
        }
    }

    void stop() { child_.stop(); }

    void answerTo(const http::Responder& responder) {
        const std::lock_guard lock(mutex_);
        if (reply_)
            responder(std::move(*reply_));
        else
            responder_ = responder;
    }

private:
    void answer(http::Reply reply) {
        const std::lock_guard lock(mutex_);
        if (responder_)
            (*responder_)(std::move(reply));
        else
            reply_ = std::move(reply);
    }

    RunRequest request_;
    const std::chrono::seconds time_;
    const std::size_t mostBytes_;
    ChildProgram child_;
    std::mutex mutex_;
    std::optional<http::Responder> responder_;
    std::optional<http::Reply> reply_;
};

VerbRuns::VerbRuns(std::string program, const RunLimits& limits)
    : program_(std::move(program)), limits_(limits) {}

VerbRuns::~VerbRuns() = default;

http::Answer VerbRuns::begin(RunRequest request) {
    const std::lock_guard lock(mutex_);
    runs_.removeEnded();
    if (runs_.size() >= limits_.runs) {
        return http::errorReply(429, "as many commands as can be are under way already");
    }
    const std::chrono::seconds time = timeFor(request, limits_);
    const auto run = std::make_shared<Run>(program_, std::move(request), limits_);
    runs_.start(run, [](Run& started) { started.follow(); });
    const auto stop = stopperOf(run);
    const auto end = [stop]() -> http::Answer {
        stop();
        return http::errorReply(503, "the console ends, and the command with it");
    };
    return http::Later{[run](const http::Responder& responder) { run->answerTo(responder); },
                       time + kMargin, end, stop};
}

void VerbRuns::stopAll() {
    const std::lock_guard lock(mutex_);
    runs_.stopAll();
}

bool VerbRuns::empty() const {
    const std::lock_guard lock(mutex_);
    return runs_.haveAllEnded();
}

}  // namespace fleet
