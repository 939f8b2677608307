/// What a guard says when it holds a request back.
#pragma once

#include <stdexcept>
#include <string>
#include <utility>

namespace host {

/// Thrown before anything was handed to the plug-in. what() is the reason, a sentence for the
/// client.
class Refusal : public std::runtime_error {
public:
    /// Whether the request could be right at another time or on another machine.
    enum class Kind {
        Conflict,   ///< it does not go with what is there now; answered with 409
        Malformed,  ///< it never makes sense; answered with 400
    };

    Refusal(std::string guard, const std::string& reason, std::string hint,
            Kind kind = Kind::Conflict)
        : std::runtime_error(reason),
          guard_(std::move(guard)),
          hint_(std::move(hint)),
          kind_(kind) {}

    /// The guard's name, as the guards' page lists it.
    const std::string& guard() const { return guard_; }
    /// The way out, a sentence; empty if there is none.
    const std::string& hint() const { return hint_; }
    unsigned httpStatus() const { return kind_ == Kind::Malformed ? 400 : 409; }

private:
    std::string guard_;
    std::string hint_;
    Kind kind_;
};

}  // namespace host
