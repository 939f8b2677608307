// GET /v1/tables

#include "host/api/route.h"
#include "host/api/schema.h"
#include "host/api/services.h"
#include "host/tables/table_documents.h"

namespace host {

Endpoint getTables;
Schema tablesSchema, rowSchema;

http::Answer getTables(Services& services, const Call&) {
    return http::jsonReply(200, tablesDocument(services.tables.all()));
}

nlohmann::ordered_json tablesSchema(Components&) {
    const nlohmann::ordered_json column = shape::object(
        "Column", "A column of a table.",
        {{"name", shape::text("its name, in capitals")},
         {"offset", shape::wholeNumber("where it begins in a row, in bytes")},
         {"length", shape::wholeNumber("its length in bytes")},
         {"type", shape::wholeNumber("3: a signed integer of 32 bits; 9: characters")}});
    const nlohmann::ordered_json table =
        shape::object("Table", "A table.",
                      {{"application", shape::text("the application that it belongs to")},
                       {"name", shape::text("its name")},
                       {"columns", shape::listOf("its columns, in their order", column)}});
    return shape::object("Tables", "The tables of the plug-in.",
                         {{"tables", shape::listOf("one after the other", table)}});
}

nlohmann::ordered_json rowSchema(Components&) {
    return {{"title", "Row"},
            {"type", "object"},
            {"additionalProperties", {{"type", {"string", "integer"}}}},
            {"description",
             "A row of a table: its columns in their order, characters without the blanks at the "
             "end, integers as numbers."}};
}

}  // namespace host
