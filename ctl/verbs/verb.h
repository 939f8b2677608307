/// A command of the program as data.
#pragma once

#include "ctl/client/failure.h"
#include "ctl/verbs/arguments/argument.h"

namespace ctl {

struct Invocation;
struct TaskRequest;
class Values;

/// One row of the table of verbs.
struct Verb {
    const char* name;  ///< as it is typed; "config get" is the verb "get" of the group "config"
    const char* help;  ///< one line, no full stop
    ArgumentList arguments;
    const char* examples[2];  ///< whole command lines
    /// Does what the invocation asks for and shows the result. May throw Failure.
    ExitStatus (*run)(const Invocation& invocation);
    /// The task that it asks of a host, without an identifier: what each of many hosts gets. Null
    /// if the verb is for one host at a time. May throw Failure.
    TaskRequest (*requestOf)(const Values& given) = nullptr;
};

/// Verbs whose names have their first word in common.
struct VerbGroup {
    const char* name;
    const char* help;  ///< one line, no full stop
};

}  // namespace ctl
