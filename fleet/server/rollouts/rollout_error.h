/// Why a roll-out was not made, or not changed.
#pragma once

#include <stdexcept>
#include <string>

namespace fleet {

/// what() is for the operator. Nothing was changed.
class RolloutError : public std::runtime_error {
public:
    enum class Kind {
        Invalid,   ///< the request itself is wrong
        NotFound,  ///< there is no such roll-out
        Conflict   ///< the roll-out's state does not allow it
    };

    RolloutError(Kind kind, const std::string& text) : std::runtime_error(text), kind_(kind) {}

    Kind kind() const { return kind_; }

private:
    Kind kind_;
};

/// Throws one of Kind::Invalid unless the condition holds.
inline void insistThat(bool holds, const std::string& otherwise) {
    if (!holds) throw RolloutError(RolloutError::Kind::Invalid, otherwise);
}

}  // namespace fleet
