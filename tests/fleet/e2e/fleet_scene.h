/// A whole fleet on this machine: a server of the bus, a centre, and hosts with their links.
#pragma once

#include <future>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <thread>
#include <vector>

#include "fleet/bus/messages/certificate.h"
#include "fleet/bus/messages/order.h"
#include "fleet/link/program/link_file.h"
#include "fleet/server/program/centre_program.h"
#include "support/host/managed_host.h"
#include "support/host/script_home.h"
#include "tests/fleet/bus/accounts/fleet_bus.h"

namespace fleet_e2e {

/// Anything that is expected to happen happens by then, on a machine that does much else.
inline constexpr std::chrono::minutes kPatience(3);
inline constexpr const char* kFleet = "example";

inline fleet::Moment now() {
    return std::chrono::duration_cast<fleet::Moment>(
        std::chrono::system_clock::now().time_since_epoch());
}

/// A host with its link: both are real programs.
class FleetHost {
public:
    /// What its link is told of the fleet.
    struct Fleet {
        std::string bus;
        std::string root;
        std::string centre;
        std::string token;  ///< the host's own
    };

    FleetHost(std::string name, const fleet::KeyPair& bus, const fleet::KeyPair& signing,
              const Fleet& fleet);

    const std::string& key() const { return key_; }
    const std::string& signing() const { return signing_; }
    const std::string& name() const { return name_; }

    void startHost();
    void startLink();
    void killHost();
    void killLink();
    void stopLink();
    /// Starts a link on a copy of this one's memory, as a copied machine would.
    std::unique_ptr<Program> startClone();
    Program& link() { return *link_; }
    ManagedHost& host() { return *host_; }
    ScriptHome& home() { return home_; }
    /// How often the agent was called with this verb.
    std::size_t callsOf(const std::string& verb) const;

private:
    std::unique_ptr<Program> run(const std::string& configuration) const;
    std::string configurationIn(const std::string& state) const;

    const std::string name_;
    const std::string key_;
    const std::string signing_;
    const Fleet fleet_;
    ScratchDir scratch_;
    ScriptHome home_;
    std::unique_ptr<ManagedHost> host_;
    std::unique_ptr<Program> link_;
};

class FleetScene {
public:
    FleetScene();
    ~FleetScene();

    FleetBus& bus() { return bus_; }
    fleet::CentreProgram& centre() { return *centre_; }
    const ScratchDir& files() const { return scratch_; }
    std::vector<std::string> alarms();

    void startCentre();
    /// Ends the centre; how its run has ended.
    fleet::CentreProgram::End stopCentre();

    /// Enrols a host with labels env=test, not yet started.
    std::unique_ptr<FleetHost> enrol(const std::string& name);
    void start(FleetHost& host);

    /// What this operator may: everything, unless it is changed.
    fleet::Certificate& certificate() { return certificate_; }
    /// An order of the operator for the host: this command of the product "ux".
    fleet::Order order(const FleetHost& host, const std::string& command,
                       const std::string& body = R"({"product":"ux"})") const;
    std::string sign(const fleet::Order& order) const;
    std::string signQuestion(const fleet::Order& question) const;
    /// Gives it to the centre; its identifier.
    std::string submit(const fleet::Order& order);
    std::string submit(const FleetHost& host, const std::string& command);

    /// What the centre knows of the order's end.
    std::optional<fleet::Outcome> outcome(const FleetHost& host, const std::string& order);
    /// The state in which it has ended; "" if it has not in time.
    std::string awaitEnd(const FleetHost& host, const std::string& order);

private:
    ScratchDir scratch_;
    FleetBus bus_;
    const fleet::KeyPair root_ = fleet::KeyPair::make(fleet::KeyKind::Operator);
    const fleet::KeyPair centreKey_ = fleet::KeyPair::make(fleet::KeyKind::User);
    const fleet::KeyPair operator_ = fleet::KeyPair::make(fleet::KeyKind::User);
    fleet::Certificate certificate_;
    std::mutex mutex_;
    std::vector<std::string> alarms_;
    std::unique_ptr<fleet::CentreProgram> centre_;
    std::future<fleet::CentreProgram::End> running_;
};

}  // namespace fleet_e2e
