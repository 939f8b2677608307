#include <nlohmann/json.hpp>

#include "host/api_fixture.h"
#include "host/checks/check_list.h"
#include "support/scratch_dir.h"

namespace {

using nlohmann::json;

TEST_F(ApiTest, TheDoctorTellsEveryCheckInItsOrder) {
    const ScratchDir home;
    services->checkSubject = [&home] {
        host::HostOptions options;
        options.home = home.path();
        options.state = home.path() + "/zavhost";
        return host::CheckSubject(options, [](const char*) { return nullptr; });
    };
    const http::Reply reply = ask("GET", "/v1/doctor");
    EXPECT_EQ(reply.status, 200U);
    const json document = json::parse(reply.body);
    ASSERT_EQ(document.size(), host::checks().size());
    for (std::size_t i = 0; i < document.size(); ++i) {
        EXPECT_EQ(document[i].at("check"), host::checks()[i].name);
    }
    EXPECT_EQ(document[1].at("result"), "error");
    EXPECT_EQ(document[1].at("text"),
              home.path() + "/bin/TovrinAgent is missing; no agent can start or stop");
    EXPECT_NE(document[1].at("remedy"), "");
}

}  // namespace
