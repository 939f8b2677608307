/// Where a reader of the journal's events stands.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace host {

/// Behind the event of this number in the journal of this identity.
struct EventPosition {
    std::string journal;
    std::int64_t number = 0;
};

/// "<journal>-<number>"
std::string textOf(const EventPosition& position);

/// Reads such a text; nothing when it is not one.
std::optional<EventPosition> positionIn(std::string_view text);

}  // namespace host
