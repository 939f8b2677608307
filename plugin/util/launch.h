/// Making the child process of a command.
#pragma once

#include <string>
#include <vector>

#include "util/pipes.h"
#include "util/zavprocs.h"

namespace ZAV {

/// Starts the command `argv` (a list that ends in a null pointer, with at least one argument) with
/// its standard streams on the pipes, with the calling process's environment and the "NAME=value"
/// texts of `env`. When the calling process is told to trace, so is the child, into a log of its
/// own in the home's directory "logs".
///
/// True when there is a child: `data` has its id, and the child's ends of the pipes are closed.
/// False, with a trace line, when there is none.
///
/// The memory of the calling process is not copied, so a large process pays no more than a small
/// one; in return the calling thread stands still until the child has executed the command. The
/// child has the default signal dispositions and an empty signal mask whatever the caller's are.
bool forkAndExecute(char* const* argv, const std::vector<std::string>& env, ProcessData& data,
                    ChildPipes& pipes);

}  // namespace ZAV
