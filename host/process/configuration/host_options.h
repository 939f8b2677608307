/// What the host is told to do.
#pragma once

#include <chrono>
#include <cstdint>
#include <optional>
#include <string>

#include "host/process/log.h"
#include "host/process/system/groups.h"

namespace host {

struct HostOptions {
    std::string home;
    std::string socket;
    std::string rpcSocket;
    std::string state;      ///< the directory of what the host itself keeps
    bool journal = true;    ///< false: what was accepted is kept in memory only
    bool ownState = false;  ///< it was named for this host
    int maxQueued = 1000;   ///< tasks that may wait in the journal
    int keepDays = 30;      ///< how long tasks that are over are kept
    int keepRows = 10'000;  ///< how many rows of outcomes are kept
    /// How long the commands of an earlier run may go on; then they are killed.
    std::chrono::seconds orphanWait{300};
    /// How long the host waits for the task in hand when it is told to end.
    std::chrono::seconds grace{10};
    int maxOutput = 16 << 20;  ///< bytes that the commands of one task may write
    LogFormat logFormat = LogFormat::Text;
    int logSize = 10 << 20;                 ///< bytes, after which a new trace log is begun
    bool rerunInterrupted = false;          ///< the task that an unclean end cut off runs again
    std::optional<std::uint16_t> rpcPort;   ///< absent: no TCP
    std::optional<std::string> originNode;  ///< absent: the platform's own choice
    std::optional<std::string> plugin;      ///< absent: searched for
    AccessGroups groups;                    ///< served beside root and the host's own user
    std::optional<int> taskTimeout;         ///< in seconds; absent: the variable TIMEOUT decides
    bool guarded = true;                    ///< false: the plug-in's own behaviour is seen in full
    bool traceSecrets = false;              ///< the trace log shows secrets as they are
    bool check = false;                     ///< look whether the host could start, and end
    std::optional<std::string> listing;     ///< present: print it, which says what holds, and end
};

}  // namespace host
