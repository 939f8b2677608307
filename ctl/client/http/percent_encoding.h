/// Text inside a URL.
#pragma once

#include <string>

namespace ctl {

/// The text with every byte but letters, digits and - . _ ~ written as %XX.
std::string percentEncoded(const std::string& text);

}  // namespace ctl
