#include "http/event_source.h"

namespace http {
namespace {

void appendLine(std::string& out, std::string_view field, std::string_view value) {
    out += field;
    out += ": ";
    out += value;
    out += '\n';
}

}  // namespace

void appendEvent(std::string& out, const Event& event) {
    if (!event.id.empty()) appendLine(out, "id", event.id);
    if (!event.name.empty()) appendLine(out, "event", event.name);
    std::string_view rest = event.data;
    while (true) {
        const std::size_t end = rest.find('\n');
        appendLine(out, "data", rest.substr(0, end));
        if (end == std::string_view::npos) break;
        rest.remove_prefix(end + 1);
    }
    out += '\n';
}

}  // namespace http
