#include "fleet/server/commands/operator_text.h"

#include "fleet/server/commands/texts.h"

namespace fleet {
namespace {

const char* textOf(OperatorKey::State state) {
    switch (state) {
        case OperatorKey::State::Invited:
            return "invited until";
        case OperatorKey::State::Waiting:
            return "waits";
        case OperatorKey::State::Certified:
            return "certified until";
        case OperatorKey::State::Revoked:
            return "revoked";
        case OperatorKey::State::Withdrawn:
            return "withdrawn";
    }
    return "";
}

}  // namespace

std::string lineOf(const OperatorKey& key) {
    const OperatorGrant& grant = key.grant;
    const bool hasEnd =
        key.state == OperatorKey::State::Invited || key.state == OperatorKey::State::Certified;
    return grant.name + "  " + (key.key.empty() ? "-" : key.key) + "  " + textOf(grant.role) +
           "  commands " + joined(grant.commands) + "  products " + joined(grant.products) +
           "  on " + grant.selector + "  " + textOf(key.state) +
           (hasEnd ? " " + textOfMoment(key.until) : "");
}

}  // namespace fleet
