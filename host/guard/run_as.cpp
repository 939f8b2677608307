// The guard of the list of run-as users. The plug-in takes a list that it cannot read for an empty
// one, and an entry that it does not understand for none, and starts agents as the host's user.

#include "host/guard/guard.h"
#include "host/guard/refusal.h"
#include "host/home/run_as_list.h"
#include "host/tables/plugin_facts.h"

namespace host {

void checkRunAsList(CommandRequest& request, Machine& machine);

namespace {

/// The universal agent may be started again for its new configuration.
bool startsAgents(const CommandRequest& request) {
    return request.command() == plugin::kStart || request.command() == plugin::kRestart ||
           request.configuresUniversalAgent();
}

}  // namespace

void checkRunAsList(CommandRequest& request, Machine& machine) {
    if (!startsAgents(request)) return;
    const RunAsList list = readRunAsList(machine.site().home);
    if (list.fault.empty()) return;
    throw Refusal("run-as",
                  list.path + " says which agents run as another user, but " + list.fault +
                      "; the agent would run as the host's user",
                  "correct the file, or remove it");
}

}  // namespace host
