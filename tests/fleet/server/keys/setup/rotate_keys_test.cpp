#include "fleet/server/keys/setup/rotate_keys.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <string>
#include <vector>

#include "fleet/bus/messages/certificate.h"
#include "fleet/server/keys/files/keys_error.h"
#include "tests/fleet/server/keys/made_fleet.h"

namespace {

using fleet::FleetDirectory;
using fleet::Moment;
using fleet::rotateKeys;
using made_fleet::kDay;
using made_fleet::kNow;
using made_fleet::MadeFleet;

class Rotation : public testing::Test {
protected:
    bool rotate(Moment now = kNow + kDay, Moment valid = 730 * kDay) const {
        return rotateKeys(directory_, made_.root(), now, now + valid);
    }
    std::vector<std::string> certifiedKeys() const {
        const fleet::FleetFacts facts = directory_.facts();
        std::vector<std::string> keys;
        for (const std::string& centre : facts.centres)
            keys.push_back(fleet::readCertificate(centre, facts.root, facts.fleet).key);
        return keys;
    }

    const MadeFleet made_;
    const FleetDirectory& directory_ = made_.directory();
};

TEST_F(Rotation, GivesTheCentreAKeyThatTheRootCertifiesBesideTheEarlierOne) {
    const std::string earlier = directory_.centre().key.publicKey();
    EXPECT_TRUE(rotate());
    const std::string now = directory_.centre().key.publicKey();
    EXPECT_NE(now, earlier);
    EXPECT_EQ(certifiedKeys(), (std::vector<std::string>{now, earlier}));
}

TEST_F(Rotation, ForgetsKeysThatAreOver) {
    rotate(kNow + 100 * kDay, kDay);
    rotate(kNow + 200 * kDay);
    EXPECT_EQ(certifiedKeys().size(), 2U);  // the first one lasts for two years
    rotate(kNow + 731 * kDay);
    EXPECT_EQ(certifiedKeys().size(), 2U);
    EXPECT_EQ(certifiedKeys().front(), directory_.centre().key.publicKey());
}

TEST_F(Rotation, KeepsAFewEarlierKeysOnly) {
    for (int turn = 0; turn < 12; ++turn)
        rotate(kNow + turn * kDay);
    EXPECT_EQ(certifiedKeys().size(), 8U);
}

TEST_F(Rotation, ReplacesTheUsersOfTheBusAndHasTheEarlierOnesRefused) {
    const fleet::BusKeys before = directory_.bus();
    rotate();
    const fleet::BusKeys after = directory_.bus();
    EXPECT_NE(after.centre.key.publicKey(), before.centre.key.publicKey());
    EXPECT_EQ(after.earlierCentre,
              (fleet::Revocations{{before.centre.key.publicKey(), fleet::kForEver}}));
    EXPECT_EQ(after.earlierSystem,
              (fleet::Revocations{{before.system.key.publicKey(), fleet::kForEver}}));
    EXPECT_EQ(after.hostSigner.publicKey(), before.hostSigner.publicKey());
}

TEST_F(Rotation, GivesTheServersANewCertificateOfTheSameAuthority) {
    const std::string server = made_.scratch().read("keys/server.pem");
    const std::string authority = directory_.authority();
    rotate();
    EXPECT_NE(made_.scratch().read("keys/server.pem"), server);
    EXPECT_EQ(made_.scratch().read("keys/bus/server.pem"), made_.scratch().read("keys/server.pem"));
    EXPECT_EQ(directory_.authority(), authority);
}

TEST_F(Rotation, TellsThatTheBusIsElsewhere) {
    std::filesystem::remove_all(made_.scratch().path("keys/bus"));
    EXPECT_FALSE(rotate());
    EXPECT_FALSE(made_.scratch().exists("keys/bus"));
}

TEST_F(Rotation, KilledBetweenItsFilesLeavesAKeyThatIsCertified) {
    const std::string key = made_.scratch().read("keys/centre.key");
    const std::string bus = made_.scratch().read("keys/bus.keys");
    rotate();
    // The facts are written first.
    made_.scratch().write("keys/centre.key", key, 0600);
    made_.scratch().write("keys/bus.keys", bus, 0600);
    const fleet::CentreKey centre = directory_.centre();
    EXPECT_EQ(centre.key.publicKey(), certifiedKeys().back());
    EXPECT_EQ(centre.certificate, directory_.facts().centres.back());
    EXPECT_TRUE(rotate());
    EXPECT_EQ(directory_.centre().key.publicKey(), certifiedKeys().front());
}

TEST_F(Rotation, NeedsThisFleetsRoot) {
    const MadeFleet other;
    const std::string key = made_.scratch().read("keys/centre.key");
    const std::string facts = made_.scratch().read("keys/fleet.json");
    EXPECT_THROW(rotateKeys(directory_, other.root(), kNow, kNow + kDay), fleet::KeysError);
    EXPECT_EQ(made_.scratch().read("keys/centre.key"), key);
    EXPECT_EQ(made_.scratch().read("keys/fleet.json"), facts);
}

}  // namespace
