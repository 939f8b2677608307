#include "fleet/link/enrol/enrol_host.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cstdlib>
#include <memory>
#include <nlohmann/json.hpp>
#include <system_error>

#include "ctl/client/address/host_address.h"
#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/enrolment.h"
#include "fleet/bus/messages/invitation.h"
#include "fleet/files/file_error.h"
#include "fleet/files/files.h"
#include "fleet/https/client/https_client.h"
#include "fleet/link/enrol/enrol_error.h"
#include "fleet/link/enrol/enrolled_configuration.h"
#include "fleet/link/enrol/joining_keys.h"
#include "fleet/link/enrol/owners_rights.h"
#include "fleet/link/program/directory_lock.h"
#include "fleet/link/program/link_file.h"
#include "fleet/link/program/machine.h"

namespace fleet {
namespace {

/// Thousands may come at once.
constexpr std::chrono::seconds kPatience{60};
constexpr unsigned kAccepted = 200;

[[noreturn]] void failAt(const std::string& path) {
    throw FileError(path + ": " + std::generic_category().message(errno));
}

void makeDirectory(const std::string& path) {
    if (::mkdir(path.c_str(), 0700) != 0 && errno != EEXIST) failAt(path);
}

std::string parentOf(const std::string& path) {
    const std::size_t slash = path.rfind('/');
    if (slash == std::string::npos) return ".";
    return slash == 0 ? "/" : path.substr(0, slash);
}

/// An enrolment that ended half-way may have written the configuration.
void insistOnRoomForConfiguration(const EnrolOptions& options) {
    if (isThere(options.configuration) && !areJoiningKeysThere(options.directory)) {
        throw EnrolError(options.configuration +
                         ": is there already, and would be lost; move it away. Labels and the "
                         "host's socket are given with --label and --host-socket");
    }
    const std::string folder = parentOf(options.configuration);
    if (::faccessat(AT_FDCWD, folder.c_str(), W_OK | X_OK, AT_EACCESS) != 0) failAt(folder);
}

/// What the centre says in words, if it does.
std::string reasonIn(const HttpsAnswer& answer) {
    try {
        return textIn(readDocument(answer.body), "error");
    } catch (const MessageError&) {
        return "it answers with status " + std::to_string(answer.status);
    }
}

std::string absolute(const std::string& path) {
    if (path.rfind('/', 0) == 0) return path;
    const std::unique_ptr<char, decltype(&std::free)> folder(::get_current_dir_name(), std::free);
    if (!folder) failAt(path);
    return std::string(folder.get()) + '/' + path;
}

HttpsAnswer answerTo(HttpsClient& centre, const HttpsRequest& request) {
    try {
        return centre.ask(request, std::chrono::steady_clock::now() + kPatience);
    } catch (const HttpsError& error) {
        if (error.kind() == HttpsError::Kind::NotTrusted) throw;
        throw EnrolError(std::string(error.what()) +
                         "; the same invitation may be used for another try");
    }
}

/// Who this host is, before it has joined.
class Applicant {
public:
    Applicant(const EnrolOptions& options, const Invitation& invitation)
        : keys_(joiningKeys(options.directory, invitation.token)),
          machine_(machineIdentity(keys_.bus.publicKey(), options.machineFile)) {
        if (machine_.empty()) {
            throw EnrolError(options.machineFile +
                             ": holds no identity of this machine (systemd-machine-id-setup "
                             "makes one)");
        }
    }

    const JoiningKeys& keys() const { return keys_; }

    EnrolmentAnswer apply(const Invitation& invitation, const ServerUrl& url) const {
        HttpsClient centre(url, ServerTrust::byFingerprint(invitation.authority));
        HttpsRequest request;
        request.method = "POST";
        request.target = "/v1/enrolments";
        request.contentType = "application/octet-stream";
        request.body = signEnrolment({invitation.fleet, invitation.token, keys_.bus.publicKey(),
                                      keys_.signing.publicKey(), machine_},
                                     keys_.bus, keys_.signing);
        const HttpsAnswer answer = answerTo(centre, request);
        if (answer.status != kAccepted) {
            throw EnrolError("the centre at " + invitation.url +
                             " does not take this host: " + reasonIn(answer));
        }
        return readEnrolmentAnswer(answer.body);
    }

private:
    const JoiningKeys keys_;
    const std::string machine_;
};

LinkConfiguration ownPartOf(const EnrolOptions& options) {
    LinkConfiguration own;
    own.state = absolute(options.directory);
    own.ca = own.state + "/ca.pem";
    own.labels = options.labels;
    own.hostSocket =
        absolute(options.hostSocket.empty() ? ctl::defaultSocket() : options.hostSocket);
    return own;
}

/// All that the directory gets before the host counts as enrolled.
struct Joined {
    JoiningKeys keys;
    EnrolmentAnswer answer;
    LinkConfiguration configuration;
};

Joined join(const EnrolOptions& options, const Invitation& invitation, const ServerUrl& url,
            Moment now) {
    const Applicant applicant(options, invitation);
    Joined joined{applicant.keys(), applicant.apply(invitation, url), ownPartOf(options)};
    adoptAnswer(joined.configuration, invitation, joined.answer, now);
    replaceFile(joined.configuration.ca, joined.answer.authority, Secrecy::Public);
    return joined;
}

/// The last step: from now on the host is enrolled.
void complete(const EnrolOptions& options, const Joined& joined) {
    LinkFile::create(options.directory, joined.keys.bus, joined.keys.signing,
                     joined.answer.userToken);
    forgetJoiningKeys(options.directory);
}

}  // namespace

EnrolledAs enrolHost(const EnrolOptions& options, Moment now) {
    const Invitation invitation = readInvitation(options.invitation);
    const ServerUrl url = readServerUrl(invitation.url);
    makeDirectory(options.directory);
    const auto asOwner = [&options](auto act) {
        const OwnersRights rights(options.directory);
        return act();
    };
    const sys::FileDescriptor lock = asOwner([&] { return lockDirectory(options.directory); });
    LinkFile::insistOnNone(options.directory);
    insistOnRoomForConfiguration(options);
    const Joined joined = asOwner([&] { return join(options, invitation, url, now); });
    replaceFile(options.configuration, linkConfigurationText(joined.configuration),
                Secrecy::Public);
    asOwner([&] { complete(options, joined); });
    return {joined.keys.bus.publicKey(), joined.answer.name, invitation.fleet};
}

}  // namespace fleet
