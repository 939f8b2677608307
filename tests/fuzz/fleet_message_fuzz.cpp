// Messages of a fleet, as link, centre and operator read them: whatever comes is refused with a
// MessageError or read, and what was read says the same when it is written and read again. An input
// is a line with the message's kind, and its text. The text is signed here, by keys that are always
// the same: what nobody has signed is refused before anything of it is read, which "bare" is for.
// In the text "@HOST@" stands for the host's key, "@KEY@" for one that signs, and "@ROOT@" for the
// root's.

#include <map>
#include <nlohmann/json.hpp>

#include "fleet/bus/messages/certificate.h"
#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/enrolment.h"
#include "fleet/bus/messages/facts.h"
#include "fleet/bus/messages/hello_bytes.h"
#include "fleet/bus/messages/invitation.h"
#include "fleet/bus/messages/login.h"
#include "fleet/bus/messages/numbered_order.h"
#include "fleet/bus/messages/order.h"
#include "fleet/bus/messages/question.h"
#include "fleet/bus/messages/session.h"
#include "fleet/bus/trust/signed.h"
#include "fleet/link/judge.h"
#include "fleet/link/questions/question_judge.h"
#include "support/fuzz_support.h"

using fuzz::require;
using namespace fleet;

namespace {

/// The same in each run, so that an input means the same.
struct Keys {
    KeyPair host = *KeyPair::ofSeed("SUAGQ2DINBUGQ2DINBUGQ2DINBUGQ2DINBUGQ2DINBUGQ2DINBUGQ2GYZE");
    KeyPair signer = *KeyPair::ofSeed("SUAHG43TONZXG43TONZXG43TONZXG43TONZXG43TONZXG43TONZXG4YR6A");
    KeyPair root = *KeyPair::ofSeed("SOAHE4TSOJZHE4TSOJZHE4TSOJZHE4TSOJZHE4TSOJZHE4TSOJZHE4QRJQ");
};

const Keys& keys() {
    static const Keys made;
    return made;
}

std::string withKeys(std::string_view text) {
    std::string filled(text);
    const std::map<std::string, std::string> values = {{"@HOST@", keys().host.publicKey()},
                                                       {"@KEY@", keys().signer.publicKey()},
                                                       {"@ROOT@", keys().root.publicKey()}};
    for (const auto& [name, value] : values) {
        for (std::size_t at = 0; (at = filled.find(name, at)) != std::string::npos;)
            filled.replace(at, name.size(), value);
    }
    return filled;
}

std::string signedText(Purpose purpose, const std::string& text, std::string_view carried = {}) {
    return signMessage(purpose, keys().signer, text, carried);
}

const std::string& host() {
    return keys().host.publicKey();
}

/// What was read and written again is read as the same.
template <typename Read, typename Write>
void tryRoundTrip(const std::string& bytes, Read read, Write write) {
    const std::string once = write(read(bytes));
    require(write(read(once)) == once, "what was read says the same when it is written");
}

void tryOrder(const std::string& text) {
    const std::string bytes = signedText(Purpose::Ordering, text, "a certificate");
    const SignedOrder read = readOrder(bytes);
    require(isSignedByOperator(read, keys().signer.publicKey()), "its signature counts");
    require(read.certificate == "a certificate", "it carries its certificate");
    tryRoundTrip(
        bytes, [](const std::string& some) { return readOrder(some).order; },
        [](const Order& order) { return signOrder(order, keys().signer, ""); });
}

Trust trust() {
    return {"f",
            host(),
            "web-1",
            {{"env", "test"}},
            keys().root.publicKey(),
            {keys().signer.publicKey()}};
}

/// By an operator who may do everything.
std::string certificate() {
    Certificate made;
    made.fleet = "f";
    made.name = "ada";
    made.key = keys().signer.publicKey();
    made.until = Moment(4'000'000'000'000);
    made.commands = made.products = {"*"};
    made.selector = "*";
    return signCertificate(made, keys().root);
}

void tryJudging(const std::string& text) {
    static const std::string allowed = certificate();
    const std::string order = signedText(Purpose::Ordering, text, allowed);
    const std::string id = "0123456789abcdef0123456789abcdef";
    const std::string numbered = signNumber(host(), 7, id, order, keys().signer);
    const auto directive = judge(numbered, 7, trust(), keys().host);
    require(directive.has_value(), "what the centre has numbered is recorded");
    if (directive->refusal.empty()) {
        require(directive->order == id, "an order that counts is the one that was numbered");
        for (const OrderFile& file : directive->files) {
            require(!directive->cancels.empty() || isDepotPath(file.path),
                    "a file goes below the depot");
        }
    }
    require(!judge(numbered, 8, trust(), keys().host), "a number counts for one place");
}

void tryQuestion(const std::string& text) {
    static const std::string allowed = certificate();
    const std::string question = signedText(Purpose::Asking, text, allowed);
    const auto asked = judgeQuestion(question, trust(), Moment(1'700'000'000'000),
                                     [](const std::string&) { return false; });
    if (asked) require(isOrderId(asked->id), "a question that is answered has an identifier");
}

void tryHello(const std::string& text) {
    tryRoundTrip(
        signedText(Purpose::Greeting, text),
        [](const std::string& bytes) {
            return readHello(bytes, host(), keys().signer.publicKey());
        },
        [](const Hello& hello) { return signHello(host(), hello, keys().signer); });
}

void tryReply(const std::string& text) {
    tryRoundTrip(
        signedText(Purpose::Replying, text),
        [](const std::string& bytes) {
            return readReply(bytes, host(), {keys().signer.publicKey()});
        },
        [](const Reply& reply) { return signReply(host(), reply, keys().signer); });
}

void tryOutcome(const std::string& text) {
    tryRoundTrip(
        signedText(Purpose::Reporting, text),
        [](const std::string& bytes) {
            return readOutcome(bytes, host(), keys().signer.publicKey());
        },
        [](const Outcome& outcome) { return signOutcome(outcome, keys().signer); });
}

void tryFacts(const std::string& text) {
    tryRoundTrip(
        signedText(Purpose::Describing, text),
        [](const std::string& bytes) {
            return readFacts(bytes, host(), keys().signer.publicKey());
        },
        [](const Facts& facts) { return signFacts(facts, keys().signer); });
}

void tryAnswer(const std::string& text) {
    tryRoundTrip(
        signedText(Purpose::Answering, text, "sealed"),
        [](const std::string& bytes) {
            return readAnswer(bytes, host(), keys().signer.publicKey());
        },
        [](const AnswerPiece& piece) { return signAnswer(piece, keys().signer); });
}

void tryCertificate(const std::string& text) {
    tryRoundTrip(
        signMessage(Purpose::Certifying, keys().root, text),
        [](const std::string& bytes) {
            return readCertificate(bytes, keys().root.publicKey(), "f");
        },
        [](const Certificate& read) { return signCertificate(read, keys().root); });
}

void tryLogin(const std::string& text) {
    tryRoundTrip(signedText(Purpose::LoggingIn, text), readLogin,
                 [](const LoginRequest& request) { return signLogin(request, keys().signer); });
}

void trySession(const std::string& text) {
    tryRoundTrip(
        signedText(Purpose::OpeningSession, text), readSessionRequest,
        [](const SessionRequest& request) { return signSessionRequest(request, keys().signer); });
}

void tryEnrolmentAnswer(const std::string& text) {
    tryRoundTrip(text, readEnrolmentAnswer, enrolmentAnswerText);
}

void tryLoginAnswer(const std::string& text) {
    tryRoundTrip(text, readLoginAnswer, loginAnswerText);
}

void tryInvitation(const std::string& text) {
    tryRoundTrip(text, readInvitation, invitationText);
}

/// What nobody has signed is never read.
void tryBare(const std::string& text) {
    require(!readNumber(text, host(), 1, {keys().signer.publicKey()}), "no number is signed");
    require(!judge(text, 1, trust(), keys().host), "such an order is dropped");
    static_cast<void>(orderNamedIn(text));
    static_cast<void>(questionAnsweredBy(text));
    static_cast<void>(readEnrolment(text));
    require(false, "an enrolment that nobody has signed is refused");
}

using Try = void (*)(const std::string& text);

const std::map<std::string_view, Try>& kinds() {
    static const std::map<std::string_view, Try> all = {
        {"order", tryOrder},
        {"judge", tryJudging},
        {"question", tryQuestion},
        {"hello", tryHello},
        {"reply", tryReply},
        {"outcome", tryOutcome},
        {"facts", tryFacts},
        {"answer", tryAnswer},
        {"certificate", tryCertificate},
        {"login", tryLogin},
        {"session", trySession},
        {"enrolment-answer", tryEnrolmentAnswer},
        {"login-answer", tryLoginAnswer},
        {"invitation", tryInvitation},
        {"bare", tryBare},
    };
    return all;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::Input input(data, size);
    const auto kind = kinds().find(input.line());
    if (kind == kinds().end()) return 0;
    try {
        kind->second(withKeys(input.rest()));
    } catch (const MessageError& refused) {
        require(*refused.what() != '\0', "a refusal says why");
    }
    return 0;
}
