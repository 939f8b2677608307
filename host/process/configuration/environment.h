/// The environment variables as a function, so that tests can give others.
#pragma once

#include <functional>

namespace host {

/// The value of an environment variable, or null.
using Environment = std::function<const char*(const char* name)>;

}  // namespace host
