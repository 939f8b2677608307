#include "host/api/tasks/output_position.h"

#include <charconv>

namespace host {
namespace {

/// Takes a number that is not negative from the beginning of the text. Returns false when there is
/// none.
template <typename Number>
bool takeNumber(std::string_view& text, Number& number) {
    if (text.empty() || text.front() == '-') return false;
    const char* const end = text.data() + text.size();
    const auto [rest, error] = std::from_chars(text.data(), end, number);
    if (error != std::errc()) return false;
    text.remove_prefix(static_cast<std::size_t>(rest - text.data()));
    return true;
}

bool takeDash(std::string_view& text) {
    if (text.empty() || text.front() != '-') return false;
    text.remove_prefix(1);
    return true;
}

}  // namespace

std::string textOf(const OutputPosition& position) {
    return std::to_string(position.run) + '-' + std::to_string(position.bytes[0]) + '-' +
           std::to_string(position.bytes[1]);
}

std::optional<OutputPosition> outputPositionIn(std::string_view text) {
    OutputPosition position;
    const bool isOne = takeNumber(text, position.run) && takeDash(text) &&
                       takeNumber(text, position.bytes[0]) && takeDash(text) &&
                       takeNumber(text, position.bytes[1]);
    if (!isOne || !text.empty()) return std::nullopt;
    return position;
}

}  // namespace host
