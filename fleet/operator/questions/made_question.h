/// Questions as an operator signs them.
#pragma once

#include <nlohmann/json.hpp>
#include <string>

#include "fleet/bus/messages/values.h"
#include "fleet/operator/identity/operator_identity.h"

namespace fleet {

/// What one host is asked.
struct WantedAnswer {
    std::string host;      ///< its bus key
    std::string selector;  ///< the one that chose it
    std::string kind;      ///< see question.h
    nlohmann::json body;   ///< with the key for the answer
};

struct MadeQuestion {
    std::string id;
    std::string bytes;  ///< signed
};

/// A question that is good from now on for as long as one can be.
MadeQuestion makeQuestion(const OperatorIdentity& identity, const WantedAnswer& wanted, Moment now);

/// Throws ctl::Failure if the certificate has ended, or does not allow that kind of question for
/// that product; "" stands for none.
void insistThatMayAsk(const OperatorIdentity& identity, const std::string& kind,
                      const std::string& product);

}  // namespace fleet
