/// A client of the embedded RPC runtime, as far as the kit needs one.
#pragma once

#include <cstdint>
#include <string>

#include "conformance/driver.h"

/// One association with a server on a port of 127.0.0.1. Blocks; one thread at a time.
class DceClient {
public:
    /// Connects and binds to an interface. Throws std::runtime_error when the server cannot be
    /// talked to.
    DceClient(std::uint16_t port, const uuid__t& interface, std::uint32_t version);
    ~DceClient();
    DceClient(const DceClient&) = delete;
    DceClient& operator=(const DceClient&) = delete;

    /// Calls an operation. Without the interface the fault is rpc__s_unknown_if. Throws
    /// std::runtime_error when there is no answer.
    conformance::CallResult call(std::uint16_t operation, const std::string& parameters);

private:
    void send(const std::string& bytes);
    /// The next packet, header included.
    std::string receive();
    std::string receiveBytes(std::size_t count);

    const int socket_;
    bool bound_ = false;
};
