#include "fleet/link/enrol/joining_keys.h"

#include <unistd.h>

#include <nlohmann/json.hpp>
#include <optional>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/invitation.h"
#include "fleet/files/file_error.h"
#include "fleet/files/files.h"

using nlohmann::json;

namespace fleet {
namespace {

std::string joiningFile(const std::string& directory) {
    return directory + "/joining.json";
}

/// Tells one invitation from another, and does not let anybody in.
std::string markOf(const std::string& token) {
    return base64Of(fingerprintOfToken(token).value_or(""));
}

KeyPair userKeyIn(const json& document, const char* member) {
    const std::optional<KeyPair> key = KeyPair::ofSeed(textIn(document, member));
    if (!key || key->kind() != KeyKind::User) {
        throw MessageError('"' + std::string(member) + "\" is no seed of a key");
    }
    return *key;
}

std::optional<JoiningKeys> keysKeptFor(const std::string& path, const std::string& mark) {
    if (!isThere(path)) return std::nullopt;
    const std::string text = readFile(path, Secrecy::Secret);
    try {
        const json document = readDocument(text);
        if (textIn(document, "invitation") != mark) return std::nullopt;
        return JoiningKeys{userKeyIn(document, "bus"), userKeyIn(document, "signing")};
    } catch (const MessageError& error) {
        throw FileError(path + ": " + error.what() + "; remove the file to begin anew");
    }
}

}  // namespace

JoiningKeys joiningKeys(const std::string& directory, const std::string& token) {
    const std::string path = joiningFile(directory);
    const std::string mark = markOf(token);
    if (auto kept = keysKeptFor(path, mark)) return *kept;
    JoiningKeys made{KeyPair::make(KeyKind::User), KeyPair::make(KeyKind::User)};
    replaceFile(
        path,
        textOf({{"bus", made.bus.seed()}, {"signing", made.signing.seed()}, {"invitation", mark}}) +
            '\n',
        Secrecy::Secret);
    return made;
}

bool areJoiningKeysThere(const std::string& directory) {
    return isThere(joiningFile(directory));
}

void forgetJoiningKeys(const std::string& directory) {
    ::unlink(joiningFile(directory).c_str());
}

}  // namespace fleet
