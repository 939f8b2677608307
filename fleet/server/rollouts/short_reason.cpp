#include "fleet/server/rollouts/short_reason.h"

#include <algorithm>
#include <nlohmann/json.hpp>

#include "fleet/bus/messages/document.h"

using nlohmann::json;

namespace fleet {
namespace {

constexpr std::size_t kMostReasonBytes = 300;

std::string memberOf(const json& object, const char* name) {
    const auto member = object.find(name);
    if (member == object.end()) return "";
    if (member->is_string()) return member->get<std::string>();
    return member->is_number_integer() ? member->dump() : "";
}

/// The last event that is a row: a task can have events of which only the fact is known.
std::string lastEventOf(const json& document) {
    const auto events = document.find("events");
    if (events == document.end() || !events->is_array()) return "";
    const auto row = std::find_if(events->rbegin(), events->rend(),
                                  [](const json& event) { return event.is_object(); });
    if (row == events->rend()) return "";
    std::string text;
    const std::string code = memberOf(*row, "RETVAL");
    if (!code.empty()) text = "return code " + code;
    for (const char* const column : {"RETMSGID", "RETMSGPARM"}) {
        const std::string value = memberOf(*row, column);
        if (!value.empty()) text += (text.empty() ? "" : ", ") + value;
    }
    return text;
}

/// Cuts between characters, never in the middle of one.
std::string printableLine(std::string text) {
    if (text.size() > kMostReasonBytes) {
        std::size_t end = kMostReasonBytes;
        while (end > 0 && (static_cast<unsigned char>(text[end]) & 0xC0U) == 0x80U)
            --end;
        text.resize(end);
    }
    const auto isControl = [](unsigned char c) { return c < 0x20 || c == 0x7F; };
    std::replace_if(text.begin(), text.end(), isControl, ' ');
    return text;
}

}  // namespace

std::string shortReason(const Outcome& outcome) {
    if (outcome.task.empty()) return "";
    try {
        const json document = readDocument(outcome.task);
        const std::string reason = memberOf(document, "reason");
        return printableLine(reason.empty() ? lastEventOf(document) : reason);
    } catch (const MessageError&) {
        return "";
    }
}

}  // namespace fleet
