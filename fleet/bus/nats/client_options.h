/// Turns options into those of the C client library. Included by this folder's sources only.
#pragma once

#include <atomic>
#include <cstdint>
#include <string>

#include "fleet/bus/nats/client.h"
#include "fleet/bus/nats/options.h"

namespace fleet {

/// What the client library is given to call when it connects. It must outlive the connection and
/// stay where it is.
class Identity {
public:
    explicit Identity(const ConnectionOptions& options) : options_(options) {}
    Identity(const Identity&) = delete;
    Identity& operator=(const Identity&) = delete;

    const ConnectionOptions& options() const { return options_; }

    /// New ones for one attempt: connections that were given the same would share them. Null, with
    /// the reason in `why`, if the client library does not take something.
    NatsOptions makeOptions(std::string& why);

    std::uint64_t failedReconnects() const { return failedReconnects_; }
    std::uint64_t unsendableSignatures() const { return unsendable_; }

private:
    static natsStatus giveToken(char** token, char** error, void* identity);
    static natsStatus sign(char** error, unsigned char** signature, int* length, const char* nonce,
                           void* identity);
    static std::int64_t delay(natsConnection* connection, int attempts, void* identity);

    natsStatus setCredentials(natsOptions* options);
    natsStatus setTls(natsOptions* options) const;
    natsStatus setReconnecting(natsOptions* options);
    natsStatus setRest(natsOptions* options) const;

    const ConnectionOptions options_;
    std::atomic<std::uint64_t> failedReconnects_{0};
    std::atomic<std::uint64_t> unsendable_{0};
};

}  // namespace fleet
