/// Creates the child process of a command.
#pragma once

#include <string>
#include <vector>

#include "util/process/pipes.h"
#include "util/zavprocs.h"

namespace ZAV {

/// Starts the command `argv`, a list of at least one argument that ends in a null pointer. Its
/// standard streams are the pipes; its environment is the calling process's plus the "NAME=value"
/// texts of `env`. When KBB_RAS1 is set in the calling process, the child traces too, into a log of
/// its own in the home's directory "logs".
///
/// Returns true when there is a child: `data` has its id, and the child's ends of the pipes are
/// closed here. Returns false, with a trace line, when there is none.
///
/// The memory of the calling process is not copied, so starting a command costs a large process no
/// more than a small one. In return the calling thread is suspended until the child has called
/// exec. The child has default signal dispositions and an empty signal mask, whatever the caller's
/// are.
bool forkAndExecute(char* const* argv, const std::vector<std::string>& env, ProcessData& data,
                    ChildPipes& pipes);

}  // namespace ZAV
