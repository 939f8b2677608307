/// The system's text for an errno value, made in one place.
#pragma once

#include <string>

namespace ZAV {

/// What strerror says about `errnum`; safe on any number of threads.
std::string errorText(int errnum);

}  // namespace ZAV
