#include "fleet/operator/orders/chosen_hosts.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "support/scratch_dir.h"
#include "tests/fleet/operator/certified.h"
#include "tests/fleet/operator/fake_centre.h"

namespace {

using fleet::chooseHosts;
using nlohmann::json;
using operator_test::failureOf;
using operator_test::newUser;

class ChosenHosts : public testing::Test {
protected:
    static json host(const std::string& name) {
        return {{"host", newUser().publicKey()},
                {"name", name},
                {"signing", newUser().publicKey()},
                {"state", "here"}};
    }
    operator_test::FakeCentre centre_;
};

TEST_F(ChosenHosts, AreAskedForPageByPage) {
    const std::string first = "GET /v1/hosts?limit=1000&selector=env%3Dtest";
    centre_.answer(first, json{{"hosts", {host("a"), host("b")}}, {"next", "UB"}});
    centre_.answer(first + "&after=UB", json{{"hosts", {host("c")}}});
    const fleet::Choice choice = chooseHosts(centre_, "env=test");
    ASSERT_EQ(choice.hosts.size(), 3U);
    EXPECT_EQ(choice.hosts[2].name, "c");
    EXPECT_EQ(choice.hosts[2].state, "here");
    EXPECT_EQ(choice.selector, "env=test");
}

TEST_F(ChosenHosts, MustBeSomeAndTheSelectorOne) {
    centre_.answer("GET /v1/hosts?limit=1000&selector=no", json{{"hosts", json::array()}});
    EXPECT_EQ(failureOf([&] { chooseHosts(centre_, "no"); }).status(), ctl::kHostReportedFailure);
    for (const char* const text : {"", "a in (", "=b"}) {
        EXPECT_EQ(failureOf([&] { chooseHosts(centre_, text); }).status(), ctl::kWrongUsage)
            << text;
    }
    EXPECT_EQ(centre_.asked().size(), 1U);
}

TEST_F(ChosenHosts, ComeWithWhatTheyHaveTold) {
    const std::string first = "GET /v1/inventory?limit=1000&selector=env%3Dtest";
    centre_.answer(first, json{{"hosts", {host("a")}}, {"next", "UB"}});
    centre_.answer(first + "&after=UB", json{{"hosts", {host("b")}}});
    EXPECT_EQ(fleet::inventoryDocuments(centre_, "env=test").size(), 2U);
    centre_.answer("GET /v1/inventory?limit=1000&selector=no", json{{"hosts", json::array()}});
    EXPECT_EQ(failureOf([&] { fleet::inventoryDocuments(centre_, "no"); }).status(),
              ctl::kHostReportedFailure);
    const ScratchDir scratch;
    centre_.answer("GET /v1/hosts/web-1", host("web-1"));
    const std::string file = scratch.write("hosts", "web-1\nweb-1\n");
    EXPECT_EQ(fleet::inventoryDocuments(centre_, "@" + file).size(), 1U);
}

TEST_F(ChosenHosts, AreThoseOfAFile) {
    const ScratchDir scratch;
    json second = host("web-2");
    centre_.answer("GET /v1/hosts/web-1", host("web-1"));
    centre_.answer("GET /v1/hosts/" + second["host"].get<std::string>(), second);
    const std::string file =
        scratch.write("hosts", "# ours\n web-1 \n\n" + second["host"].get<std::string>() +
                                   " # the other\nweb-1\n");
    const fleet::Choice choice = chooseHosts(centre_, "@" + file);
    ASSERT_EQ(choice.hosts.size(), 2U);
    EXPECT_EQ(choice.hosts[0].name, "web-1");
    EXPECT_EQ(choice.hosts[1].name, "web-2");
    EXPECT_EQ(choice.selector, "*");
}

TEST_F(ChosenHosts, OfAFileMustAllBeThere) {
    const ScratchDir scratch;
    centre_.answer("GET /v1/hosts/web-1", host("web-1"));
    EXPECT_NE(failureOf([&] {
                  chooseHosts(centre_, "@" + scratch.write("a", "web-1\nweb-9\n"));
              }).status(),
              ctl::kSuccess);
    EXPECT_EQ(failureOf([&] { chooseHosts(centre_, "@" + scratch.write("b", "#\n")); }).status(),
              ctl::kHostReportedFailure);
    EXPECT_EQ(failureOf([&] { chooseHosts(centre_, "@" + scratch.path("none")); }).status(),
              ctl::kWrongUsage);
    centre_.answer("GET /v1/hosts/web-3", host("web-4"));
    EXPECT_EQ(
        failureOf([&] { chooseHosts(centre_, "@" + scratch.write("c", "web-3\n")); }).status(),
        ctl::kNoHost);
}

TEST_F(ChosenHosts, OfABadCentreAreNotBelieved) {
    const std::string all = "GET /v1/hosts?limit=1000&selector=%2A";
    for (const json& answer :
         {json::object(), json{{"hosts", 1}}, json{{"hosts", {1}}},
          json{{"hosts", {json::object()}}}, json{{"hosts", {{{"host", "web-1"}}}}},
          json{{"hosts", json::array()}, {"next", "x"}}}) {
        operator_test::FakeCentre centre;
        centre.answer(all, answer);
        EXPECT_EQ(failureOf([&] { chooseHosts(centre, "*"); }).status(), ctl::kNoHost)
            << answer.dump();
    }
}

}  // namespace
