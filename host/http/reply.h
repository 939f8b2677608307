/// An answer before it becomes HTTP.
#pragma once

#include <string>
#include <utility>

#include "host/api/router.h"
#include "host/tables/json_documents.h"

namespace host {

struct Reply {
    unsigned status = 200;
    std::string body;   ///< JSON
    std::string allow;  ///< value of the Allow field; none when empty
};

inline Reply errorReply(unsigned status, std::string_view text) {
    return {status, errorDocument(text), ""};
}

inline Reply refusalReply(const Refusal& refusal) {
    return {refusal.status, errorDocument(refusal.text), refusal.allow};
}

}  // namespace host
