/// Whose output a link shows, and for how long.
#pragma once

#include <cstddef>
#include <map>
#include <string>

#include "fleet/bus/messages/output_news.h"

namespace fleet {

/// Streams of output that operators want. Each ends by itself when nobody asks for it any more, so
/// that an operator who has gone away costs the host nothing. Times are those of a clock that never
/// goes back. One thread at a time.
class OutputLeases {
public:
    static constexpr std::size_t kMost = 4;

    /// Begins one. False if there are kMost that are still wanted.
    bool begin(const std::string& stream, Moment now);
    /// Somebody asks for it again. False if there is none such, or no more.
    bool renew(const std::string& stream, Moment now);
    /// Whether somebody still wants it.
    bool isWanted(const std::string& stream, Moment now) const;
    void end(const std::string& stream) { lasting_.erase(stream); }

private:
    std::map<std::string, Moment> lasting_;  ///< until when
};

}  // namespace fleet
