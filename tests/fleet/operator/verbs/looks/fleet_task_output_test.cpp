/// Whose output is meant, and how it becomes a document.
#include "fleet/operator/verbs/looks/fleet_task_output.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <string>

#include "tests/fleet/operator/certified.h"
#include "tests/fleet/operator/fake_centre.h"

namespace {

using fleet::hostOfTask;
using fleet::OutputDocument;
using nlohmann::json;
using operator_test::failureOf;
using operator_test::FakeCentre;
using operator_test::newUser;

const std::string kOrder(32, 'a');

json hostDocument(const std::string& key, const std::string& name) {
    return {{"host", key}, {"name", name}, {"state", "here"}, {"signing", "S"}};
}

TEST(TheHostOfATask, IsTheOneThatTheCentreHasGivenTheOrder) {
    FakeCentre centre;
    const std::string key = newUser().publicKey();
    centre.answer("GET /v1/orders/" + kOrder, json{{"order", kOrder}, {"host", key}});
    centre.answer("GET /v1/hosts/" + key, hostDocument(key, "web-1"));
    const fleet::WantedOutput wanted = hostOfTask(centre, "", kOrder);
    EXPECT_EQ(wanted.host.key, key);
    EXPECT_EQ(wanted.host.name, "web-1");
    EXPECT_EQ(wanted.host.signing, "S");
    EXPECT_EQ(wanted.selector, "*");
    EXPECT_EQ(wanted.task, kOrder);
}

TEST(TheHostOfATask, IsNamed) {
    FakeCentre centre;
    const std::string key = newUser().publicKey();
    centre.answer("GET /v1/hosts/web-1", hostDocument(key, "web-1"));
    EXPECT_EQ(hostOfTask(centre, "web-1", "deploy-7").host.key, key);
}

TEST(TheHostOfATask, IsTheOnlyOneThatASelectorMeans) {
    FakeCentre centre;
    const std::string key = newUser().publicKey();
    const json one = hostDocument(key, "web-1");
    const std::string list = "GET /v1/hosts?limit=1000&selector=";
    centre.answer(list + "env%3Dtest", json{{"hosts", {one}}});
    const fleet::WantedOutput wanted = hostOfTask(centre, "env=test", "deploy-7");
    EXPECT_EQ(wanted.host.key, key);
    EXPECT_EQ(wanted.selector, "env=test");
    centre.answer(list + "prod", json{{"hosts", {one, hostDocument(newUser().publicKey(), "b")}}});
    const ctl::Failure two = failureOf([&] { hostOfTask(centre, "prod", "deploy-7"); });
    EXPECT_EQ(two.status(), ctl::kWrongUsage);
    EXPECT_STREQ(two.what(), "a task is one host's, and --on means 2 of them");
    centre.answer(list + "none", json{{"hosts", json::array()}});
    EXPECT_EQ(failureOf([&] { hostOfTask(centre, "none", "deploy-7"); }).status(),
              ctl::kHostReportedFailure);
}

TEST(TheHostOfATask, IsNotGuessed) {
    FakeCentre centre;
    const ctl::Failure unknown = failureOf([&] { hostOfTask(centre, "", "deploy-7"); });
    EXPECT_EQ(unknown.status(), ctl::kWrongUsage);
    EXPECT_STREQ(unknown.what(), "\"deploy-7\" is no order's identifier");
    EXPECT_TRUE(centre.asked().empty());
    EXPECT_EQ(failureOf([&] { hostOfTask(centre, "", kOrder); }).status(), ctl::kWrongUsage)
        << "the centre knows no such order";
}

TEST(OutputAsADocument, HasThePiecesWithTheirStreamsAndALimit) {
    OutputDocument document;
    document.add({false, "out"});
    document.add({true, "err"});
    EXPECT_EQ(json::parse(document.page().out),
              (json{{"output",
                     {{{"stream", "stdout"}, {"text", "out"}},
                      {{"stream", "stderr"}, {"text", "err"}}}}}));
    const std::string much(OutputDocument::kMostBytes, 'x');
    EXPECT_EQ(failureOf([&] { document.add({false, much}); }).status(), ctl::kHostReportedFailure);
    OutputDocument empty;
    EXPECT_EQ(failureOf([&] {
                  for (std::size_t i = 0; i <= OutputDocument::kMostBytes / 32; ++i)
                      empty.add({false, ""});
              }).status(),
              ctl::kHostReportedFailure)
        << "empty texts take room, too";
}

}  // namespace
