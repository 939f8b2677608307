/// The three streams that a program is started with.
#pragma once

#include "ctl/client/failure.h"

namespace ctl {

/// A standard descriptor that the caller has closed would be given to the next socket, and the
/// output would go to the host. In its place stands one on which reading or writing fails. To be
/// called first of all.
void occupyStandardDescriptors();

/// Output that could not be written, on a full disk for instance, is a failure. It is none when the
/// reader has read enough and gone. Returns the status with which to end.
ExitStatus withOutputWritten(ExitStatus status);

}  // namespace ctl
