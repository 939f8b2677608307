/// Opening what lies beneath a directory, and nothing else.
#pragma once

#include <sys/types.h>

#include "base/file_descriptor.h"

namespace ZAV {

/// Opens `name`, which is relative to the directory `top`, like openFile. Every step is resolved
/// beneath `top`, also while others rename things: relative links that stay beneath it are
/// followed; an absolute link, or one that leads out, fails with EXDEV. With O_PATH the result may
/// be anything that exists. Any thread.
FileDescriptor openBeneath(int top, const char* name, int flags, mode_t mode = 0);

}  // namespace ZAV
