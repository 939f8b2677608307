/// The instances of a home's agents, as the home's own program tells them.
#pragma once

#include <string>
#include <vector>

#include "host/process/children/run_command.h"

namespace host {

/// One instance of an agent. Texts are in the code page of the process's locale.
struct AgentInstance {
    enum class State {
        Running,
        Missing,  ///< it was started and not stopped on request, and does not run
        Stopped,
    };
    std::string product;
    std::string instance;  ///< empty: the default instance
    std::string user;      ///< whoever runs it; empty if stopped
    State state = State::Stopped;
    int pid = 0;  ///< 0 unless it runs
};

struct InstanceList {
    /// False: the home has no program that tells. Everything else is empty then.
    bool isOffered = false;
    CommandResult result;  ///< of that program
    std::vector<AgentInstance> instances;
};

/// Runs `home`/bin/instances. Any thread; takes as long as that program, at most twelve seconds.
InstanceList readInstances(const std::string& home);

/// What the program printed; lines that make no sense are left out.
std::vector<AgentInstance> instancesIn(const std::string& list);

/// "running", "missing" or "stopped".
const char* nameOf(AgentInstance::State state);

}  // namespace host
