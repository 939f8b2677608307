/// A scratch home made of scripts: its TovrinAgent writes down how it was called and ends as it is
/// told, so that tests need no real agents.
#pragma once

#include <string>
#include <vector>

#include "support/scratch_dir.h"

class ScriptHome {
public:
    ScriptHome();

    std::string path() const { return scratch_.path("home"); }
    const ScratchDir& files() const { return scratch_; }

    /// What TovrinAgent does with its last argument, the product, after it has written itself down:
    /// shell commands with $product and $verb set.
    void agentScript(const std::string& body);

    /// Adds an inventory of the shared component, "lz" and these products, all for one platform, a
    /// report for each product while no file "home/unreported" exists, and a translator with this
    /// body. Returns the translator's path.
    std::string products(const std::vector<std::string>& codes, const std::string& translatorBody);

    /// The depot, made here, with a "/" at its end.
    std::string depot() const { return scratch_.path("depot") + "/"; }

    /// The command lines of all runs of TovrinAgent so far.
    std::vector<std::string> agentCalls() const;

private:
    ScratchDir scratch_;
};
