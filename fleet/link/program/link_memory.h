/// What a link remembers.
#pragma once

#include <string>

#include "fleet/bus/accounts/nkey.h"
#include "fleet/link/core/kept.h"

namespace fleet {

/// Who this host is, and what must not be forgotten. One thread at a time.
///
/// The bus's key is never the one that signs: a bad server of the bus can have its key sign
/// anything.
class LinkMemory {
public:
    virtual ~LinkMemory() = default;

    virtual const KeyPair& bus() const = 0;
    virtual const KeyPair& signing() const = 0;
    virtual const std::string& token() const = 0;
    virtual const Kept& kept() const = 0;

    /// Durable when it returns. Throws FileError; then the older state is remembered.
    virtual void keep(const Kept& kept) = 0;
};

}  // namespace fleet
