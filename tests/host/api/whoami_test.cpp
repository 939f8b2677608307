#include <gtest/gtest.h>
#include <unistd.h>

#include <nlohmann/json.hpp>

#include "host/api_fixture.h"

namespace {

using nlohmann::json;

class Whoami : public ApiTest {
protected:
    json as(const host::Peer& peer) {
        auto handled = api->handle({"GET", "/v1/whoami", "", peer});
        const host::Answer answer = std::get<host::Job>(handled)();
        const auto& reply = std::get<host::Reply>(answer);
        EXPECT_EQ(reply.status, 200U);
        return json::parse(reply.body);
    }
};

TEST_F(Whoami, TellsTheClientHisUserAndHisAccess) {
    EXPECT_EQ(as({7, 0, 4, host::Access::Act, "root"}), json({{"user", "root"},
                                                              {"uid", 0},
                                                              {"gid", 4},
                                                              {"pid", 7},
                                                              {"access", "act"},
                                                              {"reason", "root"}}));
    const json reader = as({7, 4'000'000, 5, host::Access::Read, "a member"});
    EXPECT_EQ(reader.at("user"), "4000000") << "one without a name";
    EXPECT_EQ(reader.at("access"), "read");
    EXPECT_EQ(reader.at("reason"), "a member");
}

}  // namespace
