/// What a browser asks to have run.
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "ctl/console/received_file.h"

namespace fleet {

/// A verb of the program as it is run, and as it is shown.
struct RunRequest {
    std::vector<std::string> words;  ///< from the program's name on
    std::string input;               ///< for its standard input
    std::string hosts;               ///< for --on: a name on each line; "" if a selector says it
    std::string command;             ///< the line that does the same in a shell
    bool beginsRollout = false;      ///< its document is a new roll-out
    /// What it brings; null if it brings nothing.
    std::shared_ptr<const console::ReceivedFile> file = {};
};

/// Reads {"verb": "start", "arguments": ["ux"], "options": {"on": "env=test"}} for the fleet whose
/// centre is at that URL. "hosts" is a list of names in the place of the option "on", and "input"
/// the text of a configuration. Throws ctl::Failure(kWrongUsage) for a verb, an argument or an
/// option that a browser may not give, and for whatever the program would not take as it is meant.
RunRequest readRunRequest(const std::string& body, const std::string& url);

/// The push of a file, yet to be received, to a place in the depots of a selector's hosts. Throws
/// as readRunRequest() does.
RunRequest pushRequest(const std::string& path, const std::string& selector,
                       const std::string& url);

}  // namespace fleet
