// POST /v1/query: bodies, good and bad.
#include "host/api_fixture.h"

#include <gtest/gtest.h>

namespace {

class QueryEndpoint : public ApiTest {
protected:
    http::Reply post(const std::string& body) { return ask("POST", "/v1/query", body); }
};

TEST_F(QueryEndpoint, HandsTheConditionsOnInTheirOrder) {
    std::string seen;
    table.sampler = [&](rtoxa& request) {
        FLT1_FILTERINFO entry{};
        while (request.GetFilterInfo(&entry) == OXA_OK)
            seen += std::string(entry.columnName) + "=" + entry.value + ";";
        return static_cast<int>(OXA_OK);
    };
    EXPECT_EQ(post(R"({"table":"PLAIN","where":[]})").body, "{\"rows\":[]}\n");
    EXPECT_EQ(seen, "");
    EXPECT_EQ(post(R"({"table":"PLAIN","where":[)"
                   R"({"column":"NAME","op":"=","value":"ux"},)"
                   R"({"value":3,"op":"=","column":"NUMBER"},)"
                   R"({"column":"NAME","op":"=","value":""}]})")
                  .status,
              200U);
    EXPECT_EQ(seen, "NAME=ux;NUMBER=3;NAME=;");
}

TEST_F(QueryEndpoint, RefusesUnknownTables) {
    expectError(404, "there is no table \"NOPE\"", post(R"({"table":"NOPE"})"));
    expectError(404, "there is no table \"plain\"", post(R"({"table":"plain"})"));
    expectError(404, "there is no table \"\"", post(R"({"table":""})"));
}

TEST_F(QueryEndpoint, RefusesConditionsThatMakeNoSense) {
    expectError(400, "table PLAIN has no column \"NOPE\"",
                post(R"({"table":"PLAIN","where":[{"column":"NOPE","op":"=","value":""}]})"));
    expectError(400, "a condition is not an object", post(R"({"table":"PLAIN","where":[1]})"));
}

TEST_F(QueryEndpoint, RefusesBodiesOfTheWrongShape) {
    expectError(400, "the body is not a JSON object", post("[]"));
    expectError(400, "the body is not a JSON object", post("\"PLAIN\""));
    expectError(400, "the body lacks \"table\"", post("{}"));
    expectError(400, "\"table\" is not a string", post(R"({"table":1})"));
    expectError(400, "\"where\" is not an array", post(R"({"table":"PLAIN","where":{}})"));
    expectError(400, "\"where\" is not an array", post(R"({"table":"PLAIN","where":null})"));
    expectError(400, "unknown member \"were\" in the body; did you mean \"where\"?",
                post(R"({"table":"PLAIN","were":[]})"));
}

TEST_F(QueryEndpoint, RefusesWhatIsNotJson) {
    expectError(400, "the body is not JSON: error at byte 1", post(""));
    expectError(400, "the body is not JSON: error at byte 11", post(R"({"table": PLAIN})"));
    expectError(400, "the body is not JSON: error at byte 18", post(R"({"table":"PLAIN"}x)"));
    for (const std::string& body :
         {std::string("{"), std::string("{'table':'PLAIN'}"), std::string("{\"table\":\"\xFF\"}"),
          std::string("{\"table\":\"\\ud800\"}"), std::string("\0", 1), std::string("NaN"),
          std::string("{\"table\":1e999}")}) {
        const http::Reply reply = post(body);
        EXPECT_EQ(reply.status, 400U) << body;
        EXPECT_EQ(reply.body.find("{\"error\":\"the body is not JSON"), 0U) << reply.body;
    }
}

TEST_F(QueryEndpoint, RefusesMembersThatAreGivenTwice) {
    expectError(400, "the body has the member \"table\" twice",
                post(R"({"table":"PLAIN","where":[],"table":"KAGREQT"})"));
    expectError(
        400, "the body has the member \"op\" twice",
        post(R"({"table":"PLAIN","where":[{"column":"NAME","op":"=","op":"=","value":""}]})"));
    expectError(400, "the body has the member \"table\" twice",
                post(R"({"table":"PLAIN","t\u0061ble":"PLAIN"})"));
    EXPECT_EQ(post(R"({"table":"PLAIN","where":[{"column":"NAME","op":"=","value":""},)"
                   R"({"column":"NAME","op":"=","value":""}]})")
                  .status,
              200U)
        << "each condition has members of its own";
}

TEST_F(QueryEndpoint, RefusesEveryTruncatedBody) {
    const std::string whole =
        R"({"table":"PLAIN","where":[{"column":"NAME","op":"=","value":"ux"}]})";
    EXPECT_EQ(post(whole).status, 200U);
    for (std::size_t length = 0; length < whole.size(); ++length)
        EXPECT_EQ(post(whole.substr(0, length)).status, 400U) << length;
}

TEST_F(QueryEndpoint, RefusesDeepNestingBeforeItIsBuilt) {
    expectError(400, "the body is nested too deeply", post(std::string(1'000'000, '[')));
    std::string objects;
    for (int i = 0; i < 100'000; ++i)
        objects += R"({"a":)";
    expectError(400, "the body is nested too deeply", post(objects));
}

TEST_F(QueryEndpoint, SaysThatATableIsNoLongerOffered) {
    {
        MadeUpTable passing("PASSING", plainColumns());
        passing.RegisterWithManager();
        api.reset();
        services.emplace(oxa::tables(), host::CodePage("UTF-8"), "/home/of/it");
        api.emplace(*services, host::routes());
    }
    expectError(404, "table PASSING is no longer offered", post(R"({"table":"PASSING"})"));
}

TEST_F(QueryEndpoint, LetsReadersPickNoOutcomesByWhatTheyDoNotSee) {
    MadeUpTable outcomes("KAGDYST", {{"transid", 0, 12, OXA_TYPE_CHARACTER},
                                     {"retmsgparm", 12, 32, OXA_TYPE_CHARACTER}});
    outcomes.RegisterWithManager();
    api.reset();
    services.emplace(oxa::tables(), host::CodePage("UTF-8"), "/home/of/it");
    api.emplace(*services, host::routes());
    const std::string target = "/v1/events?table=KAGDYST&";
    expectError(403,
                "you may only read from this host, and what is in RETMSGPARM is not shown to you "
                "as it is",
                ask("GET", target + "RETMSGPARM=secret", "", http::Access::Read));
    for (const auto& [column, access] :
         {std::pair{"TRANSID", http::Access::Read}, {"RETMSGPARM", http::Access::Act}}) {
        const http::Answer answer = answerTo("GET", target + column + "=x", "", access);
        EXPECT_TRUE(std::holds_alternative<std::unique_ptr<http::EventSource>>(answer)) << column;
    }
}

TEST_F(QueryEndpoint, LetsReadersQueryTheInventoryAndNothingElse) {
    MadeUpTable requests("KAGREQT", plainColumns());
    MadeUpTable inventory("KINAGT", plainColumns());
    int requestSamples = 0;
    int inventorySamples = 0;
    requests.sampler = [&](rtoxa&) {
        ++requestSamples;
        return static_cast<int>(OXA_OK);
    };
    inventory.sampler = [&](rtoxa&) {
        ++inventorySamples;
        return static_cast<int>(OXA_OK);
    };
    requests.RegisterWithManager();
    inventory.RegisterWithManager();
    api.reset();
    services.emplace(oxa::tables(), host::CodePage("UTF-8"), "/home/of/it");
    api.emplace(*services, host::routes());
    const auto query = [&](const char* name, http::Access access) {
        return ask("POST", "/v1/query", R"({"table":")" + std::string(name) + "\"}", access);
    };
    expectError(403, "you may only read from this host, and query KINAGT only",
                query("PLAIN", http::Access::Read));
    expectError(403, "you may only read from this host; a query on KAGREQT acts",
                query("KAGREQT", http::Access::Read));
    EXPECT_EQ(requestSamples, 0);
    EXPECT_EQ(query("KINAGT", http::Access::Read).status, 200U);
    EXPECT_EQ(inventorySamples, 1);
    EXPECT_EQ(query("KAGREQT", http::Access::Act).status, 200U);
    EXPECT_EQ(query("PLAIN", http::Access::Act).status, 200U);
    EXPECT_EQ(requestSamples, 1);
    expectError(403, "you may only read from this host; KAGREQT takes requests",
                ask("GET", "/v1/events?table=KAGREQT", "", http::Access::Read));
    EXPECT_EQ(requestSamples, 1);
}

/// A request table whose requests are counted.
class GuardedQuery : public QueryEndpoint {
protected:
    GuardedQuery() {
        requests.sampler = [this](rtoxa& request) {
            ++samples;
            FLT1_FILTERINFO entry{};
            while (request.GetFilterInfo(&entry) == OXA_OK)
                seen += std::string(entry.columnName) + "=" + entry.value + ";";
            return static_cast<int>(OXA_OK);
        };
        requests.RegisterWithManager();
    }
    void serve(bool guarded) {
        api.reset();
        services.emplace(oxa::tables(), host::CodePage("UTF-8"), "/home/of/it",
                         host::RowQueue::Limits{}, guarded);
        api.emplace(*services, host::routes());
    }

