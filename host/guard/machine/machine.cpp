#include "host/guard/machine/machine.h"

#include "host/tables/plugin_facts.h"

namespace host {

const Inventory& Machine::inventory() {
    if (!inventory_) inventory_ = readInventory(site_.home);
    return *inventory_;
}

Resolution Machine::resolve(const std::string& product, const std::string& target) {
    if (product == plugin::kUniversalAgent) return {universalAgentInstance(target), ""};
    return instanceByTranslator(translatorPath(site_.home, inventory()), product, target);
}

}  // namespace host
