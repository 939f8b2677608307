/// What became of pushed files in the depot.
#pragma once

#include <string>
#include <vector>

#include "ctl/client/address/host_address.h"
#include "ctl/client/transfer/pushed_file.h"

namespace ctl {

/// Has the host compute the checksums of the files that it took, and compares them with those of
/// what was sent. Stores the host's sum in each file, or the problem. Returns why the host could
/// not be asked; empty when it could.
std::string verifyArrival(const HostAddress& host, std::vector<PushedFile>& files);

/// Removes from the depot what arrived of files only in part. Returns a sentence about each, and
/// about each file that was there before and may be gone.
std::vector<std::string> removePartialFiles(const HostAddress& host,
                                            const std::vector<PushedFile>& files);

/// A sentence about each file of which a part may lie in the depot, or which may be gone from
/// there.
std::vector<std::string> namePartialFiles(const std::vector<PushedFile>& files);

}  // namespace ctl
