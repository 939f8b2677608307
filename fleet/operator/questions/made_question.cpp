#include "fleet/operator/questions/made_question.h"

#include "ctl/client/failure.h"
#include "fleet/bus/messages/certificate.h"
#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/question.h"

namespace fleet {

MadeQuestion makeQuestion(const OperatorIdentity& identity, const WantedAnswer& wanted,
                          Moment now) {
    Order question;
    question.fleet = identity.fleet;
    question.id = makeOrderId();
    question.host = wanted.host;
    question.selector = wanted.selector;
    question.kind = wanted.kind;
    question.body = textOf(wanted.body);
    question.issued = now;
    question.expires = now + kLongestQuestion;
    return {question.id, signQuestion(question, identity.key, identity.certificate)};
}

void insistThatMayAsk(const OperatorIdentity& identity, const std::string& kind,
                      const std::string& product) {
    const Certificate grant = identity.grant();
    if (grant.until <= wallClock()) {
        throw ctl::Failure(ctl::kHostReportedFailure, "your certificate has ended",
                           "Ask for another invitation, and log in with that.");
    }
    if (allows(grant, kind, product)) return;
    throw ctl::Failure(ctl::kHostReportedFailure,
                       "your certificate does not allow " + kind +
                           (product.empty() ? std::string() : " for the product " + product),
                       "zavctl whoami with --fleet shows what it allows.");
}

}  // namespace fleet
