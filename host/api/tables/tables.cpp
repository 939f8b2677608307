// GET /v1/tables

#include "host/api/route.h"
#include "host/api/services.h"
#include "host/tables/table_documents.h"

namespace host {

Endpoint getTables;

Answer getTables(Services& services, const Call&) {
    return jsonReply(200, tablesDocument(services.tables.all()));
}

}  // namespace host
