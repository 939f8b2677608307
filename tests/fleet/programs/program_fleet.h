/// A fleet of real programs that can be killed: the bus, the centre, hosts with their links, and an
/// operator.
#pragma once

#include <chrono>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "fleet/operator/identity/operator_identity.h"
#include "support/host/managed_host.h"
#include "support/host/program.h"
#include "support/host/script_home.h"
#include "tests/fleet/server/keys/made_fleet.h"

namespace fleet_programs {

/// Anything that is expected to happen happens by then, on a machine that does much else.
inline constexpr std::chrono::minutes kPatience{5};

fleet::Moment wallTime();

/// The keys of a fleet, its bus with TLS, its centre, and an operator who may do everything.
/// Processes end with the object, and with the thread that has started them.
class ProgramFleet {
public:
    /// Makes the keys. Nothing runs yet.
    ProgramFleet();
    ProgramFleet(const ProgramFleet&) = delete;
    ProgramFleet& operator=(const ProgramFleet&) = delete;

    const fleet::FleetDirectory& directory() const { return made_.directory(); }
    const ScratchDir& scratch() const { return made_.scratch(); }

    /// Each starts a program; both throw std::runtime_error if it ends at once.
    void startBus();
    void startCentre();
    /// Returns when the centre works, or throws when it does not get there.
    void awaitCentre();
    bool isCentreAtWork() const;
    /// Sends the signal and waits for the end.
    void endBus(int signal);
    void endCentre(int signal);
    Program& bus() const { return *bus_; }
    Program& centre() const { return *centre_; }

    /// The word with which a host of that name joins. The centre must work.
    std::string inviteHost(const std::string& name) const;
    /// zavctl --fleet, as the operator.
    std::unique_ptr<Program> zavctl(const std::vector<std::string>& arguments) const;

private:
    void addOperator();

    const std::string busPort_;
    const std::string centrePort_;
    const made_fleet::MadeFleet made_;
    std::unique_ptr<Program> bus_;
    std::unique_ptr<Program> centre_;
};

/// A host that has joined, with its link.
class JoinedHost {
public:
    /// Starts the host, has it join and starts its link. Throws std::runtime_error.
    JoinedHost(const ProgramFleet& fleet, std::string name);

    const std::string& name() const { return name_; }
    /// Its bus key.
    const std::string& key() const { return key_; }
    ScriptHome& home() { return home_; }
    ManagedHost& host() { return host_; }
    void killHost();
    void startHost() { host_.start(); }
    void killLink();
    void startLink();

private:
    const std::string name_;
    ScratchDir scratch_;
    ScriptHome home_;
    ManagedHost host_;
    std::string key_;
    std::unique_ptr<Program> link_;
};

}  // namespace fleet_programs
