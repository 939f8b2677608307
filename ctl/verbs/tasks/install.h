/// install: a product from the depot, also one that restarts the host.
#pragma once

#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "ctl/client/task.h"
#include "ctl/show/page.h"

namespace ctl {

/// How an install went that was to be awaited through the restart of the host.
struct CompletedInstall {
    TaskResult task;            ///< its first outcome says no more than that the install has begun
    nlohmann::json completion;  ///< the row with the install's own result; null if it did not begin
};

/// `title` names the command, such as "install ux".
Page showCompletedInstall(const std::string& title, const CompletedInstall& install, Format format);

/// The words as one command line, which the host splits at blanks outside quotes. A word with
/// blanks gets quotes; a word that contains quotes is kept as it is. A single word is a whole
/// command line.
std::string joinedCommand(const std::vector<std::string>& words);

}  // namespace ctl
