/// Parts of a refusal's sentence.
#pragma once

#include <string>
#include <vector>

#include "host/tables/code_page.h"

namespace host {

/// A client's value in quotation marks, in UTF-8 and cut to what can be read at a glance.
std::string quoted(const std::string& value, const CodePage& codePage);

/// The first names, separated by commas, in UTF-8; how many more there are.
std::string enumerated(const std::vector<std::string>& names, const CodePage& codePage);

}  // namespace host
