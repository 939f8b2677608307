#include "fleet/operator/verbs/login.h"

#include <algorithm>
#include <nlohmann/json.hpp>
#include <optional>
#include <thread>
#include <utility>

#include "ctl/client/failure.h"
#include "ctl/client/interruption.h"
#include "ctl/show/page.h"
#include "ctl/show/printable.h"
#include "ctl/verbs/invocation.h"
#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/login.h"
#include "fleet/https/client/https_client.h"
#include "fleet/operator/centre/answers.h"
#include "fleet/operator/verbs/fleet_verbs.h"
#include "fleet/operator/verbs/operator_side.h"

using nlohmann::json;

namespace fleet {
namespace {

constexpr ctl::Argument kInvitation =
    ctl::positional("INVITATION", "The word that zavfleetd operator add has printed").required();
constexpr ctl::Argument kLoginArguments[] = {kInvitation};

constexpr std::chrono::milliseconds kLoginPause{2000};
constexpr std::chrono::seconds kLoginAnswerTime{60};

PendingLogin pendingLoginOf(const OperatorFiles& files, const Invitation& invitation) {
    std::optional<PendingLogin> known = files.pendingLogin(invitation.url);
    if (known && known->invitation.token == invitation.token) return std::move(*known);
    PendingLogin made{invitation, KeyPair::make(KeyKind::User)};
    files.keep(made);
    return made;
}

/// Asks the centre for the certificate, as often as it takes.
class LoginQuestion {
public:
    LoginQuestion(const PendingLogin& login, ctl::Deadline deadline)
        : deadline_(deadline),
          client_(readServerUrl(login.invitation.url),
                  ServerTrust::byFingerprint(login.invitation.authority)),
          request_{
              "POST", "/v1/logins",
              signLogin({login.invitation.fleet, login.invitation.token, login.key.publicKey()},
                        login.key),
              "application/octet-stream"} {}

    /// Nothing while the root has not signed it.
    std::optional<std::string> ask() {
        const HttpsAnswer answer = client_.ask(
            request_, std::min(deadline_, std::chrono::steady_clock::now() + kLoginAnswerTime));
        if (answer.status != 200) throw centreRefusal(answer.status, answer.body);
        return readLoginAnswer(answer.body).certificate;
    }
    /// After an answer.
    const std::string& authority() const { return client_.authority(); }

private:
    const ctl::Deadline deadline_;
    HttpsClient client_;
    const HttpsRequest request_;
};

std::string awaitCertificate(LoginQuestion& question, const PendingLogin& login,
                             ctl::Deadline deadline, const LoginEvents& events) {
    bool isTold = false;
    for (;;) {
        if (std::optional<std::string> certificate = question.ask()) return *certificate;
        if (!std::exchange(isTold, true) && events.onWaiting) {
            events.onWaiting(login.key.publicKey());
        }
        if (std::chrono::steady_clock::now() >= deadline) {
            throw ctl::Failure(ctl::kNoOutcome, "the key is not certified yet",
                               "The same zavctl login goes on waiting.");
        }
        if (events.pause)
            events.pause(kLoginPause);
        else
            std::this_thread::sleep_for(kLoginPause);
    }
}

void tellKey(const std::string& key) {
    ctl::print({{},
                "Your key is\n  " + key +
                    "\nand waits to be certified. Read it out to the administrator, who compares "
                    "it.\n"});
}

std::string listText(const std::vector<std::string>& words) {
    std::string text;
    for (const std::string& word : words)
        text += (text.empty() ? "" : ", ") + word;
    return text;
}

ctl::Page showLogin(const OperatorIdentity& identity, ctl::Format format) {
    const Certificate grant = identity.grant();
    if (format == ctl::Format::Json) {
        return ctl::jsonPage({{"operator", grant.name},
                              {"key", grant.key},
                              {"fleet", grant.fleet},
                              {"url", identity.url},
                              {"commands", grant.commands},
                              {"products", grant.products},
                              {"selector", grant.selector}});
    }
    ctl::Page page;
    page.out = "You are " + ctl::printable(grant.name) + " in the fleet " +
               ctl::printable(grant.fleet) + ".\n";
    if (!grant.commands.empty()) {
        page.out += "You may " + ctl::printable(listText(grant.commands)) + " for " +
                    ctl::printable(listText(grant.products)) + " on " +
                    ctl::printable(grant.selector) + ".\n";
    }
    page.out += "Use it with --fleet " + ctl::printable(identity.url) + ", or set $ZAV_FLEET.\n";
    return page;
}

Invitation invitationIn(const std::string& text) {
    try {
        return readInvitation(text);
    } catch (const MessageError& error) {
        throw ctl::Failure(ctl::kWrongUsage, "that is no invitation: " + std::string(error.what()));
    }
}

ctl::ExitStatus runLogin(const ctl::Invocation& invocation) {
    const Invitation invitation = invitationIn(invocation.given.text(kInvitation));
    const ctl::Page interrupted = ctl::failurePage(
        {ctl::kInterrupted, "interrupted", "The same zavctl login goes on with the same key."},
        invocation.format);
    const ctl::InterruptNote note(interrupted.err, interrupted.out);
    const OperatorFiles files(OperatorFiles::usualDirectory());
    const OperatorIdentity identity =
        logIn(files, invitation, deadlineOf(invocation.given), {tellKey, {}});
    return ctl::print(showLogin(identity, invocation.format));
}

}  // namespace

OperatorIdentity logIn(const OperatorFiles& files, const Invitation& invitation,
                       ctl::Deadline deadline, const LoginEvents& events) {
    const PendingLogin login = pendingLoginOf(files, invitation);
    LoginQuestion question(login, deadline);
    const std::string certificate = awaitCertificate(question, login, deadline, events);
    const OperatorIdentity identity{invitation.url,       invitation.fleet, invitation.root,
                                    question.authority(), login.key,        certificate};
    (void)identity.grant();  // a certificate that does not count is not kept
    files.keep(identity);
    files.forgetPendingLogin(invitation.url);
    return identity;
}

constexpr ctl::Verb kLoginVerb = {
    "login",         "Make a key on this machine and have it certified",
    kLoginArguments, {"zavctl login INVITATION", "zavctl --timeout 3600 login INVITATION"},
    runLogin,
};

}  // namespace fleet
