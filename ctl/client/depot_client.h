/// The host's depot over its HTTP interface.
#pragma once

#include <cstdint>
#include <nlohmann/json_fwd.hpp>
#include <string>
#include <utility>
#include <vector>

#include "ctl/client/address/host_address.h"

namespace ctl {

/// Each request may take as long as the address's time-out says. Operations throw Failure as
/// HostClient does.
class DepotClient {
public:
    explicit DepotClient(HostAddress host) : host_(std::move(host)) {}

    /// What the host says of a push of these names with that many bytes together, and of each name
    /// in their order: see GET /v1/depot/check. Null when the host is older than this question.
    nlohmann::json check(const std::vector<std::string>& names, std::uintmax_t bytes) const;

    /// The checksums of these files in their order: an array of the rows of GET /v1/depot/sum. Null
    /// when the host is older than this question.
    nlohmann::json sums(const std::vector<std::string>& paths) const;

    /// The document of GET /v1/depot.
    nlohmann::json list(const std::string& path) const;

    void remove(const std::string& path, bool recursive) const;

private:
    HostAddress host_;
};

}  // namespace ctl
