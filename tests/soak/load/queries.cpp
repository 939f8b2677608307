// Requests that are answered at once.

#include <nlohmann/json.hpp>
#include <utility>

#include "soak/answers.h"
#include "soak/load/commands.h"

namespace soak {

using nlohmann::json;
using Conditions = std::vector<std::pair<std::string, std::string>>;

Exchange Commands::getConfiguration() {
    World& world = world_;
    const std::string product = world.chance.oneIn(60) ? world.chance.of({"hg", "fl", "er", "sk"})
                                                       : world.chance.of({"ux", "db", "lz"});
    world.tally.count("GETCONFIG");
    return {postRequest("/v1/query", queryBody("KAGREQT", {{"COMMAND", "GETCONFIG"},
                                                           {"TRANSID", "at once"},
                                                           {"PRODUCT", product},
                                                           {"TARGETMSN", target()}})),
            nullptr, [&world, product](const Answer* answer) {
                const json row = rowOf(world, answer, "GETCONFIG");
                if (row.is_null()) return;
                if (row.at("RETVAL") != 0) return world.tally.count("GETCONFIG, failed");
                // A translator that a signal has ended counts as one that had nothing to say.
                const std::string context = row.at("CONTEXT").get<std::string>();
                if (!context.empty() && context != "INSTANCE=" + product + "\nKEY=value\n") {
                    world.tally.fault("GETCONFIG of " + product + " brought: " + context);
                }
            }};
}

Exchange Commands::completeInstall() {
    World& world = world_;
    world.tally.count("COMPLETE_INSTALL");
    return {postRequest("/v1/query", queryBody("KAGREQT", {{"COMMAND", "COMPLETE_INSTALL"},
                                                           {"TRANSID", "at once"}})),
            nullptr, [&world](const Answer* answer) { rowOf(world, answer, "COMPLETE_INSTALL"); }};
}

Exchange Commands::refused() {
    World& world = world_;
    const Ledger::Number number = world.ledger.announce("none", "", 1, Hope::Any, 0);
    const std::string transid = world.ledger.transid(number);
    const Conditions where = world.chance.of<Conditions>(
        {{{"COMMAND", "JUMP"}, {"TRANSID", transid}},
         {{"COMMAND", "START"}, {"TRANSID", transid}},
         {{"COMMAND", "INSTALL"}, {"TRANSID", transid}, {"PRODUCT", "ux"}},
         {{"COMMAND", "REMOVEINSTANCE"}, {"TRANSID", transid}, {"PRODUCT", "um"}},
         {{"TRANSID", transid}}});
    world.tally.count("commands to be refused");
    return {postRequest("/v1/query", queryBody("KAGREQT", where)),
            [&world, number] { world.ledger.sending(number, world.clock.wall()); },
            [&world, number](const Answer* answer) {
                const json row = rowOf(world, answer, "a bad command");
                world.ledger.answered(number, false, world.clock.wall());
                if (!row.is_null() && row.at("RETVAL") == 0) {
                    world.tally.fault("a bad command was accepted: " + row.dump());
                }
            }};
}

Exchange Commands::inventory() {
    World& world = world_;
    const bool filtered = world.chance.oneIn(2);
    world.tally.count("KINAGT queries");
    return {postRequest("/v1/query", filtered ? queryBody("KINAGT", {{"PRODUCT", "ux"}})
                                              : queryBody("KINAGT", {})),
            nullptr, [&world, filtered](const Answer* answer) {
                const json document = documentOf(world, answer, "KINAGT");
                if (document.is_null()) return;
                for (const json& row : document.at("rows")) {
                    if (filtered && row.at("PRODUCT") != "ux") {
                        world.tally.fault("a row that does not match: " + row.dump());
                    }
                }
                // Its program may have been killed.
                if (document.at("rows").size() != (filtered ? 1 : 13)) {
                    world.tally.count("KINAGT queries, incomplete");
                }
            }};
}

Exchange Commands::health() const {
    World& world = world_;
    return {getRequest("/v1/health"), nullptr,
            [&world](const Answer* answer) { documentOf(world, answer, "/v1/health"); }};
}

Exchange Commands::query() {
    World& world = world_;
    world.tally.count("other queries");
    switch (world.chance.below(4)) {
        case 0:
            return health();
        case 1:
            return {getRequest("/v1/tables"), nullptr, [&world](const Answer* answer) {
                        const json document = documentOf(world, answer, "/v1/tables");
                        if (!document.is_null() && document.at("tables").size() != 3) {
                            world.tally.fault("not all tables: " + document.dump());
                        }
                    }};
        case 2:
            return {postRequest("/v1/query", queryBody("KAGDYST", {})), nullptr,
                    [&world](const Answer* answer) {
                        const json document = documentOf(world, answer, "KAGDYST");
                        if (!document.is_null() && !document.at("rows").empty()) {
                            world.tally.fault("a query on KAGDYST has rows: " + document.dump());
                        }
                    }};
        default:
            return {getRequest("/v1/nothing"), nullptr, [&world](const Answer* answer) {
                        if (answer != nullptr && answer->status != 404 && answer->status != 503) {
                            world.tally.fault("nothing was found: " + answer->body);
                        }
                    }};
    }
}

}  // namespace soak
