#include "host/tables/masked_row.h"

#include <cstddef>
#include <utility>

#include "host/tables/plugin_facts.h"
#include "host/tables/row_fields.h"
#include "secrets/masked.h"

namespace host {
namespace {

void replaceField(const oxa::Column& column, std::string text, std::string& row) {
    text.resize(static_cast<std::size_t>(column.length), ' ');
    row.replace(static_cast<std::size_t>(column.offset), text.size(), text);
}

}  // namespace

std::string maskedRow(const oxa::Table& table, std::string row) {
    for (const oxa::Column& column : table.columns) {
        if (!plugin::holdsFreeText(column.name)) continue;
        const std::string_view field = textField(column, row);
        if (!field.empty()) replaceField(column, secrets::masked(field), row);
    }
    return row;
}

std::string rowForReaders(const oxa::Table& table, std::string row) {
    const oxa::Column* const values = table.find(std::string(plugin::kMessageValuesColumn));
    if (values != nullptr && !textField(*values, row).empty()) replaceField(*values, "", row);
    return maskedRow(table, std::move(row));
}

}  // namespace host
