#include "fleet/link/questions/question_side.h"

#include <algorithm>
#include <chrono>
#include <exception>
#include <nlohmann/json.hpp>
#include <utility>

#include "ctl/client/deadline.h"
#include "ctl/client/host_client.h"
#include "ctl/client/http/percent_encoding.h"
#include "ctl/client/tasks/task_request.h"
#include "fleet/bus/messages/document.h"
#include "fleet/link/questions/allowed_tasks.h"

using nlohmann::json;

namespace fleet {
namespace {

using Steady = std::chrono::steady_clock;

constexpr Number kMostTasksAsked = 1000;

/// The link ends.
struct QuestionsEnd {};

std::string optionalText(const json& body, const char* member) {
    return body.contains(member) ? textIn(body, member) : std::string();
}

struct Asking {
    const ctl::HostClient& client;
    ctl::Deadline deadline;
    const ctl::Ticker& tick;
};

json tasksOf(const Asking& asking, const AskedQuestion& question, const json& body) {
    const Number limit =
        body.contains("limit") ? std::min(numberIn(body, "limit"), kMostTasksAsked) : 20;
    std::string filters;
    for (const char* const filter : {"state", "product"}) {
        const std::string value = optionalText(body, filter);
        if (value.empty()) continue;
        filters += "&" + std::string(filter) + "=" + ctl::percentEncoded(value);
    }
    const auto ask = [&](Number most, const std::string& after) {
        std::string target = "/v1/tasks?limit=" + std::to_string(most) + filters;
        if (!after.empty()) target += "&after=" + ctl::percentEncoded(after);
        return asking.client.ask(target, asking.deadline, asking.tick).document();
    };
    return allowedTasks(ask, std::max<Number>(limit, 1), question.grant);
}

json configurationOf(const Asking& asking, const AskedQuestion& question, const json& body) {
    ctl::TaskRequest request;
    request.command = kAsksConfiguration;
    request.product = textIn(body, "product");
    request.targetmsn = optionalText(body, "target");
    // Not the bare identifier: a task of that name would be told as the outcome of an order.
    request.transid = "ask-" + question.id;
    const ctl::QueryAnswer answer =
        asking.client.query(request.query(), asking.deadline, asking.tick);
    return {{"rows", answer.rows}, {"full", answer.full}, {"warnings", answer.warnings}};
}

json checksOf(const Asking& asking, const AskedQuestion&, const json&) {
    return asking.client.ask("/v1/doctor", asking.deadline, asking.tick).document();
}

/// What can be asked. A new kind is a function and a row.
struct Kind {
    const char* name;
    json (*answer)(const Asking&, const AskedQuestion&, const json& body);
};
constexpr Kind kKinds[] = {
    {kAsksTasks, tasksOf}, {kAsksConfiguration, configurationOf}, {kAsksDoctor, checksOf}};

}  // namespace

QuestionSide::~QuestionSide() {
    isEnding_ = true;
    worker_.await();
}

void QuestionSide::answer(const AskedQuestion& question, Moment now,
                          std::function<void(const std::string&)> take) {
    if (!question.refusal.empty()) return take(textOf({{"error", question.refusal}}));
    if (waiting_ >= kMostWaiting) {
        return take(R"({"error":"the host is asked too much at once"})");
    }
    ++waiting_;
    const auto until = Steady::now() + (question.expires - now);
    worker_.add([this, question, until, take = std::move(take)] {
        --waiting_;
        const auto left = std::chrono::duration_cast<Moment>(until - Steady::now());
        if (left <= Moment{}) return;
        try {
            take(answerNow(question, left));
        } catch (const QuestionsEnd&) {
        } catch (const std::exception&) {
            // It cannot be told; who asked learns it from the silence.
        }
    });
}

std::string QuestionSide::answerNow(const AskedQuestion& question, Moment within) const {
    const ctl::HostClient client(socket_);
    const ctl::Ticker tick = [this] {
        if (isEnding_) throw QuestionsEnd{};
    };
    const auto* const kind =
        std::find_if(std::begin(kKinds), std::end(kKinds),
                     [&](const Kind& known) { return question.kind == known.name; });
    if (kind == std::end(kKinds)) return R"({"error":"the host is not asked such things"})";
    try {
        const Asking asking{client, ctl::deadlineIn(within), tick};
        return textOf({{"answer", kind->answer(asking, question, readDocument(question.body))}});
    } catch (const std::exception& error) {
        return textOf({{"error", error.what()}});
    }
}

}  // namespace fleet
