#include "fleet/link/facts/published_facts.h"

#include <nlohmann/json.hpp>

#include "fleet/bus/messages/document.h"

using nlohmann::json;

namespace fleet {
namespace {

json* listIn(json& document, const char* member) {
    const auto found = document.find(member);
    return found != document.end() && found->is_array() ? &*found : nullptr;
}

/// Takes the second half of a list away; returns how many entries that were.
std::size_t halve(json* list) {
    if (list == nullptr || list->empty()) return 0;
    const std::size_t all = list->size();
    list->erase(list->begin() + static_cast<std::ptrdiff_t>(all / 2), list->end());
    return all - all / 2;
}

}  // namespace

std::string publishedFacts(Facts facts, const KeyPair& signing) {
    std::string bytes = signFacts(facts, signing);
    if (bytes.size() <= kMostFactsBytes || !facts.inventory) return bytes;
    json inventory = readDocument(facts.inventory->document);
    const auto signedAgain = [&] {
        facts.inventory->document = textOf(inventory);
        return signFacts(facts, signing);
    };
    inventory.erase("warnings");
    if (json* const products = listIn(inventory, "products")) {
        for (json& product : *products)
            product.erase("PRODDESC");
    }
    std::size_t leftOut = 0;
    for (bytes = signedAgain(); bytes.size() > kMostFactsBytes; bytes = signedAgain()) {
        json* const products = listIn(inventory, "products");
        json* const instances = listIn(inventory, "instances");
        const bool areProductsMore =
            products != nullptr && (instances == nullptr || products->size() >= instances->size());
        const std::size_t some = halve(areProductsMore ? products : instances);
        if (some == 0) break;  // one entry that is longer than all may be, or nothing that is known
        leftOut += some;
        inventory["leftOut"] = leftOut;
    }
    return bytes;
}

}  // namespace fleet
