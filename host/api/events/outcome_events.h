/// The stream of outcomes, backed by the journal.
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "embedded/oxa_host.h"
#include "host/api/tasks/task_document.h"
#include "http/event_source.h"

namespace host {

struct Services;

/// What a reader of outcomes wants.
struct OutcomeWish {
    std::vector<oxa::Predicate> where;  ///< conditions on the outcome table, all of which must hold
    bool tasks = false;                 ///< the ends of tasks, too
    Outputs outputs = Outputs::Hidden;  ///< else rows are rowForReaders()
    std::string after;                  ///< the event after which to continue; empty: from now on
};

/// Each row is one event; so is each end of a task, named "task", if that is wanted. Both have an
/// identifier. Where events are missing because they are not kept any more stands one named "gap"
/// with the data {"missing": N}; N is null when that is not known.
///
/// A task that has no row satisfies conditions on TRANSID, COMMAND, TARGETMSN and ORIGINNODE only;
/// else its last row counts.
///
/// The services outlive the source. Null when the table makes no filter. Throws routes::BadRequest
/// for an event that cannot be one.
std::unique_ptr<http::EventSource> outcomeEvents(Services& services, const oxa::Table& table,
                                                 const OutcomeWish& wish);

}  // namespace host
