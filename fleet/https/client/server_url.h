/// Where a server is.
#pragma once

#include <stdexcept>
#include <string>
#include <string_view>

namespace fleet {

/// What is wrong with a URL, for people.
class UrlError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

struct ServerUrl {
    std::string host;  ///< a DNS name or an IP address; one of IPv6 has no brackets here
    std::string port;

    /// "host:port", as the Host field of a request has it.
    std::string authority() const;
};

/// Reads "https://HOST", "https://HOST:PORT" or "https://[ADDRESS]:PORT", with or without a "/" at
/// the end. The port is 8443 if there is none. Throws UrlError for everything else.
ServerUrl readServerUrl(std::string_view url);

}  // namespace fleet
