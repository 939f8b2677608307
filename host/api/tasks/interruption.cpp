#include "host/api/tasks/interruption.h"

#include "host/home/inventory.h"
#include "host/tables/plugin_facts.h"

namespace host {
namespace {

/// A product's versions with their platforms.
std::string entriesOf(const std::string& product, const Inventory& inventory) {
    std::string text;
    for (const InstalledProduct& entry : inventory.products) {
        if (entry.code != product) continue;
        text += (text.empty() ? "" : ", ") + entry.code;
        if (!entry.version.empty()) text += ' ' + entry.version + " for " + entry.platform;
    }
    return text;
}

}  // namespace

std::string inventoryNow(const Services& services, const Task& task) {
    const std::string product(task.value(plugin::kProductColumn));
    if (product.empty()) return {};
    const Inventory inventory = readInventory(services.home);
    if (!inventory.result.succeeded()) {
        return "; what the inventory shows now is not known, because bin/cinfo failed";
    }
    const std::string entries = entriesOf(product, inventory);
    if (entries.empty()) return "; the inventory does not show " + product + " now";
    return "; the inventory shows " + entries + " now";
}

void describeInterrupted(Services& services) {
    const Recovered& recovered = services.journal.recovered();
    if (recovered.interrupted.empty() || recovered.runsAgain) return;
    std::optional<Task> task = services.journal.find(recovered.interrupted);
    if (!task) return;
    const std::string shown = inventoryNow(services, *task);
    if (shown.empty()) return;
    task->reason += shown;
    services.journal.save(*task);
}

}  // namespace host
