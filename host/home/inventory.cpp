#include "host/home/inventory.h"

#include <algorithm>
#include <array>
#include <chrono>
#include <cstddef>
#include <sstream>
#include <string_view>

#include "embedded/mutex.h"

namespace host {
namespace {

constexpr CommandLimits kLimits{std::chrono::seconds(10), std::size_t{1} << 20};
constexpr std::string_view kHeader =
    "\"ProdCode\",\"Description\",\"Platform\",\"Version\",\"Release\"";
constexpr std::size_t kFields = 5;

/// The shared component cannot be used on these platforms, although it may be listed for them.
constexpr std::array<std::string_view, 6> kUnusable = {"aix433", "hp102",  "sol273",
                                                       "sol276", "sol278", "sol288"};

/// What readInventory() has read last.
class InventoryNote {
public:
    void set(const LastInventory& inventory) {
        const embedded::MutexLock lock(lock_);
        last_ = inventory;
    }
    std::optional<LastInventory> get() const {
        const embedded::MutexLock lock(lock_);
        return last_;
    }
    static InventoryNote& ofProcess() {
        static InventoryNote note;
        return note;
    }

private:
    mutable embedded::Mutex lock_;
    std::optional<LastInventory> last_ ZAV_GUARDED_BY(lock_);
};

/// The pieces between commas and quotes; empty ones count as none.
std::vector<std::string> fieldsOf(const std::string& line) {
    std::vector<std::string> fields;
    const char* const separators = "\r,\"";
    std::size_t begin = line.find_first_not_of(separators);
    while (begin != std::string::npos) {
        const std::size_t end = line.find_first_of(separators, begin);
        fields.push_back(line.substr(begin, end - begin));
        begin = line.find_first_not_of(separators, end);
    }
    return fields;
}

/// Whether two platforms have the same length and the same last two characters.
bool endAlike(const std::string& platform, const std::string& preferred) {
    const std::size_t length = platform.size();
    return length >= 2 && length == preferred.size() &&
           platform.compare(length - 2, 2, preferred, length - 2, 2) == 0;
}

bool isUnusable(const InstalledProduct& product) {
    return product.code == "ax" &&
           std::find(kUnusable.begin(), kUnusable.end(), product.platform) != kUnusable.end();
}

/// The first platform of the product that ends like the preferred one, else its last platform;
/// its first one when none is preferred.
std::string platformOf(const Inventory& inventory, const std::string& code,
                       const std::string& preferred) {
    std::string platform;
    for (const InstalledProduct& product : inventory.products) {
        if (product.code != code || product.platform.empty() || isUnusable(product)) continue;
        platform = product.platform;
        if (preferred.empty() || endAlike(platform, preferred)) break;
    }
    return platform;
}

}  // namespace

bool Inventory::has(const std::string& code) const {
    return std::any_of(products.begin(), products.end(),
                       [&](const InstalledProduct& product) { return product.code == code; });
}

Inventory readInventory(const std::string& home) {
    Inventory inventory;
    inventory.result = runCommand({home + "/bin/cinfo", "-d"}, kLimits);
    if (!inventory.result.succeeded()) return inventory;
    inventory.products = productsIn(inventory.result.out);
    InventoryNote::ofProcess().set({inventory.products.size(), std::chrono::steady_clock::now()});
    return inventory;
}

std::optional<LastInventory> lastInventory() {
    return InventoryNote::ofProcess().get();
}

std::vector<InstalledProduct> productsIn(const std::string& list) {
    std::vector<InstalledProduct> products;
    const std::size_t header = list.find(kHeader);
    if (header == std::string::npos) return products;
    std::istringstream lines(list.substr(header + kHeader.size()));
    for (std::string line; std::getline(lines, line);) {
        const std::vector<std::string> fields = fieldsOf(line);
        if (fields.size() == kFields) products.push_back({fields[0], fields[2], fields[3]});
        if (fields.size() > kFields) products.push_back({fields[0], "", ""});
    }
    return products;
}

std::string translatorPath(const std::string& home, const Inventory& inventory) {
    const std::string platform = platformOf(inventory, "ax", platformOf(inventory, "lz", ""));
    return platform.empty() ? "" : home + "/agtqvs6/" + platform + "/bin/zav_xa";
}

}  // namespace host
