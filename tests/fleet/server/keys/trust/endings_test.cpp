#include "fleet/server/keys/trust/endings.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <string>
#include <vector>

#include "fleet/server/keys/setup/rotate_keys.h"
#include "tests/fleet/server/keys/trust/joining.h"

namespace {

using fleet::KeyKind;
using fleet::KeyPair;
using fleet::Moment;
using joining::kDay;
using joining::kNow;

class EndingKeys : public testing::Test {
protected:
    std::vector<std::string> endingAt(Moment now) {
        std::vector<std::string> names;
        for (const auto& ending :
             fleet::endingsOf(fleet_.made.directory(), fleet_.trust.connection(), now)) {
            names.push_back(ending.what);
        }
        return names;
    }
    void certify(const std::string& name, Moment valid) {
        const KeyPair key = KeyPair::make(KeyKind::User);
        fleet_.login(joining::loginOf(
            key,
            fleet_.operators.invite({name, fleet::Role::Viewer, {}, {}, "*", valid}, kDay, kNow)));
        fleet_.operators.certify({key.publicKey()}, fleet_.made.root(), kNow);
    }

    joining::Fleet fleet_;
};

TEST_F(EndingKeys, AreToldThirtyDaysBefore) {
    EXPECT_TRUE(endingAt(kNow).empty());
    EXPECT_TRUE(endingAt(kNow + 699 * kDay).empty());
    EXPECT_EQ(endingAt(kNow + 700 * kDay),
              (std::vector<std::string>{"the certificate of the centre's key",
                                        "the certificate for TLS of the centre and the bus"}));
}

TEST_F(EndingKeys, AreThoseOfTheTlsAuthorityToo) {
    const auto late = endingAt(kNow + 3640 * kDay);
    EXPECT_NE(std::find(late.begin(), late.end(), "the certificate of the TLS authority"),
              late.end());
}

TEST_F(EndingKeys, EndNoMoreAfterARotation) {
    const Moment now = kNow + 710 * kDay;
    EXPECT_EQ(endingAt(now).size(), 2U);
    rotateKeys(fleet_.made.directory(), fleet_.made.root(), now, now + 730 * kDay);
    EXPECT_TRUE(endingAt(now).empty());
}

TEST_F(EndingKeys, AreThoseOfOperatorsWhoHaveNoLongerOne) {
    certify("anna", 20 * kDay);
    certify("bert", 20 * kDay);
    certify("bert", 300 * kDay);
    certify("carl", 20 * kDay);
    fleet_.revoked.revokeOperator("carl", kNow);
    const std::vector<std::string> anna = {"the certificate of the operator anna"};
    EXPECT_EQ(endingAt(kNow), anna);
    EXPECT_EQ(endingAt(kNow + 49 * kDay), anna);  // it is over
    EXPECT_TRUE(endingAt(kNow + 50 * kDay).empty());
}

TEST_F(EndingKeys, StandInTheOrderOfTheirEnds) {
    certify("late", 25 * kDay);
    certify("soon", 5 * kDay);
    EXPECT_EQ(endingAt(kNow), (std::vector<std::string>{"the certificate of the operator soon",
                                                        "the certificate of the operator late"}));
}

}  // namespace
