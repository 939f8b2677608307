/// Asks many hosts and gathers what they answer.
#pragma once

#include <chrono>
#include <functional>
#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "fleet/operator/centre/centre.h"
#include "fleet/operator/identity/operator_identity.h"
#include "fleet/operator/orders/chosen_hosts.h"

namespace fleet {

/// What is asked.
struct Inquiry {
    std::string kind;     ///< see question.h
    nlohmann::json body;  ///< without the key for the answers, which is made up for each inquiry
};

struct HostAnswer {
    ChosenHost host;
    nlohmann::json answer;  ///< null if there is none
    std::string trouble;    ///< why there is none; "" if there is
};

struct AskingPace {
    std::chrono::steady_clock::time_point deadline;
    /// Called between two looks for answers.
    std::function<void()> pause;
};

/// The answers of all hosts of the choice, in its order. Hosts that the centre has not heard lately
/// are not asked. Nobody but this process can read the answers: the key for them is in its memory
/// only. Throws ctl::Failure if nobody can be asked: as the centre does, or because the certificate
/// does not allow it.
std::vector<HostAnswer> askHosts(Centre& centre, const OperatorIdentity& identity,
                                 const Choice& choice, const Inquiry& inquiry,
                                 const AskingPace& pace);

/// Asks as a command with this deadline does.
std::vector<HostAnswer> askHosts(Centre& centre, const OperatorIdentity& identity,
                                 const Choice& choice, const Inquiry& inquiry,
                                 std::chrono::steady_clock::time_point deadline);

}  // namespace fleet
