/// Hosts and operators that join, for tests.
#pragma once

#include <chrono>
#include <exception>
#include <functional>
#include <stdexcept>
#include <string>
#include <vector>

#include "fleet/bus/messages/enrolment.h"
#include "fleet/bus/messages/login.h"
#include "fleet/server/keys/trust/host_enrolment.h"
#include "fleet/server/keys/trust/operators.h"
#include "fleet/server/keys/trust/revocations.h"
#include "fleet/server/keys/trust/trust_database.h"
#include "tests/fleet/server/keys/made_fleet.h"

namespace joining {

using made_fleet::kDay;
using made_fleet::kNow;

/// A machine with the keys that it has made.
struct Machine {
    fleet::KeyPair bus = fleet::KeyPair::make(fleet::KeyKind::User);
    fleet::KeyPair signing = fleet::KeyPair::make(fleet::KeyKind::User);
    std::string id = "machine";

    std::string request(const std::string& token, const std::string& fleet = "demo") const {
        return signEnrolment({fleet, token, bus.publicKey(), signing.publicKey(), id}, bus,
                             signing);
    }
};

/// What an operator's key says to log in.
inline std::string loginOf(const fleet::KeyPair& key, const std::string& token,
                           const std::string& fleet = "demo") {
    return signLogin({fleet, token, key.publicKey()}, key);
}

class Register : public fleet::HostRegister {
public:
    void enrol(const fleet::EnrolledHost& host) override {
        if (isBroken) throw std::runtime_error("the register is broken");
        hosts.push_back(host);
    }
    std::vector<fleet::EnrolledHost> hosts;
    bool isBroken = false;
};

/// A fleet and a connection to its database of who may take part.
struct Fleet {
    made_fleet::MadeFleet made;
    fleet::TrustDatabase trust{made.directory().trustDatabase()};
    fleet::HostEnrolment enrolment{trust.connection()};
    fleet::Operators operators{trust.connection()};
    fleet::RevokedKeys revoked{trust.connection()};
    Register hosts;

    std::string invite(const std::string& name, bool replaces = false) {
        return enrolment.invite({name, {{"env", "test"}}, replaces, std::chrono::hours(1)}, kNow);
    }
    fleet::EnrolmentAnswer redeem(const std::string& request, fleet::Moment now = kNow) {
        return enrolment.redeem(request, made.directory(), hosts, now);
    }
    fleet::LoginAnswer login(const std::string& request, fleet::Moment now = kNow) {
        return operators.login(request, made.directory().facts(), now);
    }
};

/// The words of what an act throws; "" if it throws nothing.
inline std::string wordsOf(const std::function<void()>& act) {
    try {
        act();
        return "";
    } catch (const std::exception& error) {
        return error.what();
    }
}

}  // namespace joining
