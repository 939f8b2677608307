/// task output: what a task's commands write on a host of the fleet.
#pragma once

#include <nlohmann/json.hpp>
#include <string>

#include "ctl/show/page.h"
#include "fleet/operator/centre/centre.h"
#include "fleet/operator/questions/followed_output.h"

namespace fleet {

/// The host of --on, by its name, its key, or a selector that only it fits; without --on the one
/// that has the order of this identifier. Throws ctl::Failure if that is not one host.
WantedOutput hostOfTask(Centre& centre, const std::string& on, const std::string& task);

/// A task of the host of that name or key; a selector is none. Throws ctl::Failure if there is no
/// such host.
WantedOutput taskOnHost(Centre& centre, const std::string& nameOrKey, const std::string& task);

/// Output that becomes one document: it is kept until the end, so there is a limit to it.
class OutputDocument {
public:
    static constexpr std::size_t kMostBytes = std::size_t{64} << 20;

    /// Throws ctl::Failure if there is too much.
    void add(const OutputText& text);
    ctl::Page page() const;

private:
    nlohmann::json pieces_ = nlohmann::json::array();
    std::size_t bytes_ = 0;
};

}  // namespace fleet
