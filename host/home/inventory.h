/// The products of a home, as its own inventory program lists them.
#pragma once

#include <chrono>
#include <cstddef>
#include <optional>
#include <string>
#include <vector>

#include "host/process/children/run_command.h"

namespace host {

/// The last two are empty where a comma in the product's description hides them from the plug-in.
struct InstalledProduct {
    std::string code;
    std::string platform;
    std::string version;
};

struct Inventory {
    CommandResult result;  ///< of the inventory program
    /// In the program's order; one entry for each platform that a product is installed for. Empty
    /// too when the program failed.
    std::vector<InstalledProduct> products;

    bool has(const std::string& code) const;
};

/// Runs `home`/bin/cinfo. Any thread; takes as long as that program, at most ten seconds.
Inventory readInventory(const std::string& home);

/// What this process knew when it last read an inventory successfully.
struct LastInventory {
    std::size_t products = 0;  ///< entries
    std::chrono::steady_clock::time_point read{};
};

/// Nothing before the first time. Any thread.
std::optional<LastInventory> lastInventory();

/// The products in the list that the inventory program prints. Lines that are no entry are ignored,
/// as the plug-in does.
std::vector<InstalledProduct> productsIn(const std::string& list);

/// Where the plug-in looks for the two-way translator of this home, which belongs to the shared
/// component "ax"; "" while that is not in the inventory.
std::string translatorPath(const std::string& home, const Inventory& inventory);

}  // namespace host
