#include "ctl/console/browser_session.h"

#include <gtest/gtest.h>

#include <set>

#include "ctl/console/secret.h"

namespace {

using console::BrowserSession;

constexpr std::chrono::hours kHalfADay{12};
constexpr std::chrono::seconds kMoment{1};

class TheBrowserSession : public testing::Test {
protected:
    std::string opened() { return "zav_console=" + *session.open(session.token(), ""); }

    std::chrono::seconds now{1000};
    BrowserSession session{[this] { return now; }};
};

TEST(ASecret, Is256BitsThatNobodyHadBefore) {
    std::set<std::string> seen;
    for (int i = 0; i < 100; ++i) {
        const std::string secret = console::newSecret();
        EXPECT_EQ(secret.size(), 64U);
        EXPECT_TRUE(console::isSecretText(secret)) << secret;
        EXPECT_TRUE(seen.insert(secret).second) << secret;
    }
}

TEST(ASecret, IsTheSameOnlyIfEveryDigitIs) {
    const std::string secret = console::newSecret();
    EXPECT_TRUE(console::isSameSecret(secret, secret));
    for (std::size_t i = 0; i < secret.size(); ++i) {
        std::string other = secret;
        other[i] = other[i] == '0' ? '1' : '0';
        EXPECT_FALSE(console::isSameSecret(secret, other)) << i;
    }
    EXPECT_FALSE(console::isSameSecret(secret, ""));
    EXPECT_FALSE(console::isSameSecret(secret, secret + "0"));
    EXPECT_FALSE(console::isSameSecret(secret, secret.substr(1)));
}

TEST_F(TheBrowserSession, IsOpenedOnceByItsToken) {
    EXPECT_FALSE(session.open("", ""));
    EXPECT_FALSE(session.open(console::newSecret(), ""));
    const auto cookie = session.open(session.token(), "");
    ASSERT_TRUE(cookie);
    EXPECT_NE(*cookie, session.token());
    EXPECT_FALSE(session.open(session.token(), "")) << "a used token opens nothing";
}

TEST_F(TheBrowserSession, IsInItsCookieAmongOthers) {
    EXPECT_FALSE(session.isIn("zav_console=" + session.token())) << "nobody has opened it";
    const std::string cookie = opened();
    EXPECT_TRUE(session.isIn(cookie));
    EXPECT_TRUE(session.isIn("a=b; " + cookie + "; c"));
    EXPECT_FALSE(session.isIn(""));
    EXPECT_FALSE(session.isIn("zav_console=" + session.token()));
    EXPECT_FALSE(session.isIn("x" + cookie));
    EXPECT_FALSE(session.isIn("zav_console="));
    EXPECT_FALSE(session.isIn(cookie + "0"));
    EXPECT_FALSE(session.isIn(cookie.substr(0, cookie.size() - 1)));
}

TEST_F(TheBrowserSession, EndsAfterHalfADay) {
    const std::string cookie = opened();
    now += kHalfADay - kMoment;
    EXPECT_TRUE(session.isIn(cookie));
    now += kMoment;
    EXPECT_FALSE(session.isIn(cookie));
}

TEST_F(TheBrowserSession, IsNotOpenedByALinkThatIsHalfADayOld) {
    now += kHalfADay;
    EXPECT_FALSE(session.open(session.token(), ""));
}

TEST_F(TheBrowserSession, LeavesOtherConsolesTheirs) {
    BrowserSession other([this] { return now; });
    const std::string first = opened();
    const std::string both = "zav_console=" + *other.open(other.token(), first);
    EXPECT_TRUE(session.isIn(both));
    EXPECT_TRUE(other.isIn(both));
    EXPECT_FALSE(other.isIn(first));
}

TEST_F(TheBrowserSession, KeepsNothingOfACookieButAFewSecrets) {
    std::string cookies = "zav_console=<script>.\"; zav_console=";
    for (int i = 0; i < 50; ++i)
        cookies += console::newSecret() + ".";
    const std::string cookie = *session.open(session.token(), cookies);
    EXPECT_EQ(cookie.size(), 8 * 64U + 7);
    EXPECT_EQ(cookie.find_first_not_of("0123456789abcdef."), std::string::npos) << cookie;
}

}  // namespace
