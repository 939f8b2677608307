#include "tables/table_schema.h"

#include <algorithm>

bool TableColumn::isNamed(const char* attribute) const {
    const char* at = name;
    for (; *at != '\0'; ++at, ++attribute) {
        const bool isLetter = *at >= 'a' && *at <= 'z';
        if (*attribute != (isLetter ? *at - 'a' + 'A' : *at)) return false;
    }
    return *attribute == '\0';
}

const TableColumn* TableSchema::find(const char* attribute) const {
    const TableColumn* const end = columns + columnCount;
    const TableColumn* const found = std::find_if(
        columns, end, [attribute](const TableColumn& column) { return column.isNamed(attribute); });
    return found == end ? nullptr : found;
}
