/// The processes that a command has started.
#pragma once

#include <sys/types.h>

#include <cstddef>
#include <set>
#include <utility>
#include <vector>

#include "host/process/children/process_table.h"

namespace host {

/// Knows a process by its id and its start, so that one that got a dead one's id is not taken for
/// it. Once known it stays known, also when its parent has ended. What has made a session of its
/// own, as agents do, is none of them. One thread at a time.
///
/// While another command runs at the same time, an orphan may be of either: both are the host's
/// children then. Commands that leave a child behind without a session of its own are rare, and so
/// are those that are ended.
class Descendants {
public:
    /// `orphansBefore`: the adopted orphans just before the first of these commands started; those
    /// that came later are among its processes.
    explicit Descendants(std::vector<pid_t> orphansBefore);

    /// Looks for those below `command`, a child of this process; 0: there is none just now. With
    /// `itself` the command is one of them.
    void look(pid_t command, bool itself);
    /// Sends the signal to those that lived at the last look: SIGKILL to all of them, another one
    /// only to those that have got none. Returns how many it reached.
    std::size_t send(int signal);
    /// Kills those that lived at the last look. False once there has been nobody to kill, and
    /// nobody new, for some looks in a row: one that has ended may have started another one, which
    /// a single look can miss.
    bool kill();
    /// How many lived at the last look.
    std::size_t living() const;

private:
    using Name = std::pair<pid_t, unsigned long long>;  ///< process id and start

    static Name nameOf(const ProcessEntry& process) { return {process.pid, process.start}; }
    bool isKnown(const ProcessEntry& process) const { return known_.count(nameOf(process)) != 0; }
    bool hasKnownParent(const ProcessEntry& process) const;
    std::vector<pid_t> orphansOfLook();
    bool isInTable(pid_t pid) const;
    bool addGeneration(const std::vector<pid_t>& orphansNow);
    void addCommand();

    const std::vector<pid_t> orphansBefore_;
    const pid_t session_;
    pid_t command_ = 0;
    std::vector<ProcessEntry> processes_;  ///< of the last look
    std::set<Name> known_;
    std::set<Name> signalled_;
    bool sawTraces_ = false;  ///< of processes that were not known before, at the last look
    int quietLooks_ = 0;      ///< in a row
};

/// Kills everything that a command has started, down to the last descendant, because it has run too
/// long: its own processes, and those of the orphans that came after `orphansBefore` was taken,
/// just before the command started. Spares what has made a session of its own, as agents do. The
/// command itself is only stopped, so that it starts nothing more; whoever has started it must kill
/// it. Any thread.
void killDescendants(pid_t command, const std::vector<pid_t>& orphansBefore);

}  // namespace host
