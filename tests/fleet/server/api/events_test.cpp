// ctest-label: threaded
// GET /v1/events with a real centre behind it.
#include <gtest/gtest.h>

#include <algorithm>
#include <functional>
#include <memory>
#include <nlohmann/json.hpp>
#include <sstream>
#include <string>
#include <vector>

#include "fleet/server/keys/trust/revocations.h"
#include "tests/fleet/server/api/centre_interface.h"

namespace {

using centre_interface::CentreInterface;
using centre_interface::LoggedIn;
using fleet::Role;
using made_fleet::today;
using nlohmann::json;

struct Event {
    std::string name;
    json data;
};

class CentresEvents : public CentreInterface {
protected:
    /// A reader, and what it has got.
    struct Reader {
        std::unique_ptr<http::EventSource> source;
        std::vector<Event> events{};
    };

    http::Answer request(const LoggedIn& who, const std::string& after = "") {
        http::Request request{"GET", "/v1/events", "", {0, 0, 0, http::Access::Act}};
        request.authorization = "Bearer " + who.session;
        request.lastEventId = after;
        return std::get<http::Job>(api_->handle(std::move(request)))();
    }
    Reader open(const LoggedIn& who, const std::string& after = "") {
        http::Answer answer = request(who, after);
        Reader reader{std::move(std::get<std::unique_ptr<http::EventSource>>(answer))};
        reader.source->start([] {});
        return reader;
    }
    static void read(Reader& reader) {
        std::istringstream text(reader.source->take());
        Event event;
        for (std::string line; std::getline(text, line);) {
            if (line.rfind("event: ", 0) == 0) event.name = line.substr(7);
            if (line.rfind("data: ", 0) == 0) event.data = json::parse(line.substr(6));
            if (line.empty()) reader.events.push_back(std::exchange(event, {}));
        }
    }
    /// Whether such an event has come, or comes.
    static bool has(Reader& reader, const std::string& name, const json& members) {
        return eventually([&] {
            read(reader);
            return std::any_of(reader.events.begin(), reader.events.end(), [&](const Event& event) {
                return event.name == name && holds(event.data, members);
            });
        });
    }
    static bool holds(const json& document, const json& members) {
        for (const auto& [name, value] : members.items()) {
            if (!document.contains(name) || document.at(name) != value) return false;
        }
        return true;
    }
    /// The watch knows the hosts that there are: what comes now is news.
    void awaitWatch(const LoggedIn& who) {
        Reader reader = open(who);
        int tries = 0;
        ASSERT_TRUE(eventually([&] {
            join("probe-" + std::to_string(++tries));
            read(reader);
            return !reader.events.empty();
        }));
    }
};

TEST_F(CentresEvents, TellOfHosts) {
    const LoggedIn ada = admin();
    awaitWatch(ada);
    Reader reader = open(ada);
    const std::string key = join("web-1");
    EXPECT_TRUE(has(reader, "host", {{"host", key}, {"name", "web-1"}, {"state", "unknown"}}));
    sayHello("web-1", "");
    EXPECT_TRUE(has(reader, "host", {{"host", key}, {"state", "here"}, {"blocked", ""}}));
    sayHello("web-1", "its journal was set aside");
    EXPECT_TRUE(has(reader, "host", {{"host", key}, {"blocked", "its journal was set aside"}}));
    const std::size_t before = reader.events.size();
    post("/v1/hosts/web-1/labels", ada, {{"labels", {{"env", "prod"}}}});
    EXPECT_TRUE(eventually([&] {
        read(reader);
        return reader.events.size() > before;
    }));
    post("/v1/hosts/web-1/retire", ada);
    EXPECT_TRUE(has(reader, "host", {{"host", key}, {"state", "retired"}}));
}

TEST_F(CentresEvents, TellOfOrdersAndRollOuts) {
    const LoggedIn ada = admin();
    const std::string key = join("web-1");
    awaitWatch(ada);
    Reader reader = open(ada);
    const std::string order = fleet::makeOrderId();
    const std::string id =
        post("/v1/rollouts", ada, {{"orders", {orderFor(key, ada, order)}}}).document["id"];
    const json expected = {{"order", order},     {"host", key},     {"name", "web-1"},
                           {"rollout", id},      {"kind", "START"}, {"product", "ux"},
                           {"state", "released"}};
    EXPECT_TRUE(has(reader, "order", expected));
    EXPECT_TRUE(has(reader, "rollout", {{"id", id}, {"state", "running"}}));
    const auto told = services_->ask([&](fleet::CentreDesk& desk) {
        desk.parts.centre.hear({key, 1, order, "j1", "done", "{}"});
        return true;
    });
    ASSERT_TRUE(told);
    EXPECT_TRUE(has(reader, "order", {{"order", order}, {"state", "done"}}));
    EXPECT_TRUE(has(reader, "rollout", {{"id", id}, {"state", "finished"}}));
    EXPECT_TRUE(std::any_of(reader.events.begin(), reader.events.end(), [&](const Event& event) {
        return event.data == get("/v1/rollouts/" + id, ada).document;
    })) << "a roll-out is told as it is shown";
}

TEST_F(CentresEvents, TellViewersNothingOfOtherHosts) {
    const LoggedIn ada = admin();
    const LoggedIn vera = login({"vera", Role::Viewer, {}, {}, "env=test", made_fleet::kDay});
    awaitWatch(ada);
    Reader reader = open(vera);
    join("db-1", {{"env", "prod"}});
    join("web-1", {{"env", "test"}});
    EXPECT_TRUE(has(reader, "host", {{"name", "web-1"}}));
    for (const Event& event : reader.events)
        EXPECT_EQ(event.data.at("name"), "web-1");
}

TEST_F(CentresEvents, GoOnWhereTheReaderWas) {
    const LoggedIn ada = admin();
    awaitWatch(ada);
    Reader first = open(ada);
    const std::string at = first.source->position();
    join("web-1");
    ASSERT_TRUE(has(first, "host", {{"name", "web-1"}}));
    Reader again = open(ada, at);
    EXPECT_TRUE(has(again, "host", {{"name", "web-1"}}));
    EXPECT_EQ(std::get<http::Reply>(request(ada, "nonsense")).status, 400U);
    Reader elsewhere = open(ada, "0123456789abcdef-1");
    EXPECT_TRUE(has(elsewhere, "gap", {{"missing", nullptr}}));
}

TEST_F(CentresEvents, EndWhenTheKeyOfTheirReaderCountsNoLonger) {
    const LoggedIn ada = admin();
    const LoggedIn eve = login({"eve", Role::Admin, {}, {}, "*", made_fleet::kDay});
    const Reader hers = open(ada);
    const Reader other = open(eve);
    services_->withTrust([&](sqlite::Database& database) {
        return fleet::RevokedKeys(database).revokeOperator("ada", today());
    });
    EXPECT_TRUE(eventually([&] { return hers.source->over(); }));
    EXPECT_FALSE(other.source->over());
}

}  // namespace
