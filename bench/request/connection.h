/// A client's stream connection on this machine.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

namespace request {

/// Closed with the object. What fails throws std::runtime_error. One thread.
class Connection {
public:
    /// To a Unix socket.
    explicit Connection(const std::string& path);
    /// To a TCP port on the loopback address.
    explicit Connection(std::uint16_t port);
    ~Connection();
    Connection(const Connection&) = delete;
    Connection& operator=(const Connection&) = delete;

    void send(const std::string& bytes);
    /// Appends what has come, waiting for something; false at the end.
    bool receive(std::string& bytes);
    /// Everything up to the end.
    std::string receiveAll();

private:
    int descriptor_ = -1;
};

}  // namespace request
