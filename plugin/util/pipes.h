/// The three pipes between a command and whoever runs it.
#pragma once

#include "base/file_descriptor.h"

namespace ZAV {

/// Both ends are close-on-exec from birth, so that no other child holds them, and numbered above 2
/// even when those are free: a child can make its standard streams of them in any order.
struct Pipe {
    FileDescriptor readEnd;
    FileDescriptor writeEnd;
};

/// The ends of the names are the child's: it writes `out` and `err` and reads `in`.
struct ChildPipes {
    Pipe out;
    Pipe err;
    Pipe in;
};

/// Makes the pipes for standard output, error and input, in this order. False, with a trace line,
/// when one cannot be made; those made before stay open.
bool createPipes(Pipe& out, Pipe& err, Pipe& in);

/// Closes a pipe's end, again and again while a signal interrupts that; false when it was not open.
bool closePipeEnd(FileDescriptor& end);

}  // namespace ZAV
