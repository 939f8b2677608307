#include "fleet/link/questions/question_judge.h"

#include <nlohmann/json.hpp>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/trust/sealed.h"
#include "fleet/link/core/link.h"

using nlohmann::json;

namespace fleet {
namespace {

std::string productAsked(const json& body) {
    return body.contains("product") ? textIn(body, "product") : std::string();
}

/// Why an operator who may be answered is refused; "" if they are not.
std::string refusalOf(const Order& question, const Certificate& certificate, const Trust& trust) {
    try {
        if (!allows(certificate, question.kind, productAsked(readDocument(question.body)))) {
            return "the operator's certificate does not allow this question for this product";
        }
        if (!isMeant(certificate.selector, trust)) {
            return "the operator's certificate is not for hosts with these labels";
        }
        if (!isMeant(question.selector, trust)) {
            return "the question is not for hosts with these labels";
        }
    } catch (const MessageError& error) {
        return error.what();
    }
    return "";
}

}  // namespace

std::optional<AskedQuestion> judgeQuestion(
    std::string_view bytes, const Trust& trust, Moment now,
    const std::function<bool(const std::string&)>& isRevoked) {
    try {
        const SignedOrder read = readOrder(bytes);
        const Order& question = read.order;
        const Certificate certificate = readCertificate(read.certificate, trust.root, trust.fleet);
        const bool isOperators = certificate.holder == Certificate::Holder::Operator &&
                                 isQuestionSignedBy(read, certificate.key) &&
                                 certificate.until > now && !isRevoked(certificate.key);
        const bool isForThis = question.fleet == trust.fleet && question.host == trust.host;
        const bool isNow = question.expires > now &&
                           question.expires <= question.issued + kLongestQuestion &&
                           question.issued <= now + Link::kMostAhead;
        AskedQuestion asked{question.id,      question.kind,
                            question.body,    textIn(readDocument(question.body), "answerTo"),
                            question.expires, "",
                            certificate};
        const bool canBeAnswered =
            isPublicKey(asked.answerTo, KeyKind::User) && canSealFor(asked.answerTo);
        if (!isOperators || !isForThis || !isNow || !canBeAnswered) return std::nullopt;
        asked.refusal = refusalOf(question, certificate, trust);
        return asked;
    } catch (const MessageError&) {
        return std::nullopt;
    }
}

bool QuestionBook::enter(const std::string& id, Moment expires, Moment now) {
    for (auto known = known_.begin(); known != known_.end();)
        known = known->second <= now ? known_.erase(known) : std::next(known);
    return known_.size() < kMost && known_.emplace(id, expires).second;
}

}  // namespace fleet
