#include "fleet/server/keys/directory/root_file.h"

#include "fleet/server/keys/files/key_lines.h"
#include "fleet/server/keys/files/private_file.h"

namespace fleet {

void writeRootFile(const std::string& file, const RootKeys& keys) {
    KeyLines lines;
    lines.add("fleet", keys.fleet)
        .add("root", keys.root)
        .add("bus-operator", keys.bus.root)
        .add("control-account", keys.bus.control)
        .add("hosts-account", keys.bus.hosts)
        .add("host-signer", keys.bus.hostSigner)
        .add("system-account", keys.bus.system)
        .add("account-signer", keys.bus.accountSigner)
        .add("tls-authority", keys.authorityKey.view());
    writeNewPrivateFile(file, lines.text());
}

RootKeys readRootFile(const std::string& file) {
    const ReadKeyLines lines(file);
    SecretText authority;
    authority.append(lines.value("tls-authority"));
    return {
        std::string(lines.value("fleet")),
        lines.key("root", KeyKind::Operator),
        {lines.key("bus-operator", KeyKind::Operator),
         lines.key("control-account", KeyKind::Account),
         lines.key("hosts-account", KeyKind::Account), lines.key("host-signer", KeyKind::Account),
         lines.key("system-account", KeyKind::Account),
         lines.key("account-signer", KeyKind::Operator)},
        std::move(authority)};
}

}  // namespace fleet
