/// The host that is soaked.
#pragma once

#include <sys/types.h>

#include <string>

#include "soak/soak_home.h"

namespace soak {

class HostProcess {
public:
    /// Starts the host on the home and returns when it is ready; throws std::runtime_error when it
    /// does not get there. It dies with this process, whatever ends that.
    HostProcess(const std::string& program, const std::string& plugin, const SoakHome& home);
    /// Kills it if it still runs.
    ~HostProcess();
    HostProcess(const HostProcess&) = delete;
    HostProcess& operator=(const HostProcess&) = delete;

    pid_t pid() const { return pid_; }
    bool running();
    void stop() const;
    void resume() const;
    /// Ends it at once, without a word to it.
    void kill();
    /// Starts it again on the same home, as the constructor does.
    void start();
    /// Tells it to end and waits; its exit status, 128 + signal, or -1 when it had to be killed.
    int end(double seconds);

private:
    const std::string program_;
    const std::string plugin_;
    const SoakHome& home_;
    pid_t pid_ = -1;
    bool ended_ = false;
    int status_ = -1;
};

}  // namespace soak
