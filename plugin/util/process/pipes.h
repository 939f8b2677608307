/// The three pipes between a command and its caller.
#pragma once

#include "base/file_descriptor.h"

namespace ZAV {

/// One pipe. Both ends are created close-on-exec, so that no other child inherits them. Their
/// numbers are above 2 even when lower ones are free, so that a child can dup2 them onto its
/// standard streams in any order.
struct Pipe {
    FileDescriptor readEnd;
    FileDescriptor writeEnd;
};

/// Named from the child's side: it writes to `out` and `err` and reads from `in`.
struct ChildPipes {
    Pipe out;
    Pipe err;
    Pipe in;
};

/// Creates the pipes for standard output, error and input, in this order. Returns false, with a
/// trace line, when one cannot be created; the earlier ones stay open.
bool createPipes(Pipe& out, Pipe& err, Pipe& in);

/// Closes one end of a pipe and restarts the call when a signal interrupts it. Returns false when
/// the end was not open.
bool closePipeEnd(FileDescriptor& end);

}  // namespace ZAV
