#include "http/reply.h"

#include <gtest/gtest.h>

namespace {

TEST(ErrorReply, IsValidJsonWhateverTheClientWrote) {
    const http::Reply reply = http::errorReply(400, "no \xFF\n");
    EXPECT_EQ(reply.status, 400U);
    EXPECT_EQ(reply.body, "{\"error\":\"no \xEF\xBF\xBD\\n\"}\n");
    EXPECT_EQ(reply.type, "application/json");
}

TEST(JsonReply, EndsItsLine) {
    EXPECT_EQ(http::jsonReply(200, "{}").body, "{}\n");
}

}  // namespace
