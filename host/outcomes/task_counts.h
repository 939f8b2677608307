/// How many tasks ended, and how, for whoever watches the host.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "host/outcomes/task.h"
#include "metrics/by_label.h"
#include "metrics/counter.h"
#include "metrics/histogram.h"

namespace host {

/// Any thread.
class TaskCounts {
public:
    TaskCounts();

    /// The task has ended.
    void add(const Task& task);

    /// Calls `visit` with a command, the state in which tasks ended, and their number; with all
    /// commands of the plug-in, "other" among them, and all states that are an end.
    template <typename Visit>
    void eachEnd(const Visit& visit) const {
        ends_.each([&](std::string_view command, const metrics::ByLabel<metrics::Counter>& states) {
            states.each([&](std::string_view state, const metrics::Counter& counter) {
                if (state != metrics::kOtherLabel) visit(command, state, counter.value());
            });
        });
    }
    /// How long tasks ran that did run, by command.
    const metrics::ByLabel<metrics::Histogram>& durations() const { return durations_; }

private:
    metrics::ByLabel<metrics::ByLabel<metrics::Counter>> ends_;
    metrics::ByLabel<metrics::Histogram> durations_;
};

}  // namespace host
