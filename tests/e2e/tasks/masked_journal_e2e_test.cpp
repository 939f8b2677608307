// What a real host keeps of passwords and configurations.
// ctest-label: threaded

#include <gmock/gmock.h>

#include <filesystem>
#include <nlohmann/json.hpp>

#include "host/raw_client.h"
#include "support/host/managed_host.h"
#include "support/host/starter_home.h"

namespace {

namespace fs = std::filesystem;
using Guards = ManagedHost::Guards;
using nlohmann::json;
using testing::HasSubstr;
using testing::Not;

class MaskedJournal : public testing::Test {
protected:
    static constexpr const char* kSecrets[] = {"auburn", "hunter2", "sesame"};

    /// Everything in the files of the state directory.
    std::string allBytes() const {
        std::string bytes;
        for (const auto& entry : fs::recursive_directory_iterator(home.path("zavhost"))) {
            if (entry.is_regular_file()) {
                bytes += home.files().read(fs::relative(entry.path(), home.files().path("")));
            }
        }
        return bytes;
    }
    json get(const ManagedHost& host, const std::string& path) const {
        RawClient client(host.socket());
        return json::parse(client.get(path).body);
    }
    /// Sets and reads a configuration, and installs with passwords in the command line and the
    /// output.
    void leaveTraces(const ManagedHost& host) const {
        EXPECT_EQ(host.zavctl({"config", "set", "ux", "INSTANCE=\nCOLOUR=auburn\n"}).status, 0);
        EXPECT_THAT(host.zavctl({"config", "get", "ux"}).out, HasSubstr("auburn"));
        host.zavctl({"install", "ux", "100", "--transid", "pw", "--no-verify", "--", "/bin/echo",
                     "password=hunter2", "DB_KEY:", "sesame", "in clear"});
    }

    StarterHome home{"ux"};
};

TEST_F(MaskedJournal, HoldsNoSecretInAnyFileAfterATasksEnd) {
    ManagedHost host(home.path(), {}, {}, Guards::On);
    leaveTraces(host);
    const json task = get(host, "/v1/tasks/pw?wait=30");
    for (const char* secret : kSecrets) {
        EXPECT_TRUE(eventually([&] { return allBytes().find(secret) == std::string::npos; }))
            << secret;
        EXPECT_THAT(task.dump(), Not(HasSubstr(secret)));
    }
    EXPECT_THAT(allBytes(), HasSubstr("DB_KEY: *** in clear")) << "the rest is kept";
    EXPECT_EQ(task["context"], "/bin/echo password=*** DB_KEY: *** \"in clear\"");
    EXPECT_EQ(task["reply"]["CONTEXT"], task["context"]);
    const json command = task["details"]["commands"].at(0);
    EXPECT_EQ(command["stdout"], "password=*** DB_KEY: *** in clear\n");
    EXPECT_THAT(command["command"].get<std::string>(), HasSubstr("password=*** DB_KEY: ***"));
}

TEST_F(MaskedJournal, IsMaskedWhateverTheTraceShows) {
    ManagedHost host(home.path(), {}, {"--trace-secrets"}, Guards::Off);
    leaveTraces(host);
    get(host, "/v1/tasks/pw?wait=30");
    for (const char* secret : kSecrets) {
        EXPECT_TRUE(eventually([&] { return allBytes().find(secret) == std::string::npos; }))
            << secret;
    }
}

}  // namespace
