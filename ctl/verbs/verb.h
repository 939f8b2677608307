/// A command of the program as data.
#pragma once

#include "ctl/client/failure.h"
#include "ctl/verbs/arguments/argument.h"

namespace ctl {

struct Invocation;

/// One row of the table of verbs.
struct Verb {
    const char* name;  ///< as it is typed; "config get" is the verb "get" of the group "config"
    const char* help;  ///< one line, no full stop
    ArgumentList arguments;
    const char* examples[2];  ///< whole command lines
    /// Does what the invocation asks for and shows the result. May throw Failure.
    ExitStatus (*run)(const Invocation& invocation);
};

/// Verbs whose names have their first word in common.
struct VerbGroup {
    const char* name;
    const char* help;  ///< one line, no full stop
};

}  // namespace ctl
