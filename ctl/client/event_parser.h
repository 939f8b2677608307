/// Server-sent events: from the bytes of a stream to its events.
#pragma once

#include <string>
#include <vector>

namespace ctl {

struct ServerEvent {
    std::string type = "message";
    std::string data;
};

/// Takes the stream's bytes in pieces of any size.
class EventParser {
public:
    /// The events that are complete with these bytes.
    std::vector<ServerEvent> feed(const char* bytes, std::size_t length);

private:
    void endLine(std::vector<ServerEvent>& complete);

    std::string line_;
    ServerEvent event_;
    bool hasData_ = false;
};

}  // namespace ctl
