#include "host/http/reply.h"

#include <gtest/gtest.h>

namespace {

TEST(ErrorReply, IsValidJsonWhateverTheClientWrote) {
    const host::Reply reply = host::errorReply(400, "no \xFF\n");
    EXPECT_EQ(400U, reply.status);
    EXPECT_EQ("{\"error\":\"no \xEF\xBF\xBD\\n\"}\n", reply.body);
    EXPECT_EQ("application/json", reply.type);
}

TEST(JsonReply, EndsItsLine) {
    EXPECT_EQ("{}\n", host::jsonReply(200, "{}").body);
}

}  // namespace
