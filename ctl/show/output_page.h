/// What a task's commands have written.
#pragma once

#include <string>

#include "ctl/show/page.h"

namespace ctl {

/// A piece of the output, for the same of this program's outputs; all of it is for standard error
/// where a document stands on the other. A terminal gets no control characters.
Page outputPage(const std::string& stream, const std::string& text, Format format);

}  // namespace ctl
