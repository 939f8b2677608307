/// execvp in two halves: the one that looks up and allocates, and the one that is safe after a
/// fork.
#pragma once

#include <string>
#include <vector>

namespace ZAV {

/// Everything that executing a command needs, prepared before the fork.
class ExecPlan {
public:
    /// Borrows both lists, which end in a null pointer. A first argument without a "/" is searched
    /// for in the directories of `searchPath`, or in the system's default path when that is null.
    ExecPlan(char* const* arguments, const char* searchPath, char* const* environment);

    /// Does what execvp does; like execvp it has the shell run a script that has no "#!" line.
    /// Returns, with errno set, only when nothing could be executed. Async-signal-safe.
    void execute();

private:
    void addCandidates(const std::string& name, const char* searchPath);

    std::vector<std::string> candidates_;  // the files to try, in order
    char* const* arguments_;
    std::vector<char*> shellArguments_;  // the shell, the script, the script's arguments
    char* const* environment_;
};

}  // namespace ZAV
