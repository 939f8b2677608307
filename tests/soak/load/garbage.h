/// Clients that send what makes no sense.
#pragma once

#include "soak/load/client.h"

namespace soak {

/// Sends bytes to one of the host's sockets, all at once or drop by drop, and waits for a while for
/// what the host says to it.
class GarbageClient final : public Client {
public:
    enum class Socket { Requests, Transfers };
    GarbageClient(World& world, Socket socket);

protected:
    bool begin() override;
    bool proceed(bool readable, bool writable) override;

private:
    void checkAnswer();

    const Socket socket_;
    std::size_t dropBytes_ = 0;  ///< 0: all at once
    bool mayEndSending_ = false;
    bool checked_ = false;
    double leavesAt_ = 0;
};

/// Holds a connection and does little with it, so that the host runs out of places.
class Squatter final : public Client {
public:
    Squatter(World& world, double stays);

protected:
    bool begin() override;
    bool proceed(bool readable, bool writable) override;

private:
    const double stays_;
    double leavesAt_ = 0;
    bool answered_ = false;
};

}  // namespace soak
