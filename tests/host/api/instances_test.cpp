#include "host/home/instances.h"

#include <nlohmann/json.hpp>

#include "host/api_fixture.h"
#include "host/guard/machine/system_name.h"
#include "support/scratch_dir.h"

namespace {

using nlohmann::json;

class InstancesApi : public ApiTest {
protected:
    InstancesApi() {
        api.reset();
        services.emplace(oxa::tables(), host::CodePage("UTF-8"), home.path());
        api.emplace(*services, host::routes());
    }

    ScratchDir home;
};

TEST_F(InstancesApi, HaveTheNamesThatCommandsTake) {
    home.script("bin/instances",
                "printf 'ux\\tdb1\\troot\\trunning\\t17\\n"
                "um\\t\\t\\tstopped\\t\\n'");
    const http::Reply reply = ask("GET", "/v1/instances");
    EXPECT_EQ(reply.status, 200U);
    const std::string here = host::shortHostName();
    EXPECT_EQ(json::parse(reply.body)["instances"], (json{{{"product", "ux"},
                                                           {"instance", "db1"},
                                                           {"target", "db1:" + here + ":UX"},
                                                           {"state", "running"},
                                                           {"user", "root"},
                                                           {"pid", 17}},
                                                          {{"product", "um"},
                                                           {"instance", ""},
                                                           {"target", here + ":UA"},
                                                           {"state", "stopped"},
                                                           {"user", nullptr},
                                                           {"pid", nullptr}}}));
}

TEST_F(InstancesApi, OfAHomeThatCannotTellAreNotThere) {
    EXPECT_EQ(ask("GET", "/v1/instances").status, 404U);
    home.script("bin/instances", "echo 'no home' >&2; exit 2");
    const http::Reply reply = ask("GET", "/v1/instances");
    EXPECT_EQ(reply.status, 500U);
    EXPECT_EQ(json::parse(reply.body)["error"], "bin/instances ended with exit code 2: no home\n");
}

}  // namespace
