/// The declaration of a table's columns. Column info, filter tests, printing and the row's size all
/// derive from it.
#pragma once

#include <array>
#include <cstddef>
#include <type_traits>

#include "platform/oxa.h"
#include "platform/ras1.h"

/// One column and its place in the table's row record.
struct TableColumn {
    const char* name;  ///< lower case; requesters use the same name in upper case
    int offset;        ///< bytes from the row's start
    int length;        ///< bytes
    int type;          ///< OXA_TYPE_...

    /// Whether `attribute`, an upper-case name from a requester, is this column's name.
    bool isNamed(const char* attribute) const;
};

/// The column for a field of the row record, which is an int or an array of char.
template <typename Field>
constexpr TableColumn makeColumn(const char* name, std::size_t offset) {
    static_assert(std::is_same_v<Field, int> || std::is_same_v<std::remove_extent_t<Field>, char>,
                  "columns are integers or characters");
    return {name, static_cast<int>(offset), static_cast<int>(sizeof(Field)),
            std::is_same_v<Field, int> ? OXA_TYPE_INTEGER : OXA_TYPE_CHARACTER};
}

/// The column for a field by its name. A macro, because only the preprocessor turns a name into
/// text.
#define ZAV_COLUMN(Row, field) makeColumn<decltype(Row::field)>(#field, offsetof(Row, field))

/// Whether the columns are contiguous and cover the whole row.
template <std::size_t Count>
constexpr bool coversRow(const std::array<TableColumn, Count>& columns, std::size_t rowSize) {
    std::size_t end = 0;
    for (const TableColumn& column : columns) {
        if (static_cast<std::size_t>(column.offset) != end) return false;
        end += static_cast<std::size_t>(column.length);
    }
    return end == rowSize;
}

/// One table. Everything it points to has static storage.
struct TableSchema {
    const char* requestClass;  ///< printed with each request
    const TableColumn* columns;
    int columnCount;
    unsigned rowSize;  ///< bytes
    RAS1_UNIT* unit;   ///< the unit under which the table's requests trace

    /// Finds a column by its upper-case name; null when there is none.
    const TableColumn* find(const char* attribute) const;
};
