/// Keeps the streams of the journal's events filled.
#pragma once

#include <memory>
#include <thread>

#include "host/journal/journal.h"

namespace host {

/// A stream that is filled from the journal.
class PumpedStream {
public:
    virtual ~PumpedStream() = default;
    /// Takes the next events, if there are any and it has room for them. Returns whether it did.
    /// On the pump's thread. Throws DatabaseError, after which it is called again a second later.
    virtual bool advance() = 0;
};

/// One thread does it for all of them, because the journal is on a disk and filters are the
/// plug-in's code: neither may hold up the thread that serves all clients.
///
/// Any thread may call.
class EventPump {
public:
    /// The journal outlives this object.
    explicit EventPump(Journal& journal);
    ~EventPump();
    EventPump(const EventPump&) = delete;
    EventPump& operator=(const EventPump&) = delete;

    /// Fills this stream from now on, until nobody else holds it.
    void add(const std::shared_ptr<PumpedStream>& stream);
    /// A stream has room again.
    void wake();

private:
    struct State;
    static void work(State& state);

    const std::shared_ptr<State> state_;  ///< shared with those who may call when the pump has gone
    Journal& journal_;
    std::thread thread_;
};

}  // namespace host
