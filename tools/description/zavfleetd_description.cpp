#include "fleet/server/api/openapi.h"
#include "fleet/server/api/routes.h"
#include "tools/description/description.h"

std::string description() {
    return fleet::describe(fleet::apiRoutes());
}
