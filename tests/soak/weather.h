/// What happens around the host.
#pragma once

#include "soak/host_process.h"
#include "soak/load/client.h"

namespace soak {

/// Kills children of the host, and stops the host and continues it.
class Weather {
public:
    Weather(World& world, HostProcess& host) : world_(world), host_(host) {}

    /// Does what is due.
    void pass();
    /// Fair weather from now on: the host runs.
    void clear();
    /// Kills the children that the host has left, which would outlive it when they are stopped.
    void killLeftChildren() const;

private:
    void killOneChild();

    World& world_;
    HostProcess& host_;
    double nextKill_ = 1;
    double nextStop_ = 5;
    double resumeAt_ = 0;
};

}  // namespace soak
