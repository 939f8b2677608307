/// The page that the program brings with it.
#pragma once

#include <vector>

#include "ctl/console/page_files.h"

namespace console {

/// Its files; their bytes are part of the program. The build makes the definition.
std::vector<PageFile> embeddedPage();

}  // namespace console
