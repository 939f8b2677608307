/// A request that makes no sense.
#pragma once

#include <stdexcept>

namespace routes {

/// what() is the sentence for the client.
class BadRequest : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

}  // namespace routes
