#include "host/tables/masked_row.h"

#include "host/tables/plugin_facts.h"
#include "host/tables/row_fields.h"
#include "secrets/masked.h"

namespace host {

std::string maskedRow(const oxa::Table& table, std::string row) {
    for (const oxa::Column& column : table.columns) {
        if (!plugin::holdsFreeText(column.name)) continue;
        const std::string_view field = textField(column, row);
        if (field.empty()) continue;
        std::string shown = secrets::masked(field);
        shown.resize(static_cast<std::size_t>(column.length), ' ');
        row.replace(static_cast<std::size_t>(column.offset), shown.size(), shown);
    }
    return row;
}

}  // namespace host
