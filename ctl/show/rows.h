/// Result rows as the host gives them, and how they are printed.
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string>
#include <vector>

namespace ctl {

/// A column's text; empty when the row has no such column.
std::string textOf(const nlohmann::json& row, const std::string& column);

/// The row's RETVAL; 0 when it has none.
int returnCodeOf(const nlohmann::json& row);

/// The row's result in words, see describeResult().
std::string describeRow(const nlohmann::json& row);

/// Prints one JSON document; text that is no valid UTF-8 is mended, never refused.
void printJson(const nlohmann::json& document);

/// One column of a printed table.
struct TableColumn {
    std::string column;  ///< in the rows
    std::string title;   ///< above the table
};

/// Prints the rows as an aligned table with a line of titles.
void printTable(const nlohmann::json& rows, const std::vector<TableColumn>& columns);

/// Prints every column of every row as "COLUMN: value", empty ones left out, rows apart by an empty
/// line: the rows of some tables are far wider than a terminal.
void printRecords(const nlohmann::json& rows);

}  // namespace ctl
