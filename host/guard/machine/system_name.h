/// Managed system names, as this machine's agents bear them.
#pragma once

#include <string>

namespace host {

/// The host's name up to its first dot.
std::string shortHostName();

/// What stands at the end of a product's managed system names: "UX" for "ux".
std::string systemCodeOf(std::string product);

/// "INSTANCE:HOST:CODE", or "HOST:CODE" of the default instance, which has no name.
std::string systemName(const std::string& product, const std::string& instance);

}  // namespace host
