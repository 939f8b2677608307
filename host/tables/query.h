/// One query of a table.
#pragma once

#include <stdexcept>
#include <string>
#include <vector>

#include "embedded/oxa_host.h"

namespace host {

struct Query {
    const oxa::Table* table = nullptr;  ///< outlives the query
    std::vector<oxa::Predicate> where;  ///< combined with AND
};

/// The table did not answer; what() is the sentence for the client.
class QueryFailed : public std::runtime_error {
public:
    QueryFailed(const std::string& text, bool gone) : std::runtime_error(text), gone_(gone) {}
    /// True when the table is no longer offered at all.
    bool gone() const { return gone_; }

private:
    bool gone_;
};

/// Samples the table on the calling thread, for as long as it takes. Throws QueryFailed.
oxa::Rows run(const Query& query);

}  // namespace host
