/// Requests on the sample table, made through the driver.
#pragma once

#include <atomic>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "conformance/rule.h"
#include "conformance/sample_table.h"

namespace conformance {

/// The names in rows of the sample table, without their trailing blanks.
std::vector<std::string> namesOf(const Rows& rows);

/// The sample table, registered, with one live subscription on it.
class LiveRequest {
public:
    explicit LiveRequest(Bench& bench, const Conditions& where = {});
    ~LiveRequest();
    LiveRequest(const LiveRequest&) = delete;
    LiveRequest& operator=(const LiveRequest&) = delete;

    /// The subscription's object. It must be live.
    SampleRequest& object();
    /// Ends the subscription.
    void end() { subscription_.reset(); }

    /// The names in the rows that have come.
    std::vector<std::string> names() const;
    /// How often the requester was called.
    int calls() const;

    SampleManager manager;
    std::atomic<int> answer{OXA_OK};  ///< what the requester answers

private:
    int take(const Rows& rows);

    mutable std::mutex lock_;  ///< guards the two below
    std::vector<std::string> names_;
    int calls_ = 0;
    std::unique_ptr<Subscription> subscription_;
};

}  // namespace conformance
