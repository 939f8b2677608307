/// Runs one query.
#pragma once

#include "host/api/router.h"
#include "host/http/reply.h"
#include "host/outcomes/task_watch.h"

namespace host {

/// Samples the table on the calling thread, for as long as it takes, and writes the answer. Never
/// throws: what goes wrong becomes an answer with status 500.
Reply answerQuery(const QueryRequest& request, const CodePage& codePage, TaskWatch& watch);

}  // namespace host
