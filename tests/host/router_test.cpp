#include "host/api/router.h"

#include <gtest/gtest.h>

namespace {

using namespace host;

Router makeRouter(const char* codePage = "UTF-8") {
    return Router({{"TEST",
                    "PLAIN",
                    {{"NAME", 0, 8, OXA_TYPE_CHARACTER},
                     {"NUMBER", 8, 4, OXA_TYPE_INTEGER},
                     {"TEXT", 12, 16, OXA_TYPE_CHARACTER}}}},
                  CodePage(codePage));
}

Request post(const std::string& body) {
    static const Router& router = *new Router(makeRouter());
    return router.route("POST", "/v1/query", body);
}

/// The conditions of a query that passes, as text.
std::string conditions(const std::string& where) {
    const Request request = post(R"({"table":"PLAIN","where":)" + where + "}");
    const auto* query = std::get_if<QueryRequest>(&request);
    if (query == nullptr) return "refused: " + std::get<Refusal>(request).text;
    static const char* const names[] = {"=", "!=", "<", "<=", ">", ">=", "like"};
    std::string text;
    for (const oxa::Predicate& predicate : query->where)
        text += predicate.column + names[predicate.op] + predicate.value + ";";
    return text;
}

std::string condition(const std::string& column, const std::string& op, const std::string& value) {
    return conditions(R"([{"column":")" + column + R"(","op":")" + op + R"(","value":)" + value +
                      "}]");
}

void expectRefusal(unsigned status, const std::string& text, const Request& request) {
    const auto* refusal = std::get_if<Refusal>(&request);
    ASSERT_NE(nullptr, refusal) << text;
    EXPECT_EQ(status, refusal->status) << text;
    EXPECT_EQ(text, refusal->text);
}

TEST(Router, KnowsItsPaths) {
    const Router router = makeRouter();
    EXPECT_TRUE(std::holds_alternative<TablesRequest>(router.route("GET", "/v1/tables", "")));
    EXPECT_TRUE(std::holds_alternative<HealthRequest>(router.route("GET", "/v1/health", "")));
    EXPECT_TRUE(
        std::holds_alternative<EventsRequest>(router.route("GET", "/v1/events?table=PLAIN", "")));
    EXPECT_TRUE(std::holds_alternative<QueryRequest>(
        router.route("POST", "/v1/query", R"({"table":"PLAIN"})")));
}

TEST(Router, RefusesOtherPaths) {
    const Router router = makeRouter();
    expectRefusal(404, "there is nothing at /", router.route("GET", "/", ""));
    expectRefusal(404, "there is nothing at /v1/tables/", router.route("GET", "/v1/tables/", ""));
    expectRefusal(404, "there is nothing at *", router.route("OPTIONS", "*", ""));
    expectRefusal(400, "the request's target has a malformed escape",
                  router.route("GET", "/v1/%zz", ""));
}

TEST(Router, RefusesOtherMethodsAndNamesTheRightOne) {
    const Router router = makeRouter();
    expectRefusal(405, "/v1/query knows only the method POST",
                  router.route("GET", "/v1/query", ""));
    for (const char* method : {"POST", "PUT", "DELETE", "HEAD", "get", "BREW"}) {
        const Request request = router.route(method, "/v1/tables", "");
        expectRefusal(405, "/v1/tables knows only the method GET", request);
        EXPECT_EQ("GET", std::get<Refusal>(request).allow);
    }
}

TEST(Router, RefusesParametersThatMeanNothing) {
    const Router router = makeRouter();
    expectRefusal(400, "/v1/tables takes no parameter \"x\"",
                  router.route("GET", "/v1/tables?x=1", ""));
    expectRefusal(400, "/v1/query takes no parameter \"table\"",
                  router.route("POST", "/v1/query?table=PLAIN", "{}"));
}

TEST(Router, QueryCarriesTableAndConditionsInOrder) {
    EXPECT_EQ("", conditions("[]"));
    EXPECT_EQ("NAME=ux;NUMBER>=3;NAME!=;",
              conditions(R"([{"column":"NAME","op":"=","value":"ux"},)"
                         R"({"value":3,"op":">=","column":"NUMBER"},)"
                         R"({"column":"NAME","op":"!=","value":""}])"));
}

TEST(Router, KnowsEveryOperator) {
    for (const char* op : {"=", "!=", "<", "<=", ">", ">=", "like"}) {
        EXPECT_EQ("NAME" + std::string(op) + "a*;", condition("NAME", op, R"("a*")"));
    }
    for (const char* op : {"", "==", "<>", "LIKE", "= "}) {
        EXPECT_EQ(
            "refused: unknown operator \"" + std::string(op) + "\": there are = != < <= > >= like",
            condition("NAME", op, R"("x")"));
    }
}

TEST(Router, IntegerColumnsTakeNumbersAndDecimalStrings) {
    EXPECT_EQ("NUMBER=7;", condition("NUMBER", "=", "7"));
    EXPECT_EQ("NUMBER=7;", condition("NUMBER", "=", R"("007")"));
    EXPECT_EQ("NUMBER=-2147483648;", condition("NUMBER", "=", "-2147483648"));
    EXPECT_EQ("NUMBER=2147483647;", condition("NUMBER", "=", R"("2147483647")"));
}

TEST(Router, IntegerColumnsTakeNothingElse) {
    for (const char* value : {"2147483648", "-2147483649", "18446744073709551615", "1.0", "1e3",
                              "true", "null", "[1]", "{}", R"("")", R"("x")", R"("1 ")", R"(" 1")",
                              R"("+1")", R"("0x1")", R"("1.0")", R"("2147483648")"}) {
        EXPECT_EQ("refused: the value of column NUMBER is not a whole number of 32 bits",
                  condition("NUMBER", "=", value))
            << value;
    }
    EXPECT_EQ("refused: column NUMBER is an integer; \"like\" compares characters",
              condition("NUMBER", "like", "1"));
}

TEST(Router, CharacterColumnsTakeStringsOnly) {
    for (const char* value : {"1", "1.5", "true", "null", "[]", "{}"}) {
        EXPECT_EQ("refused: the value of column NAME is not a string",
                  condition("NAME", "=", value));
    }
    EXPECT_EQ("refused: the value of column NAME holds the character 0",
              condition("NAME", "=", R"("a\u0000b")"));
}

TEST(Router, ValuesLongerThanTheirColumnPass) {
    const std::string value(3073, 'x');
    EXPECT_EQ("TEXT=" + value + ";", condition("TEXT", "=", '"' + value + '"'));
}

TEST(Router, ValuesArriveInTheLocalCodePage) {
    const Router router = makeRouter("ISO-8859-1");
    const std::string body =
        R"({"table":"PLAIN","where":[{"column":"NAME","op":"=","value":"\u00e4"}]})";
    const Request request = router.route("POST", "/v1/query", body);
    EXPECT_EQ("\xE4", std::get<QueryRequest>(request).where.at(0).value);
    expectRefusal(400, "the value of column NAME holds what the host's code page ISO-8859-1 lacks",
                  router.route("GET", "/v1/events?table=PLAIN&NAME=%E6%97%A5", ""));
}

TEST(Router, RefusesUnknownTables) {
    expectRefusal(404, "there is no table \"NOPE\"", post(R"({"table":"NOPE"})"));
    expectRefusal(404, "there is no table \"plain\"", post(R"({"table":"plain"})"));
    expectRefusal(404, "there is no table \"\"", post(R"({"table":""})"));
}

TEST(Router, RefusesUnknownColumnsAndNamesThem) {
    EXPECT_EQ("refused: table PLAIN has no column \"NOPE\"", condition("NOPE", "=", "1"));
    EXPECT_EQ("refused: table PLAIN has no column \"name\"", condition("name", "=", R"("x")"));
    EXPECT_EQ("refused: table PLAIN has no column \"\"", condition("", "=", R"("x")"));
}

TEST(Router, RefusesBodiesOfTheWrongShape) {
    expectRefusal(400, "the body is not a JSON object", post("[]"));
    expectRefusal(400, "the body is not a JSON object", post("\"PLAIN\""));
    expectRefusal(400, "the body lacks \"table\"", post("{}"));
    expectRefusal(400, "\"table\" is not a string", post(R"({"table":1})"));
    expectRefusal(400, "\"where\" is not an array", post(R"({"table":"PLAIN","where":{}})"));
    expectRefusal(400, "\"where\" is not an array", post(R"({"table":"PLAIN","where":null})"));
    expectRefusal(400, "unknown member \"were\" in the body",
                  post(R"({"table":"PLAIN","were":[]})"));
}

TEST(Router, RefusesConditionsOfTheWrongShape) {
    EXPECT_EQ("refused: a condition is not an object", conditions("[1]"));
    EXPECT_EQ("refused: a condition lacks its \"column\"",
              conditions(R"([{"op":"=","value":""}])"));
    EXPECT_EQ("refused: a condition lacks its \"op\"",
              conditions(R"([{"column":"NAME","value":""}])"));
    EXPECT_EQ("refused: a condition lacks its \"value\"",
              conditions(R"([{"column":"NAME","op":"="}])"));
    EXPECT_EQ("refused: \"column\" of a condition is not a string",
              conditions(R"([{"column":1,"op":"=","value":""}])"));
    EXPECT_EQ("refused: \"op\" of a condition is not a string",
              conditions(R"([{"column":"NAME","op":null,"value":""}])"));
    EXPECT_EQ("refused: unknown member \"not\" in a condition",
              conditions(R"([{"column":"NAME","op":"=","value":"","not":true}])"));
}

TEST(Router, RefusesWhatIsNotJson) {
    expectRefusal(400, "the body is not JSON: error at byte 1", post(""));
    expectRefusal(400, "the body is not JSON: error at byte 11", post(R"({"table": PLAIN})"));
    expectRefusal(400, "the body is not JSON: error at byte 18", post(R"({"table":"PLAIN"}x)"));
    for (const std::string& body :
         {std::string("{"), std::string("{'table':'PLAIN'}"), std::string("{\"table\":\"\xFF\"}"),
          std::string("{\"table\":\"\\ud800\"}"), std::string("\0", 1), std::string("NaN"),
          std::string("{\"table\":1e999}")}) {
        const Request request = post(body);
        const auto* refusal = std::get_if<Refusal>(&request);
        ASSERT_NE(nullptr, refusal) << body;
        EXPECT_EQ(400U, refusal->status) << body;
        EXPECT_EQ(0U, refusal->text.find("the body is not JSON")) << refusal->text;
    }
}

TEST(Router, EveryTruncatedBodyIsRefused) {
    const std::string whole =
        R"({"table":"PLAIN","where":[{"column":"NAME","op":"=","value":"ux"}]})";
    for (std::size_t length = 0; length < whole.size(); ++length) {
        EXPECT_TRUE(std::holds_alternative<Refusal>(post(whole.substr(0, length)))) << length;
    }
}

TEST(Router, DeepNestingIsRefusedBeforeItIsBuilt) {
    expectRefusal(400, "the body is nested too deeply", post(std::string(1'000'000, '[')));
    std::string objects;
    for (int i = 0; i < 100'000; ++i)
        objects += R"({"a":)";
    expectRefusal(400, "the body is nested too deeply", post(objects));
}

TEST(Router, EventsTakeEveryOtherParameterAsEquality) {
    const Router router = makeRouter();
    const Request request =
        router.route("GET", "/v1/events?NAME=a%20b&table=PLAIN&NUMBER=5&TEXT=", "");
    const auto& events = std::get<EventsRequest>(request);
    EXPECT_EQ("PLAIN", events.table->name);
    ASSERT_EQ(3U, events.where.size());
    EXPECT_EQ("NAME", events.where[0].column);
    EXPECT_EQ("a b", events.where[0].value);
    EXPECT_EQ("NUMBER", events.where[1].column);
    EXPECT_EQ("5", events.where[1].value);
    EXPECT_EQ("", events.where[2].value);
    for (const oxa::Predicate& predicate : events.where)
        EXPECT_EQ(OPER_EQ, predicate.op);
}

TEST(Router, RefusesEventsThatMakeNoSense) {
    const Router router = makeRouter();
    const auto events = [&](const std::string& rest) {
        return router.route("GET", "/v1/events" + rest, "");
    };
    expectRefusal(400, "the parameter \"table\" is missing", events(""));
    expectRefusal(400, "the parameter \"table\" is missing", events("?NAME=x"));
    expectRefusal(400, "the parameter \"table\" is given twice", events("?table=PLAIN&table=X"));
    expectRefusal(404, "there is no table \"plain\"", events("?table=plain"));
    expectRefusal(400, "table PLAIN has no column \"name\"", events("?table=PLAIN&name=x"));
    expectRefusal(400, "the value of column NUMBER is not a whole number of 32 bits",
                  events("?table=PLAIN&NUMBER=x"));
    expectRefusal(400, "the value of column NAME holds what the host's code page UTF-8 lacks",
                  events("?table=PLAIN&NAME=%FF"));
}

}  // namespace
