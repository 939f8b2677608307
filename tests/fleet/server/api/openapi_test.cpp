// The description of the centre's interface against its route table, and the copy in the
// documentation.
#include "fleet/server/api/openapi.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <fstream>
#include <nlohmann/json.hpp>
#include <set>
#include <sstream>
#include <string>

#include "fleet/server/api/routes.h"
#include "routes/description/description.h"

namespace {

using fleet::ApiRoute;
using nlohmann::json;

std::string textOfFile(const std::string& path) {
    std::ifstream in(path);
    std::ostringstream text;
    text << in.rdbuf();
    return text.str();
}

bool mayFailWith(const ApiRoute& route, unsigned status) {
    return std::count(route.errors.begin(), route.errors.end(), status) > 0;
}

json operationOf(const json& document, const ApiRoute& route) {
    const std::string method = std::string(route.method) == "GET" ? "get" : "post";
    return document.at("paths").at(route.path).at(method);
}

TEST(CentresDescription, IsWhatTheDocumentationHas) {
    EXPECT_EQ(describe(fleet::apiRoutes()), textOfFile(ZAV_SOURCE_DIR "/docs/fleet-openapi.json"))
        << "write it anew with: cmake --build --preset native --target interface";
}

TEST(CentresDescription, NamesEachOperationOnce) {
    std::set<std::string> names;
    for (const ApiRoute& route : fleet::apiRoutes())
        EXPECT_TRUE(names.insert(operationName(route)).second) << route.path;
}

TEST(CentresDescription, TellsOfEachRouteHowItIsAnswered) {
    for (const ApiRoute& route : fleet::apiRoutes()) {
        EXPECT_FALSE(route.answers.empty()) << route.path;
        for (const routes::RouteAnswer& answer : route.answers) {
            const bool isText = std::string(answer.media) == "text/plain";
            EXPECT_TRUE(answer.document != nullptr || !answer.events.empty() || !isText)
                << route.path << " has an answer that nobody describes";
        }
    }
}

TEST(CentresDescription, TellsWhatStrangersAndViewersAreRefusedWith) {
    const json document = json::parse(describe(fleet::apiRoutes()));
    for (const ApiRoute& route : fleet::apiRoutes()) {
        const json responses = operationOf(document, route).at("responses");
        if (route.access == http::Access::None) continue;
        EXPECT_TRUE(responses.contains("401")) << route.path;
        EXPECT_TRUE(route.access == http::Access::Read || mayFailWith(route, 403)) << route.path;
    }
}

TEST(CentresDescription, SaysWhoMayAsk) {
    const json document = json::parse(describe(fleet::apiRoutes()));
    EXPECT_EQ(document.at("paths").at("/v1/health").at("get").at("x-access"), "none");
    EXPECT_EQ(document.at("paths").at("/v1/hosts").at("get").at("x-access"), "read");
    EXPECT_EQ(document.at("paths").at("/v1/rollouts").at("post").at("x-access"), "act");
}

}  // namespace
