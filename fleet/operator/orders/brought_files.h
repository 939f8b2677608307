/// Files that orders name: they are at the centre before the orders are.
#pragma once

#include <string>
#include <vector>

#include "fleet/bus/messages/order.h"
#include "fleet/operator/centre/centre.h"

namespace fleet {

/// A file here, as an order names it.
struct BroughtFile {
    std::string source;  ///< where it stands here
    OrderFile file;
};

/// The file, or all files of a folder, by the rules of a push to one host. `destination` is the
/// name in the depot; see ctl::filesToPush(). `notes` gets a sentence about each that is left out.
/// Throws ctl::Failure(kWrongUsage) if there is none, if one cannot be read, or if a name cannot be
/// one of the depot.
std::vector<BroughtFile> filesToBring(const std::string& source, const std::string& destination,
                                      std::vector<std::string>& notes);

/// Has the centre have them all. What it has already, or in part, is not sent again. Throws
/// ctl::Failure; a file that changes meanwhile is one.
void bringFiles(Centre& centre, const std::vector<BroughtFile>& files);

}  // namespace fleet
