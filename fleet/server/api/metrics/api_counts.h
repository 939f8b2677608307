/// What the centre's interface counts, for whoever watches it.
#pragma once

#include <string>
#include <vector>

#include "http/handler.h"
#include "metrics/by_label.h"
#include "metrics/counter.h"

namespace fleet {

/// Counts begin at 0 with the process. Any thread.
struct ApiCounts {
    /// Answers by their status. Those that no endpoint gives are "other".
    metrics::ByLabel<metrics::Counter> answers{
        std::vector<std::string>{"200", "201", "206", "400", "401", "403", "404", "405", "409",
                                 "416", "429", "500", "503", "507"}};
    metrics::Counter openedSessions;
    metrics::Counter servedPieces;  ///< of files, to hosts
    metrics::Counter servedBytes;

    void noteAnswer(const http::Answer& answer) {
        // A stream begins with 200.
        const auto* const reply = std::get_if<http::Reply>(&answer);
        answers.at(reply == nullptr ? "200" : std::to_string(reply->status)).add();
    }
};

}  // namespace fleet
