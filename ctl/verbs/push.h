/// push: files into the host's depot.
#pragma once

#include <vector>

#include "ctl/client/transfer/pushed_file.h"
#include "ctl/show/page.h"

namespace ctl {

struct Invocation;

struct PushReport {
    std::vector<PushedFile> files;  ///< at least one
    double seconds = 0;             ///< from the first byte to the last answer
};

PushReport askPush(const Invocation& invocation);
Page showPush(const PushReport& report, Format format);

}  // namespace ctl
