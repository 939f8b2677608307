// What is installed here, as the host tells it of a real home, and which instance a managed system
// name means.
// ctest-label: threaded

#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <nlohmann/json.hpp>

#include "support/host/managed_host.h"
#include "support/host/starter_home.h"

namespace {

using nlohmann::json;

json agents(const ManagedHost& host, const std::vector<std::string>& more = {}) {
    std::vector<std::string> arguments = {"--json", "agents"};
    arguments.insert(arguments.end(), more.begin(), more.end());
    const ProgramResult result = host.zavctl(arguments);
    EXPECT_EQ(result.status, 0) << result.err;
    return json::parse(result.out)["rows"];
}

std::vector<std::string> column(const json& rows, const char* name) {
    std::vector<std::string> values;
    for (const json& row : rows)
        values.push_back(row[name].get<std::string>());
    return values;
}

TEST(Inventory, ListsTheRealProductsWithTheArchitectureOfThisMachine) {
    StarterHome home;
    ManagedHost host(home.path(), {}, {"--origin-node", "node7:UX"});
    const json rows = agents(host);
    EXPECT_THAT(column(rows, "PRODUCT"), testing::ElementsAre("ax", "um", "ux"));
    for (const json& row : rows) {
        EXPECT_EQ(row["PLATFORM"], home.platform());
        EXPECT_EQ(row["HOSTPC"], home.platform());
        EXPECT_EQ(row["HOSTTYPE"], "Linux");
        EXPECT_EQ(row["VERSION"], "010000000");
        EXPECT_EQ(row["RELEASE"], "100");
        EXPECT_EQ(row["TOVRINHOME"], home.path());
        EXPECT_EQ(row["ORIGINNODE"], "node7:UX");
        EXPECT_EQ(row.size(), 9U);
    }
    EXPECT_EQ(rows[1]["PRODDESC"], "Universal agent for scripts and files");
}

TEST(Inventory, IsAnAlignedTableForPeople) {
    StarterHome home;
    ManagedHost host(home.path());
    const ProgramResult result = host.zavctl({"agents"});
    EXPECT_EQ(result.status, 0);
    const std::size_t architecture = result.out.find("ARCHITECTURE");
    ASSERT_NE(architecture, std::string::npos) << result.out;
    const std::size_t line = result.out.find("\nux ");
    ASSERT_NE(line, std::string::npos) << result.out;
    EXPECT_EQ(result.out.compare(line + 1 + architecture, home.platform().size(), home.platform()),
              0)
        << result.out;
}

TEST(Inventory, ConditionsChooseRows) {
    StarterHome home;
    ManagedHost host(home.path());
    EXPECT_THAT(column(agents(host, {"--product", "ux"}), "PRODUCT"), testing::ElementsAre("ux"));
    EXPECT_EQ(agents(host, {"--platform", home.platform()}).size(), 3U);
    EXPECT_EQ(agents(host, {"--product", "ux", "--platform", "aix523"}).size(), 0U);
    const json queried = json::parse(host.zavctl({"--json", "query", "KINAGT", "PRODUCT=ux"}).out);
    EXPECT_THAT(column(queried["rows"], "PRODUCT"), testing::ElementsAre("ux"));
}

TEST(Inventory, WithoutTheProbeTheProductsAreStillThere) {
    StarterHome home;
    ASSERT_EQ(::unlink(home.path("bin/dynarch.shl").c_str()), 0);
    ManagedHost host(home.path());
    const json rows = agents(host);
    EXPECT_THAT(column(rows, "PRODUCT"), testing::ElementsAre("ax", "um", "ux"));
    EXPECT_THAT(column(rows, "HOSTTYPE"), testing::Each(""));
    EXPECT_THAT(column(rows, "HOSTPC"), testing::Each(""));
}

TEST(Inventory, WithoutTheInventoryProgramNothingIsListed) {
    StarterHome home;
    ASSERT_EQ(::unlink(home.path("bin/cinfo").c_str()), 0);
    ManagedHost host(home.path());
    EXPECT_EQ(agents(host).size(), 0U);
    EXPECT_EQ(host.children(), 0);
}

/// Makes each run of the inventory program wait until another one runs, too.
void makeInventoryMeet(const StarterHome& home) {
    const std::string program = home.path("bin/cinfo");
    ASSERT_EQ(std::rename(program.c_str(), home.path("bin/cinfo-itself").c_str()), 0);
    home.files().script("home/bin/cinfo", "touch '" + home.path("run/here.") +
                                              "'$$\n"
                                              "tries=0\n"
                                              "until [ $(ls '" +
                                              home.path("run") +
                                              "' | grep -c here) -ge 2 ]; do\n"
                                              "    tries=$((tries + 1))\n"
                                              "    [ $tries -le 2400 ] || exit 9\n"
                                              "    sleep 0.05\n"
                                              "done\n"
                                              "exec '" +
                                              home.path("bin/cinfo-itself") + "' \"$@\"\n");
}

TEST(Inventory, TwoQueriesAtOnceDisturbNeitherEachOtherNorATaskThatRuns) {
    StarterHome home;
    makeInventoryMeet(home);
    const std::string started = home.path("run/started");
    const std::string release = home.path("run/release");
    home.files().script("home/bin/TovrinAgent",
                        "touch '" + started + "'; tries=0; until [ -e '" + release +
                            "' ]; do tries=$((tries + 1)); [ $tries -le 2400 ] || exit 9; "
                            "sleep 0.05; done\n");
    ManagedHost host(home.path());
    const auto task = host.startZavctl({"start", "ux"});
    ASSERT_TRUE(eventually([&] { return home.files().exists("home/run/started"); }));
    const auto first = host.startZavctl({"agents"});
    const auto second = host.startZavctl({"agents"});
    for (Program* query : {first.get(), second.get()}) {
        const ProgramResult result = query->wait();
        EXPECT_EQ(result.status, 0) << result.err;
        EXPECT_THAT(column(json::parse(result.out)["rows"], "PRODUCT"),
                    testing::ElementsAre("ax", "um", "ux"));
    }
    EXPECT_TRUE(task->running());
    home.files().write("home/run/release", "");
    const ProgramResult result = task->wait();
    EXPECT_EQ(result.status, 0) << result.out << result.err;
    EXPECT_EQ(host.children(), 0);
}

TEST(Instances, AManagedSystemNameMeansTheInstanceThatTheTranslatorNames) {
    StarterHome home("ux");
    ManagedHost host(home.path());
    ASSERT_EQ(host.zavctl({"config", "set", "ux", "INSTANCE=inst1\nINTERVAL=9\n"}).status, 0);
    ASSERT_TRUE(home.files().exists("home/config/ux_inst1.cfg"));
    const std::vector<std::string> target = {"ux", "--target", "inst1:host:UX"};
    EXPECT_EQ(host.zavctl({"start", target[0], target[1], target[2]}).status, 0);
    EXPECT_TRUE(home.runs("ux_inst1"));
    EXPECT_FALSE(home.runs("ux"));
    EXPECT_EQ(host.zavctl({"restart", target[0], target[1], target[2]}).status, 0);
    EXPECT_TRUE(home.runs("ux_inst1"));
    EXPECT_EQ(host.zavctl({"stop", target[0], target[1], target[2]}).status, 0);
    EXPECT_FALSE(home.runs("ux_inst1"));
    EXPECT_FALSE(home.runs("ux"));
    EXPECT_EQ(host.children(), 0);
}

TEST(Instances, WithoutATranslatorNoInstanceIsNamed) {
    StarterHome home("ux");
    ASSERT_EQ(::unlink(home.translator().c_str()), 0);
    const std::string calls = home.files().path("calls");
    home.files().script("home/bin/TovrinAgent", "echo \"$*\" >>'" + calls + "'\n");
    ManagedHost host(home.path());
    for (const char* verb : {"start", "stop"}) {
        EXPECT_EQ(host.zavctl({verb, "ux", "--target", "inst1:host:UX"}).status, 0);
    }
    EXPECT_EQ(home.files().read("calls"),
              "-h " + home.path() + " start ux\n" + "-h " + home.path() + " -c stop ux\n");
    EXPECT_NE(host.trace().find("No two-way translator found, default translator [" +
                                home.translator() + "] does not exist"),
              std::string::npos);
    EXPECT_NE(host.trace().find("No two-way translator found for product code [ux]"),
              std::string::npos);
}

}  // namespace
