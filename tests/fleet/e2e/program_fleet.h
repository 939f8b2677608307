/// A fleet of real programs on this machine, set up as people do it.
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "support/host/managed_host.h"
#include "support/host/program.h"
#include "support/host/script_home.h"
#include "support/scratch_dir.h"

namespace fleet_e2e {

/// The bus, the centre, one host "web-1" with its link and the label env=test, and operators.
/// Everything throws std::runtime_error when it does not come about.
class ProgramFleet {
public:
    ProgramFleet();
    ~ProgramFleet();
    ProgramFleet(const ProgramFleet&) = delete;
    ProgramFleet& operator=(const ProgramFleet&) = delete;

    const std::string& url() const { return url_; }
    ScriptHome& home() { return home_; }
    const ScriptHome& home() const { return home_; }
    ManagedHost& host() { return *host_; }
    /// That of the host.
    Program& link() { return *programs_.back(); }
    /// Kills it and starts it again.
    void restartLink();

    /// Has somebody join as an operator with these further words of "operator add".
    void join(const std::string& name, const std::vector<std::string>& words);
    /// zavctl for this fleet, as that operator calls it.
    ProgramResult zavctl(const std::string& name, const std::vector<std::string>& words) const;
    std::unique_ptr<Program> startZavctl(const std::string& name,
                                         const std::vector<std::string>& words) const;

private:
    Environment environmentOf(const std::string& name) const;
    std::string zavfleetd(const std::vector<std::string>& words) const;
    void makeKeys();
    void enrolHost();
    void startLink();
    std::unique_ptr<Program> begin(const std::vector<std::string>& words);

    ScratchDir scratch_;
    const std::string bus_;
    const std::string url_;
    ScriptHome home_;
    std::unique_ptr<ManagedHost> host_;
    std::vector<std::unique_ptr<Program>> programs_;  ///< in the order of their start
};

}  // namespace fleet_e2e
