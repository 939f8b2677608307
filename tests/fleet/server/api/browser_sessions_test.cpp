#include "fleet/server/api/sessions/browser_sessions.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "fleet/bus/messages/invitation.h"

namespace {

using fleet::BrowserSessions;
using fleet::ConsoleLink;
using fleet::Moment;

constexpr Moment kNow{1'800'000'000'000};
constexpr Moment kMoment{1};

TEST(ALinkToTheConsole, OpensOneSession) {
    BrowserSessions browsers;
    const ConsoleLink link = browsers.makeLink("ada", kNow);
    EXPECT_EQ(browsers.keyOf(link.token, kNow), std::nullopt) << "a link is no session";
    const auto session = browsers.open(link.token, kNow);
    ASSERT_TRUE(session);
    EXPECT_NE(*session, link.token);
    EXPECT_EQ(browsers.keyOf(*session, kNow), "ada");
    EXPECT_EQ(browsers.open(link.token, kNow), std::nullopt);
    EXPECT_EQ(browsers.open(*session, kNow), std::nullopt) << "a session is no link";
}

TEST(ALinkToTheConsole, IsGoodForAMinute) {
    BrowserSessions browsers;
    const ConsoleLink link = browsers.makeLink("ada", kNow);
    EXPECT_EQ(link.expires, kNow + std::chrono::seconds(60));
    EXPECT_EQ(browsers.open(link.token, link.expires), std::nullopt);
    EXPECT_EQ(browsers.open(link.token, kNow), std::nullopt) << "it has been used up";
    const ConsoleLink other = browsers.makeLink("ada", kNow);
    EXPECT_NE(browsers.open(other.token, other.expires - kMoment), std::nullopt);
}

TEST(ALinkToTheConsole, IsNothingThatSomebodyMakesUp) {
    BrowserSessions browsers;
    browsers.makeLink("ada", kNow);
    for (const std::string& token :
         {std::string(), std::string("x"), fleet::makeJoinToken(), std::string(100'000, 'a')}) {
        EXPECT_EQ(browsers.open(token, kNow), std::nullopt) << token.substr(0, 40);
        EXPECT_EQ(browsers.keyOf(token, kNow), std::nullopt) << token.substr(0, 40);
    }
}

TEST(ASessionOfABrowser, EndsAfterSomeHours) {
    BrowserSessions browsers;
    const auto session = browsers.open(browsers.makeLink("ada", kNow).token, kNow);
    ASSERT_TRUE(session);
    const Moment end = kNow + BrowserSessions::kLifetime;
    EXPECT_EQ(browsers.keyOf(*session, end - kMoment), "ada");
    EXPECT_EQ(browsers.keyOf(*session, end), std::nullopt);
}

TEST(ASessionOfABrowser, IsOneOfFewOfItsKey) {
    BrowserSessions browsers;
    const auto otto = browsers.open(browsers.makeLink("otto", kNow).token, kNow);
    std::vector<std::string> sessions;
    for (std::size_t i = 0; i <= BrowserSessions::kMostOfKey; ++i) {
        const Moment now = kNow + i * kMoment;
        sessions.push_back(*browsers.open(browsers.makeLink("ada", now).token, now));
    }
    EXPECT_EQ(browsers.keyOf(sessions.front(), kNow), std::nullopt);
    EXPECT_EQ(browsers.keyOf(sessions[1], kNow), "ada");
    EXPECT_EQ(browsers.keyOf(*otto, kNow), "otto");

    const ConsoleLink first = browsers.makeLink("ada", kNow);
    for (std::size_t i = 1; i <= BrowserSessions::kMostLinksOfKey; ++i)
        browsers.makeLink("ada", kNow + i * kMoment);
    EXPECT_EQ(browsers.open(first.token, kNow), std::nullopt);
}

}  // namespace
