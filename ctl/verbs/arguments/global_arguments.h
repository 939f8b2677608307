/// The options that every verb takes.
#pragma once

#include "ctl/client/address/host_address.h"
#include "ctl/show/page.h"
#include "ctl/verbs/arguments/argument.h"
#include "ctl/verbs/arguments/values.h"

namespace ctl {

constexpr Argument kSocket =
    textOption("--socket",
               "The host's socket; without it $ZAV_SOCKET, else zavhost.sock in\n"
               "$XDG_RUNTIME_DIR, else /run/zavhost.sock; if that is not there, the\n"
               "service's, /run/zavhost/zavhost.sock")
        .called("PATH")
        .completedBy(Completion::LocalFile);
constexpr Argument kRpcSocket =
    textOption("--rpc-socket",
               "The host's file transfer socket; without it the socket's name with .rpc\n"
               "appended")
        .called("PATH")
        .completedBy(Completion::LocalFile);
constexpr Argument kHostUser =
    textOption("--host-user", "Trust a host that this user runs, not only one's own or root's")
        .called("NAME");
constexpr Argument kJson = flag("--json", "Print one JSON document");
constexpr Argument kTimeout =
    secondsOption("--timeout", "How long to wait for an answer or an outcome")
        .called("SECONDS")
        .between(0, 1e9)
        // Room for a stop and a start that each use up the host's own time-out of 300 seconds.
        .otherwise("660");

constexpr Argument kVerbose = flag("-v", "Show what a task's commands write while they run");

constexpr Argument kGlobalArgumentList[] = {kSocket, kRpcSocket, kHostUser,
                                            kJson,   kTimeout,   kVerbose};
constexpr ArgumentList kGlobalArguments = kGlobalArgumentList;

/// Where the host is by these options and the environment.
HostAddress hostAddressOf(const Values& given);

Format formatOf(const Values& given);

}  // namespace ctl
