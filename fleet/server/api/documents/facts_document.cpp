#include "fleet/server/api/documents/facts_document.h"

#include <algorithm>
#include <nlohmann/json.hpp>
#include <string>

#include "fleet/server/api/schema.h"
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

shape::Json inventoryShape(Components& components) {
    const shape::Json any = {{"type", "object"}};
    return shape::object(
        "Inventory", "What was installed on a host and what ran there, in the host's words.",
        {{"taken",
          shape::about("when the host was asked, by its clock", components.ref(timeSchema))},
         {"age", shape::wholeNumber("how long ago that was, in seconds, by whichever clock makes "
                                    "it older")},
         {"products",
          shape::listOf("the rows of the table KINAGT",
                        shape::about("column names and values", any)),
          Need::Optional},
         {"instances",
          shape::listOf("as the host's own interface tells them",
                        shape::about("an instance of an agent", any)),
          Need::Optional},
         {"warnings", shape::listOf("what could not be found out", shape::text("a sentence")),
          Need::Optional},
         {"leftOut", shape::wholeNumber("how many entries were too many to be told"),
          Need::Optional}});
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

nlohmann::ordered_json factsSchema(Components& components) {
    return shape::object(
        "Facts", "What a host has told about itself.",
        {{"told", shape::about("when, by the host's clock", components.ref(timeSchema))},
         {"heard", shape::about("when that came to the centre", components.ref(timeSchema))},
         {"name", shape::text("for people, from the host's own configuration")},
         {"labels", labelsShape("from there, too")},
         {"link", shape::text("the link's version")},
         {"version", shape::text("the host program's; empty before one has answered")},
         {"journal", shape::text("the identity of the host's journal; empty while none answers")},
         {"blocked", shape::text("why the next order waits; empty if nothing is in the way")},
         {"inventory", inventoryShape(components), Need::Optional}});
}

}  // namespace fleet
