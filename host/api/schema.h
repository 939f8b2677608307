/// What the host's endpoints describe their documents with.
#pragma once

#include "host/api/route.h"
#include "routes/description/schema.h"

namespace host {

namespace shape = routes::shape;

}  // namespace host
