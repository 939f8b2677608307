#include "ctl/console/page_files.h"

#include <gtest/gtest.h>

#include <stdexcept>
#include <utility>

#include "ctl/console/served_console.h"

namespace {

using console::PageFiles;

std::string fieldIn(const http::Reply& reply, const std::string& name) {
    for (const auto& [known, value] : reply.fields) {
        if (known == name) return value;
    }
    return "";
}

class ThePage : public testing::Test {
protected:
    http::Reply get(const std::string& target, http::Fields fields = {},
                    const std::string& method = "GET") const {
        http::Request request{method, target, "", {}};
        request.fields = std::move(fields);
        return files.answer(request);
    }

    const PageFiles files{console_test::smallPage()};
};

TEST_F(ThePage, HasItsFilesAsTheyAre) {
    const http::Reply reply = get("/app.js?v=1");
    EXPECT_EQ(reply.status, 200U);
    EXPECT_EQ(reply.body, "run()");
    EXPECT_EQ(reply.type, "text/javascript; charset=utf-8");
    EXPECT_EQ(fieldIn(reply, "Cache-Control"), "no-cache");
    EXPECT_EQ(fieldIn(reply, "Vary"), "Accept-Encoding");
    EXPECT_EQ(fieldIn(reply, "Content-Encoding"), "");
}

TEST_F(ThePage, IsShownAtEveryPathWithoutADot) {
    for (const char* path : {"/", "/tasks", "/tasks/17", "/index.html", "//elsewhere"})
        EXPECT_EQ(get(path).body, "<!doctype html>") << path;
}

TEST_F(ThePage, HasNoOtherFiles) {
    for (const char* path : {"/app.css", "/../app.js", "/%2e%2e/etc/x.y", "/app.js/", "/APP.JS"})
        EXPECT_EQ(get(path).status, 404U) << path;
}

TEST_F(ThePage, IsOnlyRead) {
    const http::Reply reply = get("/", {}, "POST");
    EXPECT_EQ(reply.status, 405U);
    EXPECT_EQ(fieldIn(reply, "Allow"), "GET, HEAD");
    EXPECT_EQ(get("/", {}, "HEAD").status, 200U);
}

TEST_F(ThePage, IsCompressedForThoseWhoTakeIt) {
    const http::Reply reply = get("/app.js", {{"Accept-Encoding", "br, gzip;q=0.5"}});
    EXPECT_EQ(reply.body, "small js");
    EXPECT_EQ(fieldIn(reply, "Content-Encoding"), "gzip");
    EXPECT_NE(fieldIn(reply, "ETag"), fieldIn(get("/app.js"), "ETag"));
    EXPECT_EQ(get("/app.js", {{"Accept-Encoding", "gzip;q=0, br"}}).body, "run()");
}

TEST_F(ThePage, IsNotSentToThoseWhoHaveIt) {
    const std::string tag = fieldIn(get("/app.js"), "ETag");
    const http::Reply reply = get("/app.js", {{"If-None-Match", "\"a\", W/" + tag}});
    EXPECT_EQ(reply.status, 304U);
    EXPECT_EQ(reply.body, "");
    EXPECT_EQ(fieldIn(reply, "ETag"), tag);
    EXPECT_EQ(get("/app.js", {{"If-None-Match", "\"a\""}}).status, 200U);
    EXPECT_EQ(get("/index.html", {{"If-None-Match", tag}}).status, 200U);
    EXPECT_EQ(get("/app.js", {{"If-None-Match", tag}, {"Accept-Encoding", "gzip"}}).status, 200U);
}

TEST(APage, HasAnIndex) {
    EXPECT_THROW(PageFiles({}), std::runtime_error);
}

TEST(TheCodings, TakeGzipUnlessItsWeightIsNothing) {
    for (const char* taken : {"gzip", "deflate,gzip", "gzip; q=0.1", "gzip;q=1.0"})
        EXPECT_TRUE(console::takesGzip(taken)) << taken;
    for (const char* refused : {"", "br", "gzip;q=0", "gzip; q=0.000", "xgzip", "gzip2"})
        EXPECT_FALSE(console::takesGzip(refused)) << refused;
}

}  // namespace
