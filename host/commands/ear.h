/// Hears the plug-in's commands, thread by thread.
#pragma once

#include <memory>
#include <vector>

#include "host/commands/recorder.h"

namespace host {

/// The units whose lines a Recorder wants.
std::vector<ras1::HeardUnit> heardUnits();

/// Begins to hear the commands of this process, and never ends. May be called again. Throws
/// std::logic_error when somebody else listens to the trace.
void hearCommands();

/// Hears the commands that the calling thread runs while the object exists. One at a time on a
/// thread.
class ThreadEar {
public:
    /// Keeps up to `outputBytes` of the last command's standard output.
    explicit ThreadEar(std::size_t outputBytes = 0);
    ~ThreadEar();
    ThreadEar(const ThreadEar&) = delete;
    ThreadEar& operator=(const ThreadEar&) = delete;

    /// What has been heard; forgets it.
    Heard take() { return recorder_.take(); }

private:
    Recorder recorder_;
};

/// What the calling thread ran since the last call, if no ThreadEar is on it: the plug-in's own
/// threads are heard from their first command on.
Heard takeOfPluginThread();

/// The commands of the plug-in's own threads that nobody has taken yet, those that run among them.
/// Any thread.
std::vector<Command> commandsOfPluginThreads();

}  // namespace host
