/// The command line and its defaults.
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
    bool guarded = true;                    ///< false: the plug-in's own behaviour is seen in full
};

/// The value of an environment variable, or null.
using Environment = std::function<const char*(const char* name)>;

/// Reads the command line and takes what it leaves out from the environment. Returns nothing after
/// printing the help or the version. Throws StartError for anything that makes no sense: in the
/// result the home is a directory with an absolute path, and both sockets have names.
std::optional<HostOptions> readOptions(int argc, const char* const* argv,
                                       const Environment& environment);

}  // namespace host
