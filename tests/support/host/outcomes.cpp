#include "support/host/outcomes.h"

#include <cstring>
#include <stdexcept>

#include "tables/zav02agt.h"

Outcomes::Outcomes(const std::vector<oxa::Predicate>& where) {
    if (zav_kagdyst_static_manager == nullptr && zav_kagdyst_init() != 0) {
        throw std::runtime_error("KAGDYST cannot be registered");
    }
    subscription_ =
        oxa::subscribe("KAGDYST", where, [this](const oxa::Rows& rows) { return take(rows); });
    if (!subscription_) throw std::runtime_error("no subscription");
}

int Outcomes::take(const oxa::Rows& rows) {
    const std::lock_guard<std::mutex> lock(lock_);
    for (std::size_t i = 0; i < rows.count(); ++i) {
        zav_kagdyst_data_t row;
        std::memcpy(&row, rows.row(i), sizeof row);
        rows_.push_back(row);
    }
    arrived_.notify_all();
    return 0;
}

std::vector<zav_kagdyst_data_t> Outcomes::waitFor(std::size_t count) {
    std::unique_lock<std::mutex> lock(lock_);
    arrived_.wait_for(lock, std::chrono::seconds(30), [&] { return rows_.size() >= count; });
    return rows_;
}

std::vector<zav_kagdyst_data_t> Outcomes::rows() {
    const std::lock_guard<std::mutex> lock(lock_);
    return rows_;
}
