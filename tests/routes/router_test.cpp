// Routes of every kind, whether the host has one like it or not.
#include "routes/router.h"

#include <gtest/gtest.h>

#include <stdexcept>

#include "routes/bad_request.h"
#include "routes/call.h"

namespace {

using http::Access;
using http::Reply;
using routes::Call;
using routes::JsonType;
using routes::Match;
using routes::Need;
using routes::Others;
using routes::RouteFacts;
using routes::Router;
using routes::Runs;
using routes::Type;

const std::vector<routes::Parameter> kId = {{"id", Type::Text, Need::Required, ""}};

std::vector<RouteFacts> someRoutes() {
    const std::vector<routes::Parameter> list = {{"state", Type::Text, Need::Required, ""},
                                                 {"limit", Type::Number, Need::Optional, ""},
                                                 {"follow", Type::Flag, Need::Optional, ""}};
    const std::vector<routes::Parameter> page = {{"number", Type::Number, Need::Required, ""}};
    return {
        {"GET", "/v1/tasks", "", http::Access::Read, Runs::AtOnce, {}, list},
        {"POST",
         "/v1/tasks",
         "",
         http::Access::Act,
         Runs::AtOnce,
         {},
         {},
         Others::None,
         {{"name", JsonType::String, Need::Required, ""},
          {"count", JsonType::Number, Need::Optional, ""},
          {"once", JsonType::Boolean, Need::Optional, ""},
          {"where", JsonType::Array, Need::Optional, ""},
          {"more", JsonType::Object, Need::Optional, ""}}},
        {"GET", "/v1/tasks/{id}", "", http::Access::Read, Runs::AtOnce, {}, kId},
        {"DELETE", "/v1/tasks/{id}", "", http::Access::Act, Runs::AtOnce, {}, kId},
        {"POST", "/v1/tasks/{id}/cancel", "", http::Access::Act, Runs::AtOnce, {}, kId},
        {"GET", "/v1/pages/{number}", "", http::Access::Read, Runs::AtOnce, {}, page},
    };
}

class Routes : public testing::Test {
protected:
    std::variant<Match, http::Reply> find(const std::string& method, const std::string& target,
                                          http::Access access = http::Access::Act) const {
        return router.find({method, target, "", {0, 0, 0, access}});
    }
    /// The route's method and path, and the parameters; or the reply's status and body.
    std::string found(const std::string& method, const std::string& target,
                      http::Access access = http::Access::Act) const {
        const auto result = find(method, target, access);
        if (const auto* const reply = std::get_if<http::Reply>(&result))
            return std::to_string(reply->status) + " " + reply->body;
        const auto& match = std::get<Match>(result);
        std::string text = match.route->method + std::string(" ") + match.route->path;
        for (const auto& [name, value] : match.parameters)
            text += " " + name + "=" + value;
        return text;
    }
    std::string allow(const std::string& method, const std::string& target) const {
        return std::get<http::Reply>(find(method, target)).fields.at(0).second;
    }
    static std::string error(const std::string& status, const std::string& text) {
        return status + " {\"error\":\"" + text + "\"}\n";
    }

