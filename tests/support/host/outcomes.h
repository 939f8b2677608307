/// The rows of KAGDYST that arrive while the object exists.
#pragma once

#include <chrono>
#include <condition_variable>
#include <memory>
#include <mutex>
#include <vector>

#include "embedded/oxa_host.h"
#include "tasks/deploy_status.h"

class Outcomes {
public:
    /// Subscribes with the given filter; the table is registered when it is not.
    explicit Outcomes(const std::vector<oxa::Predicate>& where = {});

    /// The rows so far; waits until there are `count`, but not for ever.
    std::vector<zav_kagdyst_data_t> waitFor(std::size_t count);
    std::vector<zav_kagdyst_data_t> rows();

private:
    int take(const oxa::Rows& rows);

    std::mutex lock_;
    std::condition_variable arrived_;
    std::vector<zav_kagdyst_data_t> rows_;
    std::unique_ptr<oxa::Subscription> subscription_;  // last: it ends first
};
