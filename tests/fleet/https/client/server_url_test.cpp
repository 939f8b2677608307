#include "fleet/https/client/server_url.h"

#include <gtest/gtest.h>

#include <string>

namespace {

using fleet::readServerUrl;

TEST(ServerUrl, HasAHostAndAPort) {
    EXPECT_EQ(readServerUrl("https://centre.example:9000").authority(), "centre.example:9000");
    EXPECT_EQ(readServerUrl("https://centre.example/").authority(), "centre.example:8443");
    EXPECT_EQ(readServerUrl("https://10.0.0.1").host, "10.0.0.1");
}

TEST(ServerUrl, HasAnAddressOfTheNewKindInBrackets) {
    EXPECT_EQ(readServerUrl("https://[::1]:9000").host, "::1");
    EXPECT_EQ(readServerUrl("https://[::1]:9000").authority(), "[::1]:9000");
    EXPECT_EQ(readServerUrl("https://[::1]").authority(), "[::1]:8443");
}

TEST(ServerUrl, IsNothingElse) {
    for (const char* const text : {"",
                                   "centre.example",
                                   "http://centre.example",
                                   "https://",
                                   "https:///",
                                   "https://:80",
                                   "https://a b",
                                   "https://a:0",
                                   "https://a:65536",
                                   "https://a:",
                                   "https://a:+1",
                                   "https://a/b",
                                   "https://a:1/b",
                                   "https://user@a",
                                   "https://[::1",
                                   "https://[]",
                                   "https://[::1]x",
                                   "https://[a.b]",
                                   "https://a\r\nb",
                                   "https://a:1:2"}) {
        EXPECT_THROW(readServerUrl(text), fleet::UrlError) << text;
    }
    EXPECT_THROW(readServerUrl("https://" + std::string(256, 'a')), fleet::UrlError);
}

}  // namespace
