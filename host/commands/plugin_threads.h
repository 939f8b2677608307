/// What the plug-in's own threads run.
#pragma once

#include <chrono>
#include <memory>
#include <optional>
#include <vector>

#include "embedded/mutex.h"
#include "host/commands/recorder.h"

namespace host {

/// The recorders of the threads that have no ThreadEar. Such threads live as long as the process,
/// and so does this. Any thread may call.
class PluginThreads {
public:
    static PluginThreads& ofProcess();

    /// A recorder for another thread.
    Recorder* add();
    std::vector<std::shared_ptr<Recorder>> all() const;

    /// When the time of a command in hand is over, of several the earliest; nothing if there is
    /// none.
    std::optional<std::chrono::steady_clock::time_point> deadline() const;

    /// From now on `sink` gets what their commands write, in place of an earlier one, for as long
    /// as it lives.
    void hearOutput(const std::shared_ptr<const Recorder::OutputSink>& sink);

    /// From now on each command that such a thread starts ends at its start.
    void endCommands();
    /// No more. Returns whether that was the end of any.
    bool letCommandsRun();

private:
    PluginThreads() = default;
    void tell(const OutputPiece& piece) const;

    mutable embedded::Mutex lock_;
    std::vector<std::shared_ptr<Recorder>> recorders_ ZAV_GUARDED_BY(lock_);
    std::weak_ptr<const Recorder::OutputSink> sink_ ZAV_GUARDED_BY(lock_);
    bool ending_ ZAV_GUARDED_BY(lock_) = false;
};

}  // namespace host
