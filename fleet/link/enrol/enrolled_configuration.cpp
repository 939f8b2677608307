#include "fleet/link/enrol/enrolled_configuration.h"

#include <algorithm>
#include <cctype>
#include <string>
#include <vector>

#include "fleet/bus/messages/certificate.h"
#include "fleet/bus/messages/document.h"
#include "fleet/files/file_error.h"
#include "fleet/link/enrol/enrol_error.h"

namespace fleet {
namespace {

constexpr const char* kPemStart = "-----BEGIN CERTIFICATE-----";

/// While a key is being replaced there are several.
std::vector<std::string> centreKeysIn(const EnrolmentAnswer& answer, const Invitation& invitation,
                                      Moment now) {
    std::vector<std::string> keys;
    bool hasEnded = false;
    for (const std::string& bytes : answer.centres) {
        try {
            const Certificate certificate =
                readCertificate(bytes, invitation.root, invitation.fleet);
            if (certificate.holder != Certificate::Holder::Centre) continue;
            if (certificate.until > now) keys.push_back(certificate.key);
            hasEnded = hasEnded || certificate.until <= now;
        } catch (const MessageError&) {
            // It counts as none.
        }
    }
    if (!keys.empty()) return keys;
    throw EnrolError(hasEnded ? "the certificate of the centre has ended; if not, the clock of "
                                "this machine is wrong"
                              : "the centre cannot show that the root of the fleet has certified "
                                "it; it is not the one that the invitation means");
}

/// The centre knows the bus's servers by addresses that leave open how they are spoken to. A host
/// speaks to each of them by TLS, because their certificates come with the answer.
std::vector<std::string> encrypted(std::vector<std::string> addresses) {
    const std::string open = "nats://";
    for (std::string& address : addresses) {
        if (address.rfind(open, 0) == 0) address.replace(0, open.size(), "tls://");
    }
    return addresses;
}

}  // namespace

void adoptAnswer(LinkConfiguration& configuration, const Invitation& invitation,
                 const EnrolmentAnswer& answer, Moment now) {
    configuration.centres = centreKeysIn(answer, invitation, now);
    configuration.fleet = invitation.fleet;
    configuration.root = invitation.root;
    configuration.name = answer.name;
    configuration.bus = encrypted(answer.busUrls);
    configuration.serverName = answer.serverName;
    configuration.url = invitation.url;
    if (std::any_of(answer.name.begin(), answer.name.end(),
                    [](unsigned char c) { return std::iscntrl(c) != 0; })) {
        throw EnrolError("the centre's answer has a name that is none");
    }
    if (answer.userToken.empty() || answer.authority.rfind(kPemStart, 0) != 0) {
        throw EnrolError("the centre's answer has no token or no certificate for the bus");
    }
    try {
        parseLinkConfiguration(linkConfigurationText(configuration), "the centre's answer");
    } catch (const FileError& error) {
        throw EnrolError(error.what());
    }
}

}  // namespace fleet
