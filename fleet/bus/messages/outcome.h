/// How an order ended, as its host tells the centre.
#pragma once

#include <string>

#include "fleet/bus/messages/values.h"

namespace fleet {

struct Outcome {
    std::string host;     ///< the bus key of the host that tells it
    Number number = 0;    ///< 0 if the link no longer knows it
    std::string order;    ///< the order's identifier
    std::string journal;  ///< the identity of the journal that has the task
    EndState state;
    std::string task;  ///< the host's own document of the task, as JSON; "" if there is none
};

/// Whether two outcomes say the same. The number does not count: a link that was started anew may
/// have forgotten it.
inline bool saySame(const Outcome& a, const Outcome& b) {
    return a.host == b.host && a.order == b.order && a.journal == b.journal && a.state == b.state &&
           a.task == b.task;
}

}  // namespace fleet
