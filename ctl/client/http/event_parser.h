/// Server-sent events: from the bytes of a stream to its events.
#pragma once

#include <string>
#include <vector>

namespace ctl {

struct ServerEvent {
    std::string type = "message";
    std::string data;
    std::string id;  ///< what to name to continue behind this event; empty if it has none
};

class EventParser {
public:
    /// Takes the next bytes of the stream, as many or few as there are. Returns the events that are
    /// complete with them. Throws Failure(kNoHost) when an event grows beyond kMostBytes.
    std::vector<ServerEvent> feed(const char* bytes, std::size_t length);

private:
    void endLine(std::vector<ServerEvent>& complete);

    std::string line_;
    ServerEvent event_;
    bool hasData_ = false;
};

}  // namespace ctl
