/// The identifiers of an operator's orders in a roll-out.
///
/// They follow from the operator's key: nobody else can make one up, and its holder can tell
/// whether an order is one of a certain roll-out without having kept a list. A bad centre could
/// otherwise put an older order of the same operator into a list of those to be signed anew, and
/// would get a fresh one.
#pragma once

#include <cstddef>
#include <optional>
#include <string>

#include "fleet/bus/accounts/nkey.h"

namespace fleet {

/// How many orders of one operator a host may get in one roll-out.
constexpr std::size_t kMostTries = 64;

/// Those for one host in one roll-out, the first one having the number 0.
class OrderChain {
public:
    /// Borrows the key.
    OrderChain(const KeyPair& key, std::string rollout, std::string host);

    /// 32 hexadecimal digits in lower case. The same key makes the same ones again.
    std::string identifier(std::size_t number) const;
    /// The number of an order; nothing if it is not one of these.
    std::optional<std::size_t> numberOf(const std::string& identifier) const;

private:
    const KeyPair& key_;
    const std::string rollout_;
    const std::string host_;
};

}  // namespace fleet
