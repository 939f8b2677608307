/// A real zavhost on a scratch home, driven with zavctl and with raw bytes.
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "support/host/program.h"
#include "support/scratch_dir.h"

/// Paths of the programs under test.
std::string zavhostPath();
std::string zavctlPath();

class ManagedHost {
public:
    /// Off: the plug-in's own behaviour is seen, on homes that lack most of their programs too.
    enum class Guards { Off, On };

    /// Starts the host on `home` and returns when it is ready; throws when it does not get there.
    /// With guards, programs that they insist on and the home lacks are added first; they only
    /// fail.
    explicit ManagedHost(const std::string& home, const Environment& environment = {},
                         const std::vector<std::string>& moreArguments = {},
                         Guards guards = Guards::Off);
    ~ManagedHost();

    const std::string& socket() const { return socket_; }
    Program& program() { return *program_; }
    pid_t pid() const { return program_->pid(); }
    /// The trace that the host has written, unless its environment says where it is.
    std::string trace() const { return scratch_.read("trace.log"); }

    ProgramResult zavctl(const std::vector<std::string>& arguments, const std::string& input = "",
                         const Environment& environment = {}) const;
    /// The same with --json, started in the background.
    std::unique_ptr<Program> startZavctl(const std::vector<std::string>& arguments) const;

    /// Ends the host with SIGTERM; its result.
    ProgramResult stop();
    /// Starts it again on the same home and socket.
    void start();

    /// Sends the bytes on a connection of their own and returns all that comes back until the host
    /// closes it or nothing more comes for a while.
    std::string exchange(const std::string& bytes,
                         std::chrono::milliseconds quiet = std::chrono::seconds(30)) const;
    /// A connected socket; the caller closes it.
    int connect() const;

    /// Figures of the host process, for leak tests.
    int openDescriptors() const;
    int threads() const;
    int children() const;
    long residentKiB() const;

private:
    std::string home_;
    Environment environment_;
    std::vector<std::string> moreArguments_;
    ScratchDir scratch_;
    std::string socket_;
    std::unique_ptr<Program> program_;
};
