/// How a host joins the fleet.
#pragma once

#include <string>

#include "fleet/bus/messages/selector.h"
#include "fleet/bus/messages/values.h"

namespace fleet {

struct EnrolOptions {
    std::string invitation;                           ///< the line that the centre has printed
    std::string directory = "/var/lib/zavlink";       ///< of the link; made if it is not there
    std::string configuration = "/etc/zavlink.toml";  ///< the file to write
    std::string hostSocket;  ///< where the host is asked; "" is where zavctl would ask it
    Labels labels;           ///< of the host's own configuration
    std::string machineFile = "/etc/machine-id";
};

struct EnrolledAs {
    std::string host;  ///< the bus key, by which the fleet knows the host
    std::string name;
    std::string fleet;
};

/// Makes the host's keys, has the centre enrol it, and writes all that zavlink needs: its keys and
/// the bus's authority into the directory, and the configuration. If it ends half-way, by whatever,
/// it can be done again with the same invitation. Waits for the centre for a minute at most.
///
/// Throws EnrolError, FileError, MessageError, UrlError and HttpsError, whose texts are for people.
/// Nothing is sent if this host has been enrolled or could not keep the answer.
EnrolledAs enrolHost(const EnrolOptions& options, Moment now);

}  // namespace fleet
