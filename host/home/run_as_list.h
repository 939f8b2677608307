/// Whether a file is XML that the plug-in can read.
#pragma once

#include <string>

namespace host {

/// What is wrong with the file, in words; "" if nothing is. Reads it as the plug-in does, up to
/// 16 MiB.
std::string xmlFaultOf(const std::string& path);

}  // namespace host
