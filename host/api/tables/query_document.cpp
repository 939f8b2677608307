#include "host/api/tables/query_document.h"

#include <nlohmann/json.hpp>
#include <optional>

#include "host/api/schema.h"
#include "host/api/tasks/task_document.h"
#include "host/tables/plugin_facts.h"
#include "host/tables/table_documents.h"

namespace host {

Schema queryAnswerSchema, rowSchema;

namespace {

using Json = nlohmann::ordered_json;

/// Whether the row answers a GETCONFIG that went well.
bool isConfiguration(const oxa::Table& table, RowView row) {
    const oxa::Column* const command = table.find(std::string(plugin::kCommandColumn));
    const oxa::Column* const retval = table.find(std::string(plugin::kRetvalColumn));
    return table.name == plugin::kRequestTable && command != nullptr && retval != nullptr &&
           textField(*command, row) == plugin::kGetConfiguration &&
           integerField(*retval, row) == plugin::kAccepted;
}

/// The configuration in full, as the plug-in takes it from the output of its last command.
Json fullConfiguration(const Heard& heard, const CodePage& codePage) {
    const std::size_t begin = heard.output.find(plugin::kConfigurationBegin);
    const std::string bytes =
        begin == std::string::npos ? std::string() : heard.output.substr(begin);
    const std::string text = codePage.toUtf8(bytes);
    // Bytes that are no characters have been replaced: who wrote this back would change them.
    const bool faithful = codePage.fromUtf8(text) == bytes;
    return {{"row", 0},
            {"column", plugin::kContextColumn},
            {"text", text},
            {"complete", heard.outputComplete && faithful}};
}

std::string failureOf(const Command& command, const CodePage& codePage) {
    if (!command.error.empty()) return codePage.toUtf8(command.error);
    if (command.timedOut) return "it did not end in time";
    if (command.signal) return "it was ended by signal " + std::to_string(*command.signal);
    return "it ended with status " + std::to_string(command.exit.value_or(0));
}

/// Why the inventory may be empty although something is installed.
std::optional<Json> inventoryWarning(const Heard& heard, const CodePage& codePage,
                                     Outputs outputs) {
    if (heard.commands.empty()) return std::nullopt;
    const Command& program = heard.commands.back();
    if (!program.failed() && !heard.noInventory) return std::nullopt;
    const std::string reason =
        program.failed() ? failureOf(program, codePage) : "it did not print an inventory";
    Json warning = {
        {"text",
         "what is installed is not known, because the inventory program failed: " + reason}};
    warning.update(commandObject(program, codePage, outputs));
    return warning;
}

void add(std::string& document, const char* member, const Json& value) {
    document.pop_back();  // the closing brace
    document += ",\"";
    document += member;
    document += "\":";
    document +=
        Json::array({value}).dump(-1, ' ', false, nlohmann::json::error_handler_t::replace) + '}';
}

}  // namespace

std::string queryDocument(const Services& services, const Query& query, const WatchedAnswer& answer,
                          Outputs outputs) {
    const CodePage& codePage = services.codePage;
    std::string document = rowsDocument(*query.table, answer.rows, codePage);
    if (!services.guarded) return document;
    if (answer.rows.count() > 0 && isConfiguration(*query.table, rowOf(answer.rows, 0))) {
        add(document, "full", fullConfiguration(answer.heard, codePage));
    }
    if (query.table->name == plugin::kInventoryTable) {
        const auto warning = inventoryWarning(answer.heard, codePage, outputs);
        if (warning) add(document, "warnings", *warning);
    }
    return document;
}

nlohmann::ordered_json queryAnswerSchema(Components& components) {
    const nlohmann::ordered_json full = shape::object(
        "FullText", "A text that a column may have cut.",
        {{"row", shape::wholeNumber("the row, from 0")},
         {"column", shape::text("the column")},
         {"text", shape::text("the text")},
         {"complete", shape::yesOrNo("false: even this is a part, or holds bytes that are no "
                                     "characters")}});
    std::vector<shape::Property> members = commandProperties(components);
    members.insert(members.begin(), {"text", shape::text("why there may be less than there should "
                                                         "be")});
    const nlohmann::ordered_json warning = shape::object(
        "CommandWarning", "A warning, and the command that gave rise to it.", members);
    return shape::object(
        "QueryAnswer", "What a table answered.",
        {{"rows", shape::listOf("the rows", components.ref(rowSchema))},
         {"full", shape::listOf("texts that columns may have cut", full), Need::Optional},
         {"warnings", shape::listOf("why there may be less than there should be", warning),
          Need::Optional}});
}

}  // namespace host
