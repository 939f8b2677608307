/// The journal's database: the names that the journal's units use for it.
#pragma once

#include "sqlite/database.h"

namespace host {

using sqlite::Database;
using sqlite::DatabaseError;
using sqlite::Statement;

}  // namespace host
