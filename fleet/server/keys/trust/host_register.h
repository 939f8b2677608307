/// Where the hosts of the fleet are kept besides.
#pragma once

#include <string>

#include "fleet/bus/messages/selector.h"
#include "fleet/bus/messages/values.h"

namespace fleet {

struct EnrolledHost {
    std::string host;     ///< its bus key
    std::string signing;  ///< its signing key
    std::string machine;  ///< the machine's identity
    std::string name;     ///< for people
    Labels labels;        ///< the centre's; they decide nothing on the host
    Moment joined{};
};

/// The centre's records of hosts.
class HostRegister {
public:
    virtual ~HostRegister() = default;

    /// Takes the host up; one that is there already, by its key, stays as it is. Called again for
    /// the same host after a lost answer, and for all hosts after a restart. What it throws comes
    /// through, and the host gets no answer yet.
    virtual void enrol(const EnrolledHost& host) = 0;
};

}  // namespace fleet
