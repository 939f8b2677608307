/// push: files into the host's depot.
#pragma once

#include "ctl/verbs/depot/push_page.h"

namespace ctl {

struct Invocation;

/// Asks the host whether it takes the files, sends them and has their arrival verified. Throws
/// Failure when the sending breaks off; what had arrived in part is removed then, or named in the
/// failure's text.
PushReport askPush(const Invocation& invocation);

}  // namespace ctl
