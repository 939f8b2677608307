#include "ctl/console/host/copied_command.h"

#include <cstdlib>
#include <filesystem>

#include "ctl/verbs/arguments/global_arguments.h"
#include "ctl/verbs/host/console.h"

namespace console {

std::vector<std::string> copiedCommand(const ctl::Values& given) {
    std::vector<std::string> command = {"zavctl"};
    const char* const named = std::getenv("ZAV_SOCKET");
    const bool isNamed = named != nullptr && *named != '\0' && !given.has(ctl::kSocket);
    if (isNamed)
        command.insert(command.end(), {ctl::kSocket.name, std::filesystem::absolute(named)});
    std::vector<std::string> host = ctl::hostWords(given);
    // Another terminal has another working directory.
    for (std::size_t i = 0; i + 1 < host.size(); i += 2) {
        if (host[i] != ctl::kHostUser.name) host[i + 1] = std::filesystem::absolute(host[i + 1]);
    }
    command.insert(command.end(), host.begin(), host.end());
    return command;
}

}  // namespace console
