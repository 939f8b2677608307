// GET /v1/health

#include <nlohmann/json.hpp>

#include "host/api/pulse.h"
#include "host/api/route.h"
#include "host/api/schema.h"
#include "host/api/services.h"
#include "host/process/version.h"

namespace host {
namespace {

nlohmann::ordered_json reasonsWhyNotAlive(const Journal& journal) {
    nlohmann::ordered_json reasons = nlohmann::ordered_json::array();
    for (const Hang& hang : hangsOf(pulseOf(journal), std::chrono::steady_clock::now()))
        reasons.push_back({{"part", hang.part}, {"text", hang.text}});
    return reasons;
}

}  // namespace

Endpoint getHealth;
Schema healthSchema;

http::Answer getHealth(Services& services, const Call&) {
    using std::chrono::duration_cast;
    const auto uptime = std::chrono::steady_clock::now() - services.started;
    const nlohmann::ordered_json reasons = reasonsWhyNotAlive(services.journal);
    const nlohmann::ordered_json document = {
        {"version", kVersion},
        {"width", static_cast<int>(sizeof(void*) * 8)},
        {"home", services.codePage.toUtf8(services.home)},
        {"origin_node", services.codePage.toUtf8(oxa::originNode())},
        {"uptime_seconds", duration_cast<std::chrono::seconds>(uptime).count()},
        {"subscriptions", services.counts.streams.load()},
        {"guarded", services.guarded},
        {"journal", services.journal.identity()},
        {"alive", reasons.empty()},
        {"reasons", reasons}};
    return http::jsonReply(200, document.dump());
}

nlohmann::ordered_json healthSchema(Components&) {
    const nlohmann::ordered_json hang =
        shape::object("Hang", "Why a host only seems to be alive.",
                      {{"part", shape::oneOf("what hangs", {"command", "journal"})},
                       {"text", shape::text("a sentence")}});
    return shape::object(
        "Health", "What a host says about itself.",
        {{"version", shape::text("the product's version")},
         {"width", shape::oneNumberOf("the width of the process in bits", {32, 64})},
         {"home", shape::text("the home directory")},
         {"origin_node", shape::text("the name of the node that the host stands for")},
         {"uptime_seconds", shape::wholeNumber("how long the host has been running")},
         {"subscriptions", shape::wholeNumber("how many streams of events are open")},
         {"guarded", shape::yesOrNo("whether guards look at requests")},
         {"journal", shape::text("the identity of the journal")},
         {"alive",
          shape::yesOrNo("whether nothing hangs; if false, a watchdog would end the host")},
         {"reasons", shape::listOf("why it is not alive; empty if it is", hang)}});
}

}  // namespace host
