#include "host/depot/transfers/transfer_gate.h"

#include <algorithm>
#include <new>
#include <utility>

#include "host/depot/real_path.h"
#include "host/depot/transfers/transfer_call.h"
#include "platform/ras1.h"

namespace host {
namespace {

RAS1_UNIT traceUnit{"zavhost"};

void traceRefusal(const char* function, int line, const std::string& name,
                  const Objection& objection) {
    if ((RAS1_Flags(traceUnit) & RAS1_ERROR) == 0) return;
    const RAS1_BLOCK block{&traceUnit, function};
    RAS1_Printf(&block, RAS1_ERROR, line, "Transfer of [%s] is refused: %s", name.c_str(),
                objection.reason.c_str());
}

Objection beingSent() {
    return {"depot-transfers", "another client is just sending this file",
            "Wait until it has ended, and push again."};
}

}  // namespace

std::optional<std::string> TransferGate::before(const ncs::Call& call) {
    if (!isTransfer(call)) return std::nullopt;
    const std::optional<TransferCall> transfer = readTransferCall(call);
    if (!transfer) return std::nullopt;
    if (transfer->startsFile) counts_.begun.add();
    // Where a name leads is looked up in the file system, which ten thousand small files would
    // feel.
    const std::string destination =
        rules_.keepsAny() ? rules_.destination(transfer->name) : std::string();
    std::optional<Objection> objection =
        rules_.objectionTo(transfer->name, destination, transfer->startsFile);
    if (!objection && rules_.guarded()) objection = begin(call.association, *transfer);
    if (!objection) return std::nullopt;
    traceRefusal(__func__, __LINE__, transfer->name, *objection);
    countRefusal(*objection);
    return transferReply(kTransferRefused);
}

/// The files are compared without the lock, because that asks the file system. Of two that begin at
/// the same time the later one finds the earlier one noted already.
std::optional<Objection> TransferGate::begin(std::uint64_t association, const TransferCall& call) {
    std::uint64_t number = 0;
    std::vector<std::string> others;
    {
        const embedded::MutexLock lock(lock_);
        number = enter(association, call);
        others = rivals(association);
    }
    if (!isOneOf(call.name, others)) return std::nullopt;
    const embedded::MutexLock lock(lock_);
    const auto own = underWay_.find(association);
    if (own != underWay_.end() && own->second.number == number) underWay_.erase(own);
    return beingSent();
}

std::uint64_t TransferGate::enter(std::uint64_t association, const TransferCall& call) {
    Transfer& own = underWay_[association];
    if (own.number == 0 || own.name != call.name) own.number = ++begun_;
    own.name = call.name;
    own.endsFile = call.endsFile;
    return own.number;
}

/// There are at most as many as the server has connections.
std::vector<std::string> TransferGate::rivals(std::uint64_t association) const {
    const Transfer& own = underWay_.at(association);
    std::vector<std::string> names;
    for (const auto& [other, transfer] : underWay_) {
        const bool isRival = other != association && transfer.number < own.number;
        if (isRival && rules_.mayBeOne(transfer.name, own.name)) names.push_back(transfer.name);
    }
    return names;
}

bool TransferGate::isOneOf(const std::string& name, const std::vector<std::string>& others) const {
    if (others.empty()) return false;
    const std::string destination = rules_.destination(name);
    return std::any_of(others.begin(), others.end(), [&](const std::string& other) {
        return rules_.destination(other) == destination;
    });
}

void TransferGate::countRefusal(const Objection& objection) {
    counts_.failed.add();
    if (refusals_ != nullptr) refusals_->at(objection.guard).add();
}

/// After the plug-in has seen the call.
void TransferGate::count(const ncs::Call& call, int status) {
    const std::optional<TransferCall> transfer =
        isTransfer(call) ? readTransferCall(call) : std::nullopt;
    if (!transfer) return;
    if (status == 0) {
        counts_.bytes.add(transfer->bytes);
    } else {
        counts_.failed.add();
    }
}

void TransferGate::after(const ncs::Call& call, const std::string& reply) noexcept {
    try {
        count(call, statusOfReply(reply));
    } catch (const std::bad_alloc&) {
        // One transfer is missing in the figures.
    }
    const embedded::MutexLock lock(lock_);
    const auto found = underWay_.find(call.association);
    if (found == underWay_.end()) return;
    if (found->second.endsFile || statusOfReply(reply) != 0) underWay_.erase(found);
}

void TransferGate::ended(std::uint64_t association) noexcept {
    const embedded::MutexLock lock(lock_);
    underWay_.erase(association);
}

std::optional<Objection> TransferGate::objectionTo(const std::string& name,
                                                   const std::string& destination) const {
    if (auto objection = rules_.objectionTo(name, destination, true)) {
        return objection;
    }
    if (rules_.guarded() && isReceiving(destination)) return beingSent();
    return std::nullopt;
}

bool TransferGate::isReceiving(const std::string& destination) const {
    Transfers underWay;
    {
        const embedded::MutexLock lock(lock_);
        underWay = underWay_;
    }
    return std::any_of(underWay.begin(), underWay.end(), [&](const auto& entry) {
        return isWithin(rules_.destination(entry.second.name), destination);
    });
}

}  // namespace host
