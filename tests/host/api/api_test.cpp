// The route table and the endpoints that have little to say.
#include "host/api_fixture.h"

#include <gtest/gtest.h>

namespace {

using http::Access;

class Interface : public ApiTest {};

TEST_F(Interface, RefusesOtherPaths) {
    expectError(404, "there is nothing at /", ask("GET", "/"));
    expectError(404, "there is nothing at /v1/tables/", ask("GET", "/v1/tables/"));
    expectError(404, "there is nothing at *", ask("OPTIONS", "*"));
    expectError(400, "the request's target has a malformed escape", ask("GET", "/v1/%zz"));
}

TEST_F(Interface, RefusesOtherMethodsAndNamesTheRightOne) {
    const http::Reply query = ask("GET", "/v1/query");
    expectError(405, "/v1/query knows only the method POST", query);
    EXPECT_EQ(query.fields.at(0).second, "POST");
    for (const char* method : {"POST", "PUT", "DELETE", "get", "BREW"}) {
        const http::Reply reply = ask(method, "/v1/tables");
        expectError(405, "/v1/tables knows only the method GET", reply);
        ASSERT_EQ(reply.fields.size(), 1U);
        EXPECT_EQ(reply.fields[0].first, "Allow");
        EXPECT_EQ(reply.fields[0].second, "GET, HEAD");
    }
}

TEST_F(Interface, RefusesParametersThatMeanNothing) {
    expectError(400, "/v1/tables takes no parameter \"x\"", ask("GET", "/v1/tables?x=1"));
    expectError(400, "/v1/query takes no parameter \"table\"",
                ask("POST", "/v1/query?table=PLAIN", "{}"));
}

TEST_F(Interface, RefusesEventsThatMakeNoSense) {
    const auto events = [&](const std::string& rest) { return ask("GET", "/v1/events" + rest); };
    expectError(400, "the parameter \"table\" is missing", events(""));
    expectError(400, "the parameter \"table\" is missing", events("?NAME=x"));
    expectError(400, "the parameter \"table\" is given twice", events("?table=PLAIN&table=X"));
    expectError(404, "there is no table \"plain\"", events("?table=plain"));
    expectError(400, "table PLAIN has no column \"name\"", events("?table=PLAIN&name=x"));
    expectError(400, "table PLAIN has no column \"count\"", events("?table=PLAIN&count=0"));
    expectError(400, "the value of column NUMBER is not a whole number of 32 bits",
                events("?table=PLAIN&NUMBER=x"));
    expectError(400, "the value of column NAME holds what the host's code page UTF-8 lacks",
                events("?table=PLAIN&NAME=%FF"));
}

TEST_F(Interface, EventsTakeEveryOtherParameterAsEquality) {
    http::Answer answer = answerTo("GET", "/v1/events?NAME=a%20b&table=PLAIN&NUMBER=5&TEXT=");
    const auto& source = std::get<std::unique_ptr<http::EventSource>>(answer);
    table.publish(plainRow("a b", 5, "text"));
    table.publish(plainRow("a b", 4, ""));
    table.publish(plainRow("a", 5, ""));
    EXPECT_TRUE(source->empty());
    table.publish(plainRow("a b", 5, ""));
    EXPECT_EQ(source->take(), "data: {\"NAME\":\"a b\",\"NUMBER\":5,\"TEXT\":\"\"}\n\n");
}

TEST_F(Interface, HealthSaysWhatThisHostIs) {
    oxa::setOriginNode("node");
    services->counts.streams = 2;
    const std::string width = std::to_string(sizeof(void*) * 8);
    const std::string body = ask("GET", "/v1/health").body;
    EXPECT_EQ(body.find(R"({"version":")" ZAV_VERSION R"(","width":)" + width +
                        R"(,"home":"/home/of/it","origin_node":"node","uptime_seconds":)"),
              0U)
        << body;
    EXPECT_NE(body.find(R"(,"subscriptions":2,"guarded":true,"journal":")"), std::string::npos)
        << body;
    EXPECT_NE(body.find(R"(","alive":true,"reasons":[]})"), std::string::npos) << body;
}

TEST_F(Interface, RefusesRequestsThatMeanAnotherJournal) {
    const std::string own = services->journal.identity();
    const std::string fault = "this host's journal is " + own + ", not other";
    expectError(412, fault, ask("POST", "/v1/query", R"({"table": "PLAIN", "journal": "other"})"));
    expectError(412, fault, ask("GET", "/v1/tasks?journal=other"));
    expectError(412, fault, ask("GET", "/v1/tasks/t1?journal=other"));
    expectError(412, fault, ask("GET", "/v1/tasks/t1/output?journal=other"));
    expectError(412, fault, ask("POST", "/v1/tasks/t1/cancel?journal=other"));
    EXPECT_EQ(ask("GET", "/v1/tasks?journal=" + own).status, 200U);
    EXPECT_EQ(ask("POST", "/v1/query", R"({"table": "PLAIN", "journal": ")" + own + "\"}").status,
              200U);
}

TEST_F(Interface, LetsReadersGetEverythingButOutput) {
    for (const routes::RouteFacts& route : api->router().routes()) {
        const bool reads = std::string(route.method) == "GET" &&
                           std::string(route.path) != "/v1/tasks/{id}/output";
        const bool asks = std::string(route.path) == "/v1/query";  // judged by its table
        EXPECT_EQ(route.access, reads || asks ? http::Access::Read : http::Access::Act)
            << route.path;
    }
}

TEST_F(Interface, IsClosedToPeersWithoutAccess) {
    for (const routes::RouteFacts& route : api->router().routes()) {
        EXPECT_EQ(ask(route.method, route.path, "{}", http::Access::None).status, 403U)
            << route.path;
    }
}

}  // namespace
