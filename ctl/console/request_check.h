/// Whether a request comes from the console's own page, as far as a browser tells.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "http/handler.h"

namespace console {

/// The header fields that the console looks at.
const std::vector<std::string>& lookedAtFields();

/// The value of a field of a request; empty if it is not there, or more than once.
std::string_view fieldOf(const http::Request& request, std::string_view name);

/// What is wrong with the request, a sentence; empty if nothing is.
///
/// A page of somebody else's cannot send what is asked for here: its name is in Host, even if that
/// name leads to this machine; its origin is in Origin; and a field of one's own needs a permission
/// that the console never gives.
std::string complaintAbout(const http::Request& request, std::uint16_t port);

/// Whether the browser says that a page of another origin asks. One on another port of this machine
/// gets the cookie sent along, because cookies know no ports.
bool isOfAnotherSite(const http::Request& request);

/// Whether the console's own page asks: no other page can send its field without being let.
bool isOfPage(const http::Request& request);
/// Whether the method changes nothing.
bool onlyReads(const http::Request& request);

/// The path of a request, as it was sent.
std::string_view pathOf(const http::Request& request);

}  // namespace console
