#include "host/tables/query.h"

#include <cstdio>

namespace host {

oxa::Rows run(const Query& query) {
    oxa::Rows rows;
    const std::string& table = query.table->name;
    const int status = oxa::query(table, query.where, rows);
    if (status == OXA_OK) return rows;
    if (status == OXA_GONE) throw QueryFailed("table " + table + " is no longer offered", true);
    char number[16];
    std::snprintf(number, sizeof number, "0x%08X", static_cast<unsigned>(status));
    throw QueryFailed("table " + table + " failed with status " + number, false);
}

}  // namespace host
