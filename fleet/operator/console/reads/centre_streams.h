/// The centre's event streams on their way to browsers.
#pragma once

#include <functional>
#include <memory>
#include <mutex>
#include <variant>

#include "fleet/https/client/https_client.h"
#include "fleet/loop/run_list.h"
#include "http/event_source.h"

namespace fleet {

/// Each stream has a connection and a thread, both of which end with its browser. It holds a
/// bounded number of bytes that its browser has not taken; beyond that the centre is read no
/// further, and deals with a slow reader as it does with all of them. Any thread.
class CentreStreams {
public:
    /// Reads a stream to its end, as HttpsClient::read().
    using Read = std::function<HttpsAnswer(HttpsClient& client, const HttpsClient::TakePiece& take,
                                           const HttpsClient::OnBegin& onBegin)>;

    /// A stream, or what was answered in its place.
    using Opened = std::variant<std::unique_ptr<http::EventSource>, HttpsAnswer>;

    CentreStreams();
    /// Nothing that open() made may live any longer.
    ~CentreStreams();
    CentreStreams(const CentreStreams&) = delete;
    CentreStreams& operator=(const CentreStreams&) = delete;

    /// The stream once it has begun, whole events as the centre writes them. Blocks until then.
    /// Throws what `read` throws, and ctl::Failure if there are too many streams.
    Opened open(std::unique_ptr<HttpsClient> client, Read read);

private:
    class Reader;

    std::shared_ptr<Reader> start(std::unique_ptr<HttpsClient> client, Read read);

    std::mutex mutex_;
    RunList<Reader> readers_;
};

}  // namespace fleet
