/// What the statuses of errors mean.
#pragma once

#include <vector>

namespace host {

struct StatusMeaning {
    unsigned status;
    const char* when;       ///< begins with a small letter, no full stop
    bool ofEvery;           ///< any request may be answered with it
    bool saysWhen = false;  ///< Retry-After stands beside it
};

/// In the order of their numbers.
const std::vector<StatusMeaning>& statusMeanings();

}  // namespace host
