/// A home that prepare-home has made, with real programs and agents, in a scratch directory.
#pragma once

#include <string>

#include "support/host/program.h"
#include "support/scratch_dir.h"

class StarterHome {
public:
    /// Makes the home with these products, separated by commas, beside the shared component;
    /// throws when it cannot be made.
    explicit StarterHome(const std::string& products = "ux,um");
    /// Stops the agents that still run.
    ~StarterHome();
    StarterHome(const StarterHome&) = delete;
    StarterHome& operator=(const StarterHome&) = delete;

    std::string path(const std::string& relative = "") const;
    const ScratchDir& files() const { return scratch_; }
    /// The platform code of this machine.
    const std::string& platform() const { return platform_; }
    /// The depot's directory, with a "/" at its end.
    std::string depot() const { return path("depot") + "/"; }
    std::string translator() const { return path("agtqvs6/" + platform_ + "/bin/zav_xa"); }

    /// What a host on this home needs in its environment to use the depot.
    Environment environment() const { return {{"QVSDEPLOY_AGENTDEPOT", path("depot")}}; }

    /// Makes a product's bundle in `destination`; returns its version.
    std::string makeBundle(const std::string& product, const std::string& destination) const;

    /// Whether the instance's pid file is there: "ux" or "ux_inst1".
    bool runs(const std::string& key) const;

private:
    ScratchDir scratch_;
    std::string platform_;
};
