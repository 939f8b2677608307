/// What a link must not forget.
#pragma once

#include <string>

#include "fleet/bus/messages/values.h"

namespace fleet {

struct Kept {
    Number taken = 0;     ///< the last order that the host's journal has a record of
    std::string journal;  ///< the journal for which that holds; "" before the first one
    /// When that journal was adopted in the place of another one. Orders that were made before may
    /// have run already, with no record left of it, so they never run.
    Moment adopted{};
    /// The latest time that was seen. A clock that is put back makes no expired order good again.
    Moment latest{};
};

inline bool operator==(const Kept& a, const Kept& b) {
    return a.taken == b.taken && a.journal == b.journal && a.adopted == b.adopted &&
           a.latest == b.latest;
}

}  // namespace fleet
