/// Server-sent events: what a stream sends, and how an event is written.
#pragma once

#include <functional>
#include <string>
#include <string_view>

namespace http {

/// Where a stream gets its events. It collects them from the moment it is made, so that whoever
/// reads the response head has already missed nothing.
///
/// A stream owns its source and destroys it on the I/O thread when the client has gone or the
/// server is torn down. The destructor must not wait for other clients.
class EventSource {
public:
    virtual ~EventSource() = default;

    /// The stream can send from now on. Called once, on the I/O thread. `wake` is to be called
    /// whenever take() would return something after it had nothing, and at once if it would now.
    /// It may be called from any thread, returns at once and may outlive the source.
    virtual void start(std::function<void()> wake) = 0;

    /// All that has come since the last call, as text of an event stream; empty when nothing has.
    /// I/O thread.
    virtual std::string take() = 0;

    /// Whether all that has been published so far has been taken. I/O thread.
    virtual bool empty() const = 0;

    /// Whether nothing more will ever come: the stream then ends once everything is sent. `wake`
    /// has been called since that is so. I/O thread.
    virtual bool over() const { return false; }

    /// What a client that gets no event at all names to continue; empty if this source numbers no
    /// events. One line. I/O thread.
    virtual std::string position() const { return {}; }
};

/// One event. Texts that are empty are left out.
struct Event {
    std::string_view data;  ///< may have several lines
    std::string_view name;  ///< the type of the event; one line
    std::string_view id;    ///< what a client names to continue after this event; one line
};

/// Appends the event as it goes over the wire.
void appendEvent(std::string& out, const Event& event);

/// A line that clients ignore; it shows that the connection is alive.
inline constexpr std::string_view kHeartbeat = ":\n\n";

}  // namespace http
