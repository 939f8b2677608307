// ctest-label: threaded
// What hosts have told about themselves, as the centre's interface shows it.
#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <string>

#include "fleet/bus/messages/facts.h"
#include "fleet/bus/nats/store.h"
#include "fleet/bus/nats/streams.h"
#include "tests/fleet/server/api/centre_interface.h"

namespace {

using centre_interface::CentreInterface;
using centre_interface::LoggedIn;
using fleet::Facts;
using fleet::Moment;
using fleet::Role;
using made_fleet::kPatience;
using made_fleet::today;
using nlohmann::json;

class HostsInventory : public CentreInterface {
protected:
    Facts factsOf(const std::string& name, const fleet::Labels& labels) {
        Facts facts;
        facts.host = buses_.at(name).publicKey();
        facts.time = today();
        facts.name = name;
        facts.labels = labels;
        facts.link = "1.0";
        facts.version = "1.1";
        facts.journal = "j1";
        facts.inventory =
            fleet::Inventory{today() - std::chrono::minutes(5),
                             json{{"products", {{{"PRODUCT", "ux"}, {"VERSION", "7"}}}}}.dump()};
        return facts;
    }
    /// Publishes as the host's link does.
    void publish(const std::string& name, const std::string& bytes) {
        const fleet::KeyPair& bus = buses_.at(name);
        const auto host = fleet_->connect(bus, fleet_->hostToken(bus));
        ASSERT_TRUE(host.connection) << host.text;
        const auto result = fleet::store(*host.connection, fleet::kFactsSubject + bus.publicKey(),
                                         bytes, kPatience);
        ASSERT_EQ(result.kind, fleet::StoreResult::Kind::Stored) << result.text;
    }
    void tell(const std::string& name, const Facts& facts) {
        publish(name, signFacts(facts, signers_.at(name)));
    }
    json host(const std::string& name, const LoggedIn& who) {
        return get("/v1/hosts/" + name, who).document;
    }
    bool hasTold(const std::string& name, const LoggedIn& who) {
        return eventually([&] { return host(name, who).contains("facts"); });
    }
    std::vector<std::string> selected(const std::string& selector, const LoggedIn& who) {
        std::vector<std::string> names;
        const json document = get("/v1/hosts?selector=" + selector, who).document;
        for (const json& one : document.at("hosts"))
            names.push_back(one.at("name"));
        return names;
    }
};

using Names = std::vector<std::string>;

TEST_F(HostsInventory, IsShownWithItsAge) {
    const LoggedIn ada = admin();
    join("web-1");
    EXPECT_FALSE(host("web-1", ada).contains("facts"));
    tell("web-1", factsOf("web-1", {{"env", "test"}}));
    ASSERT_TRUE(hasTold("web-1", ada));
    const json facts = host("web-1", ada).at("facts");
    EXPECT_EQ(facts.at("version"), "1.1");
    EXPECT_EQ(facts.at("labels"), (json{{"env", "test"}}));
    EXPECT_EQ(facts.at("inventory").at("products").at(0).at("PRODUCT"), "ux");
    EXPECT_GE(facts.at("inventory").at("age").get<int>(), 300);
}

TEST_F(HostsInventory, OfManyComesInPagesAndNamesThoseThatNeverToldAny) {
    const LoggedIn ada = admin();
    join("web-1");
    join("web-2");
    tell("web-1", factsOf("web-1", {}));
    ASSERT_TRUE(hasTold("web-1", ada));
    json hosts = json::array();
    std::string target = "/v1/inventory?limit=1&selector=*";
    for (int page = 0; page < 2; ++page) {
        const json document = get(target, ada).document;
        ASSERT_EQ(document.at("hosts").size(), 1U) << document;
        hosts.push_back(document.at("hosts").at(0));
        EXPECT_EQ(document.contains("next"), page == 0);
        target = "/v1/inventory?limit=1&selector=*&after=" + document.value("next", "");
    }
    for (const json& one : hosts)
        EXPECT_EQ(one.contains("facts"), one.at("name") == "web-1");
}

TEST_F(HostsInventory, TheHostsOwnLabelsCountForSelectorsAndBeforeTheCentres) {
    const LoggedIn ada = admin();
    join("web-1", {{"env", "production"}, {"site", "a"}});
    EXPECT_EQ(selected("env%3Dproduction", ada), Names{"web-1"});
    tell("web-1", factsOf("web-1", {{"env", "test"}, {"rack", "7"}}));
    ASSERT_TRUE(hasTold("web-1", ada));
    EXPECT_EQ(selected("env%3Dproduction", ada), Names{});
    EXPECT_EQ(selected("env%3Dtest,site%3Da,rack%3D7", ada), Names{"web-1"});
    const json shown = host("web-1", ada);
    EXPECT_EQ(shown.at("labels"), (json{{"env", "test"}, {"rack", "7"}, {"site", "a"}}));
    EXPECT_EQ(shown.at("centreLabels"), (json{{"env", "production"}, {"site", "a"}}));
    // The centre's are changed without the host's becoming some of them.
    EXPECT_EQ(post("/v1/hosts/web-1/labels", ada, {{"labels", {{"site", "b"}}}}).status, 200U);
    EXPECT_EQ(selected("env%3Dtest,site%3Db", ada), Names{"web-1"});
    EXPECT_EQ(host("web-1", ada).at("centreLabels"), (json{{"site", "b"}}));
}

TEST_F(HostsInventory, IsShownToThoseWhoMayNowSeeTheHost) {
    const LoggedIn ada = admin();
    const LoggedIn vera = login({"vera", Role::Viewer, {}, {}, "env=test", made_fleet::kDay});
    join("web-1");
    EXPECT_EQ(get("/v1/inventory", vera).document.at("hosts").size(), 0U);
    tell("web-1", factsOf("web-1", {{"env", "test"}}));
    ASSERT_TRUE(hasTold("web-1", ada));
    EXPECT_EQ(get("/v1/inventory", vera).document.at("hosts").size(), 1U);
}

TEST_F(HostsInventory, ThatIsNotTheHostsOwnOrOlderCountsNothing) {
    const LoggedIn ada = admin();
    join("web-1");
    join("web-2");
    const Facts good = factsOf("web-1", {{"env", "test"}});
    publish("web-1", "nothing of the kind");
    publish("web-1", signFacts(good, signers_.at("web-2")));
    tell("web-2", good);  // about another host
    tell("web-1", good);
    ASSERT_TRUE(hasTold("web-1", ada));
    Facts older = factsOf("web-1", {{"env", "older"}});
    older.time = good.time - Moment(1);
    tell("web-1", older);
    Facts newer = factsOf("web-2", {{"env", "other"}});
    tell("web-2", newer);
    ASSERT_TRUE(hasTold("web-2", ada));  // which came behind the older ones
    EXPECT_EQ(host("web-1", ada).at("facts").at("labels"), (json{{"env", "test"}}));
}

TEST_F(HostsInventory, IsStillKnownAfterARestart) {
    join("web-1");
    const LoggedIn ada = admin();
    tell("web-1", factsOf("web-1", {{"env", "test"}}));
    ASSERT_TRUE(hasTold("web-1", ada));
    startAgain();
    const std::string session =
        ask("POST", "/v1/sessions", "", sessionRequest(ada.key)).document.value("session", "");
    const LoggedIn again{ada.key, ada.certificate, session};
    EXPECT_EQ(selected("env%3Dtest", again), Names{"web-1"});
    EXPECT_TRUE(host("web-1", again).contains("facts"));
}

}  // namespace
