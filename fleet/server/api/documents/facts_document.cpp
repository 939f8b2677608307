#include "fleet/server/api/documents/facts_document.h"

#include <algorithm>
#include <nlohmann/json.hpp>
#include <string>

#include "text/utc_time.h"

using nlohmann::json;

namespace fleet {
namespace {

std::string shownTime(Moment time) {
    return text::utcTime(std::chrono::system_clock::time_point(time));
}

Moment ageOf(const Inventory& inventory, const KeptFacts& kept, Moment now) {
    const Moment byHost = now - inventory.time;
    const Moment byCentre = (now - kept.heard) + (kept.facts.time - inventory.time);
    return std::max({byHost, byCentre, Moment{}});
}

/// What the host wrote may be any JSON: its members are checked by whoever shows them.
json inventoryDocument(const Inventory& inventory, const KeptFacts& kept, Moment now) {
    json document = json::parse(inventory.document, nullptr, false);
    if (!document.is_object()) document = json::object();
    document["taken"] = shownTime(inventory.time);
    document["age"] =
        std::chrono::duration_cast<std::chrono::seconds>(ageOf(inventory, kept, now)).count();
    return document;
}

}  // namespace

json factsDocument(const KeptFacts& kept, Moment now) {
    const Facts& facts = kept.facts;
    json document = {{"told", shownTime(facts.time)},
                     {"heard", shownTime(kept.heard)},
                     {"name", facts.name},
                     {"labels", json::object()},
                     {"link", facts.link},
                     {"version", facts.version},
                     {"journal", facts.journal},
                     {"blocked", facts.blocked}};
    for (const auto& [name, value] : facts.labels)
        document["labels"][name] = value;
    if (facts.inventory) document["inventory"] = inventoryDocument(*facts.inventory, kept, now);
    return document;
}

}  // namespace fleet
