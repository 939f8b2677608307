/// One link, or one enrolment, for each directory.
#pragma once

#include <string>

#include "system/file_descriptor.h"

namespace fleet {

/// Two that use one directory would each undo what the other has kept. The lock lasts as long as
/// the descriptor. Throws FileError, also when another process has it.
sys::FileDescriptor lockDirectory(const std::string& directory);

}  // namespace fleet
