#include "fleet/bus/accounts/fleet_accounts.h"

#include <nlohmann/json.hpp>
#include <stdexcept>

namespace fleet {

namespace {

using Json = nlohmann::json;

constexpr int kTokenVersion = 2;
constexpr int kUnlimited = -1;
/// A host's messages are 256 KiB at most, with what the protocol adds.
constexpr int kLongestOfHost = 512 << 10;
constexpr int kSubscriptionsOfHost = 16;

/// What hosts see of the centre's account: requests, then what is published to them.
constexpr const char* kServices[] = {"$JS.API.DIRECT.GET.TASKS.task.*.*", "out.*", "hello.*",
                                     "ans.*", "$KV.HOSTS.*"};
constexpr const char* kPublished[] = {"rp.task.>", "rp.ask.*"};

Json limitsOfAccount(bool stores) {
    const int storage = stores ? kUnlimited : 0;
    return {{"subs", kUnlimited},      {"data", kUnlimited},    {"payload", kUnlimited},
            {"imports", kUnlimited},   {"exports", kUnlimited}, {"wildcards", true},
            {"conn", kUnlimited},      {"leaf", kUnlimited},    {"mem_storage", storage},
            {"disk_storage", storage}, {"streams", kUnlimited}, {"consumer", kUnlimited}};
}

Json accountJson(bool stores, const Revocations& revocations) {
    Json json = {
        {"type", "account"}, {"version", kTokenVersion}, {"limits", limitsOfAccount(stores)}};
    for (const auto& [key, until] : revocations)
        json["revocations"][key] = until.count();
    return json;
}

template <typename Make>
Json shared(Make make) {
    Json list = Json::array();
    for (const char* subject : kServices)
        list.push_back(make(subject, "service"));
    for (const char* subject : kPublished)
        list.push_back(make(subject, "stream"));
    return list;
}

/// What one host may do. The server puts the host's key in: the key, as a name may be anything.
Json scopeOfHost(const AccountKeys& accounts) {
    const std::string self = "{{subject()}}";
    const Json publish = {"$JS.API.DIRECT.GET.TASKS.task." + self + ".*", "out." + self,
                          "hello." + self, "ans." + self, "$KV.HOSTS." + self};
    const Json subscribe = {"rp.task." + self + ".*", "rp.ask." + self, inboxPrefixOf(self) + ".>"};
    return {{"kind", "user_scope"},
            {"key", accounts.hostSigner},
            {"role", "host"},
            {"template",
             {{"pub", {{"allow", publish}}},
              {"sub", {{"allow", subscribe}}},
              {"subs", kSubscriptionsOfHost},
              {"data", kUnlimited},
              {"payload", kLongestOfHost}}}};
}

void needUserKey(const std::string& key) {
    if (!isPublicKey(key, KeyKind::User)) {
        throw std::invalid_argument("a user's public key is wanted, not \"" + key + "\"");
    }
}

std::string accountToken(const KeyPair& signer, const std::string& account, const char* name,
                         TokenTime issuedAt, const Json& json) {
    return signedToken({account, name, issuedAt, {}}, json.dump(), signer);
}

}  // namespace

FleetKeys FleetKeys::make() {
    return {KeyPair::make(KeyKind::Operator), KeyPair::make(KeyKind::Account),
            KeyPair::make(KeyKind::Account),  KeyPair::make(KeyKind::Account),
            KeyPair::make(KeyKind::Account),  KeyPair::make(KeyKind::Operator)};
}

AccountKeys AccountKeys::of(const FleetKeys& keys) {
    return {keys.control.publicKey(), keys.hosts.publicKey(), keys.hostSigner.publicKey(),
            keys.system.publicKey()};
}

std::string operatorToken(const FleetKeys& keys, TokenTime issuedAt) {
    const Json json = {{"type", "operator"},
                       {"version", kTokenVersion},
                       {"signing_keys", Json::array({keys.accountSigner.publicKey()})},
                       {"system_account", keys.system.publicKey()}};
    return signedToken({keys.root.publicKey(), "fleet", issuedAt, {}}, json.dump(), keys.root);
}

std::string controlToken(const AccountKeys& accounts, const KeyPair& signer, TokenTime issuedAt,
                         const Revocations& revocations) {
    Json json = accountJson(true, revocations);
    json["exports"] = shared([](const char* subject, const char* type) {
        return Json{{"name", subject}, {"subject", subject}, {"type", type}};
    });
    return accountToken(signer, accounts.control, "CTRL", issuedAt, json);
}

std::string hostsToken(const AccountKeys& accounts, const KeyPair& signer, TokenTime issuedAt,
                       const Revocations& revocations) {
    Json json = accountJson(false, revocations);
    json["imports"] = shared([&](const char* subject, const char* type) {
        return Json{
            {"name", subject}, {"subject", subject}, {"account", accounts.control}, {"type", type}};
    });
    json["signing_keys"] = Json::array({scopeOfHost(accounts)});
    return accountToken(signer, accounts.hosts, "HOSTS", issuedAt, json);
}

std::string systemToken(const AccountKeys& accounts, const KeyPair& signer, TokenTime issuedAt,
                        const Revocations& revocations) {
    return accountToken(signer, accounts.system, "SYS", issuedAt, accountJson(false, revocations));
}

std::string controlToken(const FleetKeys& keys, TokenTime issuedAt,
                         const Revocations& revocations) {
    return controlToken(AccountKeys::of(keys), keys.root, issuedAt, revocations);
}

std::string hostsToken(const FleetKeys& keys, TokenTime issuedAt, const Revocations& revocations) {
    return hostsToken(AccountKeys::of(keys), keys.root, issuedAt, revocations);
}

std::string systemToken(const FleetKeys& keys, TokenTime issuedAt) {
    return systemToken(AccountKeys::of(keys), keys.root, issuedAt, {});
}

std::string hostUserToken(const KeyPair& hostSigner, const std::string& hostsAccount,
                          const TokenHead& head) {
    needUserKey(head.subject);
    // No rights and no limits: with any of its own the server would refuse it.
    const Json json = {
        {"type", "user"}, {"version", kTokenVersion}, {"issuer_account", hostsAccount}};
    return signedToken(head, json.dump(), hostSigner);
}

std::string fullUserToken(const KeyPair& account, const TokenHead& head) {
    needUserKey(head.subject);
    const Json json = {{"type", "user"},       {"version", kTokenVersion}, {"subs", kUnlimited},
                       {"data", kUnlimited},   {"payload", kUnlimited},    {"pub", Json::object()},
                       {"sub", Json::object()}};
    return signedToken(head, json.dump(), account);
}

std::string accountsConfiguration(const FleetKeys& keys, const std::string& folder,
                                  TokenTime issuedAt) {
    const auto preloaded = [](const KeyPair& account, const std::string& token) {
        return "  " + account.publicKey() + ": \"" + token + "\"\n";
    };
    return "operator: \"" + operatorToken(keys, issuedAt) + "\"\nsystem_account: \"" +
           keys.system.publicKey() + "\"\nresolver {\n  type: full\n  dir: \"" + folder +
           "\"\n  allow_delete: false\n}\nresolver_preload {\n" +
           preloaded(keys.control, controlToken(keys, issuedAt)) +
           preloaded(keys.hosts, hostsToken(keys, issuedAt)) +
           preloaded(keys.system, systemToken(keys, issuedAt)) + "}\n";
}

std::string inboxPrefixOf(const std::string& hostKey) {
    return "_I." + hostKey;
}

}  // namespace fleet
