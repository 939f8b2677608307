#include "fleet/operator/verbs/looks/fleet_task_output.h"

#include <chrono>
#include <cstdio>
#include <thread>

#include "ctl/client/failure.h"
#include "ctl/client/http/percent_encoding.h"
#include "ctl/client/interruption.h"
#include "ctl/show/printable.h"
#include "ctl/show/tasks/output_page.h"
#include "ctl/verbs/invocation.h"
#include "fleet/bus/messages/order.h"
#include "fleet/operator/centre/answers.h"
#include "fleet/operator/verbs/fleet_arguments.h"
#include "fleet/operator/verbs/fleet_verbs.h"
#include "fleet/operator/verbs/operator_side.h"

using nlohmann::json;

namespace fleet {
namespace {

constexpr ctl::Argument kOutputTask =
    ctl::positional("ID",
                    "The order's identifier; with --on also the host's own identifier of\n"
                    "the task, or the one that it was given there")
        .required();
constexpr ctl::Argument kFollowOutput = ctl::flag("-f", "Go on until the task is over");
constexpr ctl::Argument kFleetOutputArguments[] = {kOutputTask, kFollowOutput};

/// The link tries the question's selector on the host's own labels; who names the host means it
/// whatever these are.
constexpr const char* kAnyLabels = "*";

/// A centre that says nothing is found to be away in about the time that a host is.
constexpr std::chrono::seconds kCentresTime{5};

json hostAt(Centre& centre, const std::string& nameOrKey) {
    return centre.get("/v1/hosts/" + ctl::percentEncoded(nameOrKey));
}

/// The host of that name or key; null if there is none.
json hostCalled(Centre& centre, const std::string& name) {
    constexpr const char* kOnlyInSelectors = "*=!,() @";
    if (name.find_first_of(kOnlyInSelectors) != std::string::npos) return nullptr;
    try {
        return hostAt(centre, name);
    } catch (const ctl::Failure& failure) {
        if (failure.status() != ctl::kWrongUsage) throw;
        return nullptr;
    }
}

WantedOutput wantedOn(Centre& centre, const std::string& on, const std::string& task) {
    const json named = hostCalled(centre, on);
    if (!named.is_null()) return {hostOf(named), kAnyLabels, task};
    const Choice choice = chooseHosts(centre, on);
    if (choice.hosts.size() == 1) return {choice.hosts.front(), choice.selector, task};
    throw ctl::Failure(
        ctl::kWrongUsage,
        "a task is one host's, and --on means " + std::to_string(choice.hosts.size()) + " of them",
        "--on NAME names one.");
}

OutputListener listenerFor(const std::function<void(const OutputText&)>& show) {
    OutputListener listener;
    listener.take = [show](const OutputText& text) {
        show(text);
        return std::ferror(stdout) == 0;
    };
    listener.lost = [](Number bytes) {
        ctl::print({{}, ctl::complaint("note: " + std::to_string(bytes) + " bytes came too fast")});
    };
    listener.gap = [] {
        ctl::print({{}, ctl::complaint("note: a part of the output was lost on its way")});
    };
    return listener;
}

ctl::ExitStatus runFleetTaskOutput(const ctl::Invocation& invocation) {
    const ctl::InterruptNote ending({});
    const ctl::Values& given = invocation.given;
    OperatorSide side(invocation);
    side.centre.answersWithin(kCentresTime);
    WantedOutput wanted = hostOfTask(side.centre, given.text(kOn), given.text(kOutputTask));
    wanted.isFollowed = given.flag(kFollowOutput);
    const OutputPace pace{side.deadline, [] { return OutputPace::Clock::now(); },
                          [](auto time) { std::this_thread::sleep_for(time); }};
    if (invocation.format == ctl::Format::Text) {
        ctl::OutputPages pages(ctl::Format::Text);
        followOutput(side.centre, side.identity, wanted, pace,
                     listenerFor([&pages](const OutputText& text) {
                         ctl::print(pages.next(text.isError ? "stderr" : "stdout", text.text));
                     }));
        return ctl::kSuccess;
    }
    OutputDocument document;
    followOutput(side.centre, side.identity, wanted, pace,
                 listenerFor([&document](const OutputText& text) { document.add(text); }));
    return ctl::print(document.page());
}

}  // namespace

constexpr ctl::Verb kFleetTaskOutputVerb = {
    "task output",
    "Print what the commands of a task write on a host",
    kFleetOutputArguments,
    {"zavctl --fleet https://centre.example task output -f 0123456789abcdef0123456789abcdef",
     "zavctl --fleet https://centre.example task output deploy-7 --on web-1"},
    runFleetTaskOutput,
};

WantedOutput hostOfTask(Centre& centre, const std::string& on, const std::string& task) {
    if (!on.empty()) return wantedOn(centre, on, task);
    if (!isOrderId(task)) {
        throw ctl::Failure(ctl::kWrongUsage,
                           "\"" + ctl::printable(task) + "\" is no order's identifier",
                           "With --on HOST it may be a task of that host.");
    }
    const std::string host = memberText(centre.get("/v1/orders/" + task), "host");
    return taskOnHost(centre, host, task);
}

WantedOutput taskOnHost(Centre& centre, const std::string& nameOrKey, const std::string& task) {
    return {hostOf(hostAt(centre, nameOrKey)), kAnyLabels, task};
}

void OutputDocument::add(const OutputText& text) {
    // An empty text takes room, too.
    constexpr std::size_t kAroundText = 64;
    bytes_ += text.text.size() + kAroundText;
    if (bytes_ > kMostBytes) {
        throw ctl::Failure(ctl::kHostReportedFailure,
                           "there is more output than one document may have",
                           "Without --json there is no limit.");
    }
    pieces_.push_back({{"stream", text.isError ? "stderr" : "stdout"}, {"text", text.text}});
}

ctl::Page OutputDocument::page() const {
    return ctl::jsonPage({{"output", pieces_}}, ctl::kSuccess);
}

}  // namespace fleet
