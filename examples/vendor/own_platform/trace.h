/// The vendor's trace: datagrams to the system's log. The tests and the conformance driver receive
/// them in its place.
#pragma once

#include <string>

namespace vendor {

/// Sends traces to the log socket `path` from now on, /dev/log unless told otherwise, and selects
/// what to trace: everything, or errors only. One thread at a time.
void setTrace(const std::string& path, bool everything);

}  // namespace vendor