    MadeUpTable requests{"KAGREQT",
                         {{"command", 0, 16, OXA_TYPE_CHARACTER},
                          {"product", 16, 8, OXA_TYPE_CHARACTER},
                          {"context", 24, 64, OXA_TYPE_CHARACTER}}};
    int samples = 0;
    std::string seen;
};

TEST_F(GuardedQuery, ARefusedRequestIsNotHandedOn) {
    const std::string body =
        R"({"table":"KAGREQT","where":[{"column":"PRODUCT","op":"like","value":"u*"}]})";
    serve(true);
    const http::Reply reply = post(body);
    EXPECT_EQ(reply.status, 400U);
    EXPECT_EQ(reply.body,
              "{\"error\":\"a request gives values; PRODUCT has an operator other than \\\"=\\\", "
              "which would be taken for \\\"=\\\"\",\"guard\":\"conditions\",\"hint\":\"give every "
              "column with \\\"=\\\"\"}\n");
    EXPECT_EQ(samples, 0);
    serve(false);
    EXPECT_EQ(post(body).status, 200U);
    EXPECT_EQ(samples, 1);
}

TEST_F(GuardedQuery, TheTableGetsWhatTheGuardsMadeOfTheRequest) {
    const std::string body =
        "{\"table\":\"KAGREQT\",\"where\":[{\"column\":\"CONTEXT\",\"op\":\"=\",\"value\":"
        "\"äöü\"}]}";
    serve(true);
    EXPECT_EQ(post(body).status, 200U);
    EXPECT_EQ(seen, "CONTEXT=äöü  ;");
    seen.clear();
    serve(false);
    EXPECT_EQ(post(body).status, 200U);
    EXPECT_EQ(seen, "CONTEXT=äöü;");
}

TEST_F(GuardedQuery, ForceIsForTheGuardOfProducts) {
    const auto start = [](const char* force) {
        return std::string(R"({"table":"KAGREQT")") + force +
               R"(,"where":[{"column":"COMMAND","op":"=","value":"START"},)"
               R"({"column":"PRODUCT","op":"=","value":"ux"}]})";
    };
    serve(true);
    EXPECT_EQ(post(start("")).status, 409U);
    EXPECT_EQ(post(start(",\"force\":false")).status, 409U);
    EXPECT_EQ(samples, 0);
    EXPECT_EQ(post(start(",\"force\":true")).status, 200U);
    EXPECT_EQ(samples, 1);
    expectError(400, "\"force\" is not true or false", post(start(",\"force\":1")));
    EXPECT_EQ(post(R"({"table":"PLAIN","force":true})").status, 200U);
}

TEST_F(GuardedQuery, AnUnknownColumnOfTheRequestTableGetsTheNearestName) {
    const std::string body =
        R"({"table":"KAGREQT","where":[{"column":"PRODCUT","op":"=","value":"ux"}]})";
    serve(true);
    EXPECT_EQ(post(body).body,
              "{\"error\":\"table KAGREQT has no column \\\"PRODCUT\\\"\",\"guard\":\"columns\","
              "\"hint\":\"did you mean PRODUCT?\"}\n");
    serve(false);
    expectError(400, "table KAGREQT has no column \"PRODCUT\"", post(body));
}

}  // namespace
