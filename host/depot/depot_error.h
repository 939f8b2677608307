/// What the depot says when a request does not go with what it holds.
#pragma once

#include <stdexcept>
#include <string>

namespace host {

/// what() is a sentence for the client.
class DepotError : public std::runtime_error {
public:
    enum class Kind {
        LeadsOut,   ///< the path leads out of the depot
        NotThere,   ///< there is nothing of that name
        Forbidden,  ///< the host keeps it to itself, or may not touch it
        WrongKind,  ///< a directory where a file is needed, and the like
        Failed,     ///< there is no depot, or the file system does not work
    };

    DepotError(Kind kind, const std::string& text) : std::runtime_error(text), kind_(kind) {}
    Kind kind() const { return kind_; }

private:
    Kind kind_;
};

}  // namespace host
