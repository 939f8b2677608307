/// Rows as text, in 80 columns. What is longer goes on below.
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string>
#include <vector>

namespace ctl {

struct TableColumn {
    std::string column;  ///< in the rows
    std::string title;   ///< above the table
};

/// The chosen columns as an aligned table with a line of titles.
std::string tableText(const nlohmann::json& rows, const std::vector<TableColumn>& columns);

/// All columns of all rows, a line "COLUMN  value" each, with an empty line between rows. Empty
/// columns are left out. For rows that are far wider than a terminal.
std::string recordsText(const nlohmann::json& rows);

}  // namespace ctl
