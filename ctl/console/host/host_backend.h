/// One host behind the console.
#pragma once

#include <cstddef>
#include <string>
#include <vector>

#include "ctl/client/address/host_address.h"
#include "ctl/console/answer_room.h"
#include "ctl/console/backend.h"
#include "ctl/console/host/host_streams.h"
#include "ctl/console/host/upload.h"
#include "ctl/console/turns.h"

namespace console {

struct HostSettings {
    ctl::HostAddress host;
    std::vector<std::string> command = {"zavctl"};  ///< what a line to copy begins with
    std::string uploadDirectory = "/var/tmp";       ///< where files wait for the host
    std::size_t answerRoom = AnswerRoom::kMost;     ///< for answers that browsers have yet to take
};

/// Hands what is below /v1 to the host, and takes files for its depot.
class HostBackend final : public Backend {
public:
    /// Throws std::runtime_error.
    explicit HostBackend(HostSettings settings);

    std::variant<http::Answer, http::Job> describe() override;
    std::variant<http::Answer, http::Job> handle(http::Request request) override;
    http::BodyPlan planFor(const http::Request& head) override;
    void prepareForEnd() override {}
    bool quiet() const override { return turns_.quiet() && uploads_.empty(); }

private:
    std::variant<http::Answer, http::Job> hand(http::Request request);

    const ctl::HostAddress host_;
    const std::string description_;
    Uploads uploads_;
    HostStreams streams_;
    Turns turns_;
    const AnswerRoom room_;
};

}  // namespace console
