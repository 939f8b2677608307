/// Reads single columns from the bytes of a row.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "embedded/oxa_host.h"

namespace host {

/// The table's column of that name, or null.
inline const oxa::Column* columnOf(const oxa::Table& table, std::string_view name) {
    return table.find(std::string(name));
}

/// The bytes of one row, which belong to somebody else.
using RowView = std::string_view;

inline RowView rowOf(const oxa::Rows& rows, std::size_t index) {
    return {rows.row(index), rows.rowSize};
}

/// A character column without its trailing blanks; empty when the row is too short for it.
inline std::string_view textField(const oxa::Column& column, RowView row) {
    const auto offset = static_cast<std::size_t>(column.offset);
    const auto length = static_cast<std::size_t>(column.length);
    if (column.offset < 0 || column.length < 0 || offset > row.size() ||
        length > row.size() - offset) {
        return {};
    }
    const std::string_view field = row.substr(offset, length);
    const std::size_t last = field.find_last_not_of(' ');
    return field.substr(0, last == std::string_view::npos ? 0 : last + 1);
}

/// An integer column; 0 when the row is too short for it.
inline std::int32_t integerField(const oxa::Column& column, RowView row) {
    std::int32_t value = 0;
    const auto offset = static_cast<std::size_t>(column.offset);
    if (column.offset < 0 || offset > row.size() || sizeof value > row.size() - offset) return 0;
    row.copy(reinterpret_cast<char*>(&value), sizeof value, offset);
    return value;
}

}  // namespace host
