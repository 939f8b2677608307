/// By what a request belongs to a session.
#pragma once

#include <string>

namespace fleet {

/// The token of a session, secret. Those of browsers are another kind: neither counts in the place
/// of the other.
struct SessionProof {
    std::string token;
    bool isBrowsers = false;  ///< it is that of a browser, which may only read
};

}  // namespace fleet
