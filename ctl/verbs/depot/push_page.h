/// What a push did, for people and programs.
#pragma once

#include <string>

#include "ctl/client/transfer/push.h"
#include "ctl/show/page.h"

namespace ctl {

Page showPush(const PushReport& report, Format format);

/// Whether the file is in the depot, as far as is known.
bool hasArrived(const PushedFile& file);

/// What became of a file, in words; `refused` is that of its push.
std::string meaningOf(const PushedFile& file, bool refused);

}  // namespace ctl
