/// One client's subscription as a stream of server-sent events.
#pragma once

#include <boost/beast/http/empty_body.hpp>
#include <boost/beast/http/serializer.hpp>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "host/http/server_core.h"
#include "host/outcomes/event_queue.h"

namespace host {

/// Each row is one event, "data: {...}", in the order in which the rows came. When the client reads
/// too slowly and rows are lost, one event "event: overflow" with "data: {"lost": N}" stands in
/// their place and the stream goes on: whoever waits for one outcome still gets it.
///
/// The stream has no time-out and sends nothing of its own accord; it ends when the client closes
/// its connection or the host ends.
class EventStream final : public Connection, public std::enable_shared_from_this<EventStream> {
public:
    /// `table` outlives the stream.
    EventStream(ServerCore& core, const oxa::Table& table);

    /// Opens the subscription; rows are kept from now on. False when the table takes none. Runs the
    /// table's code, so not for the I/O thread.
    bool subscribe(const std::vector<oxa::Predicate>& where);
    /// Takes over the client's connection, enters the server's books and sends head and rows.
    void start(Stream stream);
    /// Puts the subscription aside while the server ends.
    void retire();

    bool quiet() const override;
    void prepareForEnd() override {}

private:
    using Error = boost::beast::error_code;
    using Head = boost::beast::http::response<boost::beast::http::empty_body>;

    void awaitHangUp();
    void writeHead();
    void pump();
    void onWritten(Error error);
    std::string render(const EventQueue::Batch& batch) const;
    void close();

    ServerCore& core_;
    const oxa::Table& table_;
    std::shared_ptr<EventQueue> queue_;
    std::unique_ptr<oxa::Subscription> subscription_;
    std::optional<Stream> stream_;
    Head head_;
    std::optional<boost::beast::http::response_serializer<boost::beast::http::empty_body>>
        headWriter_;
    std::string out_;
    bool writing_ = false;
    bool closed_ = false;
};

}  // namespace host
