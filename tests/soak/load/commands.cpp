#include "soak/load/commands.h"

#include <cctype>
#include <nlohmann/json.hpp>
#include <utility>

#include "soak/answers.h"

namespace soak {
namespace {

using nlohmann::json;
using Conditions = std::vector<std::pair<std::string, std::string>>;

Hope hopeFor(const std::string& product) {
    if (product == "er") return Hope::Failure;
    return product == "ux" || product == "db" ? Hope::Success : Hope::Any;
}

std::string lowerCase(std::string text) {
    for (char& c : text)
        c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
    return text;
}

}  // namespace

struct Commands::Shape {
    std::string command;
    std::string product;
    Conditions more;
    Hope hope = Hope::Any;
    bool notesItsRun = false;  ///< its product is its name, which the agent's script writes down

    std::string productFor(Ledger::Number number) const {
        return notesItsRun ? Ledger::name(number) : product;
    }
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

std::string Commands::product() {
    Chance& chance = world_.chance;
    if (chance.oneIn(250)) return chance.of({"hg", "df", "fl", "bo", "he"});
    if (chance.oneIn(10)) return chance.of({"er", "sk"});
    return chance.of({"ux", "db", "lz", "oy"});
}

Exchange Commands::queued(std::size_t burst) {
    const std::size_t kind = world_.chance.below(10);
    return make(kind < 4   ? startStop()
                : kind < 6 ? configuration()
                : kind < 8 ? install()
                           : removal(),
                burst);
}

Commands::Shape Commands::startStop() {
    const std::string code = product();
    const Hope hope = hopeFor(code);
    switch (world_.chance.below(4)) {
        case 0:
            return {"START", "", {}, Hope::Success, true};
        case 1:
            return {"START", code, {{"OPTIONAL", "INSTANCE"}, {"TARGETMSN", "one"}}, hope};
        case 2:
            return {"STOP", code, {{"TARGETMSN", target()}}, Hope::Any};
        default:
            return {"RESTART", code, {}, hope};
    }
}

Commands::Shape Commands::configuration() {
    Chance& chance = world_.chance;
    if (chance.oneIn(2)) {
        const std::string options = chance.of({"PORT=7700", "RESTART=Y", "PORT=7700,RESTART=Y"});
        return {"SETCONFIG",
                "um",
                {{"UACONFIG", "app.mdl"}, {"UASCRIPT", "one.sh"}, {"CONTEXT", options}},
                Hope::Any};
    }
    const std::string code = product();
    const std::string text = "A=1\n" + std::string(chance.below(2500), 'c');
    return {"SETCONFIG", code, {{"TARGETMSN", target()}, {"CONTEXT", text}}, hopeFor(code)};
}

Commands::Shape Commands::install() {
    Chance& chance = world_.chance;
    const std::string mood = chance.oneIn(100) ? chance.of({"hang", "deaf"})
                             : chance.oneIn(8)
                                 ? chance.of({"flood", "both", "fail", "suicide", "heir"})
                                 : "well";
    const std::string code = product();
    const bool sound = hopeFor(code) == Hope::Success;
    Shape shape{"INSTALL",
                code,
                {{"VERSION", "060100000"},
                 {"CONTEXT", "|TOVRINHOME|/bin/installer " + mood + " |DEPLOYDIR|"}},
                mood == "fail"            ? Hope::Failure
                : mood == "well" && sound ? Hope::Success
                                          : Hope::Any};
    if (chance.oneIn(2)) {
        shape.more.emplace_back("OPTIONAL", chance.of({"REQUIRES_RESTART", "SETCMS"}));
    }
    return shape;
}

Commands::Shape Commands::removal() {
    const std::string code = product();
    if (world_.chance.oneIn(2)) {
        // The inventory may have been killed, and then the product is not found.
        return {"UNINSTALL", code, {}, hopeFor(code)};
    }
    return {"REMOVEINSTANCE", code, {{"TARGETMSN", target()}, {"CONTEXT", "input"}}, hopeFor(code)};
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
    if (shape.notesItsRun) world_.ledger.notesItsRun(number);
    world_.tally.count(restarts ? "INSTALL with restart" : shape.command);
    // Those of a connection's burst have an order among each other.
    if (burst == 0 && world_.chance.oneIn(3)) return inTurn(shape, number);
    Conditions where = {{"COMMAND", shape.command},
                        {"TRANSID", world_.ledger.transid(number)},
                        {"PRODUCT", shape.productFor(number)}};
    where.insert(where.end(), shape.more.begin(), shape.more.end());
    return entered(number, queryBody("KAGREQT", where));
}

Exchange Commands::inTurn(const Shape& shape, Ledger::Number number) const {
    json body = {{"command", shape.command},
                 {"product", shape.productFor(number)},
                 {"transid", world_.ledger.transid(number)},
                 {"once", true}};
    for (const auto& [column, value] : shape.more)
        body[lowerCase(column)] = value;
    return task(number, body.dump());
}

Exchange Commands::announcedInTurn(Ledger::Number number) const {
    world_.tally.count("START");
    return inTurn({"START", "ux", {}, Hope::Success, false}, number);
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

Exchange Commands::task(Ledger::Number number, const std::string& body) const {
    World& world = world_;
    world.ledger.takesItsTurn(number);
    return {postRequest("/v1/tasks", body),
            [&world, number] {
                // A repetition changes nothing about when it was asked for.
                if (world.ledger.entry(number).sent > 0) return world.tally.count("repetitions");
                world.ledger.sending(number, world.clock.wall());
            },
            [&world, number, body](const Answer* answer) {
                // That the host is too busy for a repetition says nothing about the request.
                const bool repeated = world.ledger.entry(number).answer == Ledger::Answer::Unknown;
                if (answer == nullptr || (repeated && answer->status == 503)) {
                    world.repeats.emplace_back(number, body);
                    return world.ledger.lost(number);
                }
                const double now = world.clock.wall();
                if (answer->status == 503) return world.ledger.answered(number, false, now);
                const json document = json::parse(answer->body, nullptr, false);
                if (answer->status != 202 || !document.is_object() ||
                    document.value("transid", "") != world.ledger.transid(number)) {
                    world.tally.fault(world.ledger.transid(number) + " was answered with status " +
                                      std::to_string(answer->status) + ": " + answer->body);
                    return world.ledger.lost(number);
                }
                world.ledger.answered(number, true, now);
            }};
}

}  // namespace soak
