/// A fleet behind the console.
#pragma once

#include <chrono>
#include <string>

#include "ctl/console/backend.h"
#include "ctl/console/turns.h"
#include "fleet/operator/console/outputs/output_streams.h"
#include "fleet/operator/console/reads/centre_reads.h"
#include "fleet/operator/console/runs/fleet_uploads.h"
#include "fleet/operator/console/runs/verb_runs.h"
#include "fleet/operator/identity/operator_identity.h"

namespace fleet {

/// Hands what reads to the centre, in the operator's session. What changes something is a verb of
/// the operator's own program, which signs with a key that no browser has, as it does with the
/// questions that bring a task's output from its host.
class FleetBackend final : public console::Backend {
public:
    struct Settings {
        OperatorIdentity identity;
        std::chrono::milliseconds readTime{30'000};  ///< for an answer of the centre
        /// The same while output is followed: a centre that says nothing is found to be away in
        /// about the time that a host is.
        std::chrono::milliseconds outputTime{5'000};
        /// zavctl-fleet itself, also when its file has been replaced meanwhile.
        std::string program = "/proc/self/exe";
        RunLimits runs = {};
        std::string uploadDirectory = "/var/tmp";  ///< where files wait for the centre
    };

    /// Throws UrlError, HttpsError or MessageError if the identity makes no sense.
    explicit FleetBackend(Settings settings);

    std::variant<http::Answer, http::Job> describe() override;
    std::variant<http::Answer, http::Job> handle(http::Request request) override;
    http::BodyPlan planFor(const http::Request& head) override;
    void prepareForEnd() override;
    bool quiet() const override { return turns_.quiet() && runs_.empty(); }

private:
    std::variant<http::Answer, http::Job> read(http::Request request);
    std::variant<http::Answer, http::Job> run(http::Request request);
    http::Answer start(RunRequest request);
    http::Answer follow(const http::Request& request);
    http::Answer description();

    const OperatorIdentity identity_;
    const Certificate grant_;
    CentreSession session_;
    CentreReads reads_;
    OutputStreams outputs_;
    VerbRuns runs_;
    FleetUploads uploads_;
    console::Turns turns_;
};

}  // namespace fleet
