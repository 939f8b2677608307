/// Tables and rows as JSON. All documents are valid UTF-8, whatever a table holds.
#pragma once

#include <string>
#include <vector>

#include "embedded/oxa_host.h"
#include "host/tables/code_page.h"
#include "host/tables/row_fields.h"

namespace host {

/// One row: an object with the upper-case column names in the table's order; character values
/// without trailing blanks, integers as numbers.
std::string rowDocument(const oxa::Table& table, RowView row, const CodePage& codePage);

/// {"rows": [...]}
std::string rowsDocument(const oxa::Table& table, const oxa::Rows& rows, const CodePage& codePage);

/// {"tables": [{"application", "name", "columns": [{"name", "offset", "length", "type"}]}]}; the
/// type is the framework's code.
std::string tablesDocument(const std::vector<oxa::Table>& tables);

}  // namespace host
