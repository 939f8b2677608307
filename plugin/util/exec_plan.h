/// execvp in two halves: what looks up and allocates, and what a child may do before exec.
#pragma once

#include <string>
#include <vector>

namespace ZAV {

/// How to turn a process into a command, worked out beforehand.
class ExecPlan {
public:
    /// Borrows the lists, which end in a null pointer. A first argument without a "/" is looked for
    /// in the directories of `searchPath` (the system's own when that is null).
    ExecPlan(char* const* arguments, const char* searchPath, char* const* environment);

    /// Does what execvp does, a script without a "#!" line that the shell runs included. Returns
    /// when nothing could be executed, with errno set. Async-signal-safe.
    void execute();

private:
    void addCandidates(const std::string& name, const char* searchPath);

    std::vector<std::string> candidates_;  // the files to try, in order
    char* const* arguments_;
    std::vector<char*> shellArguments_;  // the shell, the script, the script's arguments
    char* const* environment_;
};

}  // namespace ZAV
