/// A real server of the fleet's bus.
#pragma once

#include <optional>
#include <string>

#include "support/host/program.h"
#include "support/scratch_dir.h"

/// A server on a loopback port of its own, with its files in a directory of its own. It ends with
/// the object, and with the test's process. For the thread that made it.
class NatsServer {
public:
    /// Starts it; throws std::runtime_error if it does not get ready. The configuration is added to
    /// the address and to JetStream's store; "@DIR@" in it stands for dir().
    explicit NatsServer(std::string configuration = "");
    ~NatsServer();
    NatsServer(const NatsServer&) = delete;
    NatsServer& operator=(const NatsServer&) = delete;

    std::string url() const;
    const ScratchDir& dir() const { return dir_; }
    std::string log() const { return dir_.read("log"); }
    /// Waits until the log holds the text.
    bool awaitLog(const std::string& text) const;

    /// Ends it as a service manager would, and waits.
    void stop();
    /// Kills it, and waits.
    void kill();
    /// Has it stand still, and go on with what came meanwhile.
    void pause();
    void goOn();
    /// Starts it again on the same port and files.
    void start();
    /// Has it read another configuration, and waits until it has.
    void reload(const std::string& configuration);

private:
    void configure() const;
    bool run();
    void end(int signal);

    ScratchDir dir_;
    std::string configuration_;
    int port_ = 0;
    std::optional<Program> server_;
};
