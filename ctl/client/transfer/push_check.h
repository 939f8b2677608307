/// Whether the files of a push may be sent: what the host says, and what they hold.
#pragma once

#include <string>
#include <vector>

#include "ctl/client/address/host_address.h"
#include "ctl/client/transfer/pushed_file.h"

namespace ctl {

struct PushCheck {
    /// False when the host could not be asked.
    bool known = false;
    bool isOlder = false;    ///< it knows neither this question nor checksums
    std::string whyUnknown;  ///< why nobody answers; empty when somebody does
    bool guarded = false;
    bool taken = true;               ///< false: nothing should be sent
    std::vector<std::string> notes;  ///< sentences about files that change on their way
};

/// Asks the host, and stores what it says of each file there: whether it is converted, and the
/// problem that it sees. For a guarded host, looks into the files whose line ends will be
/// converted: one that is no text would be damaged. Throws Failure when there is too little room,
/// and when a file cannot be read.
PushCheck checkPush(const HostAddress& host, std::vector<PushedFile>& files);

/// Asks again about files that were refused although the first check had found nothing wrong.
void explainRefusals(const HostAddress& host, std::vector<PushedFile>& files);

}  // namespace ctl
