/// What a push did, for people and programs.
#pragma once

#include <string>
#include <vector>

#include "ctl/client/transfer/pushed_file.h"
#include "ctl/show/page.h"

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

Page showPush(const PushReport& report, Format format);

}  // namespace ctl
