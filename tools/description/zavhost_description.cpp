#include "host/api/openapi.h"
#include "host/api/routes.h"
#include "tools/description/description.h"

std::string description() {
    return host::describe(host::routes());
}
