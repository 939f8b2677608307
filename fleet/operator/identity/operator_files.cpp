#include "fleet/operator/identity/operator_files.h"

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <filesystem>
#include <nlohmann/json.hpp>
#include <system_error>
#include <utility>

#include "fleet/bus/messages/document.h"
#include "fleet/files/file_error.h"
#include "fleet/files/files.h"
#include "fleet/https/client/server_url.h"

using nlohmann::json;

namespace fleet {
namespace {

constexpr const char* kIdentityFile = ".json";
constexpr const char* kLoginFile = ".login.json";

KeyPair operatorKeyIn(const json& document) {
    const std::optional<KeyPair> key = KeyPair::ofSeed(textIn(document, "seed"));
    if (!key || key->kind() != KeyKind::User) throw MessageError("\"seed\" is no seed of a key");
    return *key;
}

/// What a file holds, by a function that may throw MessageError; nothing if there is no such file.
template <typename Read>
auto readIfThere(const std::string& path, Read read)
    -> std::optional<decltype(read(std::declval<const json&>()))> {
    if (!isThere(path)) return std::nullopt;
    try {
        return read(readDocument(readFile(path, Secrecy::Secret)));
    } catch (const MessageError& error) {
        throw FileError(path + " is damaged: " + error.what());
    }
}

std::string environmentText(const char* name) {
    const char* const value = std::getenv(name);
    return value == nullptr ? "" : value;
}

void requireOwnDirectory(const std::string& path) {
    struct stat found {};
    if (::stat(path.c_str(), &found) != 0) {
        throw FileError(path + ": " + std::generic_category().message(errno));
    }
    if (!S_ISDIR(found.st_mode)) throw FileError(path + " is no directory");
    if (found.st_uid != ::geteuid() || (found.st_mode & 077U) != 0) {
        throw FileError(path + " may be used by others; make it your own, with mode 0700");
    }
}

}  // namespace

OperatorFiles::OperatorFiles(std::string directory) : directory_(std::move(directory)) {
    if (isThere(directory_)) requireOwnDirectory(directory_);
}

void OperatorFiles::makeDirectory() const {
    namespace fs = std::filesystem;
    std::error_code error;
    fs::create_directories(fs::path(directory_).parent_path(), error);
    if (error) throw FileError("cannot make " + directory_ + ": " + error.message());
    if (::mkdir(directory_.c_str(), 0700) != 0 && errno != EEXIST) {
        throw FileError("cannot make " + directory_ + ": " +
                        std::generic_category().message(errno));
    }
    requireOwnDirectory(directory_);
}

std::string OperatorFiles::usualDirectory() {
    const std::string configuration = environmentText("XDG_CONFIG_HOME");
    const std::string home = environmentText("HOME");
    if (configuration.empty() && home.empty()) {
        throw FileError("neither $XDG_CONFIG_HOME nor $HOME says where your keys are");
    }
    return (configuration.empty() ? home + "/.config" : configuration) + "/zavctl/fleet";
}

std::string OperatorFiles::fileOf(const std::string& url, const char* kind) const {
    std::string name = readServerUrl(url).authority();
    std::replace(name.begin(), name.end(), ':', '_');
    return directory_ + "/" + name + kind;
}

std::optional<OperatorIdentity> OperatorFiles::identity(const std::string& url) const {
    return readIfThere(fileOf(url, kIdentityFile), [](const json& document) {
        return OperatorIdentity{
            textIn(document, "url"),  textIn(document, "fleet"),
            textIn(document, "root"), textIn(document, "authority"),
            operatorKeyIn(document),  bytesOfBase64(textIn(document, "certificate"))};
    });
}

void OperatorFiles::keep(const OperatorIdentity& identity) const {
    makeDirectory();
    replaceFile(fileOf(identity.url, kIdentityFile),
                textOf({{"url", identity.url},
                        {"fleet", identity.fleet},
                        {"root", identity.root},
                        {"authority", identity.authority},
                        {"seed", identity.key.seed()},
                        {"certificate", base64Of(identity.certificate)}}),
                Secrecy::Secret);
}

std::optional<PendingLogin> OperatorFiles::pendingLogin(const std::string& url) const {
    return readIfThere(fileOf(url, kLoginFile), [](const json& document) {
        return PendingLogin{readInvitation(textIn(document, "invitation")),
                            operatorKeyIn(document)};
    });
}

void OperatorFiles::keep(const PendingLogin& login) const {
    makeDirectory();
    replaceFile(
        fileOf(login.invitation.url, kLoginFile),
        textOf({{"invitation", invitationText(login.invitation)}, {"seed", login.key.seed()}}),
        Secrecy::Secret);
}

void OperatorFiles::forgetPendingLogin(const std::string& url) const {
    const std::string file = fileOf(url, kLoginFile);
    if (::unlink(file.c_str()) != 0 && errno != ENOENT) {
        throw FileError("cannot remove " + file + ": " + std::generic_category().message(errno));
    }
}

}  // namespace fleet
