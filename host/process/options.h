/// The command line, and what stands in for what it leaves out.
#pragma once

#include <cstdint>
#include <functional>
#include <optional>
#include <string>

namespace host {

struct HostOptions {
    std::string home;
    std::string socket;
    std::string rpcSocket;
    std::optional<std::uint16_t> rpcPort;   ///< absent: no TCP
    std::optional<std::string> originNode;  ///< absent: the platform's own choice
    std::optional<std::string> plugin;      ///< absent: searched for
};

/// The value of an environment variable, or null.
using Environment = std::function<const char*(const char* name)>;

/// Reads the command line and completes it from the environment. Returns nothing when help or the
/// version was asked for and has been printed; throws StartError for anything that makes no sense.
/// The home is a directory and its path absolute, the sockets' names are not empty.
std::optional<HostOptions> readOptions(int argc, const char* const* argv,
                                       const Environment& environment);

}  // namespace host
