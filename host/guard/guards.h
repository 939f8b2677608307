/// All guards of requests for commands.
#pragma once

#include <string>
#include <vector>

#include "host/guard/guard.h"
#include "host/outcomes/task_list.h"

namespace host {

/// Asks the guards. Immutable; any thread.
class Guards {
public:
    /// `tasks` and what the site refers to outlive this object.
    Guards(Site site, const TaskList& tasks) : site_(std::move(site)), tasks_(tasks) {}

    /// Every guard looks at the request before it is handed to the plug-in. Those that look at the
    /// machine are left out while a task of the same product is unfinished, because what they would
    /// see is not what the request will find. Throws Refusal; otherwise the request is as it should
    /// be handed on. May run programs of the home; holds no lock.
    /// `mayChange`: what waits elsewhere will change what they would see, too.
    void admit(CommandRequest& request, bool mayChange = false) const;

    /// The refusal of a column that the request table does not have.
    [[noreturn]] static void refuseUnknownColumn(const oxa::Table& table, const std::string& name);

private:
    const Site site_;
    const TaskList& tasks_;
};

/// The names of all guards that can refuse what a client asks for, wherever in the host they stand.
std::vector<std::string> refusingGuards();

/// The table of guards, in the order in which they are asked.
const std::vector<Guard>& guards();

}  // namespace host
