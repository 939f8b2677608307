/// A push from the question whether it may be to the proof that it has arrived.
#pragma once

#include <string>
#include <vector>

#include "ctl/client/address/host_address.h"
#include "ctl/client/transfer/pushed_file.h"
#include "ctl/client/transfer/pusher.h"

namespace ctl {

/// What is known of the files' arrival beyond the host's answers.
enum class Verification {
    None,        ///< nobody looked
    Done,        ///< the host computed the files' checksums
    Unknown,     ///< it could not be asked: what was wanted was not done
    NotOffered,  ///< it is older and cannot be asked
};

struct PushReport {
    std::vector<PushedFile> files;     ///< at least one
    double seconds = 0;                ///< from the first byte to the last answer
    std::vector<std::string> notes{};  ///< sentences about what is not as it might seem
    bool refused = false;              ///< nothing was sent, because of what the files say
    Verification verification = Verification::None;
    std::string whyUnknown{};  ///< why the arrival is unknown
    bool showsSums = false;    ///< the checksums are wanted
};

struct PushOptions {
    bool verifies = true;  ///< compare what has arrived with what was sent, if the host is guarded
    bool wantsSums = false;  ///< the checksums are wanted in any case
    /// Ctrl-C ends the sending while there is something to send: see Interruption.
    bool isInterruptible = false;
    Pusher::OnAnswer onAnswer{};
};

/// Pushes the files of a plan, at least one. A push that breaks off does not leave parts of files
/// behind if that can be helped. Throws Failure when there is too little room, and when a file
/// cannot be read or the host be reached to the end; what became of the files is part of its text.
PushReport pushToDepot(const HostAddress& host, PushPlan plan, const PushOptions& options);

}  // namespace ctl
