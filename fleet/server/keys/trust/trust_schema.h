/// The tables of the database of who may take part, and how older ones become them.
#pragma once

#include <string>

#include "sqlite/database.h"

namespace fleet {

/// The version of the tables that this centre writes.
inline constexpr int kTrustSchemaVersion = 1;

/// Makes all tables in a new database, in one transaction. Throws sqlite::DatabaseError.
void makeTrustTables(sqlite::Database& database);

/// Checks an existing database and brings it to kTrustSchemaVersion. Throws KeysError, before
/// anything was changed, if it is damaged, newer, or none; `name` is what that calls it.
void adoptTrustTables(sqlite::Database& database, const std::string& name);

}  // namespace fleet
