/// A host that was invited into a fleet, and the centre that it is to ask.
#pragma once

#include <chrono>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "fleet/bus/messages/certificate.h"
#include "fleet/bus/messages/enrolment.h"
#include "fleet/bus/messages/invitation.h"
#include "fleet/https/tls_server.h"
#include "fleet/link/enrol/enrol_host.h"
#include "fleet/server/keys/tls/certificate_authority.h"
#include "support/host/program.h"
#include "support/scratch_dir.h"
#include "tests/fleet/server/keys/trust/joining.h"

namespace fleet_test {

/// The fleet is a real one, with its database of who may take part. What its centre answers is the
/// test's to say.
class InvitedHost {
public:
    /// Answers a request whose body this is.
    using Act = std::function<void(TlsPeer& peer, const std::string& body)>;

    InvitedHost() {
        options.directory = scratch.makeDir("link");
        options.configuration = scratch.path("zavlink.toml");
        options.machineFile = scratch.write("machine-id", "0123456789abcdef0123456789abcdef\n");
    }

    /// A centre for so many connections, each with one request; the earlier one ends.
    void startCentre(const Act& act, int connections = 1) {
        startCentre(act, connections, authority);
    }
    /// One for whose certificate somebody else vouches.
    void startCentre(const Act& act, int connections, const fleet::CertificateAuthority& by) {
        centre = std::make_unique<TlsServer>(
            by.issue({"localhost", "127.0.0.1"}, now, now + std::chrono::hours(1)),
            [this, act, connections](TlsServer& server) {
                for (int i = 0; i < connections; ++i) {
                    TlsPeer peer = server.accept();
                    const std::string request = peer.request();
                    if (request.empty()) return;
                    requests.push_back(request);
                    act(peer, request.substr(request.find("\r\n\r\n") + 4));
                }
            });
    }
    /// Takes up whoever brings a token that counts.
    Act takesUp() {
        return [this](TlsPeer& peer, const std::string& body) {
            peer.answer(200, enrolmentAnswerText(fleet.redeem(body)));
        };
    }
    /// The real answer, after a change.
    Act takesUpWith(const std::function<void(fleet::EnrolmentAnswer&)>& change) {
        return [this, change](TlsPeer& peer, const std::string& body) {
            fleet::EnrolmentAnswer answer = fleet.redeem(body);
            change(answer);
            peer.answer(200, enrolmentAnswerText(answer));
        };
    }

    /// The same for the program, which goes by the real time; the keys of this fleet count in a
    /// year of their own.
    Act takesUpProgram() {
        return takesUpWith([this](fleet::EnrolmentAnswer& answer) {
            fleet::Certificate certificate;
            certificate.fleet = "demo";
            certificate.holder = fleet::Certificate::Holder::Centre;
            certificate.name = "centre";
            certificate.key = fleet.made.directory().centre().key.publicKey();
            certificate.until = now + joining::kDay;
            answer.centres = {signCertificate(certificate, fleet.made.root().root)};
        });
    }
    /// Runs the program, which gets the invitation from standard input.
    ProgramResult runProgramWith(const std::string& line) const {
        return runProgram({ZAV_BUILD_DIR "/bin/zavlink", "enrol", "--directory", options.directory,
                           "--config", options.configuration, "--label", "env=test", "-"},
                          line + "\n");
    }

    /// The line that the centre has printed.
    std::string invitation(const std::string& name = "web1") {
        return fleet::invitationText({centre ? centre->url() : "https://127.0.0.1:9",
                                      fleet::fingerprintOfCertificate(authority.certificate()),
                                      "demo", fleet.made.directory().facts().root,
                                      fleet.invite(name)});
    }
    /// What is wrong; "" if the host has joined.
    std::string refusal() {
        return joining::wordsOf([this] { enrolHost(options, joining::kNow); });
    }

    const ScratchDir scratch;
    const fleet::Moment now = wallTime();
    const fleet::CertificateAuthority authority =
        fleet::CertificateAuthority::make("demo", now, now + std::chrono::hours(24));
    joining::Fleet fleet;
    fleet::EnrolOptions options;
    std::vector<std::string> requests;  ///< read them after centre->join()
    std::unique_ptr<TlsServer> centre;
};

}  // namespace fleet_test
