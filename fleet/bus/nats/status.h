/// How an operation on the bus ended, and what came of it.
#pragma once

#include <string>
#include <utility>
#include <vector>

namespace fleet {

/// How an operation on the bus ended.
struct BusStatus {
    enum class Kind {
        Done,
        /// No answer by the deadline, nobody listens, or there is no connection. Whether the other
        /// side got it is not known.
        NoAnswer,
        /// The server does not allow it.
        Forbidden,
        /// The server or the client says no; nothing has changed.
        Refused
    };

    Kind kind = Kind::Done;
    int code = 0;      ///< the server's, with Refused; 0 if it gave none
    std::string text;  ///< for people; empty when done

    bool done() const { return kind == Kind::Done; }

    static BusStatus noAnswer(std::string why) { return {Kind::NoAnswer, 0, std::move(why)}; }
    static BusStatus forbidden(std::string what) { return {Kind::Forbidden, 0, std::move(what)}; }
    static BusStatus refused(int code, std::string why) {
        return {Kind::Refused, code, std::move(why)};
    }
};

using BusHeaders = std::vector<std::pair<std::string, std::string>>;

/// What came from the bus.
struct BusMessage {
    std::string subject;
    std::string reply;  ///< where an answer is wanted; empty if none is
    std::string data;
    BusHeaders headers;

    /// The first value of a header; nullptr if there is none.
    const std::string* header(const std::string& name) const {
        for (const auto& [key, value] : headers) {
            if (key == name) return &value;
        }
        return nullptr;
    }
};

}  // namespace fleet
