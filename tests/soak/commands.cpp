#include "soak/commands.h"

#include <nlohmann/json.hpp>
#include <utility>

namespace soak {
namespace {

using nlohmann::json;
using Conditions = std::vector<std::pair<std::string, std::string>>;

/// The answer's document; a fault and null when it is no success.
json documentOf(World& world, const Answer* answer, const std::string& what) {
    if (answer == nullptr || answer->status == 503) return {};
    if (answer->status != 200) {
        world.tally.fault(what + " was answered with status " + std::to_string(answer->status) +
                          ": " + answer->body);
        return {};
    }
    json document = json::parse(answer->body, nullptr, false);
    if (document.is_discarded()) {
        world.tally.fault(what + " was answered with what is no JSON: " + answer->body);
        return {};
    }
    return document;
}

Hope hopeFor(bool failure, bool success) {
    return failure ? Hope::Failure : success ? Hope::Success : Hope::Any;
}

/// The one row of an answer to a command.
json rowOf(World& world, const Answer* answer, const std::string& what) {
    const json document = documentOf(world, answer, what);
    if (document.is_null()) return {};
    if (!document.contains("rows") || document["rows"].size() != 1) {
        world.tally.fault(what + " was not answered with one row: " + answer->body);
        return {};
    }
    return document["rows"][0];
}

}  // namespace

struct Commands::Shape {
    std::string command;
    std::string product;
    Conditions more;
    Hope hope = Hope::Any;
};

std::vector<Exchange> Commands::next() {
    std::vector<Exchange> exchanges;
    const bool room = world_.ledger.outstanding() < kMostOutstanding;
    if (room && world_.chance.oneIn(12)) {
        const std::size_t burst = world_.ledger.newBurst();
        const std::size_t length = world_.chance.between(2, 6);
        for (std::size_t i = 0; i < length; ++i)
            exchanges.push_back(queued(burst));
        world_.tally.count("bursts of commands");
    } else {
        exchanges.push_back(one());
    }
    return exchanges;
}

Exchange Commands::one() {
    const bool room = world_.ledger.outstanding() < kMostOutstanding;
    const std::size_t kind = world_.chance.below(100);
    if (kind < 40 && room) return queued();
    if (kind < 45) return getConfiguration();
    if (kind < 48) return completeInstall();
    if (kind < 56) return refused();
    if (kind < 63) return inventory();
    return query();
}

std::string Commands::target() {
    return "node" + std::to_string(world_.chance.below(8)) + ":soak";
}

Exchange Commands::queued(std::size_t burst) {
    Chance& chance = world_.chance;
    const std::string mood = chance.oneIn(100) ? chance.of({"hang", "deaf"})
                             : chance.oneIn(8)
                                 ? chance.of({"flood", "both", "fail", "suicide", "heir"})
                                 : "well";
    // A start of "fl" fills its pipe and waits for a reader that never comes.
    const std::string product = chance.oneIn(250)  ? chance.of({"hg", "df", "fl", "bo", "he"})
                                : chance.oneIn(10) ? chance.of({"er", "sk"})
                                                   : chance.of({"ux", "db", "lz", "oy"});
    const Hope hope = hopeFor(product == "er", product == "ux" || product == "db");
    const std::string install = "|TOVRINHOME|/bin/installer " + mood + " |DEPLOYDIR|";
    const Hope installs = hopeFor(mood == "fail", mood == "well");
    switch (chance.below(10)) {
        case 0:
            return make({"START", product, {}, hope}, burst);
        case 1:
            return make({"START", product, {{"OPTIONAL", "INSTANCE"}, {"TARGETMSN", "one"}}, hope},
                        burst);
        case 2:
            return make({"STOP", product, {{"TARGETMSN", target()}}, Hope::Any}, burst);
        case 3:
            return make({"RESTART", product, {}, hope}, burst);
        case 4:
            return make({"SETCONFIG",
                         product,
                         {{"TARGETMSN", target()},
                          {"CONTEXT", "A=1\n" + std::string(chance.below(2500), 'c')}},
                         hope},
                        burst);
        case 5:
            return make(
                {"SETCONFIG",
                 "um",
                 {{"UACONFIG", "app.mdl"},
                  {"UASCRIPT", "one.sh"},
                  {"CONTEXT", chance.of({"PORT=7700", "RESTART=Y", "PORT=7700,RESTART=Y"})}},
                 Hope::Any},
                burst);
        case 6:
            return make(
                {"INSTALL", product, {{"VERSION", "060100000"}, {"CONTEXT", install}}, installs},
                burst);
        case 7:
            return make({"INSTALL",
                         product,
                         {{"VERSION", "060100000"},
                          {"CONTEXT", install},
                          {"OPTIONAL", chance.of({"REQUIRES_RESTART", "SETCMS"})}},
                         installs},
                        burst);
        case 8:
            return make({"UNINSTALL", product, {}, hope}, burst);
        default:
            return make(
                {"REMOVEINSTANCE", product, {{"TARGETMSN", target()}, {"CONTEXT", "input"}}, hope},
                burst);
    }
}

Exchange Commands::make(const Shape& shape, std::size_t burst) {
    std::string sentTarget;
    bool restarts = false;
    for (const auto& [column, value] : shape.more) {
        if (column == "TARGETMSN") sentTarget = value;
        if (value == "REQUIRES_RESTART") restarts = true;
    }
    const Ledger::Number number =
        world_.ledger.announce(shape.command, sentTarget, restarts ? 2 : 1, shape.hope, burst);
    Conditions where = {{"COMMAND", shape.command},
                        {"TRANSID", world_.ledger.transid(number)},
                        {"PRODUCT", shape.product}};
    where.insert(where.end(), shape.more.begin(), shape.more.end());
    world_.tally.count(restarts ? "INSTALL with restart" : shape.command);
    return entered(number, queryBody("KAGREQT", where));
}

Ledger::Number Commands::announceStart() {
    return world_.ledger.announce("START", "", 1, Hope::Success, 0);
}

Exchange Commands::announced(Ledger::Number number) const {
    world_.tally.count("START");
    return entered(number, queryBody("KAGREQT", {{"COMMAND", "START"},
                                                 {"TRANSID", world_.ledger.transid(number)},
                                                 {"PRODUCT", "ux"}}));
}

Exchange Commands::entered(Ledger::Number number, std::string body) const {
    World& world = world_;
    return {postRequest("/v1/query", body),
            [&world, number] { world.ledger.sending(number, world.clock.wall()); },
            [&world, number](const Answer* answer) {
                if (answer == nullptr) return world.ledger.lost(number);
                const double now = world.clock.wall();
                if (answer->status == 503) return world.ledger.answered(number, false, now);
                const json row = rowOf(world, answer, world.ledger.transid(number));
                if (row.is_null()) return world.ledger.lost(number);
                if (row.at("TRANSID") != world.ledger.transid(number)) {
                    world.tally.fault("the answer to " + world.ledger.transid(number) +
                                      " is another one's: " + row.dump());
                }
                world.ledger.answered(number, row.at("RETVAL") == 0, now);
            }};
}

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
