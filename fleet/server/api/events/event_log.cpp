#include "fleet/server/api/events/event_log.h"

#include <algorithm>
#include <charconv>
#include <utility>

#include "fleet/bus/messages/order.h"

namespace fleet {
namespace {

constexpr std::size_t kRunDigits = 16;

}  // namespace

std::string eventIdOf(const EventPlace& place) {
    return place.run + '-' + std::to_string(place.number);
}

std::optional<EventPlace> eventPlaceIn(std::string_view text) {
    constexpr std::string_view kHex = "0123456789abcdef";
    const std::size_t dash = text.find('-');
    if (dash != kRunDigits || text.find_first_not_of(kHex) != dash) return std::nullopt;
    EventPlace place{std::string(text.substr(0, dash)), 0};
    const char* const end = text.data() + text.size();
    const auto read = std::from_chars(text.data() + dash + 1, end, place.number);
    if (read.ec != std::errc() || read.ptr != end) return std::nullopt;
    return place;
}

EventLog::EventLog(const Limits& limits)
    : limits_(limits), run_(makeOrderId().substr(0, kRunDigits)) {}

void EventLog::add(std::vector<FleetEvent> events) {
    const std::lock_guard lock(mutex_);
    for (FleetEvent& event : events) {
        bytes_ += event.data.size();
        events_.push_back(std::make_shared<const FleetEvent>(std::move(event)));
        ++last_;
    }
    while (events_.size() > limits_.events || bytes_ > limits_.bytes) {
        bytes_ -= events_.front()->data.size();
        events_.pop_front();
    }
}

std::uint64_t EventLog::last() const {
    const std::lock_guard lock(mutex_);
    return last_;
}

std::uint64_t EventLog::first() const {
    const std::lock_guard lock(mutex_);
    return last_ - events_.size() + 1;
}

std::vector<EventLog::Numbered> EventLog::after(std::uint64_t number, std::size_t most) const {
    const std::lock_guard lock(mutex_);
    std::vector<Numbered> found;
    const std::uint64_t first = last_ - events_.size() + 1;
    for (std::uint64_t next = std::max(number + 1, first); next <= last_ && found.size() < most;
         ++next) {
        found.push_back({next, events_[static_cast<std::size_t>(next - first)]});
    }
    return found;
}

}  // namespace fleet
