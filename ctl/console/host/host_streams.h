/// The host's event streams on their way to browsers.
#pragma once

#include <boost/beast/core/flat_buffer.hpp>
#include <boost/beast/http/buffer_body.hpp>
#include <boost/beast/http/parser.hpp>
#include <memory>
#include <string>

#include "http/event_source.h"
#include "system/file_descriptor.h"

namespace console {

/// A stream whose head has been read from the host.
struct BegunStream {
    using Parser = boost::beast::http::response_parser<boost::beast::http::buffer_body>;

    sys::FileDescriptor connection;    ///< a Unix socket
    boost::beast::flat_buffer buffer;  ///< what has come behind the head
    std::unique_ptr<Parser> parser;
    std::string position;  ///< see http::EventSource
};

/// Carries streams on a thread of its own, whatever their number. Each holds a bounded number of
/// bytes that its browser has not taken; beyond that the host is read no further, and deals with a
/// slow reader as it does with all of them. A stream ends with the host's.
class HostStreams {
public:
    /// Throws std::runtime_error.
    HostStreams();
    /// Nothing that carry() made may live any longer.
    ~HostStreams();
    HostStreams(const HostStreams&) = delete;
    HostStreams& operator=(const HostStreams&) = delete;

    /// Passes on whole events, as the host wrote them. Any thread.
    std::unique_ptr<http::EventSource> carry(BegunStream stream);

private:
    struct Implementation;
    const std::unique_ptr<Implementation> implementation_;
};

}  // namespace console
