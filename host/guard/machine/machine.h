/// What guards ask the machine, at most once for each request.
#pragma once

#include <optional>
#include <string>

#include "host/guard/machine/translator.h"
#include "host/home/inventory.h"
#include "host/tables/code_page.h"

namespace host {

/// What stays the same as long as the host runs.
struct Site {
    const CodePage& codePage;  ///< of values and names; outlives the site
    std::string home;
    std::string depot;  ///< the depot's directory
};

/// The machine as one request sees it. What has been asked once is not asked again. One thread.
class Machine {
public:
    /// `site` outlives the machine.
    explicit Machine(const Site& site) : site_(site) {}

    const Site& site() const { return site_; }

    /// What the home's inventory program says.
    const Inventory& inventory();

    /// Resolves the name as the plug-in will: for the universal agent from its form, otherwise by
    /// the home's translator.
    Resolution resolve(const std::string& product, const std::string& target);

private:
    const Site& site_;
    std::optional<Inventory> inventory_;
};

}  // namespace host
