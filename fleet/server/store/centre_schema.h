/// The tables of the centre's database, and how older ones become them.
#pragma once

#include <string>

#include "sqlite/database.h"

namespace fleet {

/// The version of the tables that this centre writes.
inline constexpr int kCentreSchemaVersion = 3;

/// Makes all tables in a new database, in one transaction. Throws sqlite::DatabaseError.
void makeCentreTables(sqlite::Database& database);

/// Checks an existing database and brings it to kCentreSchemaVersion, in one transaction. Throws
/// StoreError, before anything was changed, when a newer centre has written it, or when it is no
/// centre's; sqlite::DatabaseError for everything else, and one of damage when it has no tables.
/// `name` is what messages call it.
void adoptCentreTables(sqlite::Database& database, const std::string& name);

}  // namespace fleet
