#include "fleet/operator/questions/asked_hosts.h"

#include <algorithm>
#include <thread>
#include <utility>

#include "ctl/client/http/bounded_json.h"
#include "ctl/client/http/percent_encoding.h"
#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/question.h"
#include "fleet/operator/centre/answers.h"
#include "fleet/operator/questions/gathered_answer.h"
#include "fleet/operator/questions/made_question.h"

using nlohmann::json;

namespace fleet {
namespace {

/// The centre takes no more at once.
constexpr std::size_t kMostOfRound = 200;
/// A request with questions is not longer.
constexpr std::size_t kRequestRoom = std::size_t{500} * 1024;
constexpr std::chrono::milliseconds kLookPause{200};

/// What one round has asked, and what has come of it.
class AskedRound {
public:
    AskedRound(Centre& centre, const OperatorIdentity& identity, std::string selector,
               const Inquiry& inquiry)
        : centre_(centre),
          identity_(identity),
          selector_(std::move(selector)),
          inquiry_(inquiry),
          key_(KeyPair::make(KeyKind::User)) {}

    void ask(const std::vector<HostAnswer*>& hosts) {
        json questions = json::array();
        for (HostAnswer* const one : hosts)
            questions.push_back(base64Of(questionFor(*one)));
        round_ = memberText(centre_.post("/v1/questions", {{"questions", questions}}), "round");
        if (round_.empty()) throw senseless("it names no round of questions");
    }

    /// Returns whether all have answered.
    bool look() {
        const json reply = centre_.get("/v1/questions/" + ctl::percentEncoded(round_));
        for (const json& message : memberList(reply, "answers")) {
            const std::string bytes = bytesOfBase64(memberText(message, "signed"));
            const std::string host = memberText(message, "host");
            for (auto& [answer, gathered] : open_) {
                if (gathered.host() == host) gathered.take(bytes);
            }
        }
        return std::all_of(open_.begin(), open_.end(),
                           [](const auto& one) { return one.second.isWhole(); });
    }

    void finish() const {
        for (const auto& [answer, gathered] : open_)
            fill(*answer, gathered);
    }

private:
    std::string questionFor(HostAnswer& asked) {
        json body = inquiry_.body;
        body["answerTo"] = key_.publicKey();
        const MadeQuestion made =
            makeQuestion(identity_, {asked.host.key, selector_, inquiry_.kind, body}, wallClock());
        open_.emplace_back(&asked,
                           GatheredAnswer(asked.host.key, asked.host.signing, made.id, key_));
        return made.bytes;
    }

    static void fill(HostAnswer& answer, const GatheredAnswer& gathered) {
        if (!gathered.isWhole()) {
            answer.trouble =
                gathered.hasGap() ? "a part of the answer was lost" : "it has not answered";
            return;
        }
        const ctl::ParsedJson parsed = ctl::parseBounded(gathered.text());
        const bool isAnswer = parsed.fault == nullptr && parsed.document.is_object();
        const std::string error = isAnswer ? memberText(parsed.document, "error") : "";
        if (isAnswer && parsed.document.contains("answer")) {
            answer.answer = parsed.document.at("answer");
        } else {
            answer.trouble = error.empty() ? "its answer makes no sense" : error;
        }
    }

    Centre& centre_;
    const OperatorIdentity& identity_;
    const std::string selector_;
    const Inquiry& inquiry_;
    const KeyPair key_;
    std::string round_;
    std::vector<std::pair<HostAnswer*, GatheredAnswer>> open_;
};

void askRound(Centre& centre, const OperatorIdentity& identity, const std::string& selector,
              const Inquiry& inquiry, const std::vector<HostAnswer*>& hosts,
              const AskingPace& pace) {
    AskedRound round(centre, identity, selector, inquiry);
    round.ask(hosts);
    const auto until = std::min(pace.deadline, std::chrono::steady_clock::now() + kLongestQuestion);
    while (!round.look() && std::chrono::steady_clock::now() < until)
        pace.pause();
    round.finish();
}

}  // namespace

std::vector<HostAnswer> askHosts(Centre& centre, const OperatorIdentity& identity,
                                 const Choice& choice, const Inquiry& inquiry,
                                 const AskingPace& pace) {
    insistThatMayAsk(identity, inquiry.kind, memberText(inquiry.body, "product"));
    std::vector<HostAnswer> answers;
    for (const ChosenHost& host : choice.hosts)
        answers.push_back({host, nullptr, host.state == "here" ? "" : "it is " + host.state});
    std::vector<HostAnswer*> there;
    for (HostAnswer& answer : answers) {
        if (answer.trouble.empty()) there.push_back(&answer);
    }
    // As text, each question is half as long again, and most of it is the certificate.
    const std::size_t bytes =
        2 * (identity.certificate.size() + textOf(inquiry.body).size() + 1024);
    const std::size_t most = std::clamp<std::size_t>(kRequestRoom / bytes, 1, kMostOfRound);
    for (std::size_t from = 0; from < there.size(); from += most) {
        const auto begin = there.begin() + static_cast<std::ptrdiff_t>(from);
        const auto some = std::min(most, there.size() - from);
        askRound(centre, identity, choice.selector, inquiry,
                 {begin, begin + static_cast<std::ptrdiff_t>(some)}, pace);
    }
    return answers;
}

std::vector<HostAnswer> askHosts(Centre& centre, const OperatorIdentity& identity,
                                 const Choice& choice, const Inquiry& inquiry,
                                 std::chrono::steady_clock::time_point deadline) {
    return askHosts(centre, identity, choice, inquiry,
                    {deadline, [] { std::this_thread::sleep_for(kLookPause); }});
}

}  // namespace fleet
