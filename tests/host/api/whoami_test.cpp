#include <gtest/gtest.h>
#include <unistd.h>

#include <nlohmann/json.hpp>

#include "host/api_fixture.h"

namespace {

using nlohmann::json;

class Whoami : public ApiTest {
protected:
    json as(const http::Peer& peer) {
        auto handled = api->handle({"GET", "/v1/whoami", "", peer});
        const http::Answer answer = std::get<http::Job>(handled)();
        const auto& reply = std::get<http::Reply>(answer);
        EXPECT_EQ(reply.status, 200U);
        return json::parse(reply.body);
    }
};

TEST_F(Whoami, TellsTheClientHisUserAndHisAccess) {
    EXPECT_EQ(as({7, 0, 4, http::Access::Act, "root"}), json({{"user", "root"},
                                                              {"uid", 0},
                                                              {"gid", 4},
                                                              {"pid", 7},
                                                              {"access", "act"},
                                                              {"reason", "root"}}));
    const json reader = as({7, 4'000'000, 5, http::Access::Read, "a member"});
    EXPECT_EQ(reader.at("user"), "4000000") << "one without a name";
    EXPECT_EQ(reader.at("access"), "read");
    EXPECT_EQ(reader.at("reason"), "a member");
}

}  // namespace
