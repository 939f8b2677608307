#include "host/journal/event_position.h"

#include <charconv>

namespace host {
namespace {

constexpr std::size_t kLongestIdentity = 64;

}  // namespace

std::string textOf(const EventPosition& position) {
    return position.journal + '-' + std::to_string(position.number);
}

std::optional<EventPosition> positionIn(std::string_view text) {
    const std::size_t dash = text.rfind('-');
    if (dash == std::string_view::npos || dash == 0 || dash > kLongestIdentity) return std::nullopt;
    EventPosition position{std::string(text.substr(0, dash)), 0};
    const char* const end = text.data() + text.size();
    const auto [rest, error] = std::from_chars(text.data() + dash + 1, end, position.number);
    if (error != std::errc() || rest != end || position.number < 0) return std::nullopt;
    return position;
}

}  // namespace host
