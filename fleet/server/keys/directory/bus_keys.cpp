#include "fleet/server/keys/directory/bus_keys.h"

#include <cstdlib>

#include "fleet/server/keys/files/keys_error.h"

namespace fleet {
namespace {

std::string textOfRevocations(const Revocations& revocations) {
    std::string text;
    for (const auto& [key, until] : revocations) {
        if (!text.empty()) text += ',';
        text += key + "=" + std::to_string(until.count());
    }
    return text;
}

Revocations revocationsIn(std::string_view text) {
    Revocations revocations;
    while (!text.empty()) {
        const std::string item(text.substr(0, text.find(',')));
        text.remove_prefix(item.size() < text.size() ? item.size() + 1 : item.size());
        const std::size_t equals = item.find('=');
        const std::string key = item.substr(0, equals);
        if (equals == std::string::npos || !isPublicKey(key, KeyKind::User)) {
            throw KeysError("the list of the bus's earlier users is damaged");
        }
        revocations[key] = TokenTime(std::strtoll(item.c_str() + equals + 1, nullptr, 10));
    }
    return revocations;
}

BusUser userIn(const ReadKeyLines& lines, const std::string& name) {
    return {lines.key(name + "-user", KeyKind::User), std::string(lines.value(name + "-token"))};
}

}  // namespace

BusUser makeBusUser(const KeyPair& account, const char* name, TokenTime issuedAt) {
    const KeyPair key = KeyPair::make(KeyKind::User);
    return {key, fullUserToken(account, {key.publicKey(), name, issuedAt, {}})};
}

KeyLines linesOfBusKeys(const BusKeys& keys) {
    KeyLines lines;
    lines.add("centre-user", keys.centre.key)
        .add("centre-token", keys.centre.token)
        .add("system-user", keys.system.key)
        .add("system-token", keys.system.token)
        .add("host-signer", keys.hostSigner)
        .add("account-signer", keys.accountSigner)
        .add("earlier-centre-users", textOfRevocations(keys.earlierCentre))
        .add("earlier-system-users", textOfRevocations(keys.earlierSystem));
    return lines;
}

BusKeys readBusKeys(const ReadKeyLines& lines) {
    return {userIn(lines, "centre"),
            userIn(lines, "system"),
            lines.key("host-signer", KeyKind::Account),
            lines.key("account-signer", KeyKind::Operator),
            revocationsIn(lines.value("earlier-centre-users")),
            revocationsIn(lines.value("earlier-system-users"))};
}

}  // namespace fleet
