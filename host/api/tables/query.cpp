// POST /v1/query

#include "host/tables/query.h"

#include <nlohmann/json.hpp>

#include "host/api/route.h"
#include "host/api/schema.h"
#include "host/api/services.h"
#include "host/api/tables/query_document.h"
#include "host/api/tables/watched_query.h"
#include "host/tables/conditions.h"
#include "host/tables/plugin_facts.h"

namespace host {
namespace {

std::vector<oxa::Predicate> queryConditions(const nlohmann::json& body, const oxa::Table& table,
                                            const Services& services) {
    std::vector<oxa::Predicate> conditions;
    const auto where = body.find("where");
    if (where == body.end()) return conditions;
    const ConditionReader reader(table, services.codePage);
    try {
        for (const nlohmann::json& condition : *where)
            conditions.push_back(reader.fromJson(condition));
    } catch (const UnknownColumn& unknown) {
        if (!services.guarded || table.name != plugin::kRequestTable) throw;
        Guards::refuseUnknownColumn(table, unknown.name());
    }
    return conditions;
}

bool isForced(const nlohmann::json& body) {
    const auto force = body.find("force");
    return force != body.end() && force->get<bool>();
}

}  // namespace

Endpoint postQuery;
Schema conditionsSchema;

http::Answer postQuery(Services& services, const Call& call) {
    const auto& name = call.body().at("table").get_ref<const std::string&>();
    const oxa::Table* const table = services.tables.find(name);
    if (table == nullptr) return http::errorReply(404, "there is no table \"" + name + "\"");
    if (call.peer().access < http::Access::Act && table->name != plugin::kInventoryTable) {
        return http::errorReply(
            403, table->name == plugin::kRequestTable
                     ? "you may only read from this host; a query on " + name + " acts"
                     : "you may only read from this host, and query " +
                           std::string(plugin::kInventoryTable) + " only");
    }
    const Query query{table, queryConditions(call.body(), *table, services)};
    const WatchedAnswer answer = runWatched(services, query, isForced(call.body()), call.peer());
    return http::jsonReply(200, queryDocument(services, query, answer, outputsFor(call.peer())));
}

nlohmann::ordered_json conditionsSchema(Components&) {
    const nlohmann::ordered_json value = {
        {"type", {"string", "integer"}},
        {"description", "of an integer column a number, or its digits as a string"}};
    nlohmann::ordered_json condition = shape::object(
        "Condition", "What a row must satisfy.",
        {{"column", shape::text("the name of a column")},
         {"op", shape::oneOf("like has a pattern, in which * stands for any characters",
                             {"=", "!=", "<", "<=", ">", ">=", "like"})},
         {"value", value}});
    condition["additionalProperties"] = false;
    nlohmann::ordered_json conditions = shape::listOf("Conditions, all of which hold.", condition);
    conditions["title"] = "Conditions";
    return conditions;
}

}  // namespace host
