/// Stands between the clients that send files and the plug-in that takes them.
#pragma once

#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include "embedded/mutex.h"
#include "embedded/ncs_host.h"
#include "host/depot/transfers/transfer_call.h"
#include "host/depot/transfers/transfer_rules.h"
#include "metrics/by_label.h"
#include "metrics/counter.h"

namespace host {

/// What came of the transfers so far. Any thread.
struct TransferCounts {
    metrics::Counter
        begun;  ///< files that clients began to send, those that were refused among them
    metrics::Counter failed;  ///< batches that were refused, or that the plug-in did not take
    metrics::Counter bytes;   ///< of files, that the plug-in took
};

/// Refuses transfers with status 6 before the plug-in sees them: those that the rules forbid and,
/// when guarded, those of a file that another client is just sending. The protocol does not say
/// where a transfer ends. Here it ends with a batch whose last chunk is not full, with a batch that
/// fails, with the first batch of the client's next file, or with its association. Any thread.
class TransferGate final : public ncs::CallWatch {
public:
    /// Both outlive this object. `refusals` counts by the name of the guard; may be null.
    explicit TransferGate(const TransferRules& rules,
                          metrics::ByLabel<metrics::Counter>* refusals = nullptr)
        : rules_(rules), refusals_(refusals) {}

    std::optional<std::string> before(const ncs::Call& call) override;
    void after(const ncs::Call& call, const std::string& reply) noexcept override;
    void ended(std::uint64_t association) noexcept override;

    /// What stands against a push of that name to that destination now.
    std::optional<Objection> objectionTo(const std::string& name,
                                         const std::string& destination) const;
    /// Whether some client is just sending the file at this destination, or one below it if it is a
    /// directory.
    bool isReceiving(const std::string& destination) const;

    const TransferCounts& counts() const { return counts_; }

private:
    struct Transfer {
        std::string name;
        bool endsFile = false;
        std::uint64_t number = 0;  ///< counts up with each file that somebody begins
    };
    using Transfers = std::map<std::uint64_t, Transfer>;

    void count(const ncs::Call& call, int status);
    void countRefusal(const Objection& objection);
    std::optional<Objection> begin(std::uint64_t association, const TransferCall& call);
    /// Notes the transfer, and returns its number.
    std::uint64_t enter(std::uint64_t association, const TransferCall& call) ZAV_REQUIRES(lock_);
    /// What others began to send before it and could be the same file.
    std::vector<std::string> rivals(std::uint64_t association) const ZAV_REQUIRES(lock_);
    bool isOneOf(const std::string& name, const std::vector<std::string>& others) const;

    const TransferRules& rules_;
    metrics::ByLabel<metrics::Counter>* const refusals_;
    TransferCounts counts_;
    mutable embedded::Mutex lock_;
    /// What each association is sending.
    Transfers underWay_ ZAV_GUARDED_BY(lock_);
    std::uint64_t begun_ ZAV_GUARDED_BY(lock_) = 0;
};

}  // namespace host
