#include "fleet/link/program/host_answers.h"

#include <nlohmann/json.hpp>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/order.h"
#include "text/utc_time.h"

using nlohmann::json;

namespace fleet {
namespace {

enum HttpStatus : unsigned {
    kOk = 200,
    kAccepted = 202,
    kBadRequest = 400,
    kNotFound = 404,
    kConflict = 409,
    kOtherJournal = 412,
    kTooLarge = 413,
    kNotImplemented = 501,
};

/// To the second.
std::string secondOf(Moment moment) {
    constexpr std::size_t kUpToSeconds = 19;
    return text::utcTime(moment).substr(0, kUpToSeconds) + "Z";
}

/// An order that was refused before it could be read has no request.
json requestOf(const Directive& directive) {
    return directive.request.empty() ? json::object() : readDocument(directive.request);
}

std::string taskOf(json body, const Directive& directive, const std::string& journal) {
    body["transid"] = directive.order;
    body["once"] = true;
    body["journal"] = journal;
    return textOf(body);
}

std::string endOf(json body, const EnterEnd& action) {
    constexpr std::size_t kLongestReason = 4096;
    body[action.state] = action.reason.substr(0, kLongestReason);
    return taskOf(std::move(body), action.directive, action.journal);
}

bool isOverState(const std::string& state) {
    return state != "queued" && state != "running";
}

/// A member of a document that is a text; "" for everything else. The host is believed, but what
/// answers on its socket may be something else.
std::string wordIn(const std::string& document, const char* member) {
    try {
        return textIn(readDocument(document), member);
    } catch (const MessageError&) {
        return "";
    }
}

std::string wordsOf(const HostAnswer& answer) {
    const std::string words = wordIn(answer.body, "error");
    return words.empty() ? "the host answers with status " + std::to_string(answer.status) : words;
}

}  // namespace

std::string bodyOf(const HandOver& action) {
    json body = requestOf(action.directive);
    body["expires"] = secondOf(action.directive.expires);
    return taskOf(std::move(body), action.directive, action.journal);
}

std::string bodyOf(const EnterEnd& action) {
    const json request = requestOf(action.directive);
    json known = json::object();
    for (const char* const member : {"command", "product"}) {
        if (request.contains(member)) known[member] = request[member];
    }
    return endOf(std::move(known), action);
}

std::string bareBodyOf(const EnterEnd& action) {
    return endOf(json::object(), action);
}

std::optional<HandOverAnswer> recordedBy(const HostAnswer& answer) {
    switch (answer.status) {
        case kOk:
        case kAccepted:
            return Recorded{isOverState(wordIn(answer.body, "state"))};
        case kConflict:
            // A guard's refusal is in the journal. Without a guard, another request has this name.
            if (!wordIn(answer.body, "guard").empty()) return Recorded{true};
            return std::nullopt;
        case kBadRequest:
        case kTooLarge:
        case kNotImplemented:
            return Unacceptable{wordsOf(answer)};
        case kOtherJournal:
            return OtherJournal{};
        default:
            return NotNow{wordsOf(answer)};
    }
}

HandOverAnswer recordOf(const HostAnswer& task, const HostAnswer& refusal) {
    if (task.status == kOk) return Recorded{isOverState(wordIn(task.body, "state"))};
    if (task.status == kNotFound) return Unacceptable{wordsOf(refusal)};
    return NotNow{wordsOf(task)};
}

std::optional<CancelAnswer> cancelledBy(const HostAnswer& answer) {
    switch (answer.status) {
        case kOk:
            return WasCancelled{};
        case kAccepted:
            return NotNow{"the host is ending the task"};
        case kConflict:
            return std::nullopt;
        case kBadRequest:
        case kNotFound:
            return NotCancelled{wordsOf(answer)};
        default:
            return NotNow{wordsOf(answer)};
    }
}

CancelAnswer cancelledOf(const HostAnswer& task, const HostAnswer& refusal) {
    if (task.status != kOk) return NotNow{wordsOf(task)};
    const std::string state = wordIn(task.body, "state");
    if (state == "cancelled") return WasCancelled{};
    if (isOverState(state)) return NotCancelled{wordsOf(refusal)};
    return NotNow{wordsOf(refusal)};
}

LookUpAnswer lookUpOf(const HostAnswer& task, const std::string& order,
                      const std::string& journal) {
    if (task.status == kNotFound) return Absent{};
    if (task.status != kOk) return NotNow{wordsOf(task)};
    std::optional<Outcome> outcome = outcomeOf(task.body, journal);
    if (outcome && outcome->order == order) return std::move(*outcome);
    if (wordIn(task.body, "transid") == order) return StillOpen{};
    return NotNow{"the host's answer makes no sense"};
}

std::optional<Outcome> outcomeOf(const std::string& task, const std::string& journal) {
    Outcome outcome;
    outcome.order = wordIn(task, "transid");
    outcome.state = wordIn(task, "state");
    if (!isOrderId(outcome.order) || outcome.state.empty() || !isOverState(outcome.state)) {
        return std::nullopt;
    }
    outcome.journal = journal;
    outcome.task = task;
    return outcome;
}

}  // namespace fleet
