// GET /v1/events: what happens in the fleet, as it happens.

#include "fleet/server/api/schema.h"
#include "fleet/server/api/visit.h"

namespace fleet {

ApiEndpoint getFleetEvents;
Schema hostEventSchema, orderEventSchema, fleetGapSchema;

http::Answer getFleetEvents(Visit& visit, const Call& call) {
    auto source =
        visit.services.readers.open({visit.key, visit.grant.selector, visit.session}, call.after());
    if (!source) throw TooMany("too many streams of events are open");
    return http::Answer(std::move(source));
}

nlohmann::ordered_json hostEventSchema(Components& components) {
    return shape::object(
        "HostEvent",
        "A host is new, was heard for the first time, has gone away or come back, has told "
        "something "
        "about itself, or its name, its labels or what is in its way have changed.",
        {{"host", shape::text("its bus key")},
         {"name", shape::text("for people")},
         {"state", shape::oneOf("as in Host; retired: it has left the fleet",
                                {"unknown", "here", "away", "stopped", "retired"})},
         {"since", shape::about("when it came into that state; of one that is away, when it was "
                                "last heard",
                                components.ref(timeSchema))},
         {"blocked", shape::text("why its next order waits; empty if nothing is in the way")}});
}

nlohmann::ordered_json orderEventSchema(Components& components) {
    return shape::object(
        "OrderEvent",
        "An order was released, or is over: the centre keeps how it ended. It comes once more if "
        "the "
        "host can tell later how an order ended whose end was unknown.",
        {{"order", shape::text("the order's identifier")},
         {"host", shape::text("the host's bus key")},
         {"name", shape::text("the host's, for people")},
         {"rollout", shape::orNull(shape::text("the roll-out that it belongs to"))},
         {"kind", shape::text("the command; empty if only the host's journal knows of the order")},
         {"product", shape::text("the product's code; empty if it names none")},
         {"state", components.ref(partStateSchema)}});
}

nlohmann::ordered_json fleetGapSchema(Components&) {
    return shape::object(
        "Gap",
        "Events that the centre does not keep any more. What it answers otherwise is up to "
        "date.",
        {{"missing", shape::orNull(shape::wholeNumber("how many; null if that is not known", 1))}});
}

}  // namespace fleet
