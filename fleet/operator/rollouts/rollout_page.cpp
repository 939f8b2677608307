#include "fleet/operator/rollouts/rollout_page.h"

#include <cmath>
#include <nlohmann/json.hpp>
#include <vector>

#include "ctl/show/printable.h"
#include "ctl/show/table.h"
#include "fleet/operator/centre/answers.h"

using ctl::Format;
using ctl::Page;
using nlohmann::json;

namespace fleet {
namespace {

constexpr const char* kFinished = "finished";
constexpr const char* kPaused = "paused";
constexpr const char* kAborted = "aborted";
constexpr const char* kDone = "done";

json membersOf(const json& document, const char* member) {
    const auto found = document.is_object() ? document.find(member) : document.end();
    return found != document.end() && found->is_object() ? *found : json::object();
}

std::uint64_t sumOf(const json& over) {
    std::uint64_t sum = 0;
    for (const auto& item : over.items())
        sum += memberNumber(over, item.key().c_str());
    return sum;
}

std::string counted(std::uint64_t number, const std::string& what) {
    return std::to_string(number) + " " + what;
}

std::string hostsText(std::uint64_t number) {
    return counted(number, number == 1 ? "host" : "hosts");
}

/// "10 done, 2 failed"
std::string endsText(const json& over) {
    std::string text;
    for (const auto& item : over.items()) {
        const std::uint64_t number = memberNumber(over, item.key().c_str());
        if (number > 0) {
            text += (text.empty() ? "" : ", ") + counted(number, ctl::printable(item.key()));
        }
    }
    return text;
}

std::string countsText(const json& counts, std::uint64_t hosts) {
    const json over = membersOf(counts, "over");
    const std::string ends = endsText(over);
    std::string text = std::to_string(sumOf(over)) + " of " + std::to_string(hosts) + " over" +
                       (ends.empty() ? "" : ": " + ends);
    const std::uint64_t released = memberNumber(counts, "released");
    if (released > 0) text += "; " + counted(released, "under way");
    const std::uint64_t waiting = memberNumber(counts, "waiting");
    if (waiting > 0) text += "; " + counted(waiting, "waiting");
    return text;
}

std::string stateText(const json& rollout) {
    std::string text = ctl::printable(memberText(rollout, "state"));
    const std::string reason = memberText(rollout, "reason");
    return reason.empty() ? text : text + ": " + ctl::redacted(reason);
}

std::string line(const std::string& title, const std::string& text) {
    constexpr std::size_t kTitleWidth = 11;
    if (text.empty()) return {};
    return title + std::string(kTitleWidth - title.size(), ' ') + text + "\n";
}

/// A time within a few years; 0 for everything else.
double memberSeconds(const json& object, const char* member) {
    constexpr double kMostSeconds = 1e8;
    const auto found = object.find(member);
    const bool isNumber = found != object.end() && found->is_number();
    const double seconds = isNumber ? found->get<double>() : 0;
    return seconds > 0 && seconds < kMostSeconds ? seconds : 0;
}

std::string planText(const json& plan) {
    std::string text = "waves " + memberText(plan, "waves") + ", at most " +
                       memberText(plan, "maxFailures") + " failures";
    const auto addTime = [&](const char* member, const std::string& before, const char* behind) {
        const std::chrono::seconds time(std::llround(memberSeconds(plan, member)));
        if (time.count() > 0) text += ", " + before + " " + ctl::spanText(time) + behind;
    };
    addTime("pause", "a pause of", " between them");
    addTime("wait", "each at most", "");
    if (const std::uint64_t parallel = memberNumber(plan, "parallel")) {
        text += ", at most " + hostsText(parallel) + " at the same time";
    }
    return ctl::printable(text);
}

std::string wavesText(const json& rollout) {
    std::string text;
    std::size_t number = 0;
    for (const json& wave : memberList(rollout, "waves")) {
        const std::uint64_t hosts = memberNumber(wave, "waiting") + memberNumber(wave, "released") +
                                    sumOf(membersOf(wave, "over"));
        text += line("wave " + std::to_string(++number), countsText(wave, hosts));
    }
    return text;
}

std::string failureLines(const json& failures) {
    std::string text;
    for (const json& part : failures)
        text += "  " + failureText(part) + "\n";
    return text.empty() ? "" : "failures:\n" + text;
}

/// What to do about it, as a line; empty if there is nothing.
std::string wayOut(const json& rollout) {
    const std::string id = ctl::printable(memberText(rollout, "id"));
    if (memberText(rollout, "state") == kPaused) {
        return "zavctl rollout resume " + id + " lets it go on, zavctl rollout abort " + id +
               " ends it.\n";
    }
    if (memberNumber(rollout, "failures") > 0) {
        return "zavctl rollout retry-failed " + id + " tries again where it failed.\n";
    }
    return {};
}

}  // namespace

std::string workText(const json& rollout) {
    const std::string product = memberText(rollout, "product");
    return ctl::printable(memberText(rollout, "kind") + (product.empty() ? "" : " " + product));
}

std::string progressText(const json& rollout) {
    std::string text = countsText(membersOf(rollout, "counts"), memberNumber(rollout, "hosts"));
    if (const std::uint64_t away = memberNumber(rollout, "away")) {
        text +=
            "; waiting for " + hostsText(away) + " that " + (away == 1 ? "is" : "are") + " away";
    }
    if (const std::uint64_t unconfirmed = memberNumber(rollout, "unconfirmed")) {
        text += "; " + counted(unconfirmed, "expired, not confirmed");
    }
    if (const std::uint64_t expired = memberNumber(rollout, "expired")) {
        text += "; " + counted(expired, "to be signed anew");
    }
    return text;
}

std::string failureText(const json& part) {
    const std::string name = memberText(part, "name");
    const std::string reason = memberText(part, "reason");
    return ctl::printable(name.empty() ? memberText(part, "host") : name) + ": " +
           ctl::printable(memberText(part, "state")) +
           (reason.empty() ? "" : ", " + ctl::redacted(reason));
}

bool isOver(const json& rollout) {
    const std::string state = memberText(rollout, "state");
    return state == kFinished || state == kPaused || state == kAborted;
}

bool isAllDone(const json& rollout) {
    const json done = membersOf(membersOf(rollout, "counts"), "over");
    const std::uint64_t hosts = memberNumber(rollout, "hosts");
    return memberText(rollout, "state") == kFinished && hosts > 0 &&
           memberNumber(done, kDone) == hosts;
}

Page showEnd(const json& rollout, const json& failures, Format format) {
    const ctl::ExitStatus status = isAllDone(rollout) ? ctl::kSuccess : ctl::kHostReportedFailure;
    if (format == Format::Json) {
        return ctl::jsonPage({{"rollout", rollout}, {"failures", failures}}, status);
    }
    Page page;
    page.status = status;
    page.out = "The roll-out is " + stateText(rollout) + ".\n" + progressText(rollout) + "\n" +
               wayOut(rollout);
    return page;
}

Page showRollout(const json& rollout, const json& failures, ctl::WallTime now, Format format) {
    if (format == Format::Json) {
        return ctl::jsonPage({{"rollout", rollout}, {"failures", failures}});
    }
    const json plan = membersOf(rollout, "plan");
    Page page;
    page.out = line("roll-out", ctl::printable(memberText(rollout, "id"))) +
               line("does", workText(rollout)) +
               line("on", ctl::printable(memberText(rollout, "selector"))) +
               line("made by", ctl::printable(memberText(rollout, "operator"))) +
               line("made at", ctl::timeText(memberText(rollout, "created"), now)) +
               line("plan", planText(plan)) + line("state", stateText(rollout)) +
               line("since", ctl::timeText(memberText(rollout, "since"), now)) +
               line("hosts", progressText(rollout)) + wavesText(rollout) + failureLines(failures);
    return page;
}

Page showRollouts(const json& answer, ctl::WallTime now, Format format) {
    if (format == Format::Json) return ctl::jsonPage(answer);
    json rows = json::array();
    for (const json& rollout : memberList(answer, "rollouts")) {
        const json over = membersOf(membersOf(rollout, "counts"), "over");
        rows.push_back({{"id", memberText(rollout, "id")},
                        {"work", workText(rollout)},
                        {"state", memberText(rollout, "state")},
                        {"done", std::to_string(memberNumber(over, kDone)) + "/" +
                                     std::to_string(memberNumber(rollout, "hosts"))},
                        {"by", memberText(rollout, "operator")},
                        {"created", ctl::timeText(memberText(rollout, "created"), now)}});
    }
    if (rows.empty()) return {"There are no roll-outs.\n", {}};
    return {ctl::tableText(rows, {{"id", "ROLL-OUT"},
                                  {"work", "WORK"},
                                  {"state", "STATE"},
                                  {"done", "DONE"},
                                  {"by", "BY"},
                                  {"created", "MADE"}}),
            {}};
}

}  // namespace fleet
