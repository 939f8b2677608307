/// What the centre's endpoints describe their documents with.
#pragma once

#include "routes/description/schema.h"

namespace fleet {

namespace shape = routes::shape;

using routes::Components;
using routes::Need;
using routes::Schema;

/// Those that documents of several subjects refer to.
Schema timeSchema, roleSchema, factsSchema, hostSchema, hostStateSchema, orderSchema,
    orderStateSchema;
Schema rolloutSchema, partSchema, partStateSchema, ordersSchema;

/// A number that need not be whole.
inline shape::Json numberShape(const char* doc) {
    return {{"type", "number"}, {"description", doc}};
}

/// Labels of a host: texts by their names.
inline shape::Json labelsShape(const char* doc) {
    return {
        {"type", "object"}, {"additionalProperties", {{"type", "string"}}}, {"description", doc}};
}

}  // namespace fleet
