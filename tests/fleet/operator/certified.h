/// Operators with certificates, for tests.
#pragma once

#include <chrono>
#include <functional>
#include <string>
#include <vector>

#include "ctl/client/failure.h"
#include "fleet/bus/messages/certificate.h"
#include "fleet/operator/identity/operator_identity.h"

namespace operator_test {

constexpr fleet::Moment kNow{1'700'000'000'000};
constexpr fleet::Moment kHour{3'600'000};

inline fleet::KeyPair newUser() {
    return fleet::KeyPair::make(fleet::KeyKind::User);
}

/// A fleet's root, and whom it has certified.
struct Root {
    fleet::KeyPair key = fleet::KeyPair::make(fleet::KeyKind::Operator);

    fleet::OperatorIdentity certified(const std::vector<std::string>& commands,
                                      const std::vector<std::string>& products,
                                      const std::string& selector = "*",
                                      fleet::Moment until = kNow + 1000 * kHour) const {
        const fleet::KeyPair pair = newUser();
        fleet::Certificate certificate;
        certificate.fleet = "demo";
        certificate.name = "mary";
        certificate.key = pair.publicKey();
        certificate.until = until;
        certificate.commands = commands;
        certificate.products = products;
        certificate.selector = selector;
        return {"https://centre.example:8443",    "demo", key.publicKey(), "authority", pair,
                signCertificate(certificate, key)};
    }
};

/// The failure with which something ends that must not succeed; kSuccess if it does.
inline ctl::Failure failureOf(const std::function<void()>& act) {
    try {
        act();
    } catch (const ctl::Failure& failure) {
        return failure;
    }
    return {ctl::kSuccess, "nothing was thrown"};
}

}  // namespace operator_test
