/// Lists that come in pages.
#pragma once

#include <algorithm>
#include <cstddef>

#include "fleet/server/api/visit.h"

namespace fleet {

/// How many entries the parameter "limit" asks for.
inline std::size_t pageSize(const Call& call, std::size_t otherwise, std::size_t most) {
    const auto wanted =
        static_cast<std::size_t>(call.number("limit", static_cast<long long>(otherwise)));
    return std::clamp<std::size_t>(wanted, 1, most);
}

}  // namespace fleet
