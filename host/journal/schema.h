/// The journal's tables, and how older ones become them.
#pragma once

#include <string>

#include "host/journal/database.h"

namespace host {

/// The version of the tables that this host writes.
inline constexpr int kSchemaVersion = 2;

/// The journal was written by a newer host; what() says so.
class NewerSchema : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

/// Sets the connection up and brings the tables to kSchemaVersion, in one transaction. A new
/// journal gets a random identity. Throws NewerSchema, before anything was changed, and
/// DatabaseError.
void prepareSchema(Database& database);

/// The first line of what the integrity check finds wrong; empty if nothing is.
std::string integrityFault(Database& database);

/// The journal's identity: 16 hexadecimal digits.
std::string journalIdentity(Database& database);
/// The key of the hashes that are left of secrets.
std::string journalKey(Database& database);
void setJournalKey(Database& database, const std::string& key);
/// The identity of the damaged journal in whose place this one came; empty if there was none, or it
/// is not known.
std::string formerIdentity(Database& database);
void setFormerIdentity(Database& database, const std::string& identity);

}  // namespace host
