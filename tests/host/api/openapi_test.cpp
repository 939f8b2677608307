// The description for machines against the route table, and the copy in the documentation.
#include "host/api/openapi.h"

#include <gtest/gtest.h>

#include <fstream>
#include <nlohmann/json.hpp>
#include <set>
#include <sstream>
#include <stdexcept>

#include "host/api/routes.h"
#include "host/api/schema.h"
#include "routes/description/description.h"

namespace host {

// What the rows below refer to.
Endpoint answerNothing;
Schema whatIsThere, thePlace, alsoAPlace;

http::Answer answerNothing(Services&, const Call&) {
    return http::Reply{};
}

nlohmann::ordered_json thePlace(Components&) {
    nlohmann::ordered_json place = shape::text("Where it is.");
    place["title"] = "Place";
    return place;
}

nlohmann::ordered_json alsoAPlace(Components& components) {
    return thePlace(components);
}

nlohmann::ordered_json whatIsThere(Components& components) {
    return shape::object("Thing", "What is there.",
                         {{"name", shape::text("its name")},
                          {"place", shape::orNull(components.ref(thePlace)), Need::Optional}});
}

}  // namespace host

namespace {

using host::JsonType;
using host::Need;
using host::Others;
using host::Route;
using host::Runs;
using host::Type;
using http::Access;
using Json = nlohmann::ordered_json;

Json described(const std::vector<Route>& routes) {
    return Json::parse(host::describe(routes));
}

Route routeOf(const char* method, const char* path) {
    return {method, path, "Says something.", http::Access::Read, Runs::AtOnce, host::answerNothing};
}

std::set<std::string> keysOf(const Json& object) {
    std::set<std::string> keys;
    for (const auto& member : object.items())
        keys.insert(member.key());
    return keys;
}

std::string textOf(const std::string& path) {
    std::ifstream in(path);
    std::ostringstream text;
    text << in.rdbuf();
    return text.str();
}

TEST(OperationNames, FollowFromMethodAndPath) {
    EXPECT_EQ(operationName(routeOf("GET", "/v1/tasks")), "getTasks");
    EXPECT_EQ(operationName(routeOf("GET", "/v1/tasks/{id}")), "getTask");
    EXPECT_EQ(operationName(routeOf("POST", "/v1/tasks/{id}/cancel")), "postTaskCancel");
    EXPECT_EQ(operationName(routeOf("POST", "/v1/tasks/{id}/try-again")), "postTaskTryAgain");
    EXPECT_EQ(operationName(routeOf("POST", "/v1/batches/{id}/orders")), "postBatchOrders");
    EXPECT_EQ(operationName(routeOf("DELETE", "/v1/depot")), "deleteDepot");
    EXPECT_EQ(operationName(routeOf("GET", "/v1/things.json")), "getThings");
}

TEST(OperationNames, DifferForAllRoutes) {
    std::set<std::string> names;
    for (const Route& route : host::routes())
        EXPECT_TRUE(names.insert(operationName(route)).second) << route.path;
}

TEST(Description, HasAnOperationForEachMethodOfAPath) {
    const Json paths = described(
        {routeOf("GET", "/v1/a"), routeOf("DELETE", "/v1/a"), routeOf("POST", "/v1/b")})["paths"];
    EXPECT_EQ(keysOf(paths), (std::set<std::string>{"/v1/a", "/v1/b"}));
    EXPECT_EQ(keysOf(paths["/v1/a"]), (std::set<std::string>{"delete", "get"}));
    EXPECT_EQ(paths["/v1/b"]["post"]["summary"], "Says something.");
    EXPECT_EQ(paths["/v1/b"]["post"]["x-access"], "read");
}

TEST(Description, TellsParametersWithTheirPlacesAndTypes) {
    Route route = routeOf("GET", "/v1/a/{id}");
    route.parameters = {{"id", Type::Text, Need::Optional, "which one"},
                        {"path", Type::Texts, Need::Required, "a file"},
                        {"wait", Type::Number, Need::Optional, "how long"},
                        {"place", Type::Text, Need::Optional, "where", host::thePlace}};
    route.others = Others::Columns;
    const Json document = described({route});
    const Json parameters = document["paths"]["/v1/a/{id}"]["get"]["parameters"];
    ASSERT_EQ(parameters.size(), 5U);
    EXPECT_EQ(parameters[0]["in"], "path");
    EXPECT_EQ(parameters[0]["required"], true) << "OpenAPI insists on it in a path";
    EXPECT_EQ(parameters[1]["in"], "query");
    EXPECT_EQ(parameters[1]["required"], true);
    EXPECT_EQ(parameters[1]["schema"]["type"], "array");
    EXPECT_EQ(parameters[2]["required"], false);
    EXPECT_EQ(parameters[2]["schema"]["type"], "integer");
    EXPECT_EQ(parameters[3]["schema"]["$ref"], "#/components/schemas/Place");
    EXPECT_EQ(parameters[4]["schema"]["type"], "object");
    EXPECT_TRUE(document["components"]["schemas"].contains("Place"));
}

TEST(Description, TellsTheMembersOfABody) {
    Route route = routeOf("POST", "/v1/a");
    route.body = {{"table", JsonType::String, Need::Required, "which"},
                  {"force", JsonType::Boolean, Need::Optional, "even if"}};
    const Json body = described({route})["paths"]["/v1/a"]["post"]["requestBody"];
    const Json schema = body["content"]["application/json"]["schema"];
    EXPECT_EQ(schema["required"], Json::array({"table"}));
    EXPECT_EQ(schema["properties"]["force"]["type"], "boolean");
    EXPECT_EQ(schema["properties"]["force"]["description"], "even if");
    EXPECT_EQ(schema["additionalProperties"], false);
}

TEST(Description, TellsAnswersAndWhatTheyReferTo) {
    Route route = routeOf("GET", "/v1/a");
    route.answers = {{200, "it is there", host::whatIsThere}};
    const Json document = described({route});
    const Json answer = document["paths"]["/v1/a"]["get"]["responses"]["200"];
    EXPECT_EQ(answer["description"], "it is there");
    EXPECT_EQ(answer["content"]["application/json"]["schema"]["$ref"],
              "#/components/schemas/Thing");
    EXPECT_EQ(keysOf(document["components"]["schemas"]),
              (std::set<std::string>{"Error", "Place", "Thing"}));
}

TEST(Description, TellsOfWhatKindAnAnswerIsThatIsNoDocument) {
    Route route = routeOf("GET", "/v1/a");
    route.answers = {{200, "text", nullptr}, {206, "bytes", nullptr, {}, "application/x"}};
    const Json answers = described({route})["paths"]["/v1/a"]["get"]["responses"];
    EXPECT_EQ(keysOf(answers["200"]["content"]), std::set<std::string>{"text/plain"});
    EXPECT_EQ(keysOf(answers["206"]["content"]), std::set<std::string>{"application/x"});
}

TEST(Description, TellsTheEventsOfAStream) {
    Route route = routeOf("GET", "/v1/a");
    route.answers = {{200, "things", nullptr, {{"message", host::whatIsThere}}}};
    const Json answer = described({route})["paths"]["/v1/a"]["get"]["responses"]["200"];
    EXPECT_EQ(answer["content"]["text/event-stream"]["x-events"]["message"]["$ref"],
              "#/components/schemas/Thing");
}

TEST(Description, TellsTheErrorsOfEveryRequestAndThoseOfTheRow) {
    Route plain = routeOf("GET", "/v1/a");
    Route more = routeOf("GET", "/v1/b");
    more.parameters = {{"journal", Type::Text, Need::Optional, "whose"}};
    more.errors = {404};
    const Json paths = described({plain, more})["paths"];
    EXPECT_EQ(keysOf(paths["/v1/a"]["get"]["responses"]),
              (std::set<std::string>{"400", "403", "413", "500", "501", "503"}));
    EXPECT_EQ(keysOf(paths["/v1/b"]["get"]["responses"]),
              (std::set<std::string>{"400", "403", "404", "412", "413", "500", "501", "503"}));
}

TEST(Description, LetsAnAnswerBeAnErrorWhereItsStatusMeansBoth) {
    Route route = routeOf("GET", "/v1/a");
    route.answers = {{503, "it is not there", host::whatIsThere}};
    const Json answer = described({route})["paths"]["/v1/a"]["get"]["responses"]["503"];
    const Json either = answer["content"]["application/json"]["schema"]["anyOf"];
    ASSERT_EQ(either.size(), 2U);
    EXPECT_EQ(either[1]["$ref"], "#/components/schemas/Error");
}

TEST(Description, RefusesAStatusWithoutAMeaning) {
    Route route = routeOf("GET", "/v1/a");
    route.errors = {418};
    EXPECT_THROW(host::describe({route}), std::logic_error);
}

TEST(Description, RefusesTwoSchemasOfOneName) {
    Route route = routeOf("GET", "/v1/a");
    route.answers = {{200, "one", host::thePlace}, {202, "another", host::alsoAPlace}};
    EXPECT_THROW(host::describe({route}), std::logic_error);
}

TEST(Description, EveryRouteSaysHowItIsAnswered) {
    for (const Route& route : host::routes())
        EXPECT_FALSE(route.answers.empty()) << route.path;
}

TEST(Description, IsWhatTheDocumentationHas) {
    EXPECT_EQ(host::describe(host::routes()), textOf(ZAV_SOURCE_DIR "/docs/openapi.json"))
        << "write it anew with: cmake --build --preset native --target interface";
}

}  // namespace
