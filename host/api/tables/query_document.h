/// The answer to a query as JSON.
#pragma once

#include <string>

#include "host/api/services.h"
#include "host/api/tables/watched_query.h"
#include "host/api/tasks/task_document.h"
#include "host/tables/query.h"

namespace host {

/// {"rows": [...]}, the rows exactly as the table gave them. On a guarded host these stand beside
/// them when there is something to say:
///
///   "full": [{"row", "column", "text", "complete"}]   what does not fit into a column; not
///   complete
///                                                     if even this is only a part of it
///   "warnings": [{"text", ...}]                       why there may be less than there should be;
///                                                     after the text the members of the command
std::string queryDocument(const Services& services, const Query& query, const WatchedAnswer& answer,
                          Outputs outputs);

}  // namespace host
