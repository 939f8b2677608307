/// The system's text for an errno value.
#pragma once

#include <string>

namespace ZAV {

/// Returns strerror's text for `errnum`. Any thread.
std::string errorText(int errnum);

}  // namespace ZAV