    const Router router{someRoutes(), "you may only read"};
};

TEST_F(Routes, AreFoundByMethodAndPath) {
    EXPECT_EQ(found("GET", "/v1/tasks?state=queued"), "GET /v1/tasks state=queued");
    EXPECT_EQ(found("POST", "/v1/tasks"), "POST /v1/tasks");
    EXPECT_EQ(found("POST", "/v1/tasks/7/cancel"), "POST /v1/tasks/{id}/cancel id=7");
    EXPECT_EQ(found("DELETE", "/v1/tasks/7"), "DELETE /v1/tasks/{id} id=7");
    EXPECT_EQ(found("HEAD", "/v1/tasks/7"), "GET /v1/tasks/{id} id=7");
}

TEST_F(Routes, TakeOneSegmentPerParameterOfThePath) {
    EXPECT_EQ(found("GET", "/v1/tasks/a%20b%2Fc"), "GET /v1/tasks/{id} id=a b/c");
    EXPECT_EQ(found("GET", "/v1/tasks/a/b"), error("404", "there is nothing at /v1/tasks/a/b"));
    EXPECT_EQ(found("GET", "/v1/tasks/"), error("404", "there is nothing at /v1/tasks/"));
    EXPECT_EQ(found("GET", "/v1"), error("404", "there is nothing at /v1"));
    EXPECT_EQ(found("GET", "/v1%2Ftasks"), error("404", "there is nothing at /v1/tasks"));
    EXPECT_EQ(found("GET", ""), error("404", "there is nothing at "));
}

TEST_F(Routes, WithAParameterOfAnotherTypeAreNotThere) {
    EXPECT_EQ(found("GET", "/v1/pages/12"), "GET /v1/pages/{number} number=12");
    EXPECT_EQ(found("GET", "/v1/pages/x"), error("404", "there is nothing at /v1/pages/x"));
    EXPECT_EQ(found("GET", "/v1/pages/-1"), error("404", "there is nothing at /v1/pages/-1"));
}

TEST_F(Routes, WithOtherMethodsNameThoseThereAre) {
    EXPECT_EQ(found("GET", "/v1/tasks/7/cancel"),
              error("405", "/v1/tasks/7/cancel knows only the method POST"));
    EXPECT_EQ(found("PUT", "/v1/tasks/7"), error("405", "/v1/tasks/7 knows only GET and DELETE"));
    EXPECT_EQ(allow("PUT", "/v1/tasks/7"), "GET, HEAD, DELETE");
    EXPECT_EQ(allow("HEAD", "/v1/tasks/7/cancel"), "POST");
}

TEST_F(Routes, AnswerOptionsWithTheirMethods) {
    EXPECT_EQ(found("OPTIONS", "/v1/tasks?anything=1"), "204 ");
    EXPECT_EQ(allow("OPTIONS", "/v1/tasks"), "GET, HEAD, POST");
    EXPECT_EQ(found("OPTIONS", "*"), error("404", "there is nothing at *"));
}

TEST_F(Routes, CheckTheTypesOfTheirParameters) {
    EXPECT_EQ(found("GET", "/v1/tasks?state=a&limit=5&follow=1"),
              "GET /v1/tasks state=a limit=5 follow=1");
    for (const char* limit : {"", "x", "-1", "+1", "1.0", " 1", "1234567890123456789"}) {
        EXPECT_EQ(found("GET", "/v1/tasks?state=a&limit=" + std::string(limit)),
                  error("400", "the parameter \\\"limit\\\" is not a whole number"));
    }
    EXPECT_EQ(found("GET", "/v1/tasks?state=a&follow=yes"),
              error("400", "the parameter \\\"follow\\\" is not 0 or 1"));
    EXPECT_EQ(found("GET", "/v1/tasks"), error("400", "the parameter \\\"state\\\" is missing"));
    EXPECT_EQ(found("GET", "/v1/tasks?state=a&state=a"),
              error("400", "the parameter \\\"state\\\" is given twice"));
    EXPECT_EQ(found("GET", "/v1/tasks?stat=a"),
              error("400", "/v1/tasks takes no parameter \\\"stat\\\""));
    EXPECT_EQ(found("GET", "/v1/tasks/7?id=8"),
              error("400", "the parameter \\\"id\\\" is given twice"));
}

TEST_F(Routes, AreClosedToThoseWhoMayNotUseThem) {
    const std::string refused = error("403", "you may only read");
    EXPECT_EQ(found("DELETE", "/v1/tasks/7", http::Access::Read), refused);
    EXPECT_EQ(found("POST", "/v1/tasks?odd=1", http::Access::Read), refused)
        << "before anything else";
    EXPECT_EQ(found("GET", "/v1/tasks/7", http::Access::Read), "GET /v1/tasks/{id} id=7");
}

TEST(RouteTable, FindsLiteralSegmentsFirstWhateverTheOrderOfItsRows) {
    const RouteFacts one{"GET", "/a/{id}", "", http::Access::Read, Runs::AtOnce, {}, kId};
    const RouteFacts removal{"DELETE", "/a/{id}", "", http::Access::Act, Runs::AtOnce, {}, kId};
    const RouteFacts all{"GET", "/a/all", "", http::Access::Read, Runs::AtOnce};
    for (const Router& router :
         {Router({one, removal, all}, ""), Router({all, removal, one}, "")}) {
        const auto find = [&router](const char* method, const char* target) {
            return router.find({method, target, "", {0, 0, 0, http::Access::Act}});
        };
        EXPECT_STREQ(std::get<Match>(find("GET", "/a/all")).route->path, "/a/all");
        EXPECT_STREQ(std::get<Match>(find("GET", "/a/7")).route->path, "/a/{id}");
        EXPECT_EQ(std::get<http::Reply>(find("DELETE", "/a/all")).status, 405U);
    }
}

TEST(RouteTable, ThatContradictsItselfIsRefused) {
    const routes::Parameter other{"other", routes::Type::Text, routes::Need::Required, ""};
    const RouteFacts alike{"GET", "/a/{other}", "", http::Access::Read, Runs::AtOnce, {}, {other}};
    const RouteFacts good{"GET", "/a/{id}", "", http::Access::Read, Runs::AtOnce, {}, kId};
    const RouteFacts lacking{"GET", "/b/{id}", "", http::Access::Read, Runs::AtOnce};
    EXPECT_THROW(Router({lacking}, ""), std::logic_error);
    EXPECT_THROW(Router({good, good}, ""), std::logic_error);
    EXPECT_THROW(Router({good, alike}, ""), std::logic_error);
    EXPECT_NO_THROW(Router({good}, ""));
}

class Calls : public Routes {
protected:
    Call call(const std::string& method, const std::string& target, const std::string& body = "") {
        return Call(std::get<Match>(find(method, target)), {method, target, body, {}});
    }
    /// Why the body is refused; empty when it is not.
    std::string refusal(const std::string& body) {
        try {
            call("POST", "/v1/tasks", body).readBody();
            return "";
        } catch (const routes::BadRequest& bad) {
            return bad.what();
        }
    }
};

TEST_F(Calls, GiveParametersByName) {
    const Call given = call("GET", "/v1/tasks?limit=12&state=&follow=1");
    EXPECT_EQ(given.required("state"), "");
    EXPECT_EQ(given.number("limit", 5), 12);
    EXPECT_TRUE(given.flag("follow"));
    const Call left = call("GET", "/v1/tasks?state=x&follow=0");
    EXPECT_EQ(left.number("limit", 5), 5);
    EXPECT_EQ(left.text("limit"), nullptr);
    EXPECT_FALSE(left.flag("follow"));
    EXPECT_EQ(call("GET", "/v1/tasks/a").required("id"), "a");
}

TEST_F(Calls, CheckTheTypesOfTheBodysMembers) {
    EXPECT_EQ(refusal(R"({"name":"x","count":1.5,"once":true,"where":[],"more":{}})"), "");
    EXPECT_EQ(refusal(R"({"name":"x","count":"1"})"), "\"count\" is not a number");
    EXPECT_EQ(refusal(R"({"name":"x","once":1})"), "\"once\" is not true or false");
    EXPECT_EQ(refusal(R"({"name":"x","where":{}})"), "\"where\" is not an array");
    EXPECT_EQ(refusal(R"({"name":"x","more":[]})"), "\"more\" is not an object");
    EXPECT_EQ(refusal(R"({"count":1})"), "the body lacks \"name\"");
    EXPECT_EQ(refusal(R"({"nome":"x"})"),
              "unknown member \"nome\" in the body; did you mean \"name\"?");
    EXPECT_EQ(refusal(R"({"name":"x","sundry":1})"), "unknown member \"sundry\" in the body");
}

TEST_F(Calls, IgnoreABodyThatTheRouteDoesNotDescribe) {
    Call given = call("GET", "/v1/tasks?state=x", "nonsense");
    EXPECT_NO_THROW(given.readBody());
}

}  // namespace
