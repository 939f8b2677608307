/// Facts as they are published.
#pragma once

#include <string>

#include "fleet/bus/messages/facts.h"

namespace fleet {

/// The signed message. Of an inventory that is too long for one, the descriptions of products are
/// left out, then as many products and instances from the end as it takes; "leftOut" says how many.
std::string publishedFacts(Facts facts, const KeyPair& signing);

}  // namespace fleet
