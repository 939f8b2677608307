/// A query with everything that is noticed while it runs.
#pragma once

#include <optional>
#include <string>

#include "host/api/services.h"
#include "host/commands/recorder.h"
#include "host/tables/query.h"
#include "http/peer.h"

namespace host {

struct WatchedAnswer {
    oxa::Rows rows;
    Heard heard;  ///< on the query's thread
};

/// Runs the query on the calling thread; a request becomes a task of this peer once the guards have
/// admitted it. `force` passes the guard of products. Throws Refusal and QueryFailed.
/// Throws NotKept, too.
WatchedAnswer runWatched(Services& services, const Query& query, bool force,
                         const http::Peer& peer);

/// Hands a task that was entered to the plug-in, once the guards have admitted it. Returns how it
/// ends if the plug-in did not get it, which is for the caller to have kept. Throws NotKept, and
/// StepBack when it does not wait any more; nothing was handed over then.
std::optional<Task> handOver(Services& services, const Task& task);

}  // namespace host
