/// How the console says no.
#pragma once

#include <string_view>

#include "http/reply.h"

namespace console {

/// Whether programs ask for this path, and not people: the host's interface or the console's.
bool isForPrograms(std::string_view path);

/// {"error": text} for programs, a page that says it for people. `text` is a sentence of the
/// console's own without a full stop.
http::Reply refusalAt(std::string_view path, unsigned status, std::string_view text);

/// The refusal of a method that the path does not know; `allowed` is the list of those that it
/// does.
http::Reply wrongMethodAt(std::string_view path, std::string_view allowed);

}  // namespace console
