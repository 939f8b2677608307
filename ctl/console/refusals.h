/// How the console says no.
#pragma once

#include <string_view>

#include "ctl/client/failure.h"
#include "http/reply.h"

namespace console {

/// Whether programs ask for this path, and not people: that interface, or the console's own.
bool isForPrograms(std::string_view path);

/// Whether a path belongs to the interface of what is behind the console.
bool isOfInterface(std::string_view path);

/// {"error": text} for programs, a page that says it for people. `text` is a sentence of the
/// console's own without a full stop.
http::Reply refusalAt(std::string_view path, unsigned status, std::string_view text);

/// The refusal of a method that the path does not know; `allowed` is the list of those that it
/// does.
http::Reply wrongMethodAt(std::string_view path, std::string_view allowed);

/// What a browser is told of a failure.
http::Reply replyTo(const ctl::Failure& failure);

}  // namespace console
