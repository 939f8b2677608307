/// The rows of the host's route table.
#pragma once

#include "routes/bad_request.h"
#include "routes/call.h"
#include "routes/route.h"

namespace host {

struct Services;

using routes::Call;
using routes::Components;
using routes::JsonType;
using routes::Member;
using routes::Need;
using routes::Others;
using routes::Parameter;
using routes::RouteAnswer;
using routes::Runs;
using routes::Schema;
using routes::StreamEvent;
using routes::Type;

/// What its endpoints throw as BadRequest is answered with 400, as Refusal with 409 or 400, as
/// DepotError with 400, 403, 404 or 500, as QueryFailed with 404 or 500.
using Route = routes::Route<Services>;
using Endpoint = Route::Endpoint;

}  // namespace host
