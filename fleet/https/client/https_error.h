/// Why a server was not asked, or has not answered.
#pragma once

#include <stdexcept>
#include <string>

namespace fleet {

/// what() is for people: which server, and what went wrong.
class HttpsError : public std::runtime_error {
public:
    enum class Kind {
        NotReached,   ///< there is no such server, or it takes no connection
        NotTrusted,   ///< somebody answers who cannot prove to be the server that is meant
        TooLate,      ///< the deadline passed first; the server may have done what it was asked
        NoAnswer,     ///< the connection broke; the server may have done what it was asked
        WrongAnswer,  ///< what came is no answer of HTTP, or is too long
        Cancelled,    ///< this side wanted it no more; the server may have done what it was asked
    };

    HttpsError(Kind kind, const std::string& text) : std::runtime_error(text), kind_(kind) {}
    Kind kind() const { return kind_; }

private:
    Kind kind_;
};

}  // namespace fleet
