// What publishing one outcome row costs with many live subscriptions, here inside one process: the
// host serves 256 connections at a time, the table of outcomes any number of subscriptions.
#include <benchmark/benchmark.h>

#include <cstring>
#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

#include "embedded/oxa_host.h"
#include "tables/zav02agt.h"

namespace {

zav_kagdyst_data_t outcomeOf(const std::string& transaction) {
    zav_kagdyst_data_t row;
    std::memset(&row, ' ', sizeof row);
    std::memcpy(row.transid, transaction.data(), transaction.size());
    std::memcpy(row.command, "START", 5);
    row.retval = 0;
    return row;
}

/// Live subscriptions that count what reaches them.
class Subscribers {
public:
    /// One each for the transactions 0, 1, ..., or all for every transaction.
    Subscribers(std::int64_t count, bool filtered) {
        for (std::int64_t i = 0; i < count; ++i) {
            std::vector<oxa::Predicate> where;
            if (filtered) where.push_back({"TRANSID", OPER_EQ, std::to_string(i)});
            live_.push_back(oxa::subscribe("KAGDYST", where, [this](const oxa::Rows& rows) {
                taken_ += static_cast<std::int64_t>(rows.count());
                return 0;
            }));
            if (!live_.back()) throw std::runtime_error("no subscription");
        }
    }
    std::int64_t taken() const { return taken_; }

private:
    std::int64_t taken_ = 0;
    std::vector<std::unique_ptr<oxa::Subscription>> live_;
};

void publish(benchmark::State& state, bool filtered) {
    const std::int64_t takers = filtered ? 1 : state.range(0);
    const Subscribers subscribers(state.range(0), filtered);
    zav_kagdyst_data_t row = outcomeOf("0");
    for (auto _ : state) {
        if (publishDeployStatus(&row, 1) != 0) state.SkipWithError("a row was refused");
    }
    if (subscribers.taken() != takers * state.iterations()) {
        state.SkipWithError("a row did not reach whom it should");
    }
}

void addGrowth(const char* name, bool filtered) {
    benchmark::RegisterBenchmark(name,
                                 [filtered](benchmark::State& state) { publish(state, filtered); })
        ->RangeMultiplier(2)
        ->Range(1, 512)
        ->Arg(1000);
}

}  // namespace

int main(int argc, char** argv) {
    benchmark::Initialize(&argc, argv);
    if (zav_kagdyst_init() != 0) return 1;
    addGrowth("subscriptions/all", false);
    addGrowth("subscriptions/one", true);
    benchmark::RunSpecifiedBenchmarks();
    benchmark::Shutdown();
    return 0;
}
