/// Files that a browser brings to the depots of many hosts.
#pragma once

#include <atomic>
#include <functional>
#include <memory>
#include <string>

#include "fleet/operator/console/runs/run_request.h"
#include "http/handler.h"

namespace fleet {

/// A few at a time. Any thread.
class FleetUploads {
public:
    /// Runs a push once its file is there; see VerbRuns::begin().
    using Push = std::function<http::Answer(RunRequest request)>;

    /// Files stand in that directory, without a name, until they are at the centre.
    FleetUploads(std::string directory, std::string url, Push push);

    /// Takes the body of the request, whose parameters are `path`, the file's place in the depots,
    /// and `on`, the selector of the hosts. A reply refuses it.
    http::BodyPlan begin(const http::Request& head);

private:
    class Upload;

    const std::string directory_;
    const std::string url_;
    const Push push_;
    std::atomic<int> count_{0};
};

}  // namespace fleet
