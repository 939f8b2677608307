#include "ctl/client/http/event_parser.h"

#include "ctl/client/failure.h"
#include "ctl/client/http/bounded_json.h"

namespace ctl {
namespace {

/// Takes the value of a line "name: value" if it has this name. A blank after the colon is not part
/// of the value.
bool takeField(const std::string& line, const std::string& name, std::string& value) {
    if (line.compare(0, name.size(), name) != 0) return false;
    if (line.size() == name.size()) {
        value.clear();
        return true;
    }
    if (line[name.size()] != ':') return false;
    const std::size_t start = name.size() + 1;
    value = line.substr(start < line.size() && line[start] == ' ' ? start + 1 : start);
    return true;
}

}  // namespace

std::vector<ServerEvent> EventParser::feed(const char* bytes, std::size_t length) {
    std::vector<ServerEvent> complete;
    if (line_.size() + event_.data.size() + length > kMostBytes) {
        throw Failure(kNoHost, "the host sent an event that is larger than 64 MiB");
    }
    for (std::size_t i = 0; i < length; ++i) {
        if (bytes[i] == '\n') {
            endLine(complete);
        } else {
            line_ += bytes[i];
        }
    }
    return complete;
}

void EventParser::endLine(std::vector<ServerEvent>& complete) {
    if (!line_.empty() && line_.back() == '\r') line_.pop_back();
    std::string value;
    if (line_.empty()) {
        if (hasData_) complete.push_back(event_);
        event_ = ServerEvent{};
        hasData_ = false;
    } else if (takeField(line_, "data", value)) {
        if (hasData_) event_.data += '\n';
        event_.data += value;
        hasData_ = true;
    } else if (takeField(line_, "event", value)) {
        event_.type = value;
    } else if (takeField(line_, "id", value)) {
        event_.id = value;
    }
    line_.clear();
}

}  // namespace ctl
