#include "fleet/server/keys/directory/fleet_directory.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <functional>
#include <string>

#include "fleet/server/keys/files/keys_error.h"
#include "tests/fleet/server/keys/made_fleet.h"

namespace {

using fleet::FleetDirectory;
using fleet::KeyKind;
using fleet::KeyPair;
using fleet::KeysError;
using made_fleet::MadeFleet;

class CentresKeys : public testing::Test {
protected:
    std::string refusal(const std::function<void()>& act) const {
        try {
            act();
            return "";
        } catch (const KeysError& error) {
            return error.what();
        }
    }

    const MadeFleet made_;
    const FleetDirectory& directory_ = made_.directory();
};

TEST_F(CentresKeys, AreThoseThatTheRootHasMade) {
    const fleet::RootKeys root = made_.root();
    const fleet::BusKeys bus = directory_.bus();
    EXPECT_EQ(bus.hostSigner.publicKey(), root.bus.hostSigner.publicKey());
    EXPECT_EQ(bus.accountSigner.publicKey(), root.bus.accountSigner.publicKey());
    EXPECT_TRUE(fleet::isTokenSignedBy(bus.centre.token, root.bus.control.publicKey()));
    EXPECT_TRUE(fleet::isTokenSignedBy(bus.system.token, root.bus.system.publicKey()));
    const fleet::CentreKey centre = directory_.centre();
    EXPECT_EQ(centre.certificate, directory_.facts().centres.front());
}

TEST_F(CentresKeys, HoldNoneThatCouldMakeOperatorsOrAccounts) {
    const fleet::RootKeys root = made_.root();
    for (const KeyPair* const key :
         {&root.root, &root.bus.root, &root.bus.control, &root.bus.hosts, &root.bus.system}) {
        const std::string seed = key->seed();
        for (const auto& entry : std::filesystem::recursive_directory_iterator(directory_.path())) {
            if (!entry.is_regular_file()) continue;
            const std::string path = entry.path().lexically_relative(made_.scratch().path());
            EXPECT_EQ(made_.scratch().read(path).find(seed), std::string::npos) << path;
        }
    }
}

TEST_F(CentresKeys, FactsKeepNoSecret) {
    const fleet::BusKeys bus = directory_.bus();
    const std::string facts = made_.scratch().read("keys/fleet.json");
    for (const KeyPair* const key :
         {&bus.centre.key, &bus.system.key, &bus.hostSigner, &bus.accountSigner}) {
        EXPECT_EQ(facts.find(key->seed()), std::string::npos);
    }
    EXPECT_EQ(facts.find(directory_.centre().key.seed()), std::string::npos);
}

TEST_F(CentresKeys, AreReadAsTheyWereKept) {
    fleet::FleetFacts facts = directory_.facts();
    facts.url = "https://elsewhere:1";
    facts.busUrls = {"nats://a:1", "nats://b:2"};
    directory_.keepFacts(facts);
    EXPECT_EQ(directory_.facts().url, facts.url);
    EXPECT_EQ(directory_.facts().busUrls, facts.busUrls);
    EXPECT_EQ(directory_.facts().accounts.hostSigner, facts.accounts.hostSigner);
    fleet::BusKeys bus = directory_.bus();
    const std::string earlier = KeyPair::make(KeyKind::User).publicKey();
    const std::string other = KeyPair::make(KeyKind::User).publicKey();
    bus.earlierCentre = {{earlier, fleet::TokenTime(5)}, {other, fleet::kForEver}};
    directory_.keepBus(bus);
    EXPECT_EQ(directory_.bus().earlierCentre, bus.earlierCentre);
    EXPECT_TRUE(directory_.bus().earlierSystem.empty());
    EXPECT_EQ(directory_.bus().centre.token, bus.centre.token);
}

TEST_F(CentresKeys, OfADirectoryThatOthersMayUseAreRefused) {
    std::filesystem::permissions(directory_.path(), std::filesystem::perms(0750));
    EXPECT_NE(refusal([&] { FleetDirectory again(directory_.path()); }).find("mode 0700"),
              std::string::npos);
}

TEST_F(CentresKeys, CountOnlyIfTheRootHasCertifiedThem) {
    directory_.keepCentre(KeyPair::make(KeyKind::User));
    EXPECT_NE(refusal([&] { directory_.centre(); }).find("has not certified"), std::string::npos);
}

TEST_F(CentresKeys, ThatAreDamagedAreRefusedAndNamed) {
    for (const char* const name : {"fleet.json", "centre.key", "bus.keys"}) {
        const std::string whole = made_.scratch().read(std::string("keys/") + name);
        made_.scratch().write(std::string("keys/") + name, whole.substr(0, whole.size() / 2), 0600);
        EXPECT_NE(refusal([&] {
                      directory_.centre();
                      directory_.bus();
                  }),
                  "")
            << name;
        made_.scratch().write(std::string("keys/") + name, whole, 0600);
    }
    EXPECT_EQ(refusal([&] { directory_.bus(); }), "");
}

TEST(RootFile, IsMadeOnceAndReadByItsOwnerOnly) {
    const MadeFleet made;
    const fleet::RootKeys root = made.root();
    EXPECT_EQ(root.fleet, "demo");
    EXPECT_EQ(root.root.publicKey(), made.directory().facts().root);
    EXPECT_THROW(fleet::writeRootFile(made.rootFile(), root), KeysError);
    std::filesystem::permissions(made.rootFile(), std::filesystem::perms(0640));
    EXPECT_THROW(fleet::readRootFile(made.rootFile()), KeysError);
}

}  // namespace
