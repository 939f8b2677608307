#include "host/tables/table_documents.h"

#include <nlohmann/json.hpp>

namespace host {
namespace {

using Json = nlohmann::ordered_json;

/// Replaces bytes that are not UTF-8, where the library would throw by default.
std::string dump(const Json& document) {
    return document.dump(-1, ' ', false, Json::error_handler_t::replace);
}

Json rowObject(const oxa::Table& table, RowView row, const CodePage& codePage) {
    Json object = Json::object();
    for (const oxa::Column& column : table.columns) {
        if (column.type == OXA_TYPE_INTEGER) {
            object.push_back({column.name, integerField(column, row)});
        } else {
            object.push_back({column.name, codePage.toUtf8(textField(column, row))});
        }
    }
    return object;
}

}  // namespace

std::string rowDocument(const oxa::Table& table, RowView row, const CodePage& codePage) {
    return dump(rowObject(table, row, codePage));
}

std::string rowsDocument(const oxa::Table& table, const oxa::Rows& rows, const CodePage& codePage) {
    std::string document = "{\"rows\":[";
    for (std::size_t i = 0; i < rows.count(); ++i) {
        if (i > 0) document += ',';
        document += rowDocument(table, rowOf(rows, i), codePage);
    }
    return document + "]}";
}

std::string tablesDocument(const std::vector<oxa::Table>& tables) {
    Json list = Json::array();
    for (const oxa::Table& table : tables) {
        Json columns = Json::array();
        for (const oxa::Column& column : table.columns) {
            columns.push_back({{"name", column.name},
                               {"offset", column.offset},
                               {"length", column.length},
                               {"type", column.type}});
        }
        list.push_back({{"application", table.application},
                        {"name", table.name},
                        {"columns", std::move(columns)}});
    }
    return dump({{"tables", std::move(list)}});
}

}  // namespace host
