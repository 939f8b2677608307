#include "fleet/server/keys/setup/make_fleet.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <filesystem>
#include <functional>
#include <map>
#include <string>
#include <vector>

#include "fleet/bus/messages/certificate.h"
#include "fleet/server/keys/files/keys_error.h"
#include "fleet/server/keys/trust/trust_database.h"
#include "tests/fleet/server/keys/made_fleet.h"

namespace {

namespace fs = std::filesystem;
using fleet::FleetPlan;
using fleet::makeFleet;
using made_fleet::MadeFleet;
using made_fleet::planIn;

std::string refusalOf(const FleetPlan& plan) {
    try {
        makeFleet(plan);
        return "";
    } catch (const fleet::KeysError& error) {
        return error.what();
    }
}

/// Every file below a directory with its content.
std::map<std::string, std::string> filesIn(const ScratchDir& scratch) {
    std::map<std::string, std::string> files;
    for (const auto& entry : fs::recursive_directory_iterator(scratch.path())) {
        const std::string path = entry.path().lexically_relative(scratch.path());
        files[path] = entry.is_regular_file() ? scratch.read(path) : "";
    }
    return files;
}

TEST(NewFleet, HasFilesThatOnlyTheirOwnerMayUse) {
    const mode_t before = ::umask(0);
    const MadeFleet made;
    ::umask(before);
    for (const auto& entry : fs::recursive_directory_iterator(made.scratch().path())) {
        const auto expected = entry.is_directory() ? fs::perms(0700) : fs::perms(0600);
        EXPECT_EQ(entry.status().permissions(), expected) << entry.path();
    }
    for (const char* const name :
         {"root.key", "keys/fleet.json", "keys/centre.key", "keys/bus.keys", "keys/ca.pem",
          "keys/server.pem", "keys/trust.db", "keys/bus/nats-server.conf"}) {
        EXPECT_TRUE(made.scratch().exists(name)) << name;
    }
}

TEST(NewFleet, HasACentreThatTheRootCertifies) {
    const MadeFleet made;
    const fleet::FleetFacts facts = made.directory().facts();
    const fleet::CentreKey centre = made.directory().centre();
    const auto certificate = fleet::readCertificate(centre.certificate, facts.root, "demo");
    EXPECT_EQ(certificate.holder, fleet::Certificate::Holder::Centre);
    EXPECT_EQ(certificate.key, centre.key.publicKey());
    EXPECT_EQ(certificate.until, made_fleet::kNow + 730 * made_fleet::kDay);
    EXPECT_FALSE(fleet::allows(certificate, "START", "ux"));
}

TEST(NewFleet, IsReachedByItsFirstNameIfNothingElseIsSaid) {
    const MadeFleet made;
    EXPECT_EQ(made.directory().facts().url, "https://localhost:8443");
    EXPECT_EQ(made.directory().facts().busUrls, std::vector<std::string>{"nats://localhost:4222"});
    EXPECT_NE(made.scratch().read("keys/bus/nats-server.conf").find("listen: \"0.0.0.0:4222\""),
              std::string::npos);
}

TEST(NewFleet, OverwritesNothing) {
    for (const char* const there : {"root.key", "keys/anything", "bus/anything"}) {
        const ScratchDir scratch;
        scratch.write(there, "what counts");
        const auto before = filesIn(scratch);
        FleetPlan plan = planIn(scratch);
        plan.busDirectory = scratch.path("bus");
        EXPECT_NE(refusalOf(plan).find("is there already"), std::string::npos) << there;
        EXPECT_EQ(filesIn(scratch), before);
    }
    const MadeFleet made;
    const auto before = filesIn(made.scratch());
    EXPECT_NE(refusalOf(planIn(made.scratch())), "");
    FleetPlan other = planIn(made.scratch());
    other.rootFile = made.scratch().path("other.key");
    EXPECT_NE(refusalOf(other), "");
    EXPECT_EQ(filesIn(made.scratch()), before);
}

TEST(NewFleet, KeepsItsRootApartFromTheCentre) {
    const ScratchDir scratch;
    scratch.makeDir("elsewhere");
    fs::create_directory_symlink(scratch.path("keys"), scratch.path("elsewhere/link"));
    for (const char* const inside : {"keys/root.key", "keys/a/b/root.key", "keys/../keys/root.key",
                                     "elsewhere/link/root.key"}) {
        FleetPlan plan = planIn(scratch);
        plan.rootFile = scratch.path() + "/" + inside;
        EXPECT_NE(refusalOf(plan).find("must not be in the centre's directory"), std::string::npos)
            << inside;
        EXPECT_FALSE(scratch.exists("keys/root.key"));
    }
}

TEST(NewFleet, RefusesAPlanThatCannotBeAndMakesNothing) {
    const ScratchDir scratch;
    const auto refusedWith = [&](const std::function<void(FleetPlan&)>& change) {
        FleetPlan plan = planIn(scratch);
        change(plan);
        return refusalOf(plan);
    };
    const auto names = [](const std::string& words, const std::string& part) {
        return words.find(part) != std::string::npos;
    };
    for (const std::string& name : {std::string(), std::string("a b"), std::string(41, 'a')}) {
        EXPECT_TRUE(
            names(refusedWith([&](FleetPlan& plan) { plan.fleet = name; }), "a fleet's name"));
    }
    EXPECT_NE(refusedWith([](FleetPlan& plan) { plan.names = {}; }), "");
    for (const char* const url :
         {"http://localhost", "https://", "https://localhost:0", "https://localhost:65536",
          "https://localhost:1x", "https://elsewhere", "https://localhost/path"}) {
        EXPECT_NE(refusedWith([&](FleetPlan& plan) { plan.url = url; }), "") << url;
    }
    for (const char* const url : {"localhost:4222", "nats://localhost", "nats://elsewhere:4222"}) {
        EXPECT_NE(refusedWith([&](FleetPlan& plan) { plan.busUrls = {url}; }), "") << url;
    }
    EXPECT_TRUE(names(refusedWith([](FleetPlan& plan) { plan.busDirectory = "/a\"b"; }),
                      "the bus's directory"));
    EXPECT_TRUE(filesIn(scratch).empty());
}

TEST(NewFleet, HasAnAddressInBracketsToo) {
    FleetPlan plan;
    plan.fleet = "demo";
    plan.directory = "/somewhere/keys";
    plan.rootFile = "/elsewhere/root";
    plan.names = {"localhost", "::1"};
    plan.busUrls = {"nats://[::1]:4333"};
    plan.url = "https://[::1]/";
    EXPECT_EQ(fleet::completed(plan).url, "https://[::1]");
    EXPECT_EQ(fleet::portOfBus(plan.busUrls.front()), "4333");
}

TEST(NewFleet, CutOffBeforeItsFactsIsNoneYet) {
    const MadeFleet made;
    fs::remove(made.scratch().path("keys/fleet.json"));
    EXPECT_THROW(made.directory().facts(), fleet::KeysError);
    EXPECT_NE(refusalOf(planIn(made.scratch())).find("remove what it left"), std::string::npos);
}

}  // namespace
