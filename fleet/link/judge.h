/// Decides whether an order counts on this host.
#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "fleet/bus/accounts/nkey.h"
#include "fleet/bus/messages/selector.h"
#include "fleet/link/core/directive.h"

namespace fleet {

/// Whom a link believes, and what it says of itself.
struct Trust {
    std::string fleet;  ///< the fleet's name
    std::string host;   ///< this host's bus key
    std::string name;   ///< its name for people, which selectors may mean
    Labels labels;      ///< from the host's own configuration; the centre has no part in them
    std::string root;   ///< the public key that certifies operators
    std::vector<std::string> centres;  ///< the centre's signing keys: there may be a newer one
};

/// Whether a selector means this host, by its own labels. Throws MessageError if it is not one.
bool isMeant(const std::string& selector, const Trust& trust);

/// The order that has this number; nothing if the centre has not signed that, which is dropped and
/// counted. Everything else that is wrong becomes the directive's refusal, which the host records.
/// Times are not judged: that is done when its turn has come. `key` unseals what was sealed for
/// this host.
std::optional<Directive> judge(std::string_view bytes, Number number, const Trust& trust,
                               const KeyPair& key);

}  // namespace fleet
