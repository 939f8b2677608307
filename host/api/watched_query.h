/// A query with everything that is noticed while it runs.
#pragma once

#include "host/api/services.h"
#include "host/commands/recorder.h"
#include "host/http/peer.h"
#include "host/tables/query.h"

namespace host {

struct WatchedAnswer {
    oxa::Rows rows;
    Heard heard;  ///< on the query's thread
};

/// Runs the query on the calling thread; a request becomes a task of this peer once the guards have
/// admitted it. `force` passes the guard of products. Throws Refusal and QueryFailed.
WatchedAnswer runWatched(Services& services, const Query& query, bool force, const Peer& peer);

}  // namespace host
