#include "ctl/console/request_check.h"

#include <gtest/gtest.h>

#include <utility>

namespace {

constexpr std::uint16_t kPort = 4711;

http::Request request(const std::string& method, http::Fields fields) {
    http::Request made{method, "/v1/tasks", "", {}};
    made.fields = std::move(fields);
    return made;
}

bool isTaken(const std::string& method, http::Fields fields, std::uint16_t port = kPort) {
    return console::complaintAbout(request(method, std::move(fields)), port).empty();
}

TEST(ARequest, IsForTheConsolesOwnNames) {
    EXPECT_TRUE(isTaken("GET", {{"Host", "127.0.0.1:4711"}}));
    EXPECT_TRUE(isTaken("HEAD", {{"Host", "localhost:4711"}}));
    EXPECT_TRUE(isTaken("GET", {{"Host", "localhost"}}, 80));
}

TEST(ARequest, IsRefusedUnderAnyOtherName) {
    for (const char* host : {"", "localhost", "127.0.0.1", "evil.example:4711", "127.0.0.1:4712",
                             "127.0.0.1:47110", "localhost:4711.evil.example", "[::1]:4711",
                             "127.0.0.1:4711 ", "2130706433:4711", "x@127.0.0.1:4711"}) {
        EXPECT_FALSE(isTaken("GET", {{"Host", host}})) << host;
    }
    EXPECT_FALSE(isTaken("GET", {}));
    EXPECT_FALSE(isTaken("GET", {{"Host", "localhost:4711"}, {"Host", "localhost:4711"}}));
}

TEST(ARequest, IsRefusedWhenTheBrowserNamesAnotherSite) {
    EXPECT_FALSE(console::isOfAnotherSite(request("GET", {})));
    for (const char* site : {"same-origin", "none"})
        EXPECT_FALSE(console::isOfAnotherSite(request("GET", {{"Sec-Fetch-Site", site}}))) << site;
    for (const char* site : {"same-site", "cross-site", "", "Same-Origin"})
        EXPECT_TRUE(console::isOfAnotherSite(request("GET", {{"Sec-Fetch-Site", site}}))) << site;
}

TEST(ARequestThatMayChangeSomething, NeedsTheConsolesField) {
    for (const char* method : {"POST", "PUT", "DELETE", "PATCH", "OPTIONS", "get", "FOO"}) {
        EXPECT_FALSE(isTaken(method, {{"Host", "localhost:4711"}})) << method;
        EXPECT_TRUE(isTaken(method, {{"Host", "localhost:4711"}, {"X-Zav-Console", "1"}}))
            << method;
    }
    for (const char* value : {"", "0", "11", "true"}) {
        EXPECT_FALSE(isTaken("POST", {{"Host", "localhost:4711"}, {"X-Zav-Console", value}}))
            << value;
    }
    EXPECT_FALSE(isTaken(
        "POST", {{"Host", "localhost:4711"}, {"X-Zav-Console", "1"}, {"X-Zav-Console", "1"}}));
}

TEST(ARequestThatMayChangeSomething, ComesFromNoOtherPage) {
    const auto from = [](const std::string& origin) {
        return isTaken("POST",
                       {{"Host", "localhost:4711"}, {"X-Zav-Console", "1"}, {"Origin", origin}});
    };
    EXPECT_TRUE(from("http://localhost:4711"));
    for (const char* origin :
         {"", "null", "http://evil.example", "http://localhost:4712", "https://localhost:4711",
          "http://127.0.0.1:4711", "http://localhost:4711.evil.example", "localhost:4711"}) {
        EXPECT_FALSE(from(origin)) << origin;
    }
    EXPECT_FALSE(isTaken("POST", {{"Host", "localhost:4711"},
                                  {"X-Zav-Console", "1"},
                                  {"Origin", "http://localhost:4711"},
                                  {"Origin", "http://localhost:4711"}}));
}

TEST(ARequest, HasAPathWithoutWhatFollowsIt) {
    http::Request made{"GET", "/v1/tasks?state=failed#x", "", {}};
    EXPECT_EQ(console::pathOf(made), "/v1/tasks");
    made.target = "/a#b?c";
    EXPECT_EQ(console::pathOf(made), "/a");
}

}  // namespace
